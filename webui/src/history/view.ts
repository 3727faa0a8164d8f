import { RUN_STATES, type RunState } from '../api/history';
import { replace, routeTo } from '../app/route';

export const RUNS_PER_PAGE = [20, 50, 100] as const;
const USUAL = 20;

/** Which runs are shown; it stands in the address. */
export interface HistoryView {
    task: number | null;
    state: RunState | '';
    /** The run whose output is open. */
    run: number | null;
    page: number;
    perPage: number;
}

function positive(text: string | null): number | null {
    return text !== null && /^[1-9]\d{0,14}$/.test(text) ? Number(text) : null;
}

export function parseHistory(query: URLSearchParams): HistoryView {
    const perPage = Number(query.get('per'));
    return {
        task: positive(query.get('task')),
        state: RUN_STATES.find((state) => state === query.get('state')) ?? '',
        run: positive(query.get('run')),
        page: positive(query.get('page')) ?? 1,
        perPage: RUNS_PER_PAGE.find((count) => count === perPage) ?? USUAL,
    };
}

export function showHistory(view: HistoryView): void {
    const text = (value: number | null) => (value === null ? undefined : String(value));
    replace(
        routeTo('history', {
            task: text(view.task),
            state: view.state || undefined,
            run: text(view.run),
            page: view.page > 1 ? String(view.page) : undefined,
            per: view.perPage === USUAL ? undefined : String(view.perPage),
        }),
    );
}
