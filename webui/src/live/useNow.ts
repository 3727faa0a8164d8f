import { useEffect, useState } from 'react';

/** The clock, again every `period` milliseconds while `active`. */
export function useNow(active: boolean, period = 1000): number {
    const [now, setNow] = useState(() => Date.now());
    useEffect(() => {
        if (!active) {
            return;
        }
        const timer = setInterval(() => setNow(Date.now()), period);
        return () => clearInterval(timer);
    }, [active, period]);
    return now;
}
