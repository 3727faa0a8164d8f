import { createContext, type ReactNode, useContext, useEffect, useMemo, useState } from 'react';

import { type Catalogue, readTexts } from '../api/appliance';
import { setApiLanguage } from '../api/client';
import { live, useLive } from '../live/live';
import { type Format, makeFormat } from './format';
import { type Language, loadTexts, preferredLanguage, storeLanguage, type Texts } from './language';
import { makeTranslate, type Translate } from './translate';

interface TextsValue {
    language: Language;
    setLanguage(language: Language): void;
    t: Translate;
    format: Format;
    /** A text of the appliance's own catalogue; null when it has none (or before sign-in). */
    catalogue(section: string, key: string): string | null;
}

const Context = createContext<TextsValue | null>(null);

interface Loaded {
    language: Language;
    texts: Partial<Texts>;
}

export function useTexts(): TextsValue {
    const value = useContext(Context);
    if (!value) {
        throw new Error('useTexts outside of TextsProvider');
    }
    return value;
}

function useCatalogue(language: Language | undefined, signedIn: boolean): Catalogue {
    const [catalogue, setCatalogue] = useState<Catalogue>({});
    useEffect(() => {
        if (!signedIn || language === undefined) {
            return;
        }
        const abort = new AbortController();
        readTexts(abort.signal).then(
            (answer) => setCatalogue(answer.texts),
            // Names from the catalogue only refine what the page says; it speaks without them.
            () => undefined,
        );
        return () => abort.abort();
    }, [language, signedIn]);
    return catalogue;
}

export function TextsProvider({ children }: { children: ReactNode }) {
    const [wanted, setWanted] = useState(preferredLanguage);
    const [loaded, setLoaded] = useState<Loaded | null>(null);
    const { info } = useLive();
    const zone = info?.zone;
    const catalogue = useCatalogue(loaded?.language, info !== null);

    useEffect(() => {
        let current = true;
        void loadTexts(wanted).then((texts) => {
            if (current) {
                setApiLanguage(wanted);
                document.documentElement.lang = wanted;
                setLoaded({ language: wanted, texts });
                // What the appliance says, it says in the reader's language.
                live.refresh();
            }
        });
        return () => {
            current = false;
        };
    }, [wanted]);

    const value = useMemo<TextsValue | null>(() => {
        if (!loaded) {
            return null;
        }
        return {
            language: loaded.language,
            setLanguage: (language) => {
                storeLanguage(language);
                setWanted(language);
            },
            t: makeTranslate(loaded.texts, loaded.language),
            format: makeFormat(loaded.language, zone),
            catalogue: (section, key) => catalogue[section]?.[key] ?? null,
        };
    }, [loaded, zone, catalogue]);

    return value && <Context value={value}>{children}</Context>;
}
