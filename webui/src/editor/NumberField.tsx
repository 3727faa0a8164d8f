import { InputGroup, InputGroupItem, InputGroupText, TextInput } from '@patternfly/react-core';

import { Field } from './fields';

interface Props {
    field: string;
    label: string;
    unit: string;
    value: string;
    help?: string;
    isDisabled?: boolean;
    onChange(value: string): void;
}

/** A whole number with its unit. It stays text, so that a half-typed one is not lost. */
export function NumberField({ field, label, unit, value, help, isDisabled, onChange }: Props) {
    return (
        <Field field={field} label={label} help={help} isRequired>
            {(input) => (
                <InputGroup className="orva-number">
                    <InputGroupItem>
                        <TextInput
                            {...input}
                            inputMode="numeric"
                            autoComplete="off"
                            isDisabled={isDisabled}
                            value={value}
                            onChange={(_event, text) => onChange(text)}
                        />
                    </InputGroupItem>
                    <InputGroupText>{unit}</InputGroupText>
                </InputGroup>
            )}
        </Field>
    );
}
