import { useState } from 'react';

import { enableTasks, listTasks, type TaskRow } from '../api/tasks';
import { live } from '../live/live';
import { useTexts } from '../texts/TextsProvider';
import { focusFirst } from '../ui/focus';
import { useToasts } from '../ui/toasts';
import { type Action, concerns } from './actions';
import type { Request } from './ConfirmAction';
import { actionsId, BULK_ID } from './places';
import type { Selection } from './useSelection';
import { isFiltered, matching, type TaskView } from './view';
import { kindName } from './kinds';

async function wholeList(view: TaskView): Promise<TaskRow[]> {
    const { tasks } = await listTasks({ sort_by: view.sort, sort_direction: view.direction });
    return tasks;
}

/** The focus goes back to where the question came from, or on to the list when that is gone. */
function focusAfter(request: Request, done: boolean): void {
    const [row, ...more] = request.rows;
    const stays = !done || request.action !== 'delete';
    const origin = row && more.length === 0 && stays ? [actionsId(row.id)] : [];
    focusFirst([...origin, BULK_ID]);
}

/** What the list does with tasks: asking first where it matters. */
export function useTaskActions(view: TaskView, selection: Selection) {
    const { t } = useTexts();
    const toasts = useToasts();
    const [request, setRequest] = useState<Request | null>(null);
    const [pending, setPending] = useState<ReadonlyMap<number, boolean>>(new Map());

    const setPendingOf = (id: number, enable: boolean | null) =>
        setPending((old) => {
            const next = new Map(old);
            if (enable === null) {
                next.delete(id);
            } else {
                next.set(id, enable);
            }
            return next;
        });

    const ask = (action: Action, row: TaskRow) => setRequest({ action, rows: [row] });

    // The selection may stand on other pages and be minutes old: what is named is read anew.
    const askForSelection = async (action: Action) => {
        try {
            const all = await wholeList(view);
            selection.keep(all);
            const rows = all.filter((row) => selection.has(row.id) && concerns(action, row));
            if (rows.length > 0) {
                setRequest({ action, rows });
            } else {
                toasts.say('info', t('list.nothingToDo'));
            }
        } catch (error) {
            toasts.fail(t('list.failed'), error);
        }
    };

    const selectAll = async () => {
        try {
            const all = await wholeList(view);
            const rows = isFiltered(view)
                ? matching(all, view, (row) => kindName(t, row.type, row.app_name))
                : all;
            selection.set(rows, true);
        } catch (error) {
            toasts.fail(t('list.failed'), error);
        }
    };

    const switchTask = async (row: TaskRow, enable: boolean) => {
        const about = `switch ${row.id}`;
        setPendingOf(row.id, enable);
        try {
            await enableTasks([row.id], enable);
            toasts.settle(about);
            live.look();
            // Until the row says so itself.
            setTimeout(() => setPendingOf(row.id, null), 1000);
        } catch (error) {
            setPendingOf(row.id, null);
            toasts.fail(t('failed.switch', { name: row.name }), error, about);
        }
    };

    const close = (done: boolean) => {
        if (!request) {
            return;
        }
        if (done && request.action === 'delete') {
            selection.set(request.rows, false);
        }
        setRequest(null);
        focusAfter(request, done);
    };

    return { request, pending, ask, askForSelection, selectAll, switchTask, close };
}
