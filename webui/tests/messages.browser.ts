import type { Locator } from '@playwright/test';

import { violations } from './support/axe';
import { expect, openNew, rowOf, tab, test } from './support/test';

/** Which of these controls a click would not reach, because something lies over their middle. */
async function covered(controls: Locator): Promise<string[]> {
    return controls.evaluateAll((elements) => {
        const seen = elements.filter((element) => element.checkVisibility());
        return seen.flatMap((element) => {
            // Where a person could scroll to it, it counts as it lies once that is done.
            element.scrollIntoView({ block: 'nearest' });
            const box = element.getBoundingClientRect();
            const hit = document.elementFromPoint(
                box.left + box.width / 2,
                box.top + box.height / 2,
            );
            // A switch is an input that cannot be seen in a label that can.
            const face = element.closest('label') ?? element;
            const reached = hit !== null && (face.contains(hit) || hit.contains(element));
            return reached ? [] : [element.getAttribute('aria-label') ?? element.textContent];
        });
    });
}

// The link that skips to the content shows itself with the focus only.
const CONTROLS = 'a[href]:not([href="#main"]), button, input, [role=tab]';

for (const [name, width, height] of [
    ['a wide window', 1280, 900],
    ['a phone', 390, 844],
] as const) {
    test.describe(`in ${name}`, () => {
        test.use({ viewport: { width, height } });

        test('a message covers nothing that is used', async ({ app }) => {
            const messages = app.getByRole('list', { name: 'Messages' });
            await app.route('**/set_enable*', (route) => route.abort());
            await app.route('**/create*', (route) => route.abort());
            // A failure stays, so there is time to look at everything under it.
            await app.getByRole('switch', { name: 'Enable Lunch signal' }).click({ force: true });
            await expect(messages).toContainText('Lunch signal could not be switched');
            expect(await covered(app.locator(CONTROLS))).toEqual([]);
            expect(await violations(app)).toEqual([]);

            await openNew(app, 'Script');
            await app.getByRole('textbox', { name: 'Name', exact: true }).fill('Covered');
            await tab(app, 'Settings');
            await app.getByLabel('Commands').fill('true');
            await app.getByRole('button', { name: 'Create task' }).click();
            await expect(messages).toContainText('The task could not be saved');
            expect(await covered(app.locator(CONTROLS))).toEqual([]);
            await app.unroute('**/create*');
            await app.getByRole('button', { name: 'Create task' }).click();
            await expect(rowOf(app, 'Covered')).toBeVisible();
            await expect(messages).toContainText('Covered is created');
            // What it says no longer holds.
            await expect(messages).not.toContainText('The task could not be saved');
            await app.unroute('**/set_enable*');
            await app.getByRole('switch', { name: 'Enable Lunch signal' }).click({ force: true });
            await expect(messages).not.toContainText('Lunch signal could not be switched');
        });
    });
}

test('the same failure is told once, and a newer success takes the place of an older one', async ({
    app,
}) => {
    const messages = app.getByRole('list', { name: 'Messages' }).getByRole('listitem');
    await app.route('**/set_enable*', (route) => route.abort());
    const lunch = app.getByRole('switch', { name: 'Enable Lunch signal' });
    for (let time = 0; time < 3; time += 1) {
        await lunch.click({ force: true });
        await expect(messages).toHaveCount(1);
        await expect(lunch).toBeChecked();
    }
    for (const name of ['Lunch signal', 'Report free space']) {
        await app.getByRole('link', { name, exact: true }).click();
        await app.getByRole('button', { name: 'Save' }).click();
        await expect(messages.filter({ hasText: `${name} is saved` })).toBeVisible();
    }
    await expect(messages).toHaveCount(2);
    await expect(messages.nth(1)).toContainText('Lunch signal could not be switched');
    await messages.nth(1).getByRole('button', { name: 'Close' }).click();
    await expect(messages).toHaveCount(1);
});
