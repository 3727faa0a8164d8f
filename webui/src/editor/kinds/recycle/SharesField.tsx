import { Checkbox, Radio } from '@patternfly/react-core';

import { listShares } from '../../../api/appliance';
import { useQuery } from '../../../live/useQuery';
import { useTexts } from '../../../texts/TextsProvider';
import { errorText } from '../../../ui/errorText';
import { Field } from '../../fields';
import { fieldId } from '../../problems';
import type { SettingsProps } from '../kind';
import type { RecycleForm } from './model';
import { Notice } from '../../../ui/Notice';

/** All shares or some, and whether their bins are switched on when the task is saved. */
export function SharesField({ form, onChange }: SettingsProps<RecycleForm>) {
    const { t } = useTexts();
    const { data, error } = useQuery('shares', listShares, false);
    const known = data?.shares ?? [];
    // A share that is gone stays in the list, so that it can be taken out.
    const gone = form.shares.filter((name) => data && !known.some((share) => share.name === name));
    const offered = [
        ...known.map(({ name, recycle }) => ({
            name,
            note: t(recycle ? 'recycle.binOn' : 'recycle.binOff'),
        })),
        ...gone.map((name) => ({ name, note: t('recycle.shareGone') })),
    ];
    const toggle = (name: string, on: boolean) =>
        onChange({
            ...form,
            shares: on ? [...form.shares, name] : form.shares.filter((share) => share !== name),
        });

    return (
        <>
            <Field field="extra.shares" label={t('recycle.shares')} group isRequired>
                {({ id }) => (
                    <>
                        <Radio
                            id={`${id}-all`}
                            name={id}
                            label={t('recycle.allShares')}
                            isChecked={form.all}
                            onChange={() => onChange({ ...form, all: true })}
                        />
                        <Radio
                            id={id}
                            name={id}
                            label={t('recycle.someShares')}
                            isChecked={!form.all}
                            onChange={() => onChange({ ...form, all: false })}
                        />
                        {!form.all && (
                            <fieldset className="orva-group">
                                <legend className="orva-hidden">{t('recycle.someShares')}</legend>
                                {error && (
                                    <Notice
                                        isPlain
                                        variant="danger"
                                        title={errorText(error, t)}
                                    />
                                )}
                                {offered.map(({ name, note }) => (
                                    <Checkbox
                                        key={name}
                                        id={`${id}-share-${name}`}
                                        label={name}
                                        description={note}
                                        isChecked={form.shares.includes(name)}
                                        onChange={(_event, on) => toggle(name, on)}
                                    />
                                ))}
                            </fieldset>
                        )}
                    </>
                )}
            </Field>
            <Checkbox
                id={fieldId('extra.switchOn')}
                label={t('recycle.switchOn')}
                description={t('recycle.switchOnHelp')}
                isChecked={form.switchOn}
                onChange={(_event, switchOn) => onChange({ ...form, switchOn })}
            />
        </>
    );
}
