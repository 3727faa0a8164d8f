import { collect, numberProblem, type Problems, wholeNumber } from '../../problems';

export interface BeepForm {
    /** Seconds. */
    duration: string;
}

export const SHORTEST = 1;
export const LONGEST = 600;
const USUAL = '60';

/** The blank form carries the duration as text, a stored task as a number. */
export function beepForm(extra: unknown): BeepForm {
    const duration = (extra as { beep_duration?: unknown } | null)?.beep_duration;
    const known = typeof duration === 'number' || typeof duration === 'string';
    return { duration: known ? String(duration) : USUAL };
}

export function beepExtra(form: BeepForm): unknown {
    return { beep_duration: wholeNumber(form.duration, SHORTEST, LONGEST) };
}

export function beepProblems(form: BeepForm): Problems {
    return collect({ 'extra.duration': numberProblem(form.duration, SHORTEST, LONGEST) });
}
