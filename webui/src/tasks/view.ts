import { replace, routeTo } from '../app/route';
import type { SortDirection, SortKey, TaskRow } from '../api/tasks';

export const SORT_KEYS: readonly SortKey[] = [
    'enable',
    'id',
    'name',
    'type',
    'action',
    'next_trigger_time',
];

export const KINDS = [
    'beep',
    'script',
    'recycle',
    'service',
    'backup',
    'report',
    'power',
    'kelupdate',
    'custom',
] as const;
export type Kind = (typeof KINDS)[number];

export const PER_PAGE = [20, 50, 100, 200] as const;
const USUAL_PER_PAGE = 50;

/** What of the list is shown; it stands in the address, so that going back shows it again. */
export interface TaskView {
    sort: SortKey;
    direction: SortDirection;
    /** From 1. */
    page: number;
    perPage: number;
    text: string;
    kind: Kind | '';
}

function oneOf<T extends string>(values: readonly T[], text: string | null): T | null {
    return values.find((value) => value === text) ?? null;
}

export function parseView(query: URLSearchParams): TaskView {
    const perPage = Number(query.get('per'));
    return {
        sort: oneOf(SORT_KEYS, query.get('sort')) ?? 'next_trigger_time',
        direction: query.get('dir') === 'desc' ? 'desc' : 'asc',
        page: Math.max(1, Math.trunc(Number(query.get('page'))) || 1),
        perPage: PER_PAGE.find((count) => count === perPage) ?? USUAL_PER_PAGE,
        text: query.get('q') ?? '',
        kind: oneOf(KINDS, query.get('kind')) ?? '',
    };
}

export function viewRoute(view: TaskView): string {
    return routeTo('tasks', {
        sort: view.sort === 'next_trigger_time' ? undefined : view.sort,
        dir: view.direction === 'desc' ? 'desc' : undefined,
        page: view.page > 1 ? String(view.page) : undefined,
        per: view.perPage === USUAL_PER_PAGE ? undefined : String(view.perPage),
        q: view.text || undefined,
        kind: view.kind || undefined,
    });
}

export function showView(view: TaskView): void {
    replace(viewRoute(view));
}

export function isFiltered(view: TaskView): boolean {
    return view.text.trim() !== '' || view.kind !== '';
}

/** The rows whose name, kind's name or action holds every word, and that are of the kind. */
export function matching(
    rows: TaskRow[],
    view: Pick<TaskView, 'text' | 'kind'>,
    kindName: (row: TaskRow) => string,
): TaskRow[] {
    const words = view.text.toLocaleLowerCase().split(/\s+/).filter(Boolean);
    return rows.filter((row) => {
        if (view.kind !== '' && row.type !== view.kind) {
            return false;
        }
        const text = `${row.name}\n${kindName(row)}\n${row.action}`.toLocaleLowerCase();
        return words.every((word) => text.includes(word));
    });
}
