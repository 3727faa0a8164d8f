import { Alert } from '@patternfly/react-core';
import type { ReactNode } from 'react';

import { useTexts } from '../texts/TextsProvider';

interface Props {
    variant: 'danger' | 'warning' | 'info' | 'success';
    title: string;
    /** Without a frame, for places inside a form. */
    isPlain?: boolean;
    actionLinks?: ReactNode;
    children?: ReactNode;
}

/** Something to know, in the place that it is about. */
export function Notice(props: Props) {
    const { t } = useTexts();
    return (
        <Alert isInline component="p" variantLabel={t(`alert.${props.variant}`)} {...props} />
    );
}
