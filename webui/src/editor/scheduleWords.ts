import type { Format } from '../texts/format';
import type { Translate } from '../texts/translate';
import { minutesOf } from './clock';
import { intervalOf, type ScheduleForm } from './schedule';

const WORK_DAYS = [false, true, true, true, true, true, false];
const WEEKEND = [true, false, false, false, false, false, true];

function same(days: boolean[], others: boolean[]): boolean {
    return days.every((on, day) => on === others[day]);
}

function clockOf(time: string, format: Format): string {
    const minutes = minutesOf(time) ?? 0;
    return format.clock(Math.floor(minutes / 60), minutes % 60);
}

function times(form: ScheduleForm, t: Translate, format: Format): string {
    const first = clockOf(form.time, format);
    const interval = intervalOf(form);
    if (interval === 0) {
        return t('words.once', { time: first });
    }
    const range = { first, last: clockOf(form.last, format) };
    return interval % 60 === 0
        ? t.count('words.hours', interval / 60, range)
        : t.count('words.minutes', interval, range);
}

function weekDays(days: boolean[], t: Translate, format: Format): string {
    if (!days.includes(false)) {
        return t('words.everyDay');
    }
    if (same(days, WORK_DAYS)) {
        return t('words.workDays');
    }
    if (same(days, WEEKEND)) {
        return t('words.weekend');
    }
    // The week is read from Monday on.
    const named = [1, 2, 3, 4, 5, 6, 0].filter((day) => days[day]);
    return t('words.days', { days: format.list(named.map((day) => format.weekDay(day, 'long'))) });
}

/** The schedule as a sentence; for a form without problems. */
export function scheduleWords(form: ScheduleForm, t: Translate, format: Format): string {
    const starts = times(form, t, format);
    if (form.mode === 'weekly') {
        return t('words.weekly', { days: weekDays(form.days, t, format), times: starts });
    }
    return t(`words.date.${form.repeat}`, { date: format.localDate(form.date), times: starts });
}

/** Whether some months lack the day that the schedule repeats on. */
export function usesLastDay(form: ScheduleForm): boolean {
    const byMonth = ['monthly', 'quarterly', 'half_yearly', 'yearly'].includes(form.repeat);
    const day = Number(form.date.slice(8));
    const month = Number(form.date.slice(5, 7));
    return form.mode === 'date' && byMonth && (form.repeat === 'yearly' ? month === 2 && day === 29 : day > 28);
}
