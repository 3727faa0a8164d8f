import type { TextKey } from '../texts/language';
import type { Values } from '../texts/translate';

/** What is wrong with a field, as a text of the page. */
export interface Problem {
    key: TextKey;
    values?: Values;
}

/** Problems by field: "name", "schedule.date", "extra.duration". */
export type Problems = Partial<Record<string, Problem>>;

export const TABS = ['general', 'schedule', 'settings'] as const;
export type Tab = (typeof TABS)[number];

export function tabOf(field: string): Tab {
    if (field.startsWith('schedule')) {
        return 'schedule';
    }
    return field.startsWith('extra') ? 'settings' : 'general';
}

export function fieldId(field: string): string {
    return `field-${field.replaceAll('.', '-')}`;
}

/** The whole number that `text` is, when it lies in the range. */
export function wholeNumber(text: string, least: number, most: number): number | null {
    if (!/^\s*\d{1,10}\s*$/.test(text)) {
        return null;
    }
    const value = Number(text);
    return value >= least && value <= most ? value : null;
}

export function numberProblem(text: string, least: number, most: number): Problem | undefined {
    return wholeNumber(text, least, most) === null
        ? { key: 'problem.number', values: { least, most } }
        : undefined;
}

/** Only what is a problem. */
export function collect(problems: Record<string, Problem | undefined>): Problems {
    return Object.fromEntries(Object.entries(problems).filter(([, problem]) => problem));
}
