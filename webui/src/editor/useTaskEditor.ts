import { useCallback, useMemo, useState } from 'react';

import { ApiError } from '../api/client';
import { changeTask, createTask, type TaskDocument } from '../api/tasks';
import { live } from '../live/live';
import type { Kind } from './kinds/kind';
import type { Problem, Problems, Tab } from './problems';
import { fieldId, TABS, tabOf } from './problems';
import {
    isStored,
    placeOf,
    type Refusal,
    taskChange,
    type TaskForm,
    taskForm,
    taskProblems,
} from './task';

interface ApiRefusal extends Refusal {
    error: ApiError;
}

export interface TaskEditor {
    form: TaskForm;
    dirty: boolean;
    busy: boolean;
    tab: Tab;
    problems: Problems;
    refusal: ApiRefusal | null;
    change(part: Partial<TaskForm>): void;
    setTab(tab: Tab): void;
    touch(field: string): void;
    problemOf(field: string): Problem | string | undefined;
    refuseSchedule(message: string | null): void;
    hasShownProblem(tab: Tab): boolean;
    /** Gives the task's id; null when the form or the API has something against it. */
    save(): Promise<number | null>;
    /** Begins anew with another version of the task. */
    load(document: TaskDocument): void;
}

/** The focus goes where the first problem is, once its tab is shown. */
function focusSoon(field: string): void {
    setTimeout(() => {
        const input = document.getElementById(fieldId(field));
        const target = input?.matches('input, textarea, select')
            ? input
            : input?.querySelector<HTMLElement>('input, button');
        target?.focus();
    });
}

function wrongIn(document: TaskDocument, kind: Kind): ReadonlySet<string> {
    const problems = isStored(document) ? taskProblems(taskForm(document, kind), kind) : {};
    return new Set(Object.keys(problems));
}

export function useTaskEditor(begin: TaskDocument, kind: Kind): TaskEditor {
    const [base, setBase] = useState(begin);
    const initial = useMemo(() => taskForm(base, kind), [base, kind]);
    const [form, setForm] = useState(initial);
    const [tab, setTab] = useState<Tab>('general');
    // What is wrong with a stored task is shown from the start.
    const [touched, setTouched] = useState<ReadonlySet<string>>(() => wrongIn(begin, kind));
    const [attempted, setAttempted] = useState(false);
    const [busy, setBusy] = useState(false);
    const [refusal, setRefusal] = useState<ApiRefusal | null>(null);
    const [scheduleRefusal, setScheduleRefusal] = useState<string | null>(null);

    const problems = useMemo(() => taskProblems(form, kind), [form, kind]);
    const dirty = useMemo(
        () => JSON.stringify(form) !== JSON.stringify(initial),
        [form, initial],
    );

    const change = useCallback((part: Partial<TaskForm>) => {
        setForm((old) => ({ ...old, ...part }));
        setRefusal(null);
    }, []);
    const touch = useCallback(
        (field: string) => setTouched((old) => (old.has(field) ? old : new Set(old).add(field))),
        [],
    );

    const problemOf = (field: string) => {
        if (attempted || touched.has(field)) {
            const problem = problems[field];
            if (problem) {
                return problem;
            }
        }
        if (refusal?.field === field) {
            return refusal.error.message;
        }
        return scheduleRefusal !== null && placeOf(scheduleRefusal).field === field
            ? scheduleRefusal
            : undefined;
    };

    const showFirstProblem = (): boolean => {
        const fields = Object.keys(problems);
        const first = TABS.flatMap((each) => fields.filter((field) => tabOf(field) === each))[0];
        setAttempted(true);
        if (first === undefined) {
            return false;
        }
        setTab(tabOf(first));
        focusSoon(first);
        return true;
    };

    const refuse = (error: unknown) => {
        if (!(error instanceof ApiError)) {
            throw error;
        }
        const place = placeOf(error.message);
        if (place.tab === null) {
            throw error;
        }
        setRefusal({ ...place, error });
        setTab(place.tab);
        if (place.field) {
            focusSoon(place.field);
        }
    };

    const save = async () => {
        if (showFirstProblem()) {
            return null;
        }
        setBusy(true);
        try {
            const document = taskChange(form, base, kind);
            const answer = document.id
                ? await changeTask(document)
                : await createTask(base.type, document);
            live.look();
            return answer.id;
        } catch (error) {
            refuse(error);
            return null;
        } finally {
            setBusy(false);
        }
    };

    const load = (document: TaskDocument) => {
        setBase(document);
        setForm(taskForm(document, kind));
        setTouched(wrongIn(document, kind));
        setRefusal(null);
        setAttempted(false);
    };

    return {
        form,
        dirty,
        busy,
        tab,
        problems,
        refusal,
        change,
        setTab,
        touch,
        problemOf,
        refuseSchedule: setScheduleRefusal,
        hasShownProblem: (each) =>
            refusal?.tab === each ||
            Object.keys(problems).some((field) => tabOf(field) === each && problemOf(field)),
        save,
        load,
    };
}
