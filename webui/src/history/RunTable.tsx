import { Button } from '@patternfly/react-core';
import { ExpandableRowContent, Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import AngleDownIcon from '@patternfly/react-icons/dist/esm/icons/angle-down-icon';
import AngleRightIcon from '@patternfly/react-icons/dist/esm/icons/angle-right-icon';
import { useLayoutEffect, useRef, useState } from 'react';

import type { Run } from '../api/history';
import { useNow } from '../live/useNow';
import { useTexts } from '../texts/TextsProvider';
import { focusFirst, keepFocus } from '../ui/focus';
import { reasonText, ResultLabel, runLength } from './result';
import { RunDetails } from './RunDetails';
import { StopRun } from './StopRun';

interface Props {
    runs: Run[];
    /** Whether all runs are of one task, whose name then stands above. */
    oneTask: boolean;
    open: number | null;
    onOpen(run: number | null): void;
    onTask(task: number): void;
}

function toggleId(run: number): string {
    return `output-of-${run}`;
}

function stopId(run: number): string {
    return `stop-${run}`;
}

/** It goes when the run ends, whoever is on it. */
function StopButton({ run, onStop }: { run: Run; onStop(): void }) {
    const { t } = useTexts();
    const button = useRef<HTMLButtonElement>(null);
    useLayoutEffect(() => {
        const shown = button.current;
        return () => {
            if (shown === document.activeElement) {
                keepFocus([toggleId(run.run)]);
            }
        };
    }, [run.run]);
    return (
        <Button
            id={stopId(run.run)}
            ref={button}
            variant="secondary"
            size="sm"
            onClick={onStop}
            aria-label={t('history.stopOf', { name: run.name })}
        >
            {t('action.stop')}
        </Button>
    );
}

interface RowProps extends Omit<Props, 'runs'> {
    run: Run;
    /** Whether it was asked to stop from here. */
    isAsked: boolean;
    onStop(): void;
}

function RunRow(props: RowProps) {
    const { run, oneTask, open, isAsked, onOpen, onTask, onStop } = props;
    const { t, format } = useTexts();
    const isOpen = open === run.run;
    const running = run.state === 'running';
    const now = useNow(running);
    const length = runLength(run, now);
    const stopping = running && isAsked;
    const why = stopping ? t('history.stopping') : reasonText(run, t);
    return (
        <Tbody isExpanded={isOpen}>
            <Tr>
                <Td className="pf-v6-c-table__toggle">
                    <Button
                        id={toggleId(run.run)}
                        variant="plain"
                        aria-expanded={isOpen}
                        aria-label={t('history.outputOf', { run: run.run })}
                        icon={isOpen ? <AngleDownIcon /> : <AngleRightIcon />}
                        onClick={() => onOpen(isOpen ? null : run.run)}
                    />
                </Td>
                <Td dataLabel={t('history.result')}>
                    <ResultLabel run={run} />
                    {why && <div className="orva-subtle">{why}</div>}
                </Td>
                {!oneTask && (
                    <Td
                        dataLabel={t('history.task')}
                        modifier="breakWord"
                        className="orva-card-title"
                    >
                        <Button variant="link" isInline onClick={() => onTask(run.task)}>
                            {run.name}
                        </Button>
                    </Td>
                )}
                <Td dataLabel={t('history.start')}>
                    {format.instant(run.started ?? run.occurrence ?? run.queued)}
                </Td>
                <Td dataLabel={t('history.length')}>
                    {length === null ? '–' : format.length(length)}
                </Td>
                <Td dataLabel={t('history.reason')}>{t(`reason.${run.reason}`)}</Td>
                <Td isActionCell>
                    {(running || run.state === 'queued') && !stopping && (
                        <StopButton run={run} onStop={onStop} />
                    )}
                </Td>
            </Tr>
            <Tr isExpanded={isOpen}>
                <Td colSpan={oneTask ? 6 : 7}>
                    <ExpandableRowContent>{isOpen && <RunDetails run={run} />}</ExpandableRowContent>
                </Td>
            </Tr>
        </Tbody>
    );
}

export function RunTable(props: Props) {
    const { t } = useTexts();
    const [stopping, setStopping] = useState<Run | null>(null);
    const [asked, setAsked] = useState<ReadonlySet<number>>(new Set());

    const close = (run: Run, done: boolean) => {
        setStopping(null);
        if (done) {
            setAsked((old) => new Set(old).add(run.run));
        }
        focusFirst([...(done ? [] : [stopId(run.run)]), toggleId(run.run)]);
    };

    return (
        <>
            <Table
                aria-label={t('history.title')}
                variant="compact"
                gridBreakPoint="grid-md"
                className="orva-cards"
            >
                <Thead>
                    <Tr>
                        <Th screenReaderText={t('history.output')} />
                        <Th>{t('history.result')}</Th>
                        {!props.oneTask && <Th>{t('history.task')}</Th>}
                        <Th>{t('history.start')}</Th>
                        <Th>{t('history.length')}</Th>
                        <Th>{t('history.reason')}</Th>
                        <Th screenReaderText={t('list.actionsColumn')} />
                    </Tr>
                </Thead>
                {props.runs.map((run) => (
                    <RunRow
                        key={run.run}
                        {...props}
                        run={run}
                        isAsked={asked.has(run.run)}
                        onStop={() => setStopping(run)}
                    />
                ))}
            </Table>
            {stopping && <StopRun run={stopping} onClose={(done) => close(stopping, done)} />}
        </>
    );
}
