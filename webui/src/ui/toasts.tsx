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
}

interface Toasts {
    say(variant: 'success' | 'info' | 'warning', title: string): void;
    /** A failure stays until it is closed; the end of a session is told elsewhere. */
    fail(title: string, error: unknown): void;
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
        setToasts((old) => [added, ...old].slice(0, MOST));
    }, []);
    const value = useMemo<Toasts>(
        () => ({
            say: (variant, title) => add({ variant, title }),
            fail: (title, error) => {
                if (!(error instanceof SignedOutError)) {
                    add({ variant: 'danger', title, body: errorText(error, t) });
                }
            },
        }),
        [add, t],
    );

    return (
        <Context value={value}>
            {children}
            <AlertGroup hasAnimations={false} isToast isLiveRegion aria-label={t('toast.region')}>
                {toasts.map(({ id, variant, title, body }) => (
                    <Alert
                        key={id}
                        variant={variant}
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
        </Context>
    );
}
