import { Checkbox, Radio, SearchInput } from '@patternfly/react-core';
import { type KeyboardEvent, useState } from 'react';

import { useTexts } from '../../../texts/TextsProvider';
import { Field } from '../../fields';
import { fieldId } from '../../problems';
import type { SettingsProps } from '../kind';
import { type Service, type ServiceForm, serviceName } from './model';

interface Named {
    service: Service;
    name: string;
}

function Group(props: { title: string; services: Named[]; onSwitch(id: Service, on: boolean): void }) {
    const { title, services, onSwitch } = props;
    if (services.length === 0) {
        return null;
    }
    return (
        <fieldset className="orva-group">
            <legend>{title}</legend>
            {services.map(({ service, name }) => (
                <Checkbox
                    key={service.id}
                    id={`${fieldId('extra.services')}-${service.type}-${service.id}`}
                    label={name}
                    isChecked={service.enable}
                    onChange={(_event, on) => onSwitch(service, on)}
                />
            ))}
        </fieldset>
    );
}

/** Enter in the search would send the form that the search stands in. */
function keepFromSaving(event: KeyboardEvent): void {
    if (event.key === 'Enter') {
        event.preventDefault();
    }
}

/** Start or stop, and the services and packages that it is done to. */
export function ServiceSettings({ form, onChange }: SettingsProps<ServiceForm>) {
    const { t, catalogue } = useTexts();
    const [search, setSearch] = useState('');
    const wanted = search.trim().toLocaleLowerCase();
    const named = form.services.map((service) => ({
        service,
        name: serviceName(service, catalogue),
    }));
    const shown = named.filter(({ service, name }) =>
        `${name}\n${service.id}`.toLocaleLowerCase().includes(wanted),
    );
    const chosen = form.services.filter((service) => service.enable).length;

    const onSwitch = (changed: Service, enable: boolean) =>
        onChange({
            ...form,
            services: form.services.map((service) =>
                service === changed ? { ...service, enable } : service,
            ),
        });

    return (
        <>
            <Field field="extra.action" label={t('service.action')} group>
                {({ id }) =>
                    (['start', 'stop'] as const).map((action) => (
                        <Radio
                            key={action}
                            id={`${id}-${action}`}
                            name={id}
                            label={t(`service.${action}`)}
                            isChecked={form.action === action}
                            onChange={() => onChange({ ...form, action })}
                        />
                    ))
                }
            </Field>
            <Field
                field="extra.services"
                label={t('service.services')}
                group
                isRequired
                help={t.count('service.chosen', chosen)}
            >
                {({ id }) => (
                    <>
                        <div className="orva-search" onKeyDown={keepFromSaving}>
                            <SearchInput
                                id={id}
                                aria-label={t('service.search')}
                                placeholder={t('service.search')}
                                value={search}
                                onChange={(_event, text) => setSearch(text)}
                                onClear={() => setSearch('')}
                                resetButtonLabel={t('list.clearFilter')}
                            />
                        </div>
                        <Group
                            title={t('service.builtIn')}
                            services={shown.filter(({ service }) => service.type === 'service')}
                            onSwitch={onSwitch}
                        />
                        <Group
                            title={t('service.packages')}
                            services={shown.filter(({ service }) => service.type !== 'service')}
                            onSwitch={onSwitch}
                        />
                        {shown.length === 0 && <p>{t('service.noMatch')}</p>}
                    </>
                )}
            </Field>
        </>
    );
}
