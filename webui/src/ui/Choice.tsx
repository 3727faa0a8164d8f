import { Dropdown, DropdownItem, DropdownList, MenuToggle } from '@patternfly/react-core';
import { type ReactNode, useState } from 'react';

export interface ChoiceOption<T extends string> {
    value: T;
    label: string;
}

interface Props<T extends string> {
    label: string;
    value: T;
    options: readonly ChoiceOption<T>[];
    onChange(value: T): void;
    /** Shown on the button instead of the chosen option. */
    face?: ReactNode;
    plain?: boolean;
    className?: string;
}

/** A button that opens a small menu to choose one of a few values. */
export function Choice<T extends string>(props: Props<T>) {
    const { label, value, options, onChange, face, plain, className } = props;
    const [open, setOpen] = useState(false);
    const chosen = options.find((option) => option.value === value);
    return (
        <Dropdown
            isOpen={open}
            onOpenChange={setOpen}
            shouldFocusFirstItemOnOpen
            onSelect={(_event, picked) => {
                setOpen(false);
                onChange(picked as T);
            }}
            popperProps={{ position: plain ? 'right' : 'left' }}
            toggle={(ref) => (
                <MenuToggle
                    ref={ref}
                    className={className}
                    variant={plain ? 'plainText' : 'default'}
                    isExpanded={open}
                    onClick={() => setOpen(!open)}
                    title={face ? label : undefined}
                    aria-label={`${label}: ${chosen?.label ?? ''}`}
                >
                    {face ?? chosen?.label ?? label}
                </MenuToggle>
            )}
        >
            <DropdownList aria-label={label}>
                {options.map((option) => (
                    <DropdownItem
                        key={option.value}
                        value={option.value}
                        isSelected={option.value === value}
                    >
                        {option.label}
                    </DropdownItem>
                ))}
            </DropdownList>
        </Dropdown>
    );
}
