import { beforeAll, describe, expect, it, vi } from 'vitest';

import type { TaskRow } from '../api/tasks';

let view: typeof import('./view');

beforeAll(async () => {
    vi.stubGlobal('window', { location: { hash: '' }, addEventListener: () => undefined });
    vi.stubGlobal('history', { state: { place: 0, from: null } });
    view = await import('./view');
});

function row(id: number, name: string, type: string): TaskRow {
    const can = { can_run: true, can_delete: true, can_edit: true };
    return { id, name, type, enable: true, action: 'Run: df', next_trigger_time: '-', ...can };
}

describe('how the list is shown', () => {
    it('stands in the address and comes back from it', () => {
        const given = 'sort=name&dir=desc&page=3&per=100&q=a+b&kind=beep';
        const parsed = view.parseView(new URLSearchParams(given));
        expect(parsed).toEqual({
            sort: 'name',
            direction: 'desc',
            page: 3,
            perPage: 100,
            text: 'a b',
            kind: 'beep',
        });
        expect(view.viewRoute(parsed)).toBe(`#/tasks?${given}`);
    });

    it('takes the usual for what is missing or wrong', () => {
        const parsed = view.parseView(new URLSearchParams('sort=x&page=-1&per=3&kind=y'));
        expect(view.viewRoute(parsed)).toBe('#/tasks');
    });
});

describe('the filter', () => {
    const rows = [row(1, 'Lunch signal', 'beep'), row(2, 'Report space', 'script')];
    const found = (text: string, kind: '' | 'beep' = '') =>
        view.matching(rows, { text, kind }, (each) => each.type).map(({ id }) => id);

    it('finds every word in the name, the kind or the action, in upper or lower case', () => {
        expect(found('lunch')).toEqual([1]);
        expect(found('SCRIPT report')).toEqual([2]);
        expect(found('df')).toEqual([1, 2]);
        expect(found('lunch report')).toEqual([]);
        expect(found('  ')).toEqual([1, 2]);
    });

    it('keeps to the kind', () => {
        expect(found('', 'beep')).toEqual([1]);
    });
});
