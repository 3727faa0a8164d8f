import { useLive } from '../live/live';
import { useTexts } from '../texts/TextsProvider';
import { Notice } from '../ui/Notice';

/** Where tasks that beep are made or run: says that nothing will be heard, when that is so. */
export function NoBuzzer() {
    const { t } = useTexts();
    const { info } = useLive();
    return (
        info?.buzzer === false && (
            <Notice variant="info" title={t('beep.noBuzzer')}>
                {t('beep.noBuzzerBody')}
            </Notice>
        )
    );
}
