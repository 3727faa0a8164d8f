import { Checkbox, TextInput } from '@patternfly/react-core';

import { useTexts } from '../../../texts/TextsProvider';
import { Field } from '../../fields';
import { NumberField } from '../../NumberField';
import { fieldId } from '../../problems';
import type { SettingsProps } from '../kind';
import type { RecycleForm } from './model';

type Bound = 'keepLarger' | 'keepSmaller';

function KeepSize({ bound, form, onChange }: SettingsProps<RecycleForm> & { bound: Bound }) {
    const { t } = useTexts();
    const keep = form[bound];
    return (
        <>
            <Checkbox
                id={`${fieldId(`extra.${bound}`)}-on`}
                label={t(`recycle.${bound}`)}
                isChecked={keep.on}
                onChange={(_event, on) => onChange({ ...form, [bound]: { ...keep, on } })}
            />
            {keep.on && (
                <NumberField
                    field={`extra.${bound}`}
                    label={t(`recycle.${bound}Size`)}
                    unit="MB"
                    value={keep.megabytes}
                    onChange={(megabytes) =>
                        onChange({ ...form, [bound]: { ...keep, megabytes } })
                    }
                />
            )}
        </>
    );
}

/** What a clean keeps whatever the policy says. */
export function KeepFields(props: SettingsProps<RecycleForm>) {
    const { form, onChange } = props;
    const { t } = useTexts();
    return (
        <Field field="extra.keep" label={t('recycle.keep')} group>
            {() => (
                <div className="orva-form">
                    <Checkbox
                        id={`${fieldId('extra.extensions')}-on`}
                        label={t('recycle.keepExtensions')}
                        isChecked={form.keepExtensions}
                        onChange={(_event, on) => onChange({ ...form, keepExtensions: on })}
                    />
                    {form.keepExtensions && (
                        <Field
                            field="extra.extensions"
                            label={t('recycle.extensions')}
                            help={t('recycle.extensionsHelp')}
                            isRequired
                        >
                            {(input) => (
                                <TextInput
                                    {...input}
                                    autoComplete="off"
                                    autoCapitalize="off"
                                    spellCheck={false}
                                    value={form.extensions}
                                    onChange={(_event, extensions) =>
                                        onChange({ ...form, extensions })
                                    }
                                />
                            )}
                        </Field>
                    )}
                    <KeepSize {...props} bound="keepLarger" />
                    <KeepSize {...props} bound="keepSmaller" />
                </div>
            )}
        </Field>
    );
}
