import { useCallback, useMemo, useState } from 'react';

import type { TaskRow } from '../api/tasks';

export interface Selection {
    rows: TaskRow[];
    has(id: number): boolean;
    set(rows: TaskRow[], selected: boolean): void;
    clear(): void;
    /** Keeps of the selection what still exists, as it is now. */
    keep(existing: TaskRow[]): void;
}

/** Which tasks are selected, on whatever page of the list they stand. */
export function useSelection(): Selection {
    const [selected, setSelected] = useState<ReadonlyMap<number, TaskRow>>(new Map());

    const set = useCallback((rows: TaskRow[], on: boolean) => {
        setSelected((old) => {
            const next = new Map(old);
            for (const row of rows) {
                if (on) {
                    next.set(row.id, row);
                } else {
                    next.delete(row.id);
                }
            }
            return next;
        });
    }, []);
    const clear = useCallback(() => setSelected(new Map()), []);
    const keep = useCallback((existing: TaskRow[]) => {
        setSelected((old) => {
            const rows = existing.filter((row) => old.has(row.id));
            return new Map(rows.map((row) => [row.id, row]));
        });
    }, []);

    return useMemo(
        () => ({
            rows: [...selected.values()],
            has: (id) => selected.has(id),
            set,
            clear,
            keep,
        }),
        [selected, set, clear, keep],
    );
}
