import { Divider, Dropdown, DropdownItem, DropdownList, MenuToggle } from '@patternfly/react-core';
import EllipsisVIcon from '@patternfly/react-icons/dist/esm/icons/ellipsis-v-icon';
import { useState } from 'react';

import type { TaskRow } from '../api/tasks';
import { go, routeTo } from '../app/route';
import { useTexts } from '../texts/TextsProvider';
import type { Action } from './actions';
import { actionsId } from './places';

interface Props {
    row: TaskRow;
    onAction(action: Action, row: TaskRow): void;
}

/** What can be done with one task. What may not be done is shown with the reason. */
export function RowMenu({ row, onAction }: Props) {
    const { t } = useTexts();
    const [open, setOpen] = useState(false);
    const pick = (todo: () => void) => () => {
        setOpen(false);
        todo();
    };
    return (
        <Dropdown
            isOpen={open}
            onOpenChange={setOpen}
            shouldFocusFirstItemOnOpen
            popperProps={{ position: 'right' }}
            toggle={(ref) => (
                <MenuToggle
                    ref={ref}
                    id={actionsId(row.id)}
                    variant="plain"
                    isExpanded={open}
                    onClick={() => setOpen(!open)}
                    aria-label={t('list.actionsFor', { name: row.name })}
                    icon={<EllipsisVIcon />}
                />
            )}
        >
            <DropdownList>
                <DropdownItem
                    isAriaDisabled={!row.can_run}
                    description={row.can_run ? undefined : t('list.cannotRun')}
                    onClick={pick(() => row.can_run && onAction('run', row))}
                >
                    {t('action.run')}
                </DropdownItem>
                <DropdownItem
                    isAriaDisabled={!row.can_edit}
                    description={row.can_edit ? undefined : t('list.cannotEdit')}
                    onClick={pick(() => {
                        if (row.can_edit) {
                            go(routeTo(`tasks/${row.id}`));
                        }
                    })}
                >
                    {t('action.edit')}
                </DropdownItem>
                <DropdownItem
                    onClick={pick(() => go(routeTo('history', { task: String(row.id) })))}
                >
                    {t('nav.history')}
                </DropdownItem>
                <Divider component="li" />
                <DropdownItem
                    isDanger
                    isAriaDisabled={!row.can_delete}
                    description={row.can_delete ? undefined : t('list.cannotDelete')}
                    onClick={pick(() => row.can_delete && onAction('delete', row))}
                >
                    {t('action.delete')}
                </DropdownItem>
            </DropdownList>
        </Dropdown>
    );
}
