import BanIcon from '@patternfly/react-icons/dist/esm/icons/ban-icon';
import CheckCircleIcon from '@patternfly/react-icons/dist/esm/icons/check-circle-icon';
import ExclamationCircleIcon from '@patternfly/react-icons/dist/esm/icons/exclamation-circle-icon';
import InProgressIcon from '@patternfly/react-icons/dist/esm/icons/in-progress-icon';
import PendingIcon from '@patternfly/react-icons/dist/esm/icons/pending-icon';
import QuestionCircleIcon from '@patternfly/react-icons/dist/esm/icons/question-circle-icon';
import StopCircleIcon from '@patternfly/react-icons/dist/esm/icons/stop-circle-icon';
import type { ComponentType } from 'react';

import type { Run } from '../api/history';
import { useTexts } from '../texts/TextsProvider';
import type { TextKey } from '../texts/language';
import type { Translate } from '../texts/translate';

/** How a run stands or ended, as a person judges it. */
export type Outcome = 'ok' | 'failed' | 'stopped' | 'running' | 'queued' | 'skipped' | 'lost';

/** What the scheduler gives as reason when a person stopped the run, before or after its start. */
const STOPPED = 'stopped';

export function outcomeOf(run: Run): Outcome {
    if (run.why === STOPPED && (run.state === 'ended' || run.state === 'skipped')) {
        return 'stopped';
    }
    if (run.state !== 'ended') {
        return run.state;
    }
    return run.exit_status === 0 ? 'ok' : 'failed';
}

export function resultText(run: Run, t: Translate): string {
    const outcome = outcomeOf(run);
    if (outcome === 'stopped' && run.state === 'skipped') {
        return t('outcome.cancelled');
    }
    if (outcome !== 'failed') {
        return t(`outcome.${outcome}`);
    }
    if (run.exit_status !== null) {
        return t('outcome.exit', { status: run.exit_status });
    }
    return run.signal !== null
        ? t('outcome.signal', { signal: run.signal })
        : t('outcome.notStarted');
}

/** Why the run went as it did, where its result does not say so already. */
export function reasonText(run: Run, t: Translate): string {
    return outcomeOf(run) === 'stopped' ? '' : whyText(run.why, t);
}

/** The scheduler's own reasons, by their first words; what it does not know it says as it came. */
const REASONS: readonly [string, TextKey][] = [
    ['overlap', 'why.overlap'],
    ['disabled', 'why.disabled'],
    ['deleted', 'why.deleted'],
    ['missed', 'why.missed'],
    ['machine off', 'why.machineOff'],
    ['clock not trusted', 'why.clock'],
    ['not permitted', 'why.notPermitted'],
    ['the owner is gone', 'why.ownerGone'],
    ['the owner cannot be looked up', 'why.ownerUnknown'],
    ['cannot become the owner', 'why.notOwner'],
    ['no space for output', 'why.noSpace'],
    ['cannot keep output', 'why.noOutput'],
    ['cannot start a shell', 'why.noShell'],
    ['cannot start', 'why.cannotStart'],
    ['no command', 'why.noCommand'],
    ['the machine was restarted', 'why.restarted'],
    ['its supervisor has left no ending', 'why.noTrace'],
];

export function whyText(why: string, t: Translate): string {
    const known = REASONS.find(([words]) => why.toLowerCase().startsWith(words));
    if (!known) {
        return why;
    }
    const rest = why.slice(known[0].length).replace(/^[:\s]+/, '');
    return rest ? `${t(known[1])} (${rest})` : t(known[1]);
}

const ICONS: Record<Outcome, ComponentType<{ className?: string }>> = {
    ok: CheckCircleIcon,
    failed: ExclamationCircleIcon,
    stopped: StopCircleIcon,
    running: InProgressIcon,
    queued: PendingIcon,
    skipped: BanIcon,
    lost: QuestionCircleIcon,
};

export function ResultLabel({ run }: { run: Run }) {
    const { t } = useTexts();
    const outcome = outcomeOf(run);
    const Icon = ICONS[outcome];
    return (
        <span className="orva-with-icon">
            <Icon aria-hidden className={`orva-outcome-${outcome}`} /> {resultText(run, t)}
        </span>
    );
}

/** How long the run took, or has taken until `now`; null when it never started. */
export function runLength(run: Run, now: number): number | null {
    if (run.started === null) {
        return null;
    }
    const end = run.ended === null ? now : Date.parse(run.ended);
    return run.ended === null && run.state !== 'running' ? null : end - Date.parse(run.started);
}
