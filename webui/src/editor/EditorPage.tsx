import { Button } from '@patternfly/react-core';
import { useEffect, useState } from 'react';

import { ApiError } from '../api/client';
import { blankTask, getTask, type TaskDocument } from '../api/tasks';
import type { ViewProps } from '../app/CurrentView';
import { close } from '../app/route';
import { useQuery } from '../live/useQuery';
import { kindName } from '../tasks/kinds';
import { lastList } from '../tasks/lastList';
import { useTexts } from '../texts/TextsProvider';
import { Failed, Loading } from '../ui/states';
import { ViewTitle } from '../ui/ViewTitle';
import { asEditableKind } from './kinds/names';
import { TaskEditor } from './TaskEditor';

interface Props extends ViewProps {
    /** A stored task, or else the kind of a new one. */
    id?: number;
    kind?: string;
}

const NO_SUCH_TASK = 4801;

function isMissing(error: Error | null): boolean {
    return error instanceof ApiError && error.code === NO_SUCH_TASK;
}

/** Reads the task to edit, and keeps an eye on it while it is edited. */
export function EditorPage({ id, kind, onTitle }: Props) {
    const { t } = useTexts();
    const isNew = id === undefined;
    const known = isNew ? asEditableKind(kind ?? '') : null;
    const key = isNew ? known && `new ${known}` : `task ${id}`;
    const query = useQuery(
        key,
        (signal) => (id === undefined ? blankTask(known ?? '', signal) : getTask(id, signal)),
        !isNew,
    );
    const [begin, setBegin] = useState<TaskDocument | null>(null);
    if (begin === null && query.data !== null) {
        setBegin(query.data);
    }

    const type = begin?.type ?? kind ?? '';
    const title = isNew
        ? t('editor.new', { kind: kindName(t, type) })
        : t('editor.edit', { name: begin?.name ?? '' });
    useEffect(() => onTitle(title), [onTitle, title]);

    if (begin === null) {
        // Neither comes into being by trying again.
        if (key === null || isMissing(query.error)) {
            return (
                <Failed
                    title={t('editor.failed')}
                    error={new Error(t(key === null ? 'editor.unknownKind' : 'editor.noTask'))}
                    action={
                        <Button onClick={() => close(lastList())}>{t('editor.back')}</Button>
                    }
                />
            );
        }
        const { error } = query;
        return error ? <Failed title={t('editor.failed')} error={error} /> : <Loading />;
    }
    return (
        <>
            <ViewTitle>{title}</ViewTitle>
            {known && <p className="orva-subtle">{t(`kindHelp.${known}`)}</p>}
            <TaskEditor
                begin={begin}
                isNew={isNew}
                now={isNew ? null : query.data}
                isGone={!isNew && isMissing(query.error)}
            />
        </>
    );
}
