import { useCallback, useSyncExternalStore } from 'react';

/** The clock in steps of `period` milliseconds; shown anew at each while `active`. */
export function useNow(active: boolean, period = 1000): number {
    const subscribe = useCallback(
        (changed: () => void) => {
            const timer = active ? setInterval(changed, period) : undefined;
            return () => clearInterval(timer);
        },
        [active, period],
    );
    return useSyncExternalStore(subscribe, () => Math.floor(Date.now() / period) * period);
}
