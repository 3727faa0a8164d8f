import type { Page } from '@playwright/test';

import { violations } from './support/axe';
import { expect, openNew, rowOf, runNow, tab, test } from './support/test';

async function signIn(page: Page, token: string): Promise<void> {
    await page.getByLabel('Access token').fill(token);
    await page.getByRole('button', { name: 'Sign in' }).click();
}

test('the token lets a person in, and nothing else does', async ({ page, appliance }) => {
    await page.goto(appliance.url);
    await page.getByRole('button', { name: 'Sign in' }).click();
    await expect(page.getByText('Enter the token.')).toBeVisible();
    await signIn(page, 'wrong');
    await expect(page.getByText('This token is not right.')).toBeVisible();
    await expect(page.getByLabel('Access token')).toBeFocused();
    await signIn(page, ` ${appliance.token}\n`);
    await expect(page.getByRole('heading', { name: 'Scheduled tasks' })).toBeVisible();

    await page.reload();
    await expect(page.getByRole('heading', { name: 'Scheduled tasks' })).toBeVisible();

    await page.getByRole('button', { name: 'Sign out' }).click();
    await expect(page.getByLabel('Access token')).toBeVisible();
    await page.reload();
    await expect(page.getByLabel('Access token')).toBeVisible();
});

test('a sign-in link works once and does not stay in the address', async ({ page, appliance }) => {
    const link = appliance.link();
    await page.goto(link);
    await expect(page.getByRole('heading', { name: 'Scheduled tasks' })).toBeVisible();
    expect(page.url()).not.toContain('code');
    await page.getByRole('button', { name: 'Sign out' }).click();
    await expect(page.getByLabel('Access token')).toBeVisible();

    await page.goto('about:blank');
    await page.goto(link);
    await expect(page.getByText('The sign-in link has been used')).toBeVisible();
});

test('a sign-in link works in a tab that shows the page already', async ({ page, appliance }) => {
    await page.goto(appliance.url);
    await expect(page.getByLabel('Access token')).toBeVisible();
    await page.goto(appliance.link());
    await expect(page.getByRole('heading', { name: 'Scheduled tasks' })).toBeVisible();
});

test('guessing is slowed down', async ({ page, appliance }) => {
    await page.goto(appliance.url);
    for (let guess = 0; guess < 5; guess += 1) {
        await signIn(page, `guess ${guess}`);
        await expect(page.getByRole('button', { name: 'Sign in' })).toBeEnabled();
    }
    await signIn(page, 'guess 6');
    await expect(page.getByText('Too many wrong attempts.')).toBeVisible();
    const wait = page.getByRole('timer');
    await expect(wait).toHaveText(/^Try again in \d\d seconds\.$/);
    expect(await violations(page)).toEqual([]);
    const seconds = async () => Number(/\d+/.exec(await wait.innerText())?.[0]);
    const first = await seconds();
    expect(first).toBeLessThanOrEqual(60);
    await expect(async () => expect(await seconds()).toBeLessThan(first - 1)).toPass();

    // A sign-in link is looked at no more than a token, and is not used up.
    const link = appliance.link();
    await page.goto('about:blank');
    await page.goto(link);
    await expect(wait).toHaveText(/^Try again in \d+ seconds?\.$/);
    await expect(page.getByText('has been used')).toHaveCount(0);
});

test.describe('by TLS', () => {
    test.use({ tls: true, ignoreHTTPSErrors: true });

    test('a person signs in, works and signs out, and the cookie is for TLS alone', async ({
        page,
        appliance,
    }) => {
        expect(appliance.url).toMatch(/^https:/);
        await page.goto(appliance.url);
        await signIn(page, appliance.token);
        await expect(page.getByRole('heading', { name: 'Scheduled tasks' })).toBeVisible();
        const cookies = await page.context().cookies();
        expect(cookies).toMatchObject([
            { name: 'orva_session', secure: true, httpOnly: true, sameSite: 'Strict', path: '/' },
        ]);

        await expect(await runNow(page, 'Report free space')).toContainText('Succeeded');
        await rowOf(page, 'Report free space').locator('td[data-label="Last result"] a').click();
        await expect(page.getByRole('region', { name: 'Output' })).toContainText('Filesystem');
        await page.getByRole('button', { name: 'Sign out' }).click();
        await expect(page.getByLabel('Access token')).toBeVisible();

        await page.goto(appliance.link());
        await expect(page.getByRole('heading', { name: 'Scheduled tasks' })).toBeVisible();
    });
});

test('signing out without a connection says that it did not work', async ({ app, appliance }) => {
    await app.route('**/session', (route) => route.abort());
    await app.getByRole('button', { name: 'Sign out' }).click();
    const messages = app.getByRole('list', { name: 'Messages' });
    await expect(messages).toContainText('You could not be signed out');
    await expect(messages).toContainText('The appliance cannot be reached.');
    await expect(rowOf(app, 'Lunch signal')).toBeVisible();
    // The list goes on following the appliance.
    await appliance.script('Meanwhile', 'true');
    await expect(rowOf(app, 'Meanwhile')).toBeVisible();

    await app.unroute('**/session');
    await app.getByRole('button', { name: 'Sign out' }).click();
    await expect(app.getByLabel('Access token')).toBeVisible();
    await expect(messages).not.toContainText('You could not be signed out');
    await app.reload();
    await expect(app.getByLabel('Access token')).toBeVisible();
});

test('signing in in another tab ends the question for the token here', async ({
    app,
    appliance,
}) => {
    await app.getByRole('link', { name: 'Lunch signal' }).click();
    const name = app.getByRole('textbox', { name: 'Name', exact: true });
    await name.fill('Typed before');
    await app.context().clearCookies();
    const dialog = app.getByRole('dialog', { name: 'Your session has ended' });
    await expect(dialog).toBeVisible();
    const other = await app.context().newPage();
    await other.goto(appliance.link());
    await expect(rowOf(other, 'Lunch signal')).toBeVisible();
    await other.close();
    await app.bringToFront();
    await app.evaluate(() => window.dispatchEvent(new Event('focus')));
    await expect(dialog).toHaveCount(0);
    await expect(name).toHaveValue('Typed before');
});

test('the title of the browser is in the language of the page before anybody signs in', async ({
    page,
    appliance,
}) => {
    await page.goto(appliance.url);
    await expect(page).toHaveTitle('Sign in · Scheduled tasks');
    await page.getByRole('button', { name: 'Language: English' }).click();
    await page.getByRole('menuitem', { name: 'Deutsch' }).click();
    await expect(page).toHaveTitle('Anmelden · Geplante Aufgaben');
});

test('when the session ends, what was typed stays', async ({ app, appliance }) => {
    await openNew(app, 'Script');
    await app.getByRole('textbox', { name: 'Name', exact: true }).fill('Half done');
    await tab(app, 'Settings');
    await app.getByLabel('Commands').fill('echo typed before');
    await app.context().clearCookies();
    const dialog = app.getByRole('dialog', { name: 'Your session has ended' });
    await expect(dialog).toBeVisible();
    expect(await violations(app)).toEqual([]);
    await dialog.getByLabel('Access token').fill(appliance.token);
    await dialog.getByRole('button', { name: 'Sign in' }).click();
    await expect(dialog).toHaveCount(0);
    await expect(app.getByLabel('Commands')).toHaveValue('echo typed before');
    await app.getByRole('button', { name: 'Create task' }).click();
    await expect(app.getByText('Half done is created')).toBeVisible();
});
