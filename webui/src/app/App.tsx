import { Bullseye, Modal, ModalBody, ModalHeader, Spinner } from '@patternfly/react-core';

import { TextsProvider, useTexts } from '../texts/TextsProvider';
import { ToastsProvider } from '../ui/toasts';
import { useSession } from './session';
import { Shell } from './Shell';
import { SignInForm, SignInPage } from './SignIn';

function Inside() {
    const { t } = useTexts();
    const session = useSession();
    switch (session.state) {
        case 'checking':
            return (
                <Bullseye className="orva-whole">
                    <Spinner aria-label={t('state.loading')} />
                </Bullseye>
            );
        case 'out':
            return (
                <SignInPage
                    onSignedIn={session.entered}
                    notice={session.notice}
                    wait={session.wait}
                />
            );
        default:
            return (
                <>
                    <Shell onLeave={session.leave} />
                    <Modal
                        isOpen={session.state === 'over'}
                        variant="small"
                        aria-labelledby="session-over"
                        onEscapePress={() => undefined}
                    >
                        <ModalHeader title={t('signin.overTitle')} labelId="session-over" />
                        <ModalBody>
                            <SignInForm
                                onSignedIn={session.entered}
                                notice={t('signin.overNotice')}
                            />
                        </ModalBody>
                    </Modal>
                </>
            );
    }
}

export function App() {
    return (
        <TextsProvider>
            <ToastsProvider>
                <Inside />
            </ToastsProvider>
        </TextsProvider>
    );
}
