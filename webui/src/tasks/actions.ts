import { deleteTasks, enableTasks, runTasks, type TaskRow } from '../api/tasks';

export const ACTIONS = ['run', 'enable', 'disable', 'delete'] as const;
export type Action = (typeof ACTIONS)[number];

/** Whether the action may be done to the task; the list shows why not. */
export function allows(action: Action, row: TaskRow): boolean {
    switch (action) {
        case 'run':
            return row.can_run;
        case 'delete':
            return row.can_delete;
        default:
            return true;
    }
}

/** Whether the action would change anything about the task. */
export function concerns(action: Action, row: TaskRow): boolean {
    switch (action) {
        case 'enable':
            return !row.enable;
        case 'disable':
            return row.enable;
        default:
            return true;
    }
}

/** So many tasks are handed over in one request: thousands in one would take longer than a request may. */
const BATCH = 200;

export async function perform(action: Action, rows: TaskRow[]): Promise<void> {
    for (let start = 0; start < rows.length; start += BATCH) {
        const ids = rows.slice(start, start + BATCH).map((row) => row.id);
        await performOn(action, ids);
    }
}

async function performOn(action: Action, ids: number[]): Promise<void> {
    switch (action) {
        case 'run':
            await runTasks(ids);
            return;
        case 'delete':
            await deleteTasks(ids);
            return;
        default:
            await enableTasks(ids, action === 'enable');
    }
}
