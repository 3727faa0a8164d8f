import { writeFileSync } from 'node:fs';
import { join } from 'node:path';

import type { Page } from '@playwright/test';

import { expect, rowOf, test } from './support/test';

/** Goes on with the tab key until the element with this name has the focus. */
async function tabTo(
    page: Page,
    role: 'button' | 'textbox' | 'tab' | 'switch',
    name: string,
    key = 'Tab',
): Promise<void> {
    const target = page.getByRole(role, { name, exact: true });
    for (let step = 0; step < 60; step += 1) {
        await page.keyboard.press(key);
        if (await target.evaluate((element) => element === document.activeElement)) {
            return;
        }
    }
    throw new Error(`the tab key does not reach ${role} ${name}`);
}

/** From the button of a row's menu. */
async function chooseDelete(page: Page): Promise<void> {
    await page.keyboard.press('Enter');
    await expect(page.getByRole('menuitem', { name: 'Run now' })).toBeFocused();
    await page.keyboard.press('ArrowUp');
    await expect(page.getByRole('menuitem', { name: 'Delete' })).toBeFocused();
    await page.keyboard.press('Enter');
}

test('a task is made, switched and deleted with nothing but the keyboard', async ({ app }) => {
    await tabTo(app, 'button', 'New task');
    await app.keyboard.press('Enter');
    await expect(app.getByRole('menuitem', { name: /^Beep/ })).toBeFocused();
    await app.keyboard.press('Enter');
    await expect(app.getByRole('heading', { name: 'New task: Beep' })).toBeFocused();

    await tabTo(app, 'textbox', 'Name');
    await app.keyboard.type('By keys');
    await tabTo(app, 'tab', 'Settings', 'Shift+Tab');
    await app.keyboard.press('Enter');
    await tabTo(app, 'textbox', 'Duration');
    await app.keyboard.press('Control+A');
    await app.keyboard.type('3');
    // Enter in a field saves.
    await app.keyboard.press('Enter');
    await expect(rowOf(app, 'By keys')).toContainText('Beep for 3 seconds');
    await expect(app.getByRole('heading', { name: 'Scheduled tasks' })).toBeFocused();

    await tabTo(app, 'switch', 'Enable By keys');
    await app.keyboard.press('Space');
    await expect(rowOf(app, 'By keys').getByRole('switch')).not.toBeChecked();
    await expect(rowOf(app, 'By keys').getByRole('switch')).toBeFocused();

    await tabTo(app, 'button', 'Actions for By keys');
    await chooseDelete(app);
    const dialog = app.getByRole('dialog');
    await expect(dialog).toBeVisible();
    await app.keyboard.press('Escape');
    await expect(dialog).toHaveCount(0);
    await expect(app.getByRole('button', { name: 'Actions for By keys' })).toBeFocused();
    await chooseDelete(app);
    await tabTo(app, 'button', 'Delete');
    await app.keyboard.press('Enter');
    await expect(rowOf(app, 'By keys')).toHaveCount(0);
    await expect(app.getByRole('button', { name: 'Selected tasks' })).toBeDisabled();
    await expect(app.locator('#main')).toBeFocused();
});

test('the first stop of the tab key skips to the content', async ({ app }) => {
    await app.keyboard.press('Tab');
    await expect(app.getByRole('link', { name: 'Skip to content' })).toBeFocused();
    await app.keyboard.press('Enter');
    await expect(app.locator('#main')).toBeFocused();
    expect(app.url()).toContain('#/tasks');
});

test('the focus goes along to the view that is opened', async ({ app }) => {
    await expect(app.getByRole('heading', { name: 'Scheduled tasks' })).not.toBeFocused();
    await app.getByRole('link', { name: 'Lunch signal' }).press('Enter');
    await expect(app.getByRole('heading', { name: 'Edit Lunch signal' })).toBeFocused();
    await app.evaluate(() => history.back());
    await expect(app.getByRole('heading', { name: 'Scheduled tasks' })).toBeFocused();
    await app.getByRole('link', { name: 'History' }).press('Enter');
    await expect(app.getByRole('heading', { name: 'History' })).toBeFocused();
});

test.describe('where one run goes on at a time', () => {
    test.use({ tasks: 'none', settings: 'schedmaxruns="1"\n' });

    test('the focus stays with a run that is stopped, or that ends by itself', async ({
        app,
        appliance,
    }) => {
        await appliance.script('First', 'until [ -e "$ORVA_ROOT/go" ]; do sleep 0.1; done');
        await appliance.script('Second', 'echo never');
        await appliance.call('run', { task: [1, 2] });
        await app.getByRole('link', { name: 'History' }).press('Enter');
        await expect(app.locator('td[data-label="Result"]')).toHaveText(['Waiting', 'Running']);
        const stop = (name: string) => app.getByRole('button', { name: `Stop ${name}` });
        const toggle = (run: number) => app.getByRole('button', { name: `Output of run ${run}` });

        await stop('Second').press('Enter');
        await expect(app.getByRole('dialog', { name: 'Stop Second?' })).toBeVisible();
        await app.keyboard.press('Escape');
        await expect(stop('Second')).toBeFocused();
        await stop('Second').press('Enter');
        await app.getByRole('dialog').getByRole('button', { name: 'Stop' }).press('Enter');
        await expect(app.getByText('Second will not start')).toBeVisible();
        await expect(stop('Second')).toHaveCount(0);
        await expect(toggle(2)).toBeFocused();

        await stop('First').focus();
        writeFileSync(join(appliance.root, 'go'), '');
        await expect(stop('First')).toHaveCount(0);
        await expect(toggle(1)).toBeFocused();

        await app.getByRole('button', { name: 'First', exact: true }).press('Enter');
        await expect(app.getByRole('heading', { name: 'History of First' })).toBeFocused();
    });
});
