import { errorOf, jsonRequest, readAnswer, send } from './client';

/** What a person, or the sign-in link, shows to be let in. */
export type Credential = { token: string } | { code: string };

export type SignInResult =
    | { state: 'ok' }
    | { state: 'refused' }
    /** After too many wrong ones nothing is looked at for so many seconds. */
    | { state: 'too-many'; seconds: number };

/** When the server does not say how long it looks at nothing. */
const USUAL_WAIT = 60;

export async function signIn(credential: Credential): Promise<SignInResult> {
    const response = await send('session', jsonRequest('POST', credential));
    if (response.status === 401) {
        return { state: 'refused' };
    }
    if (response.status === 429) {
        const seconds = Number(response.headers.get('Retry-After'));
        return { state: 'too-many', seconds: seconds > 0 ? Math.ceil(seconds) : USUAL_WAIT };
    }
    const answer = await readAnswer(response);
    if (!answer.success) {
        throw errorOf(answer, response.status);
    }
    return { state: 'ok' };
}

export async function isSignedIn(): Promise<boolean> {
    const response = await send('session', { method: 'GET' });
    const body = (await response.json()) as {
        signed_in?: boolean;
        data?: { signed_in?: boolean };
    };
    return (body.signed_in ?? body.data?.signed_in) === true;
}

export async function signOut(): Promise<void> {
    const response = await send('session', {
        method: 'DELETE',
        headers: { 'Content-Type': 'application/json' },
    });
    if (!response.ok) {
        throw errorOf(await readAnswer(response), response.status);
    }
}
