import type { Repeat, ScheduleDocument } from '../api/tasks';
import { clockText, minutesOf } from './clock';
import { collect, numberProblem, type Problems, wholeNumber } from './problems';

/** The schedule as it is typed. Numbers are texts, so that nothing typed is lost. */
export interface ScheduleForm {
    mode: 'weekly' | 'date';
    /** From Sunday on. */
    days: boolean[];
    /** "YYYY-MM-DD". */
    date: string;
    repeat: Repeat;
    /** "HH:MM", like `last`; or what was typed, when that is no time. */
    time: string;
    often: 'once' | 'interval';
    every: string;
    unit: 'minutes' | 'hours';
    last: string;
    runMissed: boolean;
}

const LONGEST_INTERVAL = 24 * 60 - 1;
const USUAL_INTERVAL = 60;

export function isDate(text: string): boolean {
    const parts = /^(\d{4})-(\d\d)-(\d\d)$/.exec(text);
    if (!parts || Number(parts[1]) < 1970) {
        return false;
    }
    const moment = new Date(`${text}T00:00:00Z`);
    return !Number.isNaN(moment.valueOf()) && moment.toISOString().startsWith(text);
}

export function scheduleForm(document: ScheduleDocument): ScheduleForm {
    const days = new Set(document.week_day.split(','));
    const interval = document.interval_min || USUAL_INTERVAL;
    const hours = interval % 60 === 0;
    return {
        mode: document.mode,
        days: Array.from({ length: 7 }, (_, day) => days.has(String(day))),
        date: document.date,
        repeat: document.repeat_date,
        time: clockText(document.hour, document.minute),
        often: document.interval_min > 0 ? 'interval' : 'once',
        every: String(hours ? interval / 60 : interval),
        unit: hours ? 'hours' : 'minutes',
        last: clockText(document.last_hour, document.last_min),
        runMissed: document.run_missed,
    };
}

/** Minutes from one start of a day to the next; 0 for one start a day. */
export function intervalOf(form: ScheduleForm): number {
    const factor = form.unit === 'hours' ? 60 : 1;
    return form.often === 'once' ? 0 : (wholeNumber(form.every, 1, LONGEST_INTERVAL) ?? 0) * factor;
}

/** For a form without problems. What the other mode uses is sent too: it is kept for later. */
export function scheduleDocument(form: ScheduleForm): ScheduleDocument {
    const first = minutesOf(form.time) ?? 0;
    const last = minutesOf(form.last) ?? LONGEST_INTERVAL;
    return {
        mode: form.mode,
        week_day: form.days.flatMap((on, day) => (on ? [day] : [])).join(','),
        date: isDate(form.date) ? form.date : '',
        repeat_date: form.repeat,
        hour: Math.floor(first / 60),
        minute: first % 60,
        interval_min: intervalOf(form),
        last_hour: Math.floor(last / 60),
        last_min: last % 60,
        run_missed: form.runMissed,
    };
}

function lastProblem(form: ScheduleForm) {
    const first = minutesOf(form.time);
    const last = minutesOf(form.last);
    if (last === null) {
        return { key: 'problem.time' } as const;
    }
    return first !== null && last < first ? ({ key: 'problem.last' } as const) : undefined;
}

export function scheduleProblems(form: ScheduleForm): Problems {
    const weekly = form.mode === 'weekly';
    const repeated = form.often === 'interval';
    const most = form.unit === 'hours' ? Math.floor(LONGEST_INTERVAL / 60) : LONGEST_INTERVAL;
    return collect({
        'schedule.days':
            weekly && !form.days.includes(true) ? { key: 'problem.days' } : undefined,
        'schedule.date': !weekly && !isDate(form.date) ? { key: 'problem.date' } : undefined,
        'schedule.time': minutesOf(form.time) === null ? { key: 'problem.time' } : undefined,
        'schedule.every': repeated ? numberProblem(form.every, 1, most) : undefined,
        'schedule.last': repeated ? lastProblem(form) : undefined,
    });
}

/** The field that shows a member of the document. */
export const SCHEDULE_FIELDS: Record<string, string> = {
    week_name: 'schedule.days',
    week_day: 'schedule.days',
    date: 'schedule.date',
    repeat: 'schedule.repeat',
    repeat_date: 'schedule.repeat',
    hour: 'schedule.time',
    min: 'schedule.time',
    minute: 'schedule.time',
    interval_min: 'schedule.every',
    last_hour: 'schedule.last',
    last_min: 'schedule.last',
};
