import {
    Button,
    Bullseye,
    EmptyState,
    EmptyStateActions,
    EmptyStateBody,
    EmptyStateFooter,
    Spinner,
} from '@patternfly/react-core';
import ExclamationCircleIcon from '@patternfly/react-icons/dist/esm/icons/exclamation-circle-icon';

import { live } from '../live/live';
import { useTexts } from '../texts/TextsProvider';
import { errorText } from './errorText';

export function Loading() {
    const { t } = useTexts();
    return (
        <Bullseye>
            <Spinner aria-label={t('state.loading')} />
        </Bullseye>
    );
}

/** Nothing could be read at all. */
export function Failed({ title, error }: { title: string; error: Error }) {
    const { t } = useTexts();
    return (
        <EmptyState titleText={title} headingLevel="h2" status="danger" icon={ExclamationCircleIcon}>
            <EmptyStateBody>{errorText(error, t)}</EmptyStateBody>
            <EmptyStateFooter>
                <EmptyStateActions>
                    <Button onClick={live.refresh}>{t('action.again')}</Button>
                </EmptyStateActions>
            </EmptyStateFooter>
        </EmptyState>
    );
}
