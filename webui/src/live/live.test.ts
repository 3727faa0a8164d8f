import { afterEach, beforeEach, describe, expect, it, vi } from 'vitest';

import { Live, PERIOD } from './live';

/** What the appliance answers, and what it was asked. */
class World {
    asked: string[] = [];
    revision: object = { revision: 1, scheduler: true };
    info = { name: 'attic', scheduler: true, buzzer: false };
    hidden = false;
    down = false;
    visibility: () => void = () => undefined;

    answer(path: string): Response {
        const method = /(\w+)\?/.exec(path)?.[1] ?? '';
        this.asked.push(method);
        if (this.down) {
            throw new TypeError('no answer');
        }
        const data = method === 'info' ? this.info : this.revision;
        return new Response(JSON.stringify({ success: true, data }));
    }
}

let world: World;
let live: Live;

beforeEach(() => {
    vi.useFakeTimers();
    world = new World();
    vi.stubGlobal('fetch', (path: string) => Promise.resolve().then(() => world.answer(path)));
    vi.stubGlobal('document', {
        get hidden() {
            return world.hidden;
        },
        addEventListener: (_name: string, listener: () => void) => {
            world.visibility = listener;
        },
        removeEventListener: () => undefined,
    });
    live = new Live();
});

afterEach(() => {
    live.stop();
    vi.useRealTimers();
    vi.unstubAllGlobals();
});

function hide(hidden: boolean): void {
    world.hidden = hidden;
    world.visibility();
}

describe('the watch on the appliance', () => {
    it('asks for its state once, and then for the revision every two seconds', async () => {
        await live.start();
        expect(world.asked).toEqual(['info', 'revision']);
        await vi.advanceTimersByTimeAsync(40 * PERIOD);
        expect(world.asked).toEqual(['info', ...Array<string>(41).fill('revision')]);
    });

    it('says that something changed when the revision has', async () => {
        await live.start();
        await vi.advanceTimersByTimeAsync(PERIOD);
        const before = live.read().changes;
        world.revision = { revision: 2, scheduler: true };
        await vi.advanceTimersByTimeAsync(PERIOD);
        expect(live.read().changes).toBe(before + 1);
    });

    it('knows within two seconds that the scheduler stopped, and that it is back', async () => {
        await live.start();
        world.revision = { revision: 1, scheduler: false };
        await vi.advanceTimersByTimeAsync(PERIOD);
        expect(live.read().info).toEqual({ name: 'attic', scheduler: false, buzzer: false });
        world.revision = { revision: 1, scheduler: true };
        await vi.advanceTimersByTimeAsync(PERIOD);
        expect(live.read().info?.scheduler).toBe(true);
    });

    it('asks for the state again when the scheduler has come or gone', async () => {
        await live.start();
        world.revision = { revision: 1, scheduler: false };
        world.info = { name: 'cellar', scheduler: false, buzzer: false };
        await vi.advanceTimersByTimeAsync(2 * PERIOD);
        expect(live.read().info).toEqual({ name: 'cellar', scheduler: false, buzzer: false });
        world.asked = [];
        await vi.advanceTimersByTimeAsync(2 * PERIOD);
        expect(world.asked).toEqual(['revision', 'revision']);
    });

    it('asks for the state again when the connection is back', async () => {
        await live.start();
        world.down = true;
        await vi.advanceTimersByTimeAsync(2 * PERIOD);
        world.down = false;
        world.info.buzzer = true;
        await vi.advanceTimersByTimeAsync(2 * PERIOD);
        expect(live.read().info?.buzzer).toBe(true);
    });

    it('asks for the state until it has it', async () => {
        world.down = true;
        await live.start();
        expect(live.read()).toMatchObject({ online: false, info: null });
        world.down = false;
        await vi.advanceTimersByTimeAsync(2 * PERIOD);
        expect(live.read()).toMatchObject({ online: true, info: { name: 'attic' } });
    });

    it('sees a change within two seconds, whenever it happens', async () => {
        await live.start();
        for (let revision = 2; revision < 40; revision += 1) {
            const before = live.read().changes;
            world.revision = { revision, scheduler: true };
            await vi.advanceTimersByTimeAsync(PERIOD);
            expect(live.read().changes).toBe(before + 1);
        }
    });

    it('asks nothing while the page is hidden, and at once when it is seen again', async () => {
        await live.start();
        hide(true);
        world.asked = [];
        await vi.advanceTimersByTimeAsync(60 * PERIOD);
        expect(world.asked).toEqual([]);
        hide(false);
        await vi.advanceTimersByTimeAsync(0);
        expect(world.asked).toEqual(['revision']);
    });

    it('asks no more when the page is hidden while an answer is on its way', async () => {
        await live.start();
        vi.advanceTimersByTime(PERIOD);
        hide(true);
        world.asked = [];
        await vi.advanceTimersByTimeAsync(60 * PERIOD);
        expect(world.asked).toEqual(['revision']);
    });

    it('tells a lost connection, and reads everything again when it is back', async () => {
        await live.start();
        world.down = true;
        await vi.advanceTimersByTimeAsync(PERIOD);
        expect(live.read().online).toBe(false);
        const before = live.read().changes;
        world.down = false;
        await vi.advanceTimersByTimeAsync(PERIOD);
        expect(live.read()).toMatchObject({ online: true, changes: before + 1 });
    });
});
