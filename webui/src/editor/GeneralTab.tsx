import { FormSelect, FormSelectOption, Switch, TextInput } from '@patternfly/react-core';

import { listOwners } from '../api/appliance';
import type { TaskDocument } from '../api/tasks';
import { useQuery } from '../live/useQuery';
import { useTexts } from '../texts/TextsProvider';
import { Field } from './fields';
import type { TaskForm } from './task';

interface Props {
    document: TaskDocument;
    form: TaskForm;
    onChange(part: Partial<TaskForm>): void;
}

function OwnerField({ document, form, onChange }: Props) {
    const { t } = useTexts();
    const query = useQuery(document.can_edit_owner ? 'owners' : null, listOwners, false);
    const owners = new Set([form.owner, document.owner, ...(query.data?.owners ?? [])]);
    return (
        <Field
            field="owner"
            label={t('general.owner')}
            help={t(document.can_edit_owner ? 'general.ownerHelp' : 'general.ownerFixed')}
        >
            {({ id, validated, ...input }) => (
                <FormSelect
                    id={id}
                    validated={validated}
                    aria-describedby={input['aria-describedby']}
                    value={form.owner}
                    isDisabled={!document.can_edit_owner}
                    onChange={(_event, owner) => onChange({ owner })}
                >
                    {[...owners].filter(Boolean).map((owner) => (
                        <FormSelectOption key={owner} value={owner} label={owner} />
                    ))}
                </FormSelect>
            )}
        </Field>
    );
}

export function GeneralTab(props: Props) {
    const { document, form, onChange } = props;
    const { t } = useTexts();
    return (
        <>
            <Field
                field="name"
                label={t('general.name')}
                isRequired
                help={document.can_edit_name ? undefined : t('general.nameFixed')}
            >
                {(input) => (
                    <TextInput
                        {...input}
                        isRequired
                        autoComplete="off"
                        isDisabled={!document.can_edit_name}
                        value={form.name}
                        onChange={(_event, name) => onChange({ name })}
                    />
                )}
            </Field>
            <Field field="enable" help={t('general.enabledHelp')}>
                {({ id }) => (
                    <Switch
                        id={id}
                        label={t('general.enabled')}
                        isChecked={form.enable}
                        onChange={(_event, enable) => onChange({ enable })}
                    />
                )}
            </Field>
            <OwnerField {...props} />
        </>
    );
}
