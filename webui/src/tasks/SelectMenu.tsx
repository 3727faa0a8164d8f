import {
    Dropdown,
    DropdownItem,
    DropdownList,
    MenuToggle,
    MenuToggleCheckbox,
} from '@patternfly/react-core';
import { useState } from 'react';

import type { TaskRow } from '../api/tasks';
import { useTexts } from '../texts/TextsProvider';
import type { Selection } from './useSelection';

interface Props {
    rows: TaskRow[];
    total: number;
    selection: Selection;
    onSelectAll(): void;
}

/** Selects the page, or all that match, or nothing. */
export function SelectMenu({ rows, total, selection, onSelectAll }: Props) {
    const { t } = useTexts();
    const [open, setOpen] = useState(false);
    const count = selection.rows.length;
    const wholePage = rows.length > 0 && rows.every((row) => selection.has(row.id));
    const pick = (todo: () => void) => () => {
        setOpen(false);
        todo();
    };
    return (
        <Dropdown
            isOpen={open}
            onOpenChange={setOpen}
            shouldFocusFirstItemOnOpen
            toggle={(ref) => (
                <MenuToggle
                    ref={ref}
                    isExpanded={open}
                    onClick={() => setOpen(!open)}
                    aria-label={t('list.selectMenu')}
                    splitButtonItems={[
                        <MenuToggleCheckbox
                            id="select-page"
                            key="select-page"
                            aria-label={t('list.selectPageLabel')}
                            isChecked={wholePage ? true : count > 0 ? null : false}
                            onChange={(checked) =>
                                checked || count === 0
                                    ? selection.set(rows, true)
                                    : selection.clear()
                            }
                        >
                            {count > 0 ? t.count('list.selected', count) : ''}
                        </MenuToggleCheckbox>,
                    ]}
                />
            )}
        >
            <DropdownList>
                <DropdownItem onClick={pick(selection.clear)}>{t('list.selectNone')}</DropdownItem>
                <DropdownItem onClick={pick(() => selection.set(rows, true))}>
                    {t.count('list.selectPage', rows.length)}
                </DropdownItem>
                <DropdownItem onClick={pick(onSelectAll)}>
                    {t.count('list.selectAll', total)}
                </DropdownItem>
            </DropdownList>
        </Dropdown>
    );
}
