import { describe, expect, it } from 'vitest';

import { makeFormat } from '../texts/format';
import { LANGUAGES } from '../texts/language';
import { clockText, minutesOf, parseClock } from './clock';

describe('a time that is typed', () => {
    it('is of 24 hours unless it says otherwise', () => {
        const read = ['6:30', '06:30', '18:30', '18.30', '1830', '630', '6', '0:00', '23:59', ' 7:05 '];
        expect(read.map(parseClock)).toEqual([
            '06:30',
            '06:30',
            '18:30',
            '18:30',
            '18:30',
            '06:30',
            '06:00',
            '00:00',
            '23:59',
            '07:05',
        ]);
    });

    it('may name the half of the day', () => {
        const read = ['6:30 pm', '6:30PM', '6 p.m.', '12 am', '12:15 a.m.', '12:15 pm', '午後6時30分', '午前0:05'];
        expect(read.map(parseClock)).toEqual([
            '18:30',
            '18:30',
            '18:00',
            '00:00',
            '00:15',
            '12:15',
            '18:30',
            '00:05',
        ]);
    });

    it('is understood in the manners of other languages', () => {
        const read = ['18:30 Uhr', '7 Uhr', '１８：３０', '7時', '7時05分', '18:30\u202f'];
        expect(read.map(parseClock)).toEqual(['18:30', '07:00', '18:30', '07:00', '07:05', '18:30']);
    });

    it('is none when it says no time of a day', () => {
        const wrong = ['', 'noon', '24:00', '7:60', '13:00 pm', '7:5', '12345', '-1:00', '7:30:00', 'am'];
        expect(wrong.map(parseClock)).toEqual(wrong.map(() => null));
    });

    it('is read back from what every language shows', () => {
        for (const language of LANGUAGES) {
            const format = makeFormat(language, undefined);
            for (const time of ['00:00', '00:30', '09:05', '12:00', '12:30', '13:00', '23:59']) {
                const minutes = minutesOf(time) ?? -1;
                const shown = format.clock(Math.floor(minutes / 60), minutes % 60);
                expect([language, shown, parseClock(shown)]).toEqual([language, shown, time]);
            }
        }
    });
});

describe('minutes after midnight', () => {
    it('are those of HH:MM only', () => {
        expect(minutesOf('00:00')).toBe(0);
        expect(minutesOf('23:59')).toBe(1439);
        expect(['', '24:00', '12:60', '7:00', '12:00:00'].map(minutesOf)).toEqual([
            null,
            null,
            null,
            null,
            null,
        ]);
        expect(clockText(7, 5)).toBe('07:05');
    });
});
