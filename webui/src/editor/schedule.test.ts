import { describe, expect, it } from 'vitest';

import type { ScheduleDocument } from '../api/tasks';
import { scheduleDocument, scheduleForm, scheduleProblems } from './schedule';

const LUNCH: ScheduleDocument = {
    mode: 'weekly',
    week_day: '1,2,3,4,5',
    date: '',
    repeat_date: 'never',
    hour: 12,
    minute: 5,
    interval_min: 0,
    last_hour: 23,
    last_min: 59,
    run_missed: false,
};

const LUNCH_FORM = {
    mode: 'weekly' as const,
    days: [false, true, true, true, true, true, false],
    date: '',
    repeat: 'never' as const,
    time: '12:05',
    often: 'once' as const,
    every: '1',
    unit: 'hours' as const,
    last: '23:59',
    runMissed: false,
};

describe('a schedule on days of the week', () => {
    it('is shown as days and a time', () => {
        expect(scheduleForm(LUNCH)).toEqual(LUNCH_FORM);
    });

    it('comes back unchanged', () => {
        expect(scheduleDocument(scheduleForm(LUNCH))).toEqual(LUNCH);
    });

    it('needs a day', () => {
        const none = { ...LUNCH_FORM, days: LUNCH_FORM.days.map(() => false) };
        expect(scheduleProblems(none)).toEqual({ 'schedule.days': { key: 'problem.days' } });
        expect(scheduleProblems({ ...none, mode: 'date', date: '2026-12-24' })).toEqual({});
    });

    it('needs a time', () => {
        expect(scheduleProblems({ ...LUNCH_FORM, time: '' })).toEqual({
            'schedule.time': { key: 'problem.time' },
        });
    });
});

describe('a schedule that starts again during the day', () => {
    const every = (interval: number): ScheduleDocument => ({
        ...LUNCH,
        interval_min: interval,
        last_hour: 18,
        last_min: 0,
    });

    it('is shown in hours where they are whole', () => {
        expect(scheduleForm(every(120))).toMatchObject({
            often: 'interval',
            every: '2',
            unit: 'hours',
            last: '18:00',
        });
    });

    it('is shown in minutes otherwise', () => {
        expect(scheduleForm(every(90))).toMatchObject({ every: '90', unit: 'minutes' });
    });

    it('is sent in minutes', () => {
        const form = { ...LUNCH_FORM, often: 'interval' as const, every: '3', unit: 'hours' as const };
        expect(scheduleDocument(form).interval_min).toBe(180);
        expect(scheduleDocument({ ...form, every: '45', unit: 'minutes' }).interval_min).toBe(45);
    });

    it('has an interval within the day', () => {
        const form = { ...LUNCH_FORM, often: 'interval' as const };
        expect(scheduleProblems({ ...form, unit: 'minutes', every: '1439' })).toEqual({});
        expect(scheduleProblems({ ...form, unit: 'minutes', every: '1440' })).toEqual({
            'schedule.every': { key: 'problem.number', values: { least: 1, most: 1439 } },
        });
        expect(scheduleProblems({ ...form, unit: 'hours', every: '24' })).toEqual({
            'schedule.every': { key: 'problem.number', values: { least: 1, most: 23 } },
        });
        expect(scheduleProblems({ ...form, every: '0' })).toHaveProperty(['schedule.every']);
    });

    it('ends no earlier than it begins', () => {
        const form = { ...LUNCH_FORM, often: 'interval' as const };
        expect(scheduleProblems({ ...form, last: '12:04' })).toEqual({
            'schedule.last': { key: 'problem.last' },
        });
        expect(scheduleProblems({ ...form, last: '12:05' })).toEqual({});
    });
});

describe('a schedule on a date', () => {
    const NEW_YEAR: ScheduleDocument = {
        mode: 'date',
        week_day: '0,1,2,3,4,5,6',
        date: '2027-01-01',
        repeat_date: 'half_yearly',
        hour: 0,
        minute: 0,
        interval_min: 0,
        last_hour: 23,
        last_min: 59,
        run_missed: true,
    };

    it('comes back unchanged, the days of the week included', () => {
        expect(scheduleDocument(scheduleForm(NEW_YEAR))).toEqual(NEW_YEAR);
    });

    it('needs a date that exists', () => {
        const form = scheduleForm(NEW_YEAR);
        for (const date of ['', '2027-02-29', '1969-12-31', '27-01-01']) {
            expect(scheduleProblems({ ...form, date })).toEqual({
                'schedule.date': { key: 'problem.date' },
            });
        }
        expect(scheduleProblems({ ...form, date: '2028-02-29' })).toEqual({});
    });
});
