import { Button, Modal, ModalBody, ModalFooter, ModalHeader } from '@patternfly/react-core';
import { useState } from 'react';

import { type Run, stopRun } from '../api/history';
import { live } from '../live/live';
import { useTexts } from '../texts/TextsProvider';
import { errorText } from '../ui/errorText';
import { useToasts } from '../ui/toasts';
import { Notice } from '../ui/Notice';

interface Props {
    run: Run;
    /** Tells whether the run was asked to stop. */
    onClose(asked: boolean): void;
}

export function StopRun({ run, onClose }: Props) {
    const { t } = useTexts();
    const toasts = useToasts();
    const [busy, setBusy] = useState(false);
    const [failure, setFailure] = useState('');

    const stop = async () => {
        setBusy(true);
        try {
            await stopRun(run.run);
            toasts.say(
                'info',
                t(run.state === 'queued' ? 'done.cancelled' : 'done.stopping', { name: run.name }),
            );
            live.look();
            onClose(true);
        } catch (error) {
            setFailure(errorText(error, t));
            setBusy(false);
        }
    };

    return (
        <Modal
            isOpen
            variant="small"
            onEscapePress={() => onClose(false)}
            aria-labelledby="stop-title"
        >
            <ModalHeader title={t('stop.title', { name: run.name })} labelId="stop-title" />
            <ModalBody>
                {failure && <Notice variant="danger" title={failure} />}
                {t(run.state === 'queued' ? 'stop.queued' : 'stop.body')}
            </ModalBody>
            <ModalFooter>
                <Button variant="danger" isLoading={busy} isDisabled={busy} onClick={() => void stop()}>
                    {t('action.stop')}
                </Button>
                <Button variant="link" onClick={() => onClose(false)}>
                    {t('action.cancel')}
                </Button>
            </ModalFooter>
        </Modal>
    );
}
