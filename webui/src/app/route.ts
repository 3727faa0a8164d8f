import { useMemo, useSyncExternalStore } from 'react';

/** Where the page stands: the part of the fragment before and after its question mark. */
export interface Route {
    path: string[];
    query: URLSearchParams;
}

export function parseRoute(fragment: string): Route {
    const [path = '', query = ''] = fragment.replace(/^#\/?/, '').split('?', 2);
    return {
        path: path.split('/').filter((part) => part !== ''),
        query: new URLSearchParams(query),
    };
}

export function routeTo(path: string, query: Record<string, string | undefined> = {}): string {
    const given = Object.entries(query).filter((entry): entry is [string, string] =>
        Boolean(entry[1]),
    );
    const text = new URLSearchParams(given).toString();
    return `#/${path}${text && `?${text}`}`;
}

/** A guard may keep the page where it is, for one that has unsaved work. It goes on when it wants. */
type Guard = (goOn: () => void) => void;

/** A sign-in link's fragment, with its code. */
export const SIGN_IN_LINK = /^#code=([^&]+)$/;

const listeners = new Set<() => void>();
let guard: Guard | null = null;
let current = window.location.hash;

function follow(): void {
    current = window.location.hash;
    listeners.forEach((listener) => listener());
}

window.addEventListener('hashchange', () => {
    const wanted = window.location.hash;
    if (wanted === current) {
        return;
    }
    if (SIGN_IN_LINK.test(wanted)) {
        // Opened where the page is already: the link is taken when the page begins.
        window.location.reload();
        return;
    }
    if (guard) {
        // Shown where it was until the guard says otherwise.
        history.replaceState(null, '', current || '#/');
        guard(() => {
            guard = null;
            window.location.hash = wanted;
        });
        return;
    }
    follow();
});

export function setGuard(next: Guard | null): void {
    guard = next;
}

export function go(target: string): void {
    window.location.hash = target;
}

/** Replaces the address without a step to go back to. */
export function replace(target: string): void {
    if (target !== window.location.hash) {
        history.replaceState(null, '', target);
        follow();
    }
}

function subscribe(listener: () => void): () => void {
    listeners.add(listener);
    return () => listeners.delete(listener);
}

export function useRoute(): Route {
    const fragment = useSyncExternalStore(subscribe, () => current);
    return useMemo(() => parseRoute(fragment), [fragment]);
}
