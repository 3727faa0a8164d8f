import { useCallback, useEffect, useState } from 'react';

import { onSignedOut } from '../api/client';
import { isSignedIn, signIn, type SignInResult, signOut } from '../api/session';
import { live } from '../live/live';
import { useTexts } from '../texts/TextsProvider';
import { errorText } from '../ui/errorText';
import { useToasts } from '../ui/toasts';
import { guarded, replace, SIGN_IN_LINK } from './route';

export type SessionState = 'checking' | 'out' | 'in' | 'over';

export interface Session {
    state: SessionState;
    /** Why the sign-in is shown, when there is something to say. */
    notice: string;
    /** For so many seconds the appliance looks at no token. */
    wait: number;
    entered(): void;
    leave(): void;
}

/** What a failed sign-out, and the one that succeeds then, are about. */
const SIGN_OUT = 'sign out';

/** The one-time code of a sign-in link; it leaves the address bar and the history at once. */
function takeCode(): string | null {
    const code = SIGN_IN_LINK.exec(window.location.hash)?.[1] ?? null;
    if (code !== null) {
        replace('#/tasks');
    }
    return code;
}

const linkCode = takeCode();

async function enterWithLink(): Promise<SignInResult | null> {
    return linkCode === null ? null : signIn({ code: decodeURIComponent(linkCode) });
}

export function useSession(): Session {
    const { t } = useTexts();
    const toasts = useToasts();
    const [state, setState] = useState<SessionState>('checking');
    const [notice, setNotice] = useState('');
    const [wait, setWait] = useState(0);

    const entered = useCallback(() => {
        setNotice('');
        void live.start().then(() => {
            live.refresh();
            setState('in');
        });
    }, []);

    useEffect(() => {
        let current = true;
        const begin = async () => {
            const byLink = await enterWithLink();
            const inside = byLink?.state === 'ok' || (await isSignedIn());
            if (!current) {
                return;
            }
            if (inside) {
                entered();
                return;
            }
            setNotice(byLink?.state === 'refused' ? 'signin.linkUsed' : '');
            setWait(byLink?.state === 'too-many' ? byLink.seconds : 0);
            setState('out');
        };
        begin().catch((error: unknown) => {
            if (current) {
                setNotice(errorText(error, t));
                setState('out');
            }
        });
        return () => {
            current = false;
        };
        // Once: a change of language does not sign in again.
        // eslint-disable-next-line react-hooks/exhaustive-deps
    }, []);

    // Views stay as they are under the dialog: nothing that was typed is lost.
    useEffect(() => onSignedOut(() => setState((old) => (old === 'in' ? 'over' : old))), []);

    // Another tab, or a sign-in link opened there, lets this one in too.
    useEffect(() => {
        if (state !== 'over') {
            return;
        }
        const look = () => {
            if (!document.hidden) {
                isSignedIn().then(
                    (inside) => inside && entered(),
                    () => undefined,
                );
            }
        };
        document.addEventListener('visibilitychange', look);
        window.addEventListener('focus', look);
        return () => {
            document.removeEventListener('visibilitychange', look);
            window.removeEventListener('focus', look);
        };
    }, [state, entered]);

    const leave = useCallback(() => {
        guarded(() => {
            live.stop();
            signOut().then(
                () => {
                    toasts.settle(SIGN_OUT);
                    setNotice('');
                    setState('out');
                },
                (error: unknown) => {
                    toasts.fail(t('failed.signOut'), error, SIGN_OUT);
                    void live.start();
                },
            );
        });
    }, [t, toasts]);

    return {
        state,
        notice: notice === 'signin.linkUsed' ? t('signin.linkUsed') : notice,
        wait,
        entered,
        leave,
    };
}

