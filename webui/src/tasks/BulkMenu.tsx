import { Dropdown, DropdownItem, DropdownList, MenuToggle } from '@patternfly/react-core';
import { useState } from 'react';

import { useTexts } from '../texts/TextsProvider';
import { type Action, ACTIONS } from './actions';
import { BULK_ID } from './places';

interface Props {
    /** How many tasks are selected. */
    count: number;
    onAction(action: Action): void;
}

/** What can be done with the selected tasks. */
export function BulkMenu({ count, onAction }: Props) {
    const { t } = useTexts();
    const [open, setOpen] = useState(false);
    return (
        <Dropdown
            isOpen={open}
            onOpenChange={setOpen}
            shouldFocusFirstItemOnOpen
            onSelect={(_event, value) => {
                setOpen(false);
                onAction(value as Action);
            }}
            toggle={(ref) => (
                <MenuToggle
                    ref={ref}
                    id={BULK_ID}
                    isExpanded={open}
                    isDisabled={count === 0}
                    onClick={() => setOpen(!open)}
                >
                    {t('list.bulk')}
                </MenuToggle>
            )}
        >
            <DropdownList>
                {ACTIONS.map((action) => (
                    <DropdownItem key={action} value={action} isDanger={action === 'delete'}>
                        {t(`action.${action}`)}
                    </DropdownItem>
                ))}
            </DropdownList>
        </Dropdown>
    );
}
