import { TextArea } from '@patternfly/react-core';

import { useTexts } from '../../../texts/TextsProvider';
import { Field } from '../../fields';
import type { SettingsProps } from '../kind';
import type { ScriptForm } from './model';

export function ScriptSettings({ form, onChange }: SettingsProps<ScriptForm>) {
    const { t } = useTexts();
    return (
        <Field field="extra.script" label={t('script.label')} help={t('script.help')} isRequired>
            {(input) => (
                <TextArea
                    {...input}
                    className="orva-script"
                    rows={14}
                    resizeOrientation="vertical"
                    spellCheck={false}
                    autoCapitalize="off"
                    autoComplete="off"
                    value={form.script}
                    onChange={(_event, script) => onChange({ script })}
                />
            )}
        </Field>
    );
}
