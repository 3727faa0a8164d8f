import type { Run } from '../api/history';
import { useTexts } from '../texts/TextsProvider';
import { type Outcome, outcomeOf, resultText, runLength } from './result';

const HEIGHT = 60;
const BAR = 10;
const STEP = 14;
const LEAST = 3;

/** Told only when there are any. */
const OTHERS = ['stopped', 'skipped', 'lost', 'running', 'queued'] as const;

/** The runs that stand below, from old to new: how long each took, and how it went. */
export function RunChart({ runs }: { runs: Run[] }) {
    const { t, format } = useTexts();
    const shown = runs.toReversed().map((run) => ({ run, length: runLength(run, Date.now()) ?? 0 }));
    const longest = Math.max(0, ...shown.map(({ length }) => length));
    const count = (outcome: Outcome) => runs.filter((run) => outcomeOf(run) === outcome).length;
    const counts = [
        t.count('chart.good', count('ok')),
        t.count('chart.bad', count('failed')),
        ...OTHERS.filter((outcome) => count(outcome) > 0).map((outcome) =>
            t.count(`chart.${outcome}`, count(outcome)),
        ),
    ];
    const summary = t('chart.summary', {
        counts: format.list(counts),
        longest: format.length(longest),
    });
    return (
        <figure className="orva-chart">
            <svg
                viewBox={`0 0 ${shown.length * STEP} ${HEIGHT}`}
                width={shown.length * STEP}
                height={HEIGHT}
                role="img"
                aria-label={summary}
            >
                {shown.map(({ run, length }, index) => {
                    const height = Math.max(LEAST, Math.round((length / (longest || 1)) * HEIGHT));
                    return (
                        <rect
                            key={run.run}
                            className={`orva-bar-${outcomeOf(run)}`}
                            x={index * STEP}
                            y={HEIGHT - height}
                            width={BAR}
                            height={height}
                            rx={1}
                        >
                            <title>
                                {[
                                    format.instant(run.started ?? run.queued),
                                    resultText(run, t),
                                    format.length(length),
                                ].join(' · ')}
                            </title>
                        </rect>
                    );
                })}
            </svg>
            <figcaption className="orva-subtle">{summary}</figcaption>
        </figure>
    );
}
