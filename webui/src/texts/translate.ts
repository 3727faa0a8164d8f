import type { CountedKey, Language, TextKey, Texts } from './language';

export type Values = Record<string, string | number>;

/** `text` with each {name} replaced. */
export function fill(text: string, values: Values): string {
    return text.replace(/\{(\w+)\}/g, (place, name: string) => String(values[name] ?? place));
}

export interface Translate {
    (key: TextKey, values?: Values): string;
    /** The plural form for `count`, which is also the value {count}. */
    count(key: CountedKey, count: number, values?: Values): string;
}

export function makeTranslate(texts: Partial<Texts>, language: Language): Translate {
    const plurals = new Intl.PluralRules(language);
    const numbers = new Intl.NumberFormat(language);
    const translate = (key: TextKey, values: Values = {}) => fill(texts[key] ?? key, values);
    const count = (key: CountedKey, amount: number, values: Values = {}) => {
        const form = `${key}.${plurals.select(amount)}` as TextKey;
        const other = `${key}.other` as TextKey;
        const text = texts[form] ?? texts[other] ?? key;
        return fill(text, { count: numbers.format(amount), ...values });
    };
    return Object.assign(translate, { count });
}
