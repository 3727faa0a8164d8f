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
import type { ReactNode } from 'react';

import { live } from '../live/live';
import { useTexts } from '../texts/TextsProvider';
import { errorText } from './errorText';
import { useArrival } from './ViewTitle';

export function Loading() {
    const { t } = useTexts();
    return (
        <Bullseye>
            <Spinner aria-label={t('state.loading')} />
        </Bullseye>
    );
}

interface FailedProps {
    title: string;
    error: Error;
    /** What to do about it, when trying again does not help. */
    action?: ReactNode;
}

/** Stands in the place of a view of which nothing could be read at all. */
export function Failed({ title, error, action }: FailedProps) {
    const { t } = useTexts();
    const heading = useArrival<HTMLSpanElement>();
    return (
        <EmptyState
            titleText={
                <span ref={heading} tabIndex={-1}>
                    {title}
                </span>
            }
            headingLevel="h1"
            status="danger"
            icon={ExclamationCircleIcon}
        >
            <EmptyStateBody>{errorText(error, t)}</EmptyStateBody>
            <EmptyStateFooter>
                <EmptyStateActions>
                    {action ?? <Button onClick={live.refresh}>{t('action.again')}</Button>}
                </EmptyStateActions>
            </EmptyStateFooter>
        </EmptyState>
    );
}
