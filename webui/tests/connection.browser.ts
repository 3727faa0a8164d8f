import type { Page } from '@playwright/test';

import { violations } from './support/axe';
import { expect, openNew, pick, rowOf, tab, test } from './support/test';

/** When the page asked the appliance for something, in milliseconds by the browser's clock. */
function askedAt(page: Page): number[] {
    const times: number[] = [];
    page.on('requestfinished', (request) => {
        if (request.url().includes('/webapi/')) {
            times.push(request.timing().startTime);
        }
    });
    return times;
}

test('a lost connection is told, costs nothing that was typed, and comes back', async ({
    app,
    appliance,
}) => {
    await openNew(app, 'Script');
    await app.getByRole('textbox', { name: 'Name', exact: true }).fill('Written through');
    await tab(app, 'Settings');
    await app.getByLabel('Commands').fill('echo still here');
    await appliance.stopServer();
    await expect(app.getByText('No connection to the appliance')).toBeVisible();
    expect(await violations(app)).toEqual([]);
    await app.getByRole('button', { name: 'Create task' }).click();
    await expect(app.getByText('The appliance cannot be reached.')).toBeVisible();
    await expect(app.getByLabel('Commands')).toHaveValue('echo still here');

    await appliance.startServer();
    // A server that was started anew knows no sessions.
    const dialog = app.getByRole('dialog', { name: 'Your session has ended' });
    await expect(dialog).toBeVisible();
    await expect(app.getByText('No connection to the appliance')).toHaveCount(0);
    await dialog.getByLabel('Access token').fill(appliance.token);
    await dialog.getByRole('button', { name: 'Sign in' }).click();
    await expect(dialog).toHaveCount(0);
    await expect(app.getByText('No connection to the appliance')).toHaveCount(0);
    await app.getByRole('button', { name: 'Create task' }).click();
    await expect(rowOf(app, 'Written through')).toBeVisible();
});

test('what changed while the connection was lost is shown when it is back', async ({
    app,
    appliance,
}) => {
    await app.route('**/webapi/**', (route) => route.abort());
    await expect(app.getByText('No connection to the appliance')).toBeVisible();
    await appliance.script('Meanwhile', 'true');
    await app.unroute('**/webapi/**');
    await expect(rowOf(app, 'Meanwhile')).toBeVisible();
    await expect(app.getByText('No connection to the appliance')).toHaveCount(0);
});

test('a scheduler that does not run is told, and why nothing starts', async ({
    app,
    appliance,
}) => {
    await appliance.stopScheduler();
    await app.reload();
    await expect(app.getByText('The scheduler is not running')).toBeVisible();
    await pick(app, 'Report free space', 'Run now');
    const dialog = app.getByRole('dialog');
    await expect(dialog).toContainText('The scheduler is not running');
    await dialog.getByRole('button', { name: 'Run now' }).click();
    await expect(dialog).toContainText('(code 4803)');
});

test('a scheduler that stops is told within four seconds, and so is its return', async ({
    app,
    appliance,
}) => {
    const notice = app.getByText('The scheduler is not running');
    let asked = 0;
    app.on('request', (request) => {
        asked += request.url().includes('/revision') ? 1 : 0;
    });
    await app.waitForRequest(/revision/);
    await expect(notice).toHaveCount(0);
    await appliance.stopScheduler();
    asked = 0;
    await expect(notice).toBeVisible();
    expect(asked).toBeLessThanOrEqual(2);
    expect(await violations(app)).toEqual([]);
    await appliance.startScheduler();
    asked = 0;
    await expect(notice).toHaveCount(0);
    expect(asked).toBeLessThanOrEqual(2);
});

/** The browser says that the page is hidden, or seen again; gives when, by its clock. */
async function hide(page: Page, hidden: boolean): Promise<number> {
    return page.evaluate((now) => {
        Object.defineProperty(document, 'hidden', { configurable: true, get: () => now });
        document.dispatchEvent(new Event('visibilitychange'));
        return performance.timeOrigin + performance.now();
    }, hidden);
}

test('a hidden page asks nothing, even while it shows what a running task prints', async ({
    app,
    appliance,
}) => {
    await appliance.script('Count up', 'for i in $(seq 1000); do echo line $i; sleep 0.2; done');
    await pick(app, 'Count up', 'Run now');
    await app.getByRole('dialog').getByRole('button', { name: 'Run now' }).click();
    await rowOf(app, 'Count up').locator('td[data-label="Last result"] a').click();
    const output = app.getByRole('region', { name: 'Output' });
    await expect(output).toContainText('line 2');

    const times = askedAt(app);
    const hidden = await hide(app, true);
    await app.evaluate(() => new Promise((resolve) => setTimeout(resolve, 6000)));
    expect(times.filter((time) => time > hidden + 10)).toEqual([]);
    const before = (await output.innerText()).length;
    await hide(app, false);
    await expect(async () =>
        expect((await output.innerText()).length).toBeGreaterThan(before),
    ).toPass();
});

test('an idle page asks once in two seconds, a hidden one not at all', async ({ app }) => {
    await expect(rowOf(app, 'Lunch signal')).toContainText('Never ran');
    await app.waitForRequest(/revision/);
    const times = askedAt(app);
    await expect(() => expect(times.length).toBeGreaterThanOrEqual(5)).toPass({ timeout: 30_000 });
    const gaps = times.slice(1).map((time, index) => time - (times[index] ?? 0));
    // Timers may be early by a millisecond.
    expect(Math.min(...gaps)).toBeGreaterThan(1990);

    const hidden = await hide(app, true);
    await app.evaluate(() => new Promise((resolve) => setTimeout(resolve, 6000)));
    expect(times.filter((time) => time > hidden + 10)).toEqual([]);

    const asked = app.waitForRequest(/revision/);
    await hide(app, false);
    await asked;
});
