import { describe, expect, it } from 'vitest';

import type { TaskDocument } from '../api/tasks';
import { beepExtra, beepForm, beepProblems } from './kinds/beep/model';
import { defineKind } from './kinds/kind';
import { placeOf, storedPart, taskChange, taskForm, taskProblems } from './task';

const BEEP = defineKind({
    toForm: beepForm,
    toExtra: beepExtra,
    problems: beepProblems,
    Settings: () => null,
});
const OTHER = defineKind({
    toForm: (extra: unknown) => extra,
    toExtra: (extra: unknown) => extra,
    problems: () => ({}),
    Settings: () => null,
});

const LUNCH: TaskDocument = {
    action: 'Beep for 2 seconds',
    can_edit_name: true,
    can_edit_owner: false,
    enable: true,
    extra: { beep_duration: 2 },
    id: 1,
    name: 'Lunch signal',
    owner: 'root',
    schedule: {
        date: '',
        hour: 12,
        interval_min: 0,
        last_hour: 23,
        last_min: 59,
        minute: 0,
        mode: 'weekly',
        repeat_date: 'never',
        run_missed: false,
        week_day: '1,2,3,4,5',
    },
    type: 'beep',
};

describe('a task', () => {
    it('is sent without what the API alone decides', () => {
        expect(taskChange(taskForm(LUNCH, BEEP), LUNCH, BEEP)).toEqual({
            id: 1,
            name: 'Lunch signal',
            owner: 'root',
            enable: true,
            schedule: LUNCH.schedule,
            extra: { beep_duration: 2 },
        });
    });

    it('has no id when it is new', () => {
        const blank = { ...LUNCH, id: -1 };
        expect(taskChange(taskForm(blank, BEEP), blank, BEEP)).not.toHaveProperty('id');
    });

    it('begins with what its kind proposes, and only when it is new', () => {
        const kind = { ...BEEP, toNewForm: () => ({ duration: '5' }) };
        expect(taskForm({ ...LUNCH, id: -1 }, kind).extra).toEqual({ duration: '5' });
        expect(taskForm(LUNCH, kind).extra).toEqual({ duration: '2' });
    });

    it('of another application gives back its settings as they came', () => {
        const backup = { ...LUNCH, type: 'backup', extra: null };
        expect(taskChange(taskForm(backup, OTHER), backup, OTHER).extra).toBeNull();
    });

    it('is the same in every language, and another once something of it is stored anew', () => {
        const before = storedPart(LUNCH, BEEP);
        expect(storedPart({ ...LUNCH, action: 'Signalton für 2 Sekunden' }, BEEP)).toBe(before);
        const changes = [{ name: 'Noon' }, { enable: false }, { owner: 'ann' }];
        for (const change of [...changes, { extra: { beep_duration: 3 } }]) {
            expect(storedPart({ ...LUNCH, ...change }, BEEP)).not.toBe(before);
        }
    });

    it('tells all that is wrong at once', () => {
        const form = { ...taskForm(LUNCH, BEEP), name: ' ', extra: { duration: 'x' } };
        form.schedule = { ...form.schedule, time: '' };
        expect(Object.keys(taskProblems(form, BEEP))).toEqual([
            'name',
            'schedule.time',
            'extra.duration',
        ]);
    });

    it('has a name of at most 255 bytes that can be shown', () => {
        const named = (name: string) => taskProblems({ ...taskForm(LUNCH, BEEP), name }, BEEP);
        expect(named('é'.repeat(127))).toEqual({});
        expect(named('é'.repeat(128))).toEqual({
            name: { key: 'problem.longName', values: { most: 255 } },
        });
        expect(named('a\tb')).toEqual({ name: { key: 'problem.control' } });
    });
});

describe('a refusal of the API', () => {
    it('belongs to the part that it names', () => {
        expect(placeOf('Invalid (basic) object')).toEqual({ tab: 'general', field: null });
        expect(placeOf('Invalid (schedule) object')).toEqual({ tab: 'schedule', field: null });
        expect(placeOf('invalid (app) object')).toEqual({ tab: 'settings', field: null });
    });

    it('belongs to the field that it names', () => {
        expect(placeOf('schedule.interval_min: is no integer from 0 to 1439')).toEqual({
            tab: 'schedule',
            field: 'schedule.every',
        });
    });

    it('belongs nowhere when it names nothing', () => {
        expect(placeOf('Failed to save task')).toEqual({ tab: null, field: null });
    });
});
