import { FormGroup, FormHelperText, HelperText, HelperTextItem } from '@patternfly/react-core';
import { createContext, type ReactNode, useContext } from 'react';

import { useTexts } from '../texts/TextsProvider';
import { fieldId, type Problem } from './problems';

interface FieldsValue {
    /** The problem to show at a field now; none while a person has not come to it. */
    problemOf(field: string): Problem | string | undefined;
    touch(field: string): void;
}

export const FieldsContext = createContext<FieldsValue>({
    problemOf: () => undefined,
    touch: () => undefined,
});

/** What an input needs to belong to its field. */
export interface InputProps {
    id: string;
    validated: 'error' | 'default';
    'aria-describedby': string | undefined;
    onBlur(): void;
}

interface Props {
    field: string;
    label?: string;
    help?: string | undefined;
    isRequired?: boolean;
    /** The field is several inputs with a name in common. */
    group?: boolean;
    children(input: InputProps): ReactNode;
}

/** The problem of a field, or the help that stands there otherwise. */
export function FieldHelp({ field, help }: { field: string; help?: string | undefined }) {
    const { t } = useTexts();
    const problem = useContext(FieldsContext).problemOf(field);
    const text = typeof problem === 'object' ? t(problem.key, problem.values) : problem;
    // The region stands from the start: readers announce what appears in it.
    return (
        <FormHelperText>
            <HelperText id={`${fieldId(field)}-help`} aria-live="polite">
                {(text ?? help) && (
                    <HelperTextItem variant={text ? 'error' : 'default'} screenReaderText="">
                        {text ?? help}
                    </HelperTextItem>
                )}
            </HelperText>
        </FormHelperText>
    );
}

/** A labelled input with its help, or its problem once there is one. */
export function Field({ field, label, help, isRequired, group, children }: Props) {
    const { problemOf, touch } = useContext(FieldsContext);
    const id = fieldId(field);
    return (
        <FormGroup
            label={label}
            fieldId={id}
            isRequired={isRequired}
            {...(group && { role: 'group' })}
        >
            {children({
                id,
                validated: problemOf(field) ? 'error' : 'default',
                'aria-describedby': `${id}-help`,
                onBlur: () => touch(field),
            })}
            <FieldHelp field={field} help={help} />
        </FormGroup>
    );
}
