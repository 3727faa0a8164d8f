import type en from './en.json';

export type Texts = Record<keyof typeof en, string>;
export type TextKey = keyof typeof en;
/** Keys that stand once per plural form, named without the form. */
export type CountedKey = TextKey extends infer K ? (K extends `${infer Base}.other` ? Base : never) : never;

export const LANGUAGES = ['en', 'de', 'ja'] as const;
export type Language = (typeof LANGUAGES)[number];

/** Each language's name in that language. */
export const LANGUAGE_NAMES: Record<Language, string> = {
    en: 'English',
    de: 'Deutsch',
    ja: '日本語',
};

const STORED = 'orva.language';

const loaders: Record<Language, () => Promise<{ default: Partial<Texts> }>> = {
    en: () => import('./en.json'),
    de: () => import('./de.json'),
    ja: () => import('./ja.json'),
};

function isLanguage(code: string | null | undefined): code is Language {
    return LANGUAGES.some((language) => language === code);
}

/** The language that was chosen here before, else the browser's first one that the page speaks. */
export function preferredLanguage(): Language {
    const stored = localStorage.getItem(STORED);
    if (isLanguage(stored)) {
        return stored;
    }
    const wished = navigator.languages.map((tag) => tag.split('-')[0]);
    return wished.find(isLanguage) ?? 'en';
}

export function storeLanguage(language: Language): void {
    localStorage.setItem(STORED, language);
}

export async function loadTexts(language: Language): Promise<Partial<Texts>> {
    return (await loaders[language]()).default;
}
