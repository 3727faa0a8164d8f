import AdjustIcon from '@patternfly/react-icons/dist/esm/icons/adjust-icon';
import GlobeIcon from '@patternfly/react-icons/dist/esm/icons/globe-icon';

import { LANGUAGE_NAMES, LANGUAGES } from '../texts/language';
import { useTexts } from '../texts/TextsProvider';
import { Choice } from '../ui/Choice';
import { THEMES, useTheme } from './theme';

/** The switches for language and colours. */
export function Preferences() {
    const { t, language, setLanguage } = useTexts();
    const [theme, setTheme] = useTheme();
    return (
        <>
            <Choice
                label={t('preferences.language')}
                value={language}
                options={LANGUAGES.map((code) => ({ value: code, label: LANGUAGE_NAMES[code] }))}
                onChange={setLanguage}
                face={<GlobeIcon />}
                plain
            />
            <Choice
                label={t('preferences.theme')}
                value={theme}
                options={THEMES.map((each) => ({ value: each, label: t(`theme.${each}`) }))}
                onChange={setTheme}
                face={<AdjustIcon />}
                plain
            />
        </>
    );
}
