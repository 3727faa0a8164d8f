import { Card, CardBody, CardTitle, Label, Skeleton } from '@patternfly/react-core';
import { useEffect } from 'react';

import { ApiError } from '../api/client';
import { type ComingStart, comingStarts } from '../api/history';
import { useQuery, useSettled } from '../live/useQuery';
import { useTexts } from '../texts/TextsProvider';
import type { Translate } from '../texts/translate';
import { errorText } from '../ui/errorText';
import { type ScheduleForm, scheduleDocument } from './schedule';
import { scheduleWords } from './scheduleWords';

const COUNT = 10;
const TYPING_MS = 300;

interface Props {
    form: ScheduleForm;
    hasProblems: boolean;
    /** The API refuses the schedule: its reason, or null when it takes it. */
    onRefused(message: string | null): void;
}

/** What the appliance notes about a start, by the words that each note ends with or begins with. */
function noteText(note: string, t: Translate): string {
    if (note.startsWith('moved')) {
        return t('starts.moved');
    }
    if (note.endsWith('the first of them')) {
        return t('starts.firstOfTwo');
    }
    return note.endsWith('the second of them') ? t('starts.secondOfTwo') : note;
}

function Start({ start }: { start: ComingStart }) {
    const { t, format } = useTexts();
    return (
        <li>
            {format.local(start.local)}
            {start.note !== '' && (
                <>
                    {' '}
                    <Label color="orange" isCompact>
                        {noteText(start.note, t)}
                    </Label>
                </>
            )}
        </li>
    );
}

/** The schedule in words, and when it would start next. */
export function ComingStarts({ form, hasProblems, onRefused }: Props) {
    const { t, format } = useTexts();
    const wanted = hasProblems ? null : JSON.stringify(scheduleDocument(form));
    const key = useSettled(wanted, TYPING_MS);
    const { data, error, settled } = useQuery(
        key,
        (signal) => comingStarts(JSON.parse(key ?? '{}'), COUNT, signal),
        false,
    );
    const refused = settled && error instanceof ApiError ? error.message : null;
    useEffect(() => onRefused(refused), [refused, onRefused]);

    return (
        <Card isCompact className="orva-starts">
            <CardTitle component="h2">{t('starts.title')}</CardTitle>
            <CardBody>
                {hasProblems ? (
                    <p className="orva-subtle">{t('starts.incomplete')}</p>
                ) : (
                    <>
                        <p className="orva-words">{scheduleWords(form, t, format)}</p>
                        {error && settled && <p>{errorText(error, t)}</p>}
                        {!data && !error && <Skeleton screenreaderText={t('state.loading')} />}
                        {data && !error && data.starts.length === 0 && <p>{t('starts.none')}</p>}
                        {data && !error && (
                            <ol aria-label={t('starts.title')}>
                                {data.starts.map((start) => (
                                    <Start key={start.utc} start={start} />
                                ))}
                            </ol>
                        )}
                        {data && !error && (
                            <p className="orva-subtle">{t('starts.zone', { zone: data.zone })}</p>
                        )}
                    </>
                )}
            </CardBody>
        </Card>
    );
}
