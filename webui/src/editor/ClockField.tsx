import { TextInput } from '@patternfly/react-core';
import { useState } from 'react';

import { useTexts } from '../texts/TextsProvider';
import { minutesOf, parseClock } from './clock';
import { Field } from './fields';

interface Props {
    field: string;
    label: string;
    /** "HH:MM" of 24 hours, or what was typed when that is no time. */
    value: string;
    onChange(value: string): void;
}

// An evening hour shows whether the language counts to 12 or to 24.
const EXAMPLE = [18, 30] as const;

/**
 * A time of day. The browser's own input for times would count to 12 or to 24 as the browser does,
 * not as the rest of the page.
 */
export function ClockField({ field, label, value, onChange }: Props) {
    const { t, format } = useTexts();
    const [typed, setTyped] = useState<string | null>(null);
    const minutes = minutesOf(value);
    const shown = minutes === null ? value : format.clock(Math.floor(minutes / 60), minutes % 60);
    return (
        <Field
            field={field}
            label={label}
            help={t('schedule.timeHelp', { time: format.clock(...EXAMPLE) })}
            isRequired
        >
            {({ onBlur, ...input }) => (
                <TextInput
                    {...input}
                    className="orva-short"
                    autoComplete="off"
                    value={typed ?? shown}
                    onChange={(_event, text) => {
                        setTyped(text);
                        onChange(parseClock(text) ?? text);
                    }}
                    onBlur={() => {
                        setTyped(null);
                        onBlur();
                    }}
                />
            )}
        </Field>
    );
}
