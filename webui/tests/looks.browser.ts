import { join } from 'node:path';

import type { Page } from '@playwright/test';

import { pictureFolder } from './support/places';
import { choose, expect, runNow, tab, test } from './support/test';
import { VIEWS } from './support/views';

async function widthOf(page: Page): Promise<number> {
    return page.evaluate(() => document.documentElement.scrollWidth);
}

test('the colours follow the system and the switch', async ({ app }) => {
    const html = app.locator('html');
    await expect(html).not.toHaveClass(/theme-dark/);
    await app.emulateMedia({ colorScheme: 'dark' });
    await expect(html).toHaveClass(/theme-dark/);
    await choose(app, /^Colours/, 'Light');
    await expect(html).not.toHaveClass(/theme-dark/);
    await app.emulateMedia({ colorScheme: 'light' });
    await choose(app, /^Colours/, 'Dark');
    await app.reload();
    await expect(html).toHaveClass(/theme-dark/);
});

test.describe('on a phone', () => {
    test.use({ viewport: { width: 390, height: 844 }, hasTouch: true });

    test('no view is wider than the screen', async ({ app, appliance }) => {
        await appliance.script('Speak', 'echo a line that is long enough to be broken somewhere');
        await runNow(app, 'Speak');
        for (const view of VIEWS) {
            await view.open(app);
            expect([view.name, await widthOf(app)]).toEqual([view.name, 390]);
            await app.screenshot({ path: join(pictureFolder, `phone-${view.name}.png`) });
        }
    });

    test('a task is made and the list sorted', async ({ app }) => {
        await app.getByRole('button', { name: /^Sort by/ }).tap();
        await app.getByRole('menuitem', { name: 'Name, descending' }).tap();
        await expect(app.locator('td[data-label="Name"]').first()).toHaveText(
            'Switch off on Fridays',
        );
        await app.getByRole('button', { name: 'New task' }).tap();
        await app.getByRole('menuitem', { name: 'Script' }).tap();
        await app.getByRole('textbox', { name: 'Name', exact: true }).fill('From a phone');
        await tab(app, 'Settings');
        await app.getByLabel('Commands').fill('true');
        await app.getByRole('button', { name: 'Create task' }).tap();
        await expect(app.getByText('From a phone is created')).toBeVisible();
    });
});

test('pictures of the main views are taken', async ({ app, appliance }) => {
    await appliance.script('Check the disks', 'echo all disks are well; df -h /');
    await runNow(app, 'Report free space');
    await runNow(app, 'Check the disks');
    await expect(app.getByText(/is started/)).toHaveCount(0);
    await app.setViewportSize({ width: 1280, height: 940 });
    for (const colours of ['light', 'dark'] as const) {
        await app.emulateMedia({ colorScheme: colours });
        for (const view of VIEWS) {
            await view.open(app);
            await app.evaluate(() => (document.activeElement as HTMLElement | null)?.blur());
            await app.screenshot({ path: join(pictureFolder, `${colours}-${view.name}.png`) });
        }
    }
});
