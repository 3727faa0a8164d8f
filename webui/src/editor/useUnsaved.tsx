import { Button, Modal, ModalBody, ModalFooter, ModalHeader } from '@patternfly/react-core';
import { type ReactNode, useEffect, useState } from 'react';

import { setGuard } from '../app/route';
import { useTexts } from '../texts/TextsProvider';

/** Asks before unsaved work is left; gives the dialog to show. */
export function useUnsaved(dirty: boolean): ReactNode {
    const { t } = useTexts();
    const [leave, setLeave] = useState<{ goOn: () => void } | null>(null);

    useEffect(() => {
        if (!dirty) {
            return;
        }
        const stay = (event: BeforeUnloadEvent) => event.preventDefault();
        window.addEventListener('beforeunload', stay);
        setGuard((goOn) => setLeave({ goOn }));
        return () => {
            window.removeEventListener('beforeunload', stay);
            setGuard(null);
        };
    }, [dirty]);

    return (
        leave && (
            <Modal
                isOpen
                variant="small"
                onEscapePress={() => setLeave(null)}
                aria-labelledby="leave-title"
            >
                <ModalHeader title={t('leave.title')} labelId="leave-title" />
                <ModalBody>{t('leave.body')}</ModalBody>
                <ModalFooter>
                    <Button
                        variant="danger"
                        onClick={() => {
                            setLeave(null);
                            leave.goOn();
                        }}
                    >
                        {t('leave.go')}
                    </Button>
                    <Button variant="link" onClick={() => setLeave(null)}>
                        {t('leave.stay')}
                    </Button>
                </ModalFooter>
            </Modal>
        )
    );
}
