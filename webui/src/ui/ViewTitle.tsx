import { Title } from '@patternfly/react-core';
import { useEffect, useRef } from 'react';

import { takeArrival } from '../app/route';

/**
 * The heading of a view. It takes the focus when the view is opened: it is read out, and Tab goes on
 * from there.
 */
export function ViewTitle({ children }: { children: string }) {
    const title = useRef<HTMLHeadingElement>(null);
    useEffect(() => {
        if (takeArrival()) {
            title.current?.focus();
        }
    }, []);
    return (
        <Title headingLevel="h1" ref={title} tabIndex={-1}>
            {children}
        </Title>
    );
}
