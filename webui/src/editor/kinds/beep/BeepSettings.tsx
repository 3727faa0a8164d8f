import { useTexts } from '../../../texts/TextsProvider';
import { NumberField } from '../../NumberField';
import type { SettingsProps } from '../kind';
import { type BeepForm, LONGEST, SHORTEST } from './model';

export function BeepSettings({ form, onChange }: SettingsProps<BeepForm>) {
    const { t } = useTexts();
    return (
        <NumberField
            field="extra.duration"
            label={t('beep.duration')}
            unit={t('beep.seconds')}
            help={t('beep.help', { least: SHORTEST, most: LONGEST })}
            value={form.duration}
            onChange={(duration) => onChange({ duration })}
        />
    );
}
