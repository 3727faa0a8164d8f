import { FormSelect, FormSelectOption, Radio } from '@patternfly/react-core';

import { useTexts } from '../../../texts/TextsProvider';
import { Notice } from '../../../ui/Notice';
import { Field } from '../../fields';
import { NumberField } from '../../NumberField';
import type { SettingsProps } from '../kind';
import { MOST_MEGABYTES, type RecycleForm } from './model';

const POLICIES = ['time', 'size', 'clean_all'] as const;

/** Which files a clean removes. */
export function PolicyField({ form, onChange }: SettingsProps<RecycleForm>) {
    const { t } = useTexts();
    return (
        <>
            <Field field="extra.policy" label={t('recycle.policy')} group>
                {({ id }) =>
                    POLICIES.map((policy) => (
                        <Radio
                            key={policy}
                            id={`${id}-${policy}`}
                            name={id}
                            label={t(`policy.${policy}`)}
                            isChecked={form.policy === policy}
                            onChange={() => onChange({ ...form, policy })}
                        />
                    ))
                }
            </Field>
            {form.policy === 'clean_all' && (
                <Notice
                    variant="warning"
                    title={t(form.all ? 'recycle.emptiesAll' : 'recycle.emptiesThese')}
                >
                    {t('recycle.emptiesBody')}
                </Notice>
            )}
            {form.policy === 'time' && (
                <NumberField
                    field="extra.days"
                    label={t('recycle.days')}
                    unit={t('recycle.daysUnit')}
                    help={t('recycle.daysHelp')}
                    value={form.days}
                    onChange={(days) => onChange({ ...form, days })}
                />
            )}
            {form.policy === 'size' && (
                <>
                    <NumberField
                        field="extra.megabytes"
                        label={t('recycle.megabytes')}
                        unit="MB"
                        help={t('recycle.megabytesHelp', { most: MOST_MEGABYTES })}
                        value={form.megabytes}
                        onChange={(megabytes) => onChange({ ...form, megabytes })}
                    />
                    <Field field="extra.order" label={t('recycle.order')}>
                        {({ id }) => (
                            <FormSelect
                                id={id}
                                className="orva-short"
                                value={form.order}
                                onChange={(_event, order) =>
                                    onChange({ ...form, order: order as RecycleForm['order'] })
                                }
                            >
                                <FormSelectOption value="oldest" label={t('recycle.oldest')} />
                                <FormSelectOption value="largest" label={t('recycle.largest')} />
                            </FormSelect>
                        )}
                    </Field>
                </>
            )}
        </>
    );
}
