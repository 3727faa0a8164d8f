import type { ComponentType } from 'react';

import type { Problems } from '../problems';

export interface SettingsProps<F> {
    form: F;
    onChange(form: F): void;
}

/** How one kind of task is edited. */
export interface KindOf<F> {
    /** From the document's section "extra". */
    toForm(extra: unknown): F;
    /** What a new task begins with, where the blank document is no good beginning. */
    toNewForm?(extra: unknown): F;
    /** Back to it; for a form without problems. */
    toExtra(form: F): unknown;
    problems(form: F): Problems;
    Settings: ComponentType<SettingsProps<F>>;
    /** Something to know about every task of the kind, whatever part of it is shown. */
    Remark?: ComponentType;
}

/** A kind whose form only the kind itself looks into. */
export type Kind = KindOf<unknown>;

export function defineKind<F>(kind: KindOf<F>): Kind {
    // The editor hands a kind nothing but what the same kind gave it.
    return kind as unknown as Kind;
}
