import {
    ActionGroup,
    AlertActionLink,
    Button,
    Form,
    Tab as TabItem,
    Tabs,
    TabTitleIcon,
    TabTitleText,
} from '@patternfly/react-core';
import ExclamationCircleIcon from '@patternfly/react-icons/dist/esm/icons/exclamation-circle-icon';
import { type FormEvent, useMemo, useState } from 'react';

import type { TaskDocument } from '../api/tasks';
import { close, setGuard } from '../app/route';
import { lastList } from '../tasks/lastList';
import { useTexts } from '../texts/TextsProvider';
import { errorText } from '../ui/errorText';
import { useToasts } from '../ui/toasts';
import { FieldsContext } from './fields';
import { GeneralTab } from './GeneralTab';
import { kindOf } from './kinds';
import { type Tab, TABS, tabOf } from './problems';
import { ScheduleTab } from './ScheduleTab';
import { storedPart } from './task';
import { type TaskEditor as Editor, useTaskEditor } from './useTaskEditor';
import { useUnsaved } from './useUnsaved';
import { Notice } from '../ui/Notice';

/** What a failed save, and the one that succeeds then, are about. */
const SAVE = 'save';

interface Props {
    begin: TaskDocument;
    isNew: boolean;
    /** The task as it is stored at this moment; null for a new one. */
    now: TaskDocument | null;
    /** Somebody deleted it meanwhile. */
    isGone: boolean;
}

/** Says when the stored task is no longer the one that is being edited. */
function Meanwhile(props: { isGone: boolean; isChanged: boolean; onLoad(): void }) {
    const { t } = useTexts();
    const { isGone, isChanged, onLoad } = props;
    if (isGone) {
        return <Notice variant="warning" title={t('editor.gone')} />;
    }
    if (!isChanged) {
        return null;
    }
    return (
        <Notice
            variant="warning"
            title={t('editor.changed')}
            actionLinks={
                <AlertActionLink onClick={onLoad}>{t('editor.loadChanged')}</AlertActionLink>
            }
        >
            {t('editor.changedBody')}
        </Notice>
    );
}

function TabTitle({ tab, bad }: { tab: Tab; bad: boolean }) {
    const { t } = useTexts();
    return (
        <>
            <TabTitleText>{t(`tab.${tab}`)}</TabTitleText>
            {bad && (
                <TabTitleIcon>
                    <ExclamationCircleIcon className="orva-outcome-failed" title={t('tab.bad')} />
                </TabTitleIcon>
            )}
        </>
    );
}

function TabBody({ tab, editor, begin }: { tab: Tab; editor: Editor; begin: TaskDocument }) {
    const { form, change, problems } = editor;
    const kind = kindOf(begin.type);
    switch (tab) {
        case 'general':
            return <GeneralTab document={begin} form={form} onChange={change} />;
        case 'schedule':
            return (
                <ScheduleTab
                    form={form.schedule}
                    hasProblems={Object.keys(problems).some((name) => tabOf(name) === 'schedule')}
                    onChange={(part) => change({ schedule: { ...form.schedule, ...part } })}
                    onRefused={editor.refuseSchedule}
                />
            );
        case 'settings':
            return <kind.Settings form={form.extra} onChange={(extra) => change({ extra })} />;
    }
}

export function TaskEditor({ begin, isNew, now, isGone }: Props) {
    const { t } = useTexts();
    const toasts = useToasts();
    const kind = useMemo(() => kindOf(begin.type), [begin.type]);
    const editor = useTaskEditor(begin, kind);
    const [seen, setSeen] = useState(() => storedPart(begin, kind));
    const stored = useMemo(() => now && storedPart(now, kind), [now, kind]);
    const [saved, setSaved] = useState(false);
    const leaveDialog = useUnsaved(editor.dirty && !saved);
    const { form, tab, refusal } = editor;

    const save = async (event: FormEvent) => {
        event.preventDefault();
        try {
            if ((await editor.save()) !== null) {
                setSaved(true);
                setGuard(null);
                toasts.settle(SAVE);
                toasts.say('success', t(isNew ? 'done.created' : 'done.saved', { name: form.name }));
                close(lastList());
            }
        } catch (error) {
            toasts.fail(t('failed.save'), error, SAVE);
        }
    };

    const fields = { problemOf: editor.problemOf, touch: editor.touch };
    return (
        <FieldsContext value={fields}>
            {!saved && (
                <Meanwhile
                    isGone={isGone}
                    isChanged={stored !== null && stored !== seen}
                    onLoad={() => {
                        if (now) {
                            setSeen(storedPart(now, kind));
                            editor.load(now);
                        }
                    }}
                />
            )}
            {kind.Remark && <kind.Remark />}
            <Form onSubmit={(event) => void save(event)} noValidate className="orva-editor">
                <Tabs
                    activeKey={tab}
                    onSelect={(_event, key) => editor.setTab(key as Tab)}
                    aria-label={t('editor.tabs')}
                >
                    {TABS.map((each) => (
                        <TabItem
                            key={each}
                            eventKey={each}
                            title={<TabTitle tab={each} bad={editor.hasShownProblem(each)} />}
                        >
                            <div className="orva-tab orva-form">
                                {refusal?.tab === each && !refusal.field && (
                                    <Notice
                                        variant="danger"
                                        title={t('failed.save')}
                                    >
                                        {errorText(refusal.error, t)}
                                    </Notice>
                                )}
                                {each === tab && <TabBody tab={each} editor={editor} begin={begin} />}
                            </div>
                        </TabItem>
                    ))}
                </Tabs>
                <ActionGroup className="orva-actions">
                    <Button type="submit" isLoading={editor.busy} isDisabled={editor.busy || isGone}>
                        {t(isNew ? 'action.create' : 'action.save')}
                    </Button>
                    <Button variant="link" onClick={() => close(lastList())}>
                        {t('action.cancel')}
                    </Button>
                </ActionGroup>
            </Form>
            {leaveDialog}
        </FieldsContext>
    );
}
