import { Alert, AlertActionCloseButton, AlertGroup } from '@patternfly/react-core';
import { createContext, type ReactNode, useCallback, useContext, useMemo, useRef, useState } from 'react';

import { SignedOutError } from '../api/client';
import { useTexts } from '../texts/TextsProvider';
import { errorText } from './errorText';

interface Toast {
    id: number;
    variant: 'success' | 'danger' | 'info' | 'warning';
    title: string;
    body?: string;
    /** What was tried, of a failure. */
    about?: string;
}

interface Toasts {
    say(variant: 'success' | 'info' | 'warning', title: string): void;
    /**
     * A failure stays until it is closed, or until what was tried, `about`, is settled. The end of a
     * session is told elsewhere.
     */
    fail(title: string, error: unknown, about?: string): void;
    /** It has worked now. */
    settle(about: string): void;
}

const Context = createContext<Toasts | null>(null);
const STAYS_MS = 6000;
const MOST = 5;

export function useToasts(): Toasts {
    const toasts = useContext(Context);
    if (!toasts) {
        throw new Error('useToasts outside of ToastsProvider');
    }
    return toasts;
}

export function ToastsProvider({ children }: { children: ReactNode }) {
    const { t } = useTexts();
    const [toasts, setToasts] = useState<Toast[]>([]);
    const next = useRef(0);

    const remove = useCallback(
        (id: number) => setToasts((old) => old.filter((toast) => toast.id !== id)),
        [],
    );
    const add = useCallback((toast: Omit<Toast, 'id'>) => {
        next.current += 1;
        const added = { ...toast, id: next.current };
        // Failures stay until they are closed, each once; of the rest the newest says enough.
        const stays = (old: Toast) =>
            old.variant === 'danger' && (old.title !== toast.title || old.body !== toast.body);
        setToasts((old) => [added, ...old.filter(stays)].slice(0, MOST));
    }, []);
    const value = useMemo<Toasts>(
        () => ({
            say: (variant, title) => add({ variant, title }),
            fail: (title, error, about) => {
                if (!(error instanceof SignedOutError)) {
                    add({ variant: 'danger', title, body: errorText(error, t), about });
                }
            },
            settle: (about) => setToasts((old) => old.filter((toast) => toast.about !== about)),
        }),
        [add, t],
    );

    return (
        <Context value={value}>
            <div className="orva-window">
                <div className="orva-window-view">{children}</div>
                {/* Below the view, not over it: whatever it says covers nothing. */}
                <section className="orva-toasts" aria-label={t('toast.region')}>
                    <AlertGroup hasAnimations={false} isLiveRegion aria-label={t('toast.region')}>
                        {toasts.map(({ id, variant, title, body }) => (
                            <Alert
                                key={id}
                                variant={variant}
                                component="p"
                                title={title}
                                variantLabel={t(`alert.${variant}`)}
                                timeout={variant === 'danger' ? false : STAYS_MS}
                                onTimeout={() => remove(id)}
                                actionClose={
                                    <AlertActionCloseButton
                                        aria-label={t('action.close')}
                                        onClose={() => remove(id)}
                                    />
                                }
                            >
                                {body}
                            </Alert>
                        ))}
                    </AlertGroup>
                </section>
            </div>
        </Context>
    );
}
