import { readdirSync, readFileSync } from 'node:fs';
import { join } from 'node:path';

import { describe, expect, it } from 'vitest';

import de from './de.json';
import en from './en.json';
import { makeFormat } from './format';
import ja from './ja.json';
import { fill, makeTranslate } from './translate';

const LANGUAGES = { en, de, ja };
const FORM = /\.(zero|one|two|few|many|other)$/;

function sourceFiles(folder: string): string[] {
    return readdirSync(folder, { recursive: true, encoding: 'utf8' })
        .filter((name) => /\.tsx?$/.test(name) && !name.includes('.test.'))
        .map((name) => join(folder, name));
}

function places(text: string): string[] {
    return [...text.matchAll(/\{(\w+)\}/g)].map((match) => match[1] ?? '').toSorted();
}

describe.each(Object.entries(LANGUAGES))('the texts in %s', (language, texts) => {
    const all = texts as Record<string, string>;

    it('have a text for every key, in every plural form of the language', () => {
        const forms = new Intl.PluralRules(language).resolvedOptions().pluralCategories;
        const wanted = Object.keys(en).flatMap((key) => {
            const counted = FORM.test(key);
            return counted ? forms.map((form) => key.replace(FORM, `.${form}`)) : [key];
        });
        expect(Object.keys(all).toSorted()).toEqual([...new Set(wanted)].toSorted());
    });

    it('are nowhere empty', () => {
        expect(Object.keys(all).filter((key) => all[key]?.trim() === '')).toEqual([]);
    });

    it('have the same places to fill as the English ones', () => {
        const english = en as Record<string, string>;
        for (const [key, text] of Object.entries(all)) {
            const model = english[key] ?? english[key.replace(FORM, '.other')] ?? '';
            // A form for one or for many may leave the number, or the one name, out.
            const optional = FORM.test(key) ? ['count', 'name'] : [];
            const fixed = (names: string[]) => names.filter((name) => !optional.includes(name));
            expect([key, fixed(places(text))]).toEqual([key, fixed(places(model))]);
        }
    });
});

describe('the keys of texts', () => {
    it('are all used', () => {
        const source = sourceFiles(join(import.meta.dirname, '..'))
            .map((path) => readFileSync(path, 'utf8'))
            .join('\n');
        const made = [...source.matchAll(/`([\w.]+)\.\$\{/g)].map((match) => `${match[1]}.`);
        const unused = Object.keys(en)
            .map((key) => key.replace(FORM, ''))
            .filter((key) => !source.includes(`'${key}'`))
            .filter((key) => !made.some((start) => key.startsWith(start)));
        expect(unused).toEqual([]);
    });
});

describe('a text', () => {
    it('is filled by name', () => {
        expect(fill('{a} of {b} and {c}', { a: 1, b: 'two' })).toBe('1 of two and {c}');
    });

    it('takes the plural form of the language', () => {
        const english = makeTranslate(en, 'en');
        expect(english.count('confirm.more', 1)).toBe('and 1 more');
        expect(english.count('list.selectAll', 1)).toBe('Select all (1 task)');
        expect(english.count('list.selectAll', 10000)).toBe('Select all (10,000 tasks)');
        expect(makeTranslate(ja, 'ja').count('list.selectAll', 1)).toBe('すべて選択（1件）');
    });
});

describe('numbers and times', () => {
    const format = makeFormat('en', 'Europe/Berlin');
    const plain = (text: string) => text.replace(/\s/g, ' ');

    it('are written in the manner of the language', () => {
        expect(plain(format.local('2026-11-22 02:00'))).toBe('Sun, Nov 22, 2026, 2:00 AM');
        expect(plain(makeFormat('de', undefined).local('2026-11-22 02:00'))).toBe(
            'So., 22. Nov. 2026, 02:00',
        );
        expect(format.local('soon')).toBe('soon');
    });

    it('show instants on the clock of the appliance', () => {
        expect(plain(format.instant('2026-07-01T22:30:05.000Z'))).toBe('Jul 2, 2026, 12:30:05 AM');
        expect(format.instant(null)).toBe('');
    });

    it('do without a zone that the browser does not know', () => {
        expect(makeFormat('en', 'Nowhere/At_All').instant('2026-07-01T22:30:05Z')).toContain('2026');
    });

    it('show lengths with the two largest units', () => {
        expect(format.length(57)).toBe('57 ms');
        expect(format.length(1234)).toBe('1.2 sec');
        expect(format.length(61_000)).toBe('1 min 1 sec');
        expect(format.length(7_260_000)).toBe('2 hr 1 min');
    });

    it('show bytes in powers of 1024', () => {
        expect(format.bytes(1)).toBe('1 byte');
        expect(format.bytes(89)).toBe('89 bytes');
        expect(format.bytes(1536)).toBe('1.5 kB');
        expect(format.bytes(104857600)).toBe('100 MB');
    });
});
