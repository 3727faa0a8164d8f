import BellIcon from '@patternfly/react-icons/dist/esm/icons/bell-icon';
import CogIcon from '@patternfly/react-icons/dist/esm/icons/cog-icon';
import CubeIcon from '@patternfly/react-icons/dist/esm/icons/cube-icon';
import HistoryIcon from '@patternfly/react-icons/dist/esm/icons/history-icon';
import PowerOffIcon from '@patternfly/react-icons/dist/esm/icons/power-off-icon';
import SyncAltIcon from '@patternfly/react-icons/dist/esm/icons/sync-alt-icon';
import TerminalIcon from '@patternfly/react-icons/dist/esm/icons/terminal-icon';
import ChartBarIcon from '@patternfly/react-icons/dist/esm/icons/chart-bar-icon';
import TrashIcon from '@patternfly/react-icons/dist/esm/icons/trash-icon';
import type { ComponentType } from 'react';

import type { TaskRow } from '../api/tasks';
import { useTexts } from '../texts/TextsProvider';
import type { Translate } from '../texts/translate';
import { type Kind, KINDS } from './view';

const ICONS: Record<Kind, ComponentType> = {
    beep: BellIcon,
    script: TerminalIcon,
    recycle: TrashIcon,
    service: CogIcon,
    backup: HistoryIcon,
    report: ChartBarIcon,
    power: PowerOffIcon,
    kelupdate: SyncAltIcon,
    custom: CubeIcon,
};

export function asKind(type: string): Kind {
    return KINDS.find((kind) => kind === type) ?? 'custom';
}

/** A task's kind in words; for tasks of other applications, the application's name. */
export function kindName(t: Translate, type: string, appName?: string): string {
    return appName || t(`kind.${asKind(type)}`);
}

export function KindIcon({ type }: { type: string }) {
    const Icon = ICONS[asKind(type)];
    return <Icon aria-hidden />;
}

export function KindLabel({ row }: { row: TaskRow }) {
    const { t } = useTexts();
    return (
        <span className="orva-with-icon">
            <KindIcon type={row.type} /> {kindName(t, row.type, row.app_name)}
        </span>
    );
}
