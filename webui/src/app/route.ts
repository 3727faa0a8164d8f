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

/** What an entry of the browser's history keeps: its place there, and the address it was opened from. */
interface Entry {
    place: number;
    from: string | null;
}

function entry(): Entry | null {
    return history.state as Entry | null;
}

/** A new entry knows nothing yet; it follows the one that was shown. */
function nameEntry(place: number, from: string | null): Entry {
    const known = entry();
    if (known) {
        return known;
    }
    const fresh = { place, from };
    history.replaceState(fresh, '');
    return fresh;
}

/** The place of the entry that is shown. */
let { place } = nameEntry(0, null);

/** Another view is shown whose heading has not had the focus yet. */
let arriving = false;

/** What tells one view from another: its path, and the task that it is about. */
function viewOf(fragment: string): string {
    const { path, query } = parseRoute(fragment);
    return [...path, query.get('task') ?? ''].join('/');
}

/** Whether a view was opened since this was asked last. */
export function takeArrival(): boolean {
    const arrived = arriving;
    arriving = false;
    return arrived;
}

function follow(): void {
    const before = viewOf(current);
    current = window.location.hash;
    // What the page begins with was not come to from anywhere.
    arriving ||= listeners.size > 0 && viewOf(current) !== before;
    listeners.forEach((listener) => listener());
}

// Two neighbours with the same address differ in their place only.
window.addEventListener('popstate', () => {
    if (window.location.hash === current) {
        ({ place } = nameEntry(place + 1, current));
    }
});

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
    const steps = nameEntry(place + 1, current).place - place;
    if (guard && steps !== 0) {
        // Back to where it was until the guard says otherwise; every entry stays what it is.
        history.go(-steps);
        guard(() => {
            guard = null;
            history.go(steps);
        });
        return;
    }
    place += steps;
    follow();
});

export function setGuard(next: Guard | null): void {
    guard = next;
}

/** Goes on at once, or else when unsaved work may be left. */
export function guarded(goOn: () => void): void {
    if (guard) {
        guard(goOn);
    } else {
        goOn();
    }
}

export function go(target: string): void {
    window.location.hash = target;
}

/** Replaces the address without a step to go back to. */
export function replace(target: string): void {
    if (target !== window.location.hash) {
        history.replaceState(entry(), '', target);
        follow();
    }
}

/** Leaves a view for `target`: back, when it was opened from there, or else in its stead. */
export function close(target: string): void {
    if (entry()?.from === target) {
        history.back();
    } else {
        guarded(() => replace(target));
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
