import { createRequire } from 'node:module';
import { readFileSync } from 'node:fs';

import type { Page } from '@playwright/test';
import type { AxeResults } from 'axe-core';

import { expect, runNow, test } from './support/test';
import { VIEWS } from './support/views';

const AXE = readFileSync(createRequire(import.meta.url).resolve('axe-core/axe.min.js'), 'utf8');

declare const axe: { run(): Promise<AxeResults> };

/** Rule and place of everything that axe has against the page as it stands. */
async function violations(page: Page): Promise<string[]> {
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

for (const colours of ['light', 'dark'] as const) {
    test.describe(`in ${colours} colours`, () => {
        test.use({ colorScheme: colours });

        test('axe finds nothing against the sign-in', async ({ page, appliance }) => {
            await page.goto(appliance.url);
            await page.getByRole('button', { name: 'Sign in' }).click();
            await expect(page.getByText('Enter the token.')).toBeVisible();
            expect(await violations(page)).toEqual([]);
        });

        test('axe finds nothing against any view', async ({ app, appliance }) => {
            test.setTimeout(180_000);
            await appliance.script('Speak', 'echo a line');
            await runNow(app, 'Speak');
            await expect(app.getByText(/is started/)).toHaveCount(0);
            for (const view of VIEWS) {
                await view.open(app);
                expect([view.name, ...(await violations(app))]).toEqual([view.name]);
            }
        });

        test.describe('without tasks', () => {
            test.use({ tasks: 'none' });

            test('axe finds nothing against the empty list and history', async ({ app }) => {
                await expect(app.getByRole('heading', { name: 'No tasks yet' })).toBeVisible();
                expect(await violations(app)).toEqual([]);
                await app.getByRole('link', { name: 'History' }).click();
                await expect(app.getByRole('heading', { name: 'No runs' })).toBeVisible();
                expect(await violations(app)).toEqual([]);
            });
        });
    });
}
