import {
    Button,
    Modal,
    ModalBody,
    ModalFooter,
    ModalHeader,
} from '@patternfly/react-core';
import { useState } from 'react';

import type { TaskRow } from '../api/tasks';
import { live, useLive } from '../live/live';
import { useTexts } from '../texts/TextsProvider';
import { errorText } from '../ui/errorText';
import { useToasts } from '../ui/toasts';
import { Notice } from '../ui/Notice';
import { type Action, allows, perform } from './actions';
import { NoBuzzer } from './NoBuzzer';

/** More names than this are counted instead of shown. */
const MOST_NAMES = 200;

export interface Request {
    action: Action;
    rows: TaskRow[];
}

interface Props extends Request {
    onClose(done: boolean): void;
}

function Names({ rows, label }: { rows: TaskRow[]; label: string }) {
    const { t } = useTexts();
    const shown = rows.slice(0, MOST_NAMES);
    return (
        <ul className="orva-names" aria-label={label} tabIndex={0}>
            {shown.map((row) => (
                <li key={row.id}>{row.name}</li>
            ))}
            {rows.length > shown.length && (
                <li>{t.count('confirm.more', rows.length - shown.length)}</li>
            )}
        </ul>
    );
}

/** Names the tasks and asks before something is done to them. */
export function ConfirmAction({ action, rows, onClose }: Props) {
    const { t } = useTexts();
    const toasts = useToasts();
    const { info } = useLive();
    const [busy, setBusy] = useState(false);
    const [failure, setFailure] = useState('');
    const able = rows.filter((row) => allows(action, row));
    const refused = rows.filter((row) => !allows(action, row));

    const confirm = async () => {
        setBusy(true);
        setFailure('');
        try {
            await perform(action, able);
            toasts.say('success', t.count(`done.${action}`, able.length, { name: able[0]?.name ?? '' }));
            live.look();
            onClose(true);
        } catch (error) {
            // Some of them may be done already: the list is read again under the dialog.
            live.refresh();
            setFailure(errorText(error, t));
            setBusy(false);
        }
    };

    return (
        <Modal
            isOpen
            variant="small"
            onEscapePress={() => onClose(false)}
            aria-labelledby="confirm-title"
            aria-describedby="confirm-body"
        >
            <ModalHeader
                title={t.count(`confirm.${action}`, able.length)}
                titleIconVariant={action === 'delete' ? 'warning' : undefined}
                titleScreenReaderText={action === 'delete' ? t('alert.warning') : undefined}
                labelId="confirm-title"
            />
            <ModalBody id="confirm-body">
                {failure && <Notice variant="danger" title={failure} />}
                {action === 'run' && info?.scheduler === false && (
                    <Notice variant="warning" title={t('notice.noScheduler')}>
                        {t('notice.noSchedulerBody')}
                    </Notice>
                )}
                {action === 'run' && able.some((row) => row.type === 'beep') && <NoBuzzer />}
                {able.length > 0 && (
                    <Names rows={able} label={t.count(`confirm.${action}`, able.length)} />
                )}
                {action === 'delete' && able.length > 0 && <p>{t('confirm.deleteNote')}</p>}
                {refused.length > 0 && (
                    <>
                        <p>{t.count(`refused.${action === 'run' ? 'run' : 'delete'}`, refused.length)}</p>
                        <Names rows={refused} label={t('confirm.leftOut')} />
                    </>
                )}
            </ModalBody>
            <ModalFooter>
                <Button
                    variant={action === 'delete' ? 'danger' : 'primary'}
                    isDisabled={busy || able.length === 0}
                    isLoading={busy}
                    onClick={() => void confirm()}
                >
                    {t(`action.${action}`)}
                </Button>
                <Button variant="link" onClick={() => onClose(false)}>
                    {t('action.cancel')}
                </Button>
            </ModalFooter>
        </Modal>
    );
}
