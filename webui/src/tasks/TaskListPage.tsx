import { useEffect, useMemo } from 'react';

import { latestRuns } from '../api/history';
import type { SortKey } from '../api/tasks';
import { useRoute } from '../app/route';
import type { ViewProps } from '../app/CurrentView';
import { useQuery } from '../live/useQuery';
import { useTexts } from '../texts/TextsProvider';
import { Pages } from '../ui/Pages';
import { Failed, Loading } from '../ui/states';
import { ViewTitle } from '../ui/ViewTitle';
import { ConfirmAction } from './ConfirmAction';
import { rememberList } from './lastList';
import { NoMatch, NoTasks } from './EmptyList';
import { NewTask } from './NewTask';
import { TaskTable } from './TaskTable';
import { TaskToolbar } from './TaskToolbar';
import { useDue } from './useDue';
import { useSelection } from './useSelection';
import { useTaskActions } from './useTaskActions';
import { useTaskList } from './useTaskList';
import { parseView, PER_PAGE, showView, type TaskView, viewRoute } from './view';

function useLatest(ids: number[]) {
    const key = ids.length > 0 ? ids.join() : null;
    const query = useQuery(key, (signal) => latestRuns(ids, signal));
    const runs = query.data?.runs;
    return useMemo(() => new Map((runs ?? []).map((run) => [run.task, run])), [runs]);
}

export function TaskListPage({ onTitle }: ViewProps) {
    const { t } = useTexts();
    const { query } = useRoute();
    const view = useMemo(() => parseView(query), [query]);
    const list = useTaskList(view);
    const selection = useSelection();
    const actions = useTaskActions(view, selection);
    const latest = useLatest(list.rows.map((row) => row.id));
    useDue(list.rows);

    useEffect(() => onTitle(t('list.title')), [onTitle, t]);
    useEffect(() => rememberList(viewRoute(view)), [view]);

    const change = (part: Partial<TaskView>) => showView({ ...view, ...part });
    const sort = (key: SortKey) =>
        change({
            sort: key,
            direction: view.sort === key && view.direction === 'asc' ? 'desc' : 'asc',
            page: 1,
        });
    const pages = Math.max(1, Math.ceil(list.total / view.perPage));
    const page = Math.min(view.page, pages);

    // Somebody deleted what stood on the last page.
    useEffect(() => {
        if (list.loaded && page !== view.page) {
            showView({ ...view, page });
        }
    }, [list.loaded, page, view]);

    const table = list.rows.length > 0 && (
        <TaskTable
            rows={list.rows}
            view={view}
            latest={latest}
            selection={selection}
            pending={actions.pending}
            onSort={sort}
            onSwitch={(row, enable) => void actions.switchTask(row, enable)}
            onAction={actions.ask}
        />
    );
    if (!list.loaded) {
        return list.error ? <Failed title={t('list.failed')} error={list.error} /> : <Loading />;
    }
    return (
        <>
            <div className="orva-head">
                <ViewTitle>{t('list.title')}</ViewTitle>
                {list.all > 0 && <NewTask />}
            </div>
            {list.all === 0 ? (
                <NoTasks />
            ) : (
                <>
                    <TaskToolbar
                        view={{ ...view, page }}
                        rows={list.rows}
                        total={list.total}
                        selection={selection}
                        onView={change}
                        onSelectAll={() => void actions.selectAll()}
                        onAction={(action) => void actions.askForSelection(action)}
                    />
                    {table || <NoMatch onClear={() => change({ text: '', kind: '', page: 1 })} />}
                    <Pages
                        variant="bottom"
                        total={list.total}
                        page={page}
                        perPage={view.perPage}
                        choices={PER_PAGE}
                        onPage={(next) => change({ page: next })}
                        onPerPage={(perPage) => change({ perPage, page: 1 })}
                    />
                </>
            )}
            {actions.request && <ConfirmAction {...actions.request} onClose={actions.close} />}
        </>
    );
}
