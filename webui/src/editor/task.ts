import type { TaskChange, TaskDocument } from '../api/tasks';
import type { Kind } from './kinds/kind';
import { collect, type Problem, type Problems, type Tab } from './problems';
import {
    SCHEDULE_FIELDS,
    scheduleDocument,
    type ScheduleForm,
    scheduleForm,
    scheduleProblems,
} from './schedule';

/** A task as it is typed. */
export interface TaskForm {
    name: string;
    enable: boolean;
    owner: string;
    schedule: ScheduleForm;
    /** The kind's own form. */
    extra: unknown;
}

const LONGEST_NAME = 255;

/** A blank form has the number -1. */
export function isStored(document: TaskDocument): boolean {
    return document.id > 0;
}

export function taskForm(document: TaskDocument, kind: Kind): TaskForm {
    return {
        name: document.name,
        enable: document.enable,
        owner: document.owner,
        schedule: scheduleForm(document.schedule),
        extra: isStored(document)
            ? kind.toForm(document.extra)
            : (kind.toNewForm ?? kind.toForm)(document.extra),
    };
}

/** What is sent; for a form without problems. `document` is what the form began with. */
export function taskChange(form: TaskForm, document: TaskDocument, kind: Kind): TaskChange {
    return {
        ...(isStored(document) && { id: document.id }),
        name: form.name,
        owner: form.owner,
        enable: form.enable,
        schedule: scheduleDocument(form.schedule),
        extra: kind.toExtra(form.extra),
    };
}

/** What two versions of a task are compared by: all that is stored, and none of the words about it. */
export function storedPart(document: TaskDocument, kind: Kind): string {
    return JSON.stringify(taskChange(taskForm(document, kind), document, kind));
}

function nameProblem(name: string): Problem | undefined {
    if (name.trim() === '') {
        return { key: 'problem.name' };
    }
    if (new TextEncoder().encode(name).length > LONGEST_NAME) {
        return { key: 'problem.longName', values: { most: LONGEST_NAME } };
    }
    return /[\p{Cc}\u2028\u2029]/u.test(name) ? { key: 'problem.control' } : undefined;
}

export function taskProblems(form: TaskForm, kind: Kind): Problems {
    return {
        ...collect({ name: nameProblem(form.name) }),
        ...scheduleProblems(form.schedule),
        ...kind.problems(form.extra),
    };
}

/** Where a refusal of the API belongs, by its message. */
export interface Refusal {
    tab: Tab | null;
    field: string | null;
}

export function placeOf(message: string): Refusal {
    const member = /schedule\.(\w+)/.exec(message)?.[1];
    const field = member === undefined ? null : (SCHEDULE_FIELDS[member] ?? null);
    if (field) {
        return { tab: 'schedule', field };
    }
    const section = /\((basic|schedule|app)\)/.exec(message)?.[1];
    const tabs: Record<string, Tab> = { basic: 'general', schedule: 'schedule', app: 'settings' };
    return { tab: section === undefined ? null : (tabs[section] ?? null), field: null };
}
