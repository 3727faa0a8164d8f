import { Dropdown, DropdownItem, DropdownList, MenuToggle } from '@patternfly/react-core';
import { useState } from 'react';

import { go } from '../app/route';
import { EDITABLE_KINDS } from '../editor/kinds/names';
import { useTexts } from '../texts/TextsProvider';
import { KindIcon } from './kinds';

/** The button that offers one new task of each kind. */
export function NewTask() {
    const { t } = useTexts();
    const [open, setOpen] = useState(false);
    return (
        <Dropdown
            isOpen={open}
            onOpenChange={setOpen}
            shouldFocusFirstItemOnOpen
            onSelect={(_event, kind) => {
                setOpen(false);
                go(`#/tasks/new/${kind}`);
            }}
            popperProps={{ position: 'right' }}
            toggle={(ref) => (
                <MenuToggle
                    ref={ref}
                    variant="primary"
                    isExpanded={open}
                    onClick={() => setOpen(!open)}
                >
                    {t('list.new')}
                </MenuToggle>
            )}
        >
            <DropdownList>
                {EDITABLE_KINDS.map((kind) => (
                    <DropdownItem
                        key={kind}
                        value={kind}
                        icon={<KindIcon type={kind} />}
                        description={t(`kindHelp.${kind}`)}
                    >
                        {t(`kind.${kind}`)}
                    </DropdownItem>
                ))}
            </DropdownList>
        </Dropdown>
    );
}
