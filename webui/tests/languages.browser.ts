import { expect, rowOf, test } from './support/test';

test('the page speaks the language that is chosen, at once and from then on', async ({ app }) => {
    await app.getByRole('button', { name: 'Language: English' }).click();
    await app.getByRole('menuitem', { name: 'Deutsch' }).click();
    await expect(app.getByRole('heading', { name: 'Geplante Aufgaben' })).toBeVisible();
    await expect(app.locator('html')).toHaveAttribute('lang', 'de');
    await expect(rowOf(app, 'Lunch signal')).toContainText('Signalton');
    // What the appliance says itself comes in that language too.
    await expect(rowOf(app, 'Back up documents')).toContainText('Lokale Sicherung');
    await app.getByRole('button', { name: 'Aktionen für Lunch signal' }).click();
    await app.getByRole('menuitem', { name: 'Löschen' }).click();
    await expect(app.getByRole('dialog').getByRole('heading')).toHaveText(
        'Warnung:Diese Aufgabe löschen?',
    );
    await app.keyboard.press('Escape');

    await app.getByRole('button', { name: 'Sprache: Deutsch' }).click();
    await app.getByRole('menuitem', { name: '日本語' }).click();
    await expect(app.getByRole('heading', { name: 'スケジュールタスク' })).toBeVisible();
    await app.reload();
    await expect(app.getByRole('heading', { name: 'スケジュールタスク' })).toBeVisible();
    await app.getByRole('link', { name: 'File services off at night' }).click();
    await app.getByRole('tab', { name: 'スケジュール' }).click();
    await expect(app.getByText('毎日、23:00')).toBeVisible();
    await app.getByRole('tab', { name: '設定' }).click();
    await expect(app.getByRole('checkbox', { name: 'NFS' })).toBeVisible();
});

test.describe('a German browser', () => {
    test.use({ locale: 'de-DE' });

    test('is spoken to in German', async ({ page, appliance }) => {
        await page.goto(appliance.url);
        await expect(page.getByRole('heading', { name: 'Anmelden' })).toBeVisible();
    });
});
