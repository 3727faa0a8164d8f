import { useEffect, useState, useSyncExternalStore } from 'react';

export const THEMES = ['system', 'light', 'dark'] as const;
export type Theme = (typeof THEMES)[number];

const STORED = 'orva.theme';
const DARK_CLASS = 'pf-v6-theme-dark';
const systemDark = window.matchMedia('(prefers-color-scheme: dark)');

function storedTheme(): Theme {
    const stored = localStorage.getItem(STORED);
    return THEMES.find((theme) => theme === stored) ?? 'system';
}

function subscribe(listener: () => void): () => void {
    systemDark.addEventListener('change', listener);
    return () => systemDark.removeEventListener('change', listener);
}

/** Before anything is shown, so that nothing flashes in the other colours. */
export function applyStoredTheme(): void {
    apply(storedTheme(), systemDark.matches);
}

function apply(theme: Theme, dark: boolean): void {
    const shown = theme === 'dark' || (theme === 'system' && dark);
    document.documentElement.classList.toggle(DARK_CLASS, shown);
    document.documentElement.style.colorScheme = shown ? 'dark' : 'light';
}

export function useTheme(): [Theme, (theme: Theme) => void] {
    const [theme, setTheme] = useState(storedTheme);
    const dark = useSyncExternalStore(subscribe, () => systemDark.matches);
    useEffect(() => {
        localStorage.setItem(STORED, theme);
        apply(theme, dark);
    }, [theme, dark]);
    return [theme, setTheme];
}
