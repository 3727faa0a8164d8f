import { useSyncExternalStore } from 'react';

import { type ApplianceInfo, readInfo, readRevision } from '../api/appliance';
import { ConnectionError, isAbort, SignedOutError } from '../api/client';

/** Milliseconds between two requests while nothing happens. */
export const PERIOD = 2000;

export interface LiveState {
    /** Grows whenever what was read may be out of date: somebody changed something, or the connection is back. */
    changes: number;
    online: boolean;
    info: ApplianceInfo | null;
}

/**
 * Watches the appliance with one small request every two seconds, none while the page is hidden, and
 * tells the views when to read again.
 */
export class Live {
    private state: LiveState = { changes: 0, online: true, info: null };
    private readonly listeners = new Set<() => void>();
    private revision: number | null = null;
    private timer: ReturnType<typeof setTimeout> | undefined;
    private running = false;
    private asking = false;
    private askAgain = false;
    private lastAsked = 0;
    /** The appliance's state is asked for along with the next revision. */
    private wantsInfo = true;

    readonly subscribe = (listener: () => void): (() => void) => {
        this.listeners.add(listener);
        return () => this.listeners.delete(listener);
    };

    readonly read = (): LiveState => this.state;

    /** Resolves once the appliance has been asked for the first time, so that what is read later is newer. */
    async start(): Promise<void> {
        if (this.running) {
            return;
        }
        this.running = true;
        document.addEventListener('visibilitychange', this.onVisibility);
        this.wantsInfo = true;
        await this.ask();
    }

    stop(): void {
        this.running = false;
        clearTimeout(this.timer);
        document.removeEventListener('visibilitychange', this.onVisibility);
    }

    /** Looks at once, after a change of one's own. */
    readonly look = (): void => {
        if (this.asking) {
            this.askAgain = true;
        } else {
            void this.ask();
        }
    };

    /** Everything is read again. */
    readonly refresh = (): void => {
        this.update({ changes: this.state.changes + 1 });
    };

    private readonly onVisibility = (): void => {
        clearTimeout(this.timer);
        if (!document.hidden && this.running && !this.asking) {
            this.schedule(Math.max(0, this.lastAsked + PERIOD - Date.now()));
        }
    };

    private schedule(delay: number): void {
        clearTimeout(this.timer);
        if (this.running && !document.hidden) {
            this.timer = setTimeout(() => void this.ask(), delay);
        }
    }

    private async ask(): Promise<void> {
        this.asking = true;
        this.lastAsked = Date.now();
        clearTimeout(this.timer);
        const informed = this.wantsInfo ? this.askForInfo() : null;
        try {
            const { revision, scheduler } = await readRevision();
            await informed;
            const changed = this.revision !== null && this.revision !== revision;
            this.revision = revision;
            const { info } = this.state;
            if (info && info.scheduler !== scheduler) {
                this.wantsInfo = true;
                this.update({ info: { ...info, scheduler } });
            }
            this.answered(changed);
        } catch (error) {
            this.failed(error);
        }
        this.asking = false;
        if (this.askAgain) {
            this.askAgain = false;
            void this.ask();
        } else {
            this.schedule(PERIOD);
        }
    }

    private async askForInfo(): Promise<void> {
        try {
            this.update({ info: await readInfo() });
            this.wantsInfo = false;
        } catch (error) {
            this.failed(error);
        }
    }

    private answered(changed: boolean): void {
        const back = !this.state.online;
        if (back) {
            this.wantsInfo = true;
        }
        if (changed || back) {
            this.update({ online: true, changes: this.state.changes + 1 });
        }
    }

    private failed(error: unknown): void {
        if (error instanceof ConnectionError) {
            this.update({ online: false });
        } else if (error instanceof SignedOutError) {
            // An answer all the same.
            this.update({ online: true });
            this.stop();
        } else if (!isAbort(error)) {
            this.answered(false);
        }
    }

    private update(part: Partial<LiveState>): void {
        const next = { ...this.state, ...part };
        if (JSON.stringify(next) !== JSON.stringify(this.state)) {
            this.state = next;
            this.listeners.forEach((listener) => listener());
        }
    }
}

export const live = new Live();

export function useLive(): LiveState {
    return useSyncExternalStore(live.subscribe, live.read);
}
