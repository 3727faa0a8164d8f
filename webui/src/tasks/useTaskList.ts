import { useDeferredValue, useMemo } from 'react';

import { listTasks, type TaskRow } from '../api/tasks';
import { useQuery } from '../live/useQuery';
import { useTexts } from '../texts/TextsProvider';
import { kindName } from './kinds';
import { isFiltered, matching, type TaskView } from './view';

export interface TaskListData {
    /** The rows of the page. */
    rows: TaskRow[];
    /** How many tasks match; all of them when nothing is filtered. */
    total: number;
    /** How many tasks there are. */
    all: number;
    loaded: boolean;
    error: Error | null;
}

/**
 * The rows that the view shows. Without a filter only the page is read; a filter reads the whole list
 * once, and typing in it reads nothing.
 */
export function useTaskList(view: TaskView): TaskListData {
    const { t } = useTexts();
    const filtered = isFiltered(view);
    const order = { sort_by: view.sort, sort_direction: view.direction };
    const offset = (view.page - 1) * view.perPage;
    const key = JSON.stringify(filtered ? order : { ...order, offset, limit: view.perPage });
    const query = useQuery(key, async (signal) => {
        const answer = await listTasks(
            filtered ? order : { ...order, offset, limit: view.perPage },
            signal,
        );
        return { ...answer, whole: filtered };
    });

    const text = useDeferredValue(view.text);
    const whole = query.data?.whole ? query.data.tasks : null;
    const matches = useMemo(
        () =>
            whole &&
            matching(whole, { text, kind: view.kind }, (row) => kindName(t, row.type, row.app_name)),
        [whole, text, view.kind, t],
    );

    const start = matches ? Math.min(offset, lastStart(matches.length, view.perPage)) : offset;
    return {
        rows: matches?.slice(start, start + view.perPage) ?? query.data?.tasks ?? [],
        total: matches?.length ?? query.data?.total ?? 0,
        all: query.data?.total ?? 0,
        loaded: query.data !== null,
        error: query.error,
    };
}

function lastStart(count: number, perPage: number): number {
    return Math.max(0, Math.ceil(count / perPage) - 1) * perPage;
}
