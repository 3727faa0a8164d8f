import { Title } from '@patternfly/react-core';
import { useEffect, useRef } from 'react';

import { takeArrival } from '../app/route';

/** What takes the focus when its view is opened: it is read out, and Tab goes on from there. */
export function useArrival<Element extends HTMLElement>() {
    const element = useRef<Element>(null);
    useEffect(() => {
        if (takeArrival()) {
            element.current?.focus();
        }
    }, []);
    return element;
}

/** The heading of a view. */
export function ViewTitle({ children }: { children: string }) {
    const title = useArrival<HTMLHeadingElement>();
    return (
        <Title headingLevel="h1" ref={title} tabIndex={-1}>
            {children}
        </Title>
    );
}
