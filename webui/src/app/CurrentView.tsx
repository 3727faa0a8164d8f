import { Bullseye, Spinner } from '@patternfly/react-core';
import { lazy, Suspense } from 'react';

import { TaskListPage } from '../tasks/TaskListPage';
import { useTexts } from '../texts/TextsProvider';
import { type Route, useRoute } from './route';

export interface ViewProps {
    /** Names what is shown in the browser's title. */
    onTitle(title: string): void;
}

// The list is what the page opens with; the rest arrives when it is wanted.
const EditorPage = lazy(async () => ({ default: (await import('../editor/EditorPage')).EditorPage }));
const HistoryPage = lazy(async () => ({
    default: (await import('../history/HistoryPage')).HistoryPage,
}));

function viewOf({ path }: Route, props: ViewProps) {
    const [section, which, kind] = path;
    if (section === 'history') {
        return <HistoryPage {...props} />;
    }
    if (section === 'tasks' && which === 'new' && kind) {
        return <EditorPage key={`new-${kind}`} {...props} kind={kind} />;
    }
    if (section === 'tasks' && which && /^\d+$/.test(which)) {
        return <EditorPage key={which} {...props} id={Number(which)} />;
    }
    return <TaskListPage {...props} />;
}

export function CurrentView(props: ViewProps) {
    const { t } = useTexts();
    const route = useRoute();
    return (
        <Suspense
            fallback={
                <Bullseye>
                    <Spinner aria-label={t('state.loading')} />
                </Bullseye>
            }
        >
            {viewOf(route, props)}
        </Suspense>
    );
}
