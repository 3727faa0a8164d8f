
import { useTexts } from '../../../texts/TextsProvider';
import { Notice } from '../../../ui/Notice';

/** Tasks of other applications keep their settings to themselves. */
export function OtherSettings() {
    const { t } = useTexts();
    return (
        <Notice isPlain variant="info" title={t('other.title')}>
            {t('other.body')}
        </Notice>
    );
}
