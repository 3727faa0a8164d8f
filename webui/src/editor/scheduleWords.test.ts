import { describe, expect, it } from 'vitest';

import de from '../texts/de.json';
import en from '../texts/en.json';
import { makeFormat } from '../texts/format';
import ja from '../texts/ja.json';
import { makeTranslate } from '../texts/translate';
import { type ScheduleForm } from './schedule';
import { scheduleWords, usesLastDay } from './scheduleWords';

const SPEAKERS = {
    en: [makeTranslate(en, 'en'), makeFormat('en', undefined)],
    de: [makeTranslate(de, 'de'), makeFormat('de', undefined)],
    ja: [makeTranslate(ja, 'ja'), makeFormat('ja', undefined)],
} as const;

const FORM: ScheduleForm = {
    mode: 'weekly',
    days: [false, true, false, true, false, false, false],
    date: '2026-12-31',
    repeat: 'monthly',
    time: '08:00',
    often: 'once',
    every: '15',
    unit: 'minutes',
    last: '18:00',
    runMissed: false,
};

// Intl puts narrow blanks before AM and PM.
function words(part: Partial<ScheduleForm>, language: keyof typeof SPEAKERS = 'en'): string {
    return scheduleWords({ ...FORM, ...part }, ...SPEAKERS[language]).replace(/\s/g, ' ');
}

describe('a schedule in words', () => {
    it('names the days', () => {
        expect(words({})).toBe('Monday and Wednesday, at 8:00 AM');
        expect(words({}, 'de')).toBe('Montag und Mittwoch, um 08:00');
        expect(words({}, 'ja')).toBe('月曜日、水曜日、8:00');
    });

    it('has short words for usual weeks', () => {
        const all = FORM.days.map(() => true);
        expect(words({ days: all })).toBe('Every day, at 8:00 AM');
        expect(words({ days: [false, true, true, true, true, true, false] })).toBe(
            'Monday to Friday, at 8:00 AM',
        );
        expect(words({ days: [true, false, false, false, false, false, true] })).toBe(
            'Saturday and Sunday, at 8:00 AM',
        );
    });

    it('names the interval, in hours where they are whole', () => {
        expect(words({ often: 'interval' })).toBe(
            'Monday and Wednesday, every 15 minutes from 8:00 AM to 6:00 PM',
        );
        expect(words({ often: 'interval', every: '60' })).toBe(
            'Monday and Wednesday, every hour from 8:00 AM to 6:00 PM',
        );
        expect(words({ often: 'interval', every: '2', unit: 'hours' }, 'de')).toBe(
            'Montag und Mittwoch, alle 2 Stunden von 08:00 bis 18:00',
        );
    });

    it('names the date and the repetition', () => {
        expect(words({ mode: 'date' })).toBe('Every month from December 31, 2026 on, at 8:00 AM');
        expect(words({ mode: 'date', repeat: 'never' }, 'de')).toBe(
            'Am 31. Dezember 2026, um 08:00',
        );
    });
});

describe('a day that some months lack', () => {
    it('is told', () => {
        const on = (date: string, repeat: ScheduleForm['repeat']) =>
            usesLastDay({ ...FORM, mode: 'date', date, repeat });
        expect(on('2026-12-31', 'monthly')).toBe(true);
        expect(on('2026-12-28', 'monthly')).toBe(false);
        expect(on('2026-12-31', 'yearly')).toBe(false);
        expect(on('2028-02-29', 'yearly')).toBe(true);
        expect(on('2026-12-31', 'weekly')).toBe(false);
    });
});
