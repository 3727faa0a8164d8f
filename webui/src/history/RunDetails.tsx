import { type UIEvent, useEffect, useLayoutEffect, useRef, useState } from 'react';

import { type Run, runOutput } from '../api/history';
import { PERIOD, useLive } from '../live/live';
import { useQuery } from '../live/useQuery';
import { useTexts } from '../texts/TextsProvider';
import { errorText } from '../ui/errorText';
import { Loading } from '../ui/states';
import { Notice } from '../ui/Notice';

/** Pixels from the end that still count as the end: places are rounded. */
const END = 2;

/** Counts up every two seconds while `active` and the page is seen. */
function useBeat(active: boolean): number {
    const [beat, setBeat] = useState(0);
    useEffect(() => {
        if (!active) {
            return;
        }
        const timer = setInterval(() => {
            if (!document.hidden) {
                setBeat((old) => old + 1);
            }
        }, PERIOD);
        return () => clearInterval(timer);
    }, [active]);
    return beat;
}

interface TextProps {
    text: string;
    label: string;
    /** Whether more may come at the end, which is kept in sight as long as nobody goes back. */
    follow?: boolean;
}

function Text({ text, label, follow = false }: TextProps) {
    const box = useRef<HTMLPreElement>(null);
    const atEnd = useRef(true);
    useLayoutEffect(() => {
        if (follow && atEnd.current && box.current) {
            box.current.scrollTop = box.current.scrollHeight;
        }
    }, [text, follow]);
    const note = ({ currentTarget }: UIEvent) => {
        const { scrollHeight, scrollTop, clientHeight } = currentTarget;
        atEnd.current = scrollHeight - scrollTop - clientHeight < END;
    };
    return (
        <pre
            ref={box}
            className="orva-output"
            tabIndex={0}
            aria-label={label}
            role="region"
            onScroll={note}
        >
            {text}
        </pre>
    );
}

/** Facts about a run that the row has no room for, and what it printed: live while it runs. */
export function RunDetails({ run }: { run: Run }) {
    const { t, format } = useTexts();
    const { online } = useLive();
    const running = run.state === 'running';
    // To the last line, which comes when it runs no more.
    const [follow] = useState(running);
    const beat = useBeat(running && online);
    const { data, error } = useQuery(`${run.run} ${run.state} ${beat}`, (signal) =>
        runOutput(run.run, signal),
    );
    // Whole as far as it fits: on a phone what was opened may begin below the edge.
    const place = useRef<HTMLDivElement>(null);
    const arrived = data !== null || error !== null;
    useEffect(() => {
        if (arrived) {
            place.current?.closest('tbody')?.scrollIntoView({ block: 'nearest' });
        }
    }, [arrived]);

    return (
        <div className="orva-details" ref={place}>
            <dl className="orva-facts">
                <dt>{t('history.run')}</dt>
                <dd>{run.run}</dd>
                {run.occurrence && (
                    <>
                        <dt>{t('history.occurrence')}</dt>
                        <dd>{format.instant(run.occurrence)}</dd>
                    </>
                )}
                {run.reason === 'hand' && (run.asked_account || run.asked_program) && (
                    <>
                        <dt>{t('history.askedBy')}</dt>
                        <dd>{[run.asked_account, run.asked_program].filter(Boolean).join(' · ')}</dd>
                    </>
                )}
                {run.ended && (
                    <>
                        <dt>{t('history.ended')}</dt>
                        <dd>{format.instant(run.ended)}</dd>
                    </>
                )}
            </dl>
            {error && !data && (
                <Notice isPlain variant="danger" title={errorText(error, t)} />
            )}
            {!data && !error && <Loading />}
            {data && data.size === 0 && (
                <p>{t(running ? 'history.noOutputYet' : 'history.noOutput')}</p>
            )}
            {data && data.size > 0 && (
                <>
                    <p className="orva-subtle">
                        {t('history.printed', { bytes: format.bytes(data.size) })}
                    </p>
                    {data.dropped > 0 ? (
                        <>
                            <Text text={data.head} label={t('history.head')} />
                            <p className="orva-dropped">
                                {t('history.dropped', { bytes: format.bytes(data.dropped) })}
                            </p>
                            <Text text={data.tail} label={t('history.tail')} follow={follow} />
                        </>
                    ) : (
                        <Text
                            text={data.head + data.tail}
                            label={t('history.output')}
                            follow={follow}
                        />
                    )}
                </>
            )}
        </div>
    );
}
