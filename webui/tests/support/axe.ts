import { createRequire } from 'node:module';
import { readFileSync } from 'node:fs';

import type { Page } from '@playwright/test';
import type { AxeResults } from 'axe-core';

const AXE = readFileSync(createRequire(import.meta.url).resolve('axe-core/axe.min.js'), 'utf8');

declare const axe: { run(): Promise<AxeResults> };

/** Rule and place of everything that axe has against the page as it stands. */
export async function violations(page: Page): Promise<string[]> {
    // Colours are judged when they have come to rest.
    await page.evaluate(() =>
        Promise.all(
            document
                .getAnimations()
                .filter((each) => each.effect?.getComputedTiming().iterations !== Infinity)
                .map((each) => each.finished.catch(() => undefined)),
        ),
    );
    if (!(await page.evaluate(() => 'axe' in window))) {
        await page.evaluate(AXE);
    }
    const results = await page.evaluate(() => axe.run());
    return results.violations.flatMap(({ id, nodes }) =>
        nodes.map(({ target, failureSummary }) => `${id}: ${target.join(' ')} ${failureSummary}`),
    );
}
