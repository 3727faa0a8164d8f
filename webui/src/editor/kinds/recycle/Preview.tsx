import {
    Button,
    Card,
    CardBody,
    CardTitle,
    ExpandableSection,
    HelperText,
    HelperTextItem,
} from '@patternfly/react-core';
import { Table, Tbody, Td, Th, Thead, Tr } from '@patternfly/react-table';
import { useEffect, useRef, useState } from 'react';

import { type CleanFile, type CleanPreview, previewClean } from '../../../api/appliance';
import { isAbort } from '../../../api/client';
import type { TextKey } from '../../../texts/language';
import { useTexts } from '../../../texts/TextsProvider';
import type { Translate } from '../../../texts/translate';
import { errorText } from '../../../ui/errorText';
import { cleanRules, type RecycleForm } from './model';
import { Notice } from '../../../ui/Notice';

const RULES: Record<string, TextKey> = {
    extension: 'rule.extension',
    larger: 'rule.larger',
    smaller: 'rule.smaller',
    age: 'rule.age',
    within_size: 'rule.withinSize',
    mount_point: 'rule.mountPoint',
};

function ruleText(rule: string | undefined, t: Translate): string {
    const key = RULES[rule ?? ''];
    return key ? t(key) : (rule ?? '');
}

function Files({ files, label, rules }: { files: CleanFile[]; label: string; rules: boolean }) {
    const { t, format } = useTexts();
    return (
        <Table aria-label={label} variant="compact" gridBreakPoint="grid-md">
            <Thead>
                <Tr>
                    <Th>{t('preview.file')}</Th>
                    <Th>{t('preview.size')}</Th>
                    <Th>{t('preview.since')}</Th>
                    {rules && <Th>{t('preview.rule')}</Th>}
                </Tr>
            </Thead>
            <Tbody>
                {files.map((file) => (
                    <Tr key={`${file.share}/${file.path}`}>
                        <Td dataLabel={t('preview.file')} modifier="breakWord">
                            {file.share}/{file.path}
                        </Td>
                        <Td dataLabel={t('preview.size')}>{format.bytes(file.bytes)}</Td>
                        <Td dataLabel={t('preview.since')}>{format.instant(file.since)}</Td>
                        {rules && (
                            <Td dataLabel={t('preview.rule')}>
                                {ruleText(file.rule, t)}
                            </Td>
                        )}
                    </Tr>
                ))}
            </Tbody>
        </Table>
    );
}

function Part(props: { files: CleanFile[]; title: string; count: number; rules: boolean }) {
    const { t } = useTexts();
    const [open, setOpen] = useState(false);
    const { files, title, count, rules } = props;
    if (count === 0) {
        return <p>{title}</p>;
    }
    return (
        <ExpandableSection
            toggleText={title}
            isExpanded={open}
            onToggle={(_event, expanded) => setOpen(expanded)}
        >
            <Files files={files} label={title} rules={rules} />
            {count > files.length && (
                <p className="orva-subtle">{t.count('preview.first', files.length)}</p>
            )}
        </ExpandableSection>
    );
}

function Result({ preview }: { preview: CleanPreview }) {
    const { t, format } = useTexts();
    const title = (key: 'preview.remove' | 'preview.keep', part: CleanPreview['remove']) =>
        t.count(key, part.count, { bytes: format.bytes(part.bytes) });
    return (
        <>
            {!preview.complete && (
                <Notice isPlain variant="warning" title={t('preview.incomplete')}>
                    {preview.problems?.map((problem) => <p key={problem}>{problem}</p>)}
                </Notice>
            )}
            <Part
                title={title('preview.remove', preview.remove)}
                files={preview.removed}
                count={preview.remove.count}
                rules={false}
            />
            <Part
                title={title('preview.keep', preview.keep)}
                files={preview.kept}
                count={preview.keep.count}
                rules
            />
        </>
    );
}

/** What a clean by these rules would remove at this moment. */
export function Preview({ form, disabled }: { form: RecycleForm; disabled: boolean }) {
    const { t } = useTexts();
    const [preview, setPreview] = useState<{ of: RecycleForm; result: CleanPreview } | null>(null);
    const [failure, setFailure] = useState('');
    const [busy, setBusy] = useState(false);
    const abort = useRef<AbortController>(null);

    useEffect(() => () => abort.current?.abort(), []);

    const look = async () => {
        abort.current?.abort();
        abort.current = new AbortController();
        setBusy(true);
        setFailure('');
        try {
            setPreview({ of: form, result: await previewClean(cleanRules(form), abort.current.signal) });
        } catch (error) {
            if (isAbort(error)) {
                return;
            }
            setPreview(null);
            setFailure(errorText(error, t));
        }
        setBusy(false);
    };

    // What was shown for other rules says nothing about these.
    const current = preview?.of === form ? preview.result : null;
    return (
        <Card isCompact>
            <CardTitle component="h2">{t('preview.title')}</CardTitle>
            <CardBody>
                <p>{t('preview.help')}</p>
                <Button
                    variant="secondary"
                    isDisabled={disabled || busy}
                    isLoading={busy}
                    aria-describedby="preview-not-yet"
                    onClick={() => void look()}
                >
                    {t('preview.look')}
                </Button>
                <HelperText id="preview-not-yet">
                    {disabled && <HelperTextItem>{t('preview.notYet')}</HelperTextItem>}
                </HelperText>
                <div aria-live="polite">
                    {failure && <Notice isPlain variant="danger" title={failure} />}
                    {current && <Result preview={current} />}
                </div>
            </CardBody>
        </Card>
    );
}
