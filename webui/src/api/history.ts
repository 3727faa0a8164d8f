import { call } from './client';
import type { ScheduleDocument } from './tasks';

const API = 'ORVA.Core.TaskHistory';

export type RunState = 'queued' | 'running' | 'ended' | 'skipped' | 'lost';
export const RUN_STATES: readonly RunState[] = ['queued', 'running', 'ended', 'skipped', 'lost'];

export interface Run {
    run: number;
    task: number;
    name: string;
    reason: 'schedule' | 'hand' | 'missed';
    state: RunState;
    /** Skipped, or could not start: why, in English. */
    why: string;
    asked_program: string;
    asked_account: string;
    /** Instants are UTC texts such as "2026-11-21T10:00:00.123Z". */
    occurrence: string | null;
    queued: string;
    started: string | null;
    ended: string | null;
    exit_status: number | null;
    signal: number | null;
    output: number;
}

export interface RunOutput {
    run: number;
    state: RunState;
    head: string;
    tail: string;
    dropped: number;
    size: number;
}

export interface HistoryQuery {
    task?: number;
    state?: RunState;
    offset?: number;
    limit?: number;
}

export interface ComingStart {
    utc: string;
    /** "2026-11-22 03:00" on the appliance's clock. */
    local: string;
    offset: string;
    note: string;
}

export function listRuns(query: HistoryQuery, signal?: AbortSignal) {
    return call<{ runs: Run[]; total: number; offset: number }>(API, 'list', query, signal);
}

/** The newest run of each of these tasks that has one. */
export function latestRuns(tasks: number[], signal?: AbortSignal) {
    return call<{ runs: Run[] }>(API, 'latest', { tasks }, signal);
}

export function runOutput(run: number, signal?: AbortSignal) {
    return call<RunOutput>(API, 'output', { run }, signal);
}

export function comingStarts(schedule: ScheduleDocument, count: number, signal?: AbortSignal) {
    return call<{ zone: string; starts: ComingStart[] }>(API, 'next', { schedule, count }, signal);
}

export function stopRun(run: number) {
    return call<unknown>(API, 'stop', { run });
}
