import { useEffect, useRef, useState } from 'react';

import { isAbort, SignedOutError } from '../api/client';
import { useLive } from './live';

export interface Query<T> {
    /** What was read last; stays while it is read again. */
    data: T | null;
    error: Error | null;
    /** Whether what stands was read for this key. */
    settled: boolean;
}

/**
 * Reads with `load` when `key` changes and whenever something changed on the appliance. A null key
 * reads nothing.
 */
export function useQuery<T>(
    key: string | null,
    load: (signal: AbortSignal) => Promise<T>,
    again = true,
): Query<T> {
    const { changes } = useLive();
    const version = again ? changes : 0;
    const latest = useRef(load);
    const [state, setState] = useState<{ key: string | null; data: T | null; error: Error | null }>(
        { key: null, data: null, error: null },
    );

    useEffect(() => {
        latest.current = load;
    });

    useEffect(() => {
        if (key === null) {
            return;
        }
        const abort = new AbortController();
        latest.current(abort.signal).then(
            (data) => {
                if (!abort.signal.aborted) {
                    setState({ key, data, error: null });
                }
            },
            (error: unknown) => {
                if (!abort.signal.aborted && !isAbort(error) && !(error instanceof SignedOutError)) {
                    setState((old) => ({ key, data: old.data, error: error as Error }));
                }
            },
        );
        return () => abort.abort();
    }, [key, version]);

    return { data: state.data, error: state.error, settled: state.key === key };
}

/** A value that follows `value` once it has stood still for `delay` milliseconds. */
export function useSettled<T>(value: T, delay: number): T {
    const [settled, setSettled] = useState(value);
    useEffect(() => {
        const timer = setTimeout(() => setSettled(value), delay);
        return () => clearTimeout(timer);
    }, [value, delay]);
    return settled;
}
