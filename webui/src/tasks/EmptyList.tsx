import {
    Button,
    EmptyState,
    EmptyStateActions,
    EmptyStateBody,
    EmptyStateFooter,
} from '@patternfly/react-core';
import ClockIcon from '@patternfly/react-icons/dist/esm/icons/clock-icon';
import SearchIcon from '@patternfly/react-icons/dist/esm/icons/search-icon';

import { EDITABLE_KINDS } from '../editor/kinds/names';
import { useTexts } from '../texts/TextsProvider';
import { KindIcon } from './kinds';

/** There are no tasks: offers to make one of each kind. */
export function NoTasks() {
    const { t } = useTexts();
    return (
        <EmptyState titleText={t('list.emptyTitle')} headingLevel="h2" icon={ClockIcon}>
            <EmptyStateBody>{t('list.emptyBody')}</EmptyStateBody>
            <EmptyStateFooter>
                <EmptyStateActions>
                    {EDITABLE_KINDS.map((kind) => (
                        <Button
                            key={kind}
                            component="a"
                            href={`#/tasks/new/${kind}`}
                            variant="secondary"
                            icon={<KindIcon type={kind} />}
                        >
                            {t(`kind.${kind}`)}
                        </Button>
                    ))}
                </EmptyStateActions>
            </EmptyStateFooter>
        </EmptyState>
    );
}

export function NoMatch({ onClear }: { onClear(): void }) {
    const { t } = useTexts();
    return (
        <EmptyState titleText={t('list.noMatchTitle')} headingLevel="h2" icon={SearchIcon}>
            <EmptyStateBody>{t('list.noMatchBody')}</EmptyStateBody>
            <EmptyStateFooter>
                <EmptyStateActions>
                    <Button variant="link" onClick={onClear}>
                        {t('list.clearFilter')}
                    </Button>
                </EmptyStateActions>
            </EmptyStateFooter>
        </EmptyState>
    );
}
