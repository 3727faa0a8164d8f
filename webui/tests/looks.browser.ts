import { join } from 'node:path';

import type { Locator, Page } from '@playwright/test';

import { pictureFolder } from './support/places';
import { choose, expect, rowOf, runNow, tab, test } from './support/test';
import { VIEWS } from './support/views';

const VIEWS_OF_THE_WINDOW =
    'html, .orva-window-view, [class*="page__main"], .pf-v6-c-modal-box, .pf-v6-c-modal-box__body';

/** What of the window has to be scrolled sideways to be seen whole. */
async function tooWide(page: Page): Promise<string[]> {
    return page
        .locator(VIEWS_OF_THE_WINDOW)
        .evaluateAll((elements) =>
            elements
                .filter((element) => element.scrollWidth > element.clientWidth)
                .map((element) => `${element.className || element.tagName} ${element.scrollWidth}`),
        );
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
            expect([view.name, ...(await tooWide(app))]).toEqual([view.name]);
            await app.screenshot({ path: join(pictureFolder, `phone-${view.name}.png`) });
            await view.close?.(app);
        }
    });

    const middle = async (place: Locator) => {
        const box = await place.boundingBox();
        return (box?.y ?? 0) + (box?.height ?? 0) / 2;
    };

    test('a card begins with its name', async ({
        app,
    }) => {
        const row = rowOf(app, 'Report free space');
        const name = await middle(row.locator('td[data-label="Name"]'));
        for (const other of await row.locator('td[data-label]:not([data-label="Name"])').all()) {
            expect(await middle(other)).toBeGreaterThan(name);
        }
    });

    for (const language of ['English', 'Deutsch', '日本語']) {
        test(`what belongs on one line stands there in ${language}`, async ({ app, appliance }) => {
            await appliance.script('Late', 'true', {
                schedule: { mode: 'date', date: '2027-09-29', hour: 22, minute: 55 },
            });
            await appliance.call('run', { task: 2 });
            await app.getByRole('button', { name: 'Language: English' }).tap();
            await app.getByRole('menuitem', { name: language }).tap();
            const title = await middle(app.getByRole('heading', { level: 1 }));
            const button = await middle(app.locator('.orva-head button'));
            expect(Math.abs(title - button)).toBeLessThan(5);
            for (const name of ['Late', 'Back up documents']) {
                const cell = rowOf(app, name).locator('td').nth(6);
                const [day, time] = await cell.locator('.orva-nowrap').all();
                expect(await middle(day ?? cell)).toBe(await middle(time ?? cell));
            }
            const when = rowOf(app, 'Report free space').locator('.orva-last-result .orva-subtle');
            await expect(when).toBeVisible();
            expect((await when.boundingBox())?.height).toBeLessThan(25);
        });
    }

    test('the run that is opened from the list is seen with what it printed', async ({
        app,
        appliance,
    }) => {
        await appliance.script('Speak', 'seq 14; echo the last line');
        await runNow(app, 'Speak');
        await rowOf(app, 'Speak').locator('td[data-label="Last result"] a').tap();
        const output = app.getByRole('region', { name: 'Output' });
        await expect(output).toContainText('the last line');
        await expect(output).toBeInViewport({ ratio: 1 });
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
            await view.close?.(app);
        }
    }
});
