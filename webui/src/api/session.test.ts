import { afterEach, describe, expect, it, vi } from 'vitest';

import { signIn } from './session';

afterEach(() => vi.unstubAllGlobals());

function answer(status: number, headers: Record<string, string>, body: object) {
    const response = new Response(JSON.stringify(body), { status, headers });
    vi.stubGlobal('fetch', () => Promise.resolve(response));
    return signIn({ token: 'x' });
}

const REFUSED = { success: false, error: { code: 106, details: { msg: 'wrong' } } };

describe('signing in', () => {
    it('goes well or is refused', async () => {
        expect(await answer(200, {}, { success: true, data: { signed_in: true } })).toEqual({
            state: 'ok',
        });
        expect(await answer(401, {}, REFUSED)).toEqual({ state: 'refused' });
    });

    it('has to wait as long as the server says, or a minute when it does not say', async () => {
        expect(await answer(429, { 'Retry-After': '43' }, REFUSED)).toEqual({
            state: 'too-many',
            seconds: 43,
        });
        const unclear: Record<string, string>[] = [{}, { 'Retry-After': 'soon' }, { 'Retry-After': '-1' }];
        for (const headers of unclear) {
            expect(await answer(429, headers, REFUSED)).toEqual({ state: 'too-many', seconds: 60 });
        }
    });

    it('tells any other answer as the failure that it is', async () => {
        await expect(answer(403, {}, { success: false, error: { code: 112 } })).rejects.toMatchObject({
            code: 112,
        });
    });
});
