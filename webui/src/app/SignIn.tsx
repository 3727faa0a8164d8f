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
import { useTexts } from '../texts/TextsProvider';
import { errorText } from '../ui/errorText';
import { Preferences } from './Preferences';
import { Notice } from '../ui/Notice';

interface Props {
    onSignedIn(): void;
    /** Said above the form: why it is shown. */
    notice?: string;
}

/** Asks for the token. */
export function SignInForm({ onSignedIn, notice }: Props) {
    const { t } = useTexts();
    const [token, setToken] = useState('');
    const [problem, setProblem] = useState('');
    const [busy, setBusy] = useState(false);
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
            if (result === 'ok') {
                onSignedIn();
                return;
            }
            setProblem(t(result === 'refused' ? 'signin.refused' : 'signin.tooMany'));
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
                    validated={problem ? 'error' : 'default'}
                    aria-describedby="token-help"
                />
                <FormHelperText>
                    <HelperText id="token-help" aria-live="polite">
                        <HelperTextItem
                            variant={problem ? 'error' : 'default'}
                            screenReaderText=""
                        >
                            {problem || t('signin.help')}
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
