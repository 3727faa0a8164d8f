import type { Page } from '@playwright/test';

import { expect, openNew, tab, test } from './support/test';

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
});

test('when the session ends, what was typed stays', async ({ app, appliance }) => {
    await openNew(app, 'Script');
    await app.getByRole('textbox', { name: 'Name', exact: true }).fill('Half done');
    await tab(app, 'Settings');
    await app.getByLabel('Commands').fill('echo typed before');
    await app.context().clearCookies();
    const dialog = app.getByRole('dialog', { name: 'Your session has ended' });
    await expect(dialog).toBeVisible();
    await dialog.getByLabel('Access token').fill(appliance.token);
    await dialog.getByRole('button', { name: 'Sign in' }).click();
    await expect(dialog).toHaveCount(0);
    await expect(app.getByLabel('Commands')).toHaveValue('echo typed before');
    await app.getByRole('button', { name: 'Create task' }).click();
    await expect(app.getByText('Half done is created')).toBeVisible();
});
