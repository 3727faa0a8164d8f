import {
    ActionGroup,
    Button,
    Card,
    CardBody,
    CardTitle,
    Form,
    FormGroup,
    FormHelperText,
    HelperText,
    HelperTextItem,
    TextInput,
} from '@patternfly/react-core';
import { type FormEvent, useEffect, useRef, useState } from 'react';

import { signIn } from '../api/session';
import { useNow } from '../live/useNow';
import { useTexts } from '../texts/TextsProvider';
import { errorText } from '../ui/errorText';
import { Preferences } from './Preferences';
import { Notice } from '../ui/Notice';

const SECOND = 1000;

interface Props {
    onSignedIn(): void;
    /** Said above the form: why it is shown. */
    notice?: string;
    /** Seconds that begin with the form, in which no token is looked at. */
    wait?: number;
}

interface Countdown {
    /** By the browser's clock. */
    end: number;
    seconds: number;
}

function countdownOf(seconds: number): Countdown | null {
    return seconds > 0 ? { end: Date.now() + seconds * SECOND, seconds } : null;
}

/** The seconds that are left of `begin`, down to 0, and a way to begin anew. */
function useCountdown(begin: number): [number, (seconds: number) => void] {
    const [countdown, setCountdown] = useState(() => countdownOf(begin));
    const now = useNow(countdown !== null);
    useEffect(() => {
        if (!countdown) {
            return;
        }
        const timer = setTimeout(() => setCountdown(null), countdown.end - Date.now());
        return () => clearTimeout(timer);
    }, [countdown]);
    // The clock that is shown goes in steps, behind the one that ends this.
    const left = countdown
        ? Math.min(countdown.seconds, Math.ceil((countdown.end - now) / SECOND))
        : 0;
    return [left, (seconds) => setCountdown(countdownOf(seconds))];
}

/** Asks for the token. */
export function SignInForm({ onSignedIn, notice, wait: begin = 0 }: Props) {
    const { t } = useTexts();
    const [token, setToken] = useState('');
    const [problem, setProblem] = useState('');
    const [busy, setBusy] = useState(false);
    const [wait, startWait] = useCountdown(begin);
    const input = useRef<HTMLInputElement>(null);

    useEffect(() => input.current?.focus(), []);

    const submit = async (event: FormEvent) => {
        event.preventDefault();
        const given = token.trim();
        if (!given) {
            setProblem(t('signin.missing'));
            input.current?.focus();
            return;
        }
        setBusy(true);
        setProblem('');
        try {
            const result = await signIn({ token: given });
            if (result.state === 'ok') {
                onSignedIn();
                return;
            }
            if (result.state === 'refused') {
                setProblem(t('signin.refused'));
            } else {
                startWait(result.seconds);
            }
        } catch (error) {
            setProblem(errorText(error, t));
        }
        setBusy(false);
        input.current?.focus();
    };

    return (
        <Form onSubmit={(event) => void submit(event)} noValidate>
            {notice && <Notice variant="info" title={notice} />}
            <FormGroup label={t('signin.token')} fieldId="token" isRequired>
                <TextInput
                    id="token"
                    ref={input}
                    type="password"
                    autoComplete="current-password"
                    value={token}
                    onChange={(_event, value) => setToken(value)}
                    validated={problem || wait > 0 ? 'error' : 'default'}
                    aria-describedby="token-help"
                />
                <FormHelperText>
                    <HelperText id="token-help" aria-live="polite">
                        <HelperTextItem
                            variant={problem || wait > 0 ? 'error' : 'default'}
                            screenReaderText=""
                        >
                            {wait > 0 ? (
                                <>
                                    {t('signin.tooMany')}{' '}
                                    {/* Not read out again every second. */}
                                    <span role="timer">{t.count('signin.wait', wait)}</span>
                                </>
                            ) : (
                                problem || t('signin.help')
                            )}
                        </HelperTextItem>
                    </HelperText>
                </FormHelperText>
            </FormGroup>
            <ActionGroup>
                <Button type="submit" isLoading={busy} isDisabled={busy}>
                    {t('signin.submit')}
                </Button>
            </ActionGroup>
        </Form>
    );
}

export function SignInPage(props: Props) {
    const { t } = useTexts();
    useEffect(() => {
        document.title = `${t('signin.title')} · ${t('app.title')}`;
    }, [t]);
    return (
        <main className="orva-signin">
            <div className="orva-signin-preferences">
                <Preferences />
            </div>
            <Card className="orva-signin-card">
                <CardTitle component="h1">{t('signin.title')}</CardTitle>
                <CardBody>
                    <SignInForm {...props} />
                </CardBody>
            </Card>
        </main>
    );
}
