import {
    Button,
    EmptyState,
    EmptyStateBody,
    Toolbar,
    ToolbarContent,
    ToolbarItem,
} from '@patternfly/react-core';
import ListIcon from '@patternfly/react-icons/dist/esm/icons/list-icon';
import { useEffect, useMemo } from 'react';

import { ApiError } from '../api/client';
import { listRuns, type Run, RUN_STATES } from '../api/history';
import { getTask } from '../api/tasks';
import type { ViewProps } from '../app/CurrentView';
import { useRoute } from '../app/route';
import { useQuery } from '../live/useQuery';
import { useTexts } from '../texts/TextsProvider';
import { Choice } from '../ui/Choice';
import { Pages } from '../ui/Pages';
import { Failed, Loading } from '../ui/states';
import { ViewTitle } from '../ui/ViewTitle';
import { RunChart } from './RunChart';
import { RunTable } from './RunTable';
import { type HistoryView, parseHistory, RUNS_PER_PAGE, showHistory } from './view';

function useRuns(view: HistoryView) {
    const query = {
        ...(view.task !== null && { task: view.task }),
        ...(view.state !== '' && { state: view.state }),
        offset: (view.page - 1) * view.perPage,
        limit: view.perPage,
    };
    return useQuery(JSON.stringify(query), (signal) => listRuns(query, signal));
}

/** The task's name; of one that is gone, what it was called when it ran last. */
async function nameOf(task: number, signal: AbortSignal): Promise<string | null> {
    try {
        return (await getTask(task, signal)).name;
    } catch (error) {
        if (!(error instanceof ApiError)) {
            throw error;
        }
        const { runs } = await listRuns({ task, limit: 1 }, signal);
        return runs[0]?.name ?? null;
    }
}

/** What the title calls the task whose runs are shown; null when they are of all tasks. */
function useTaskName(task: number | null, runs: Run[]): string | null {
    const asked = useQuery(task === null ? null : `name ${task}`, async (signal) => ({
        task,
        name: await nameOf(task ?? 0, signal),
    }));
    if (task === null) {
        return null;
    }
    const known = asked.data?.task === task ? asked.data.name : null;
    return known ?? runs.find((run) => run.task === task)?.name ?? `${task}`;
}

function NoRuns({ filtered }: { filtered: boolean }) {
    const { t } = useTexts();
    return (
        <EmptyState titleText={t('history.emptyTitle')} headingLevel="h2" icon={ListIcon}>
            <EmptyStateBody>
                {t(filtered ? 'history.emptyFiltered' : 'history.emptyBody')}
            </EmptyStateBody>
        </EmptyState>
    );
}

export function HistoryPage({ onTitle }: ViewProps) {
    const { t } = useTexts();
    const { query } = useRoute();
    const view = useMemo(() => parseHistory(query), [query]);
    const { data, error } = useRuns(view);
    const change = (part: Partial<HistoryView>) => showHistory({ ...view, ...part });

    const runs = data?.runs ?? [];
    const name = useTaskName(view.task, runs);
    const title = name === null ? t('history.title') : t('history.titleOf', { name });
    useEffect(() => onTitle(title), [onTitle, title]);

    const pages = data ? Math.max(1, Math.ceil(data.total / view.perPage)) : view.page;
    useEffect(() => {
        if (view.page > pages) {
            showHistory({ ...view, page: pages });
        }
    }, [view, pages]);

    if (!data) {
        return error ? <Failed title={t('history.failed')} error={error} /> : <Loading />;
    }
    return (
        <>
            <ViewTitle key={view.task}>{title}</ViewTitle>
            <Toolbar isStatic className="orva-toolbar">
                <ToolbarContent>
                    <ToolbarItem>
                        <Choice
                            label={t('history.state')}
                            value={view.state}
                            options={[
                                { value: '' as const, label: t('history.allStates') },
                                ...RUN_STATES.map((state) => ({
                                    value: state,
                                    label: t(`state.${state}`),
                                })),
                            ]}
                            onChange={(state) => change({ state, page: 1, run: null })}
                        />
                    </ToolbarItem>
                    {view.task !== null && (
                        <ToolbarItem>
                            <Button
                                variant="link"
                                onClick={() => change({ task: null, page: 1, run: null })}
                            >
                                {t('history.showAll')}
                            </Button>
                        </ToolbarItem>
                    )}
                </ToolbarContent>
            </Toolbar>
            {runs.length === 0 ? (
                <NoRuns filtered={view.state !== '' || view.task !== null} />
            ) : (
                <>
                    <RunChart runs={runs} />
                    <RunTable
                        runs={runs}
                        oneTask={view.task !== null}
                        open={view.run}
                        onOpen={(run) => change({ run })}
                        onTask={(task) => change({ task, page: 1, run: null })}
                    />
                    <Pages
                        variant="bottom"
                        total={data.total}
                        page={view.page}
                        perPage={view.perPage}
                        choices={RUNS_PER_PAGE}
                        onPage={(page) => change({ page, run: null })}
                        onPerPage={(perPage) => change({ perPage, page: 1, run: null })}
                    />
                </>
            )}
        </>
    );
}
