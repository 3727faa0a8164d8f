import type { Run } from '../api/history';
import { routeTo } from '../app/route';
import { ResultLabel } from '../history/result';
import { useTexts } from '../texts/TextsProvider';

/** How the task's newest run went, with a way to what it printed. */
export function LastResult({ run }: { run: Run | undefined }) {
    const { t, format } = useTexts();
    if (!run) {
        return <span className="orva-subtle">{t('list.neverRan')}</span>;
    }
    const when = format.instant(run.ended ?? run.started ?? run.queued);
    return (
        <a
            href={routeTo('history', { task: String(run.task), run: String(run.run) })}
            className="orva-last-result"
        >
            <ResultLabel run={run} />
            <span className="orva-subtle">{when}</span>
        </a>
    );
}
