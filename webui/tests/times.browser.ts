import type { Page } from '@playwright/test';

import { expect, openNew, tab, test } from './support/test';

async function speak(page: Page, from: string, to: string): Promise<void> {
    await page.getByRole('button', { name: from }).click();
    await page.getByRole('menuitem', { name: to }).click();
}

// The browser counts hours as its own language does, whatever the page speaks.
for (const [locale, where] of [
    ['en-US', 'an American browser'],
    ['de-DE', 'a German browser'],
] as const) {
    test.describe(`in ${where}`, () => {
        test.use({ locale });

        test('a time is shown and typed as the page speaks', async ({ page, appliance }) => {
            await page.addInitScript(() => {
                if (!localStorage.getItem('orva.language')) {
                    localStorage.setItem('orva.language', 'en');
                }
            });
            await page.goto(appliance.link());
            await openNew(page, 'Beep');
            await tab(page, 'Schedule');
            const time = page.locator('#field-schedule-time');
            const words = page.locator('.orva-words');
            await expect(time).toHaveValue(/^12:00\sAM$/);
            await time.fill('6:45 pm');
            await expect(words).toHaveText(/at 6:45\sPM$/);
            await expect(time).toHaveValue('6:45 pm');
            await time.blur();
            await expect(time).toHaveValue(/^6:45\sPM$/);
            await expect(page.getByText(/For example 6:30\sPM or 18:30/)).toBeVisible();

            await speak(page, 'Language: English', 'Deutsch');
            await expect(time).toHaveValue('18:45');
            await expect(words).toHaveText('Täglich, um 18:45');
            await time.fill('7.15');
            await time.blur();
            await expect(time).toHaveValue('07:15');
            await expect(words).toHaveText('Täglich, um 07:15');

            await speak(page, 'Sprache: Deutsch', '日本語');
            await expect(time).toHaveValue('7:15');
            await time.fill('２１：０５');
            await time.blur();
            await expect(time).toHaveValue('21:05');
            await expect(words).toHaveText('毎日、21:05');
        });
    });
}

test('what is no time stays as it was typed, with its problem, and comes to no harm elsewhere', async ({
    app,
    appliance,
}) => {
    await app.getByRole('link', { name: 'Report free space' }).click();
    await tab(app, 'Schedule');
    const time = app.getByLabel('Time');
    await expect(time).toHaveValue(/^6:30\sAM$/);
    await time.fill('25:00');
    await time.blur();
    await expect(app.getByText('Enter a time.')).toBeVisible();
    await tab(app, 'General');
    await tab(app, 'Schedule');
    await expect(time).toHaveValue('25:00');
    await app.getByRole('button', { name: 'Save' }).click();
    await expect(time).toBeFocused();
    await time.fill('1405');
    await app.getByRole('button', { name: 'Save' }).click();
    await expect(app.getByText('Report free space is saved')).toBeVisible();
    const { data } = await appliance.call('get', { id: 2 });
    expect(data).toMatchObject({ schedule: { hour: 14, minute: 5 } });
});

test('a date is written out in the language of the page', async ({ app }) => {
    await openNew(app, 'Beep');
    await tab(app, 'Schedule');
    await app.getByLabel('On a date').check();
    await app.getByLabel(/^Date/).fill('2027-03-04');
    await expect(app.getByText('Thursday, March 4, 2027')).toBeVisible();
    await speak(app, 'Language: English', 'Deutsch');
    await expect(app.getByText('Donnerstag, 4. März 2027')).toBeVisible();
    await speak(app, 'Sprache: Deutsch', '日本語');
    await expect(app.getByText('2027年3月4日木曜日')).toBeVisible();
});
