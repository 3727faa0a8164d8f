import { violations } from './support/axe';
import { expect, runNow, test } from './support/test';
import { VIEWS } from './support/views';

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
                await view.close?.(app);
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
