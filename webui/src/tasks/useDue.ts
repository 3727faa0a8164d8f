import { useEffect } from 'react';

import type { TaskRow } from '../api/tasks';
import { live, useLive } from '../live/live';

/** "2026-11-22 02:00" on the appliance's clock, which texts of this form compare with. */
export function applianceMinute(now: number, zone: string): string {
    try {
        return new Intl.DateTimeFormat('sv-SE', {
            timeZone: zone,
            dateStyle: 'short',
            timeStyle: 'short',
        }).format(now);
    } catch {
        return '';
    }
}

const LOOK_MS = 15_000;

/** Reads the list again when a next start that it shows has passed: nothing need have changed for that. */
export function useDue(rows: TaskRow[]): void {
    const { info } = useLive();
    const zone = info?.zone;
    const first = rows
        .map((row) => row.next_trigger_time)
        .filter((text) => text !== '-')
        .reduce((least, text) => (least === '' || text < least ? text : least), '');
    useEffect(() => {
        if (!zone || first === '') {
            return;
        }
        const timer = setInterval(() => {
            if (!document.hidden && applianceMinute(Date.now(), zone) >= first) {
                live.refresh();
            }
        }, LOOK_MS);
        return () => clearInterval(timer);
    }, [zone, first]);
}
