import { call } from './client';

const API = 'ORVA.Core.TaskScheduler';

export interface TaskRow {
    id: number;
    name: string;
    type: string;
    app_name?: string;
    enable: boolean;
    can_run: boolean;
    can_delete: boolean;
    can_edit: boolean;
    action: string;
    /** "2026-11-22 02:00" in the appliance's local time, or "-". */
    next_trigger_time: string;
}

export type SortKey = 'enable' | 'id' | 'name' | 'type' | 'action' | 'next_trigger_time';
export type SortDirection = 'asc' | 'desc';

export interface ListQuery {
    sort_by: SortKey;
    sort_direction: SortDirection;
    offset?: number;
    limit?: number;
}

export interface ScheduleDocument {
    mode: 'weekly' | 'date';
    week_day: string;
    date: string;
    repeat_date: Repeat;
    hour: number;
    minute: number;
    interval_min: number;
    last_hour: number;
    last_min: number;
    run_missed: boolean;
}

export const REPEATS = [
    'never',
    'daily',
    'weekly',
    'monthly',
    'quarterly',
    'half_yearly',
    'yearly',
] as const;
export type Repeat = (typeof REPEATS)[number];

/** A task as the editor reads it. */
export interface TaskDocument {
    id: number;
    name: string;
    action: string;
    type: string;
    can_edit_name: boolean;
    can_edit_owner: boolean;
    enable: boolean;
    owner: string;
    schedule: ScheduleDocument;
    extra: unknown;
}

/** What the editor sends; without an id it makes a new task. */
export interface TaskChange {
    id?: number;
    name: string;
    owner: string;
    enable: boolean;
    schedule: ScheduleDocument;
    extra: unknown;
}

export function listTasks(query: ListQuery, signal?: AbortSignal) {
    return call<{ tasks: TaskRow[]; total: number }>(API, 'list', query, signal);
}

export function getTask(id: number, signal?: AbortSignal) {
    return call<TaskDocument>(API, 'get', { id }, signal);
}

/** The form that a new task of this kind starts with. */
export async function blankTask(type: string, signal?: AbortSignal): Promise<TaskDocument> {
    // No application owns it yet, so the form itself does not know its kind.
    return { ...(await call<TaskDocument>(API, 'get', { id: -1, type }, signal)), type };
}

export function createTask(type: string, change: TaskChange) {
    return call<{ id: number }>(API, 'create', { type, ...change });
}

export function changeTask(change: TaskChange) {
    return call<{ id: number }>(API, 'set', change);
}

export function deleteTasks(ids: number[]) {
    return call<null>(API, 'delete', { task: ids });
}

export function runTasks(ids: number[]) {
    return call<null>(API, 'run', { task: ids });
}

export function enableTasks(ids: number[], enable: boolean) {
    return call<null>(API, 'set_enable', { status: ids.map((id) => ({ id, enable })) });
}
