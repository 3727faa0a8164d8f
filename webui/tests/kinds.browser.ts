import type { Page } from '@playwright/test';

import { expect, openNew, pick, rowOf, runNow, tab, test } from './support/test';

test.use({ tasks: 'none' });

async function create(page: Page, name: string): Promise<void> {
    await tab(page, 'General');
    await page.getByRole('textbox', { name: 'Name', exact: true }).fill(name);
    await page.getByRole('button', { name: 'Create task' }).click();
    await expect(page.getByText(`${name} is created`)).toBeVisible();
    await expect(rowOf(page, name)).toBeVisible();
}

async function rename(page: Page, from: string, to: string): Promise<void> {
    await page.getByRole('link', { name: from, exact: true }).click();
    await page.getByRole('textbox', { name: 'Name', exact: true }).fill(to);
    await page.getByRole('button', { name: 'Save' }).click();
    await expect(rowOf(page, to)).toBeVisible();
}

/** Opens what the newest run printed. */
async function openOutput(page: Page, task: string): Promise<void> {
    await rowOf(page, task).locator('td[data-label="Last result"] a').click();
    await expect(page.getByRole('heading', { name: `History of ${task}` })).toBeVisible();
    await expect(page.getByRole('definition').first()).toBeVisible();
}

async function disableAndDelete(page: Page, task: string): Promise<void> {
    await page.getByRole('link', { name: 'Tasks', exact: true }).click();
    await page.getByRole('switch', { name: `Enable ${task}` }).click({ force: true });
    await expect(rowOf(page, task).locator('td[data-label="Next start"]')).toHaveText('–');
    await pick(page, task, 'Delete');
    const dialog = page.getByRole('dialog');
    await expect(dialog).toContainText(task);
    await dialog.getByRole('button', { name: 'Delete' }).click();
    await expect(page.getByRole('heading', { name: 'No tasks yet' })).toBeVisible();
}

test('a beep is made, changed, run, disabled and deleted', async ({ app, appliance }) => {
    await app.getByRole('link', { name: 'Beep' }).click();
    await tab(app, 'Settings');
    await app.getByLabel('Duration').fill('7');
    await create(app, 'Gong');
    await expect(rowOf(app, 'Gong')).toContainText('Beep for 7 seconds');
    const { data } = await appliance.call('get', { id: 1 });
    expect(data).toMatchObject({ type: 'beep', extra: { beep_duration: 7 } });

    await rename(app, 'Gong', 'Gong at noon');
    await runNow(app, 'Gong at noon');
    await openOutput(app, 'Gong at noon');
    await disableAndDelete(app, 'Gong at noon');
});

test('a script is made, changed, run, its output read, disabled and deleted', async ({
    app,
    appliance,
}) => {
    await app.getByRole('link', { name: 'Script' }).click();
    await tab(app, 'Settings');
    await app.getByLabel('Commands').fill('echo "hello $((6 * 7))"\necho second line >&2');
    await tab(app, 'Schedule');
    await app.getByRole('button', { name: 'Monday to Friday' }).click();
    await app.getByLabel('Time').fill('06:30');
    await create(app, 'Greet');
    const { data } = await appliance.call('get', { id: 1 });
    expect(data).toMatchObject({
        type: 'script',
        schedule: { week_day: '1,2,3,4,5', hour: 6, minute: 30, interval_min: 0 },
        extra: { script: 'echo "hello $((6 * 7))"\necho second line >&2' },
    });

    await rename(app, 'Greet', 'Greet all');
    await expect(await runNow(app, 'Greet all')).toContainText('Succeeded');
    await openOutput(app, 'Greet all');
    await expect(app.getByRole('region', { name: 'Output' })).toHaveText(
        'hello 42\nsecond line\n',
        { useInnerText: false },
    );
    await disableAndDelete(app, 'Greet all');
});

test('a recycle-bin task is previewed, made, changed, run and deleted', async ({
    app,
    appliance,
}) => {
    await app.getByRole('link', { name: 'Recycle bins' }).click();
    await tab(app, 'Settings');
    await app.getByLabel('Only these shares').check();
    await app.getByLabel('documents').check();
    await app.getByLabel('public').check();
    await app.getByLabel('Switch on the bins').check();
    await app.getByLabel('By size').check();
    // 0 would empty the bins: it is neither previewed nor saved.
    const notYet = app.getByText('Correct what is marked above first.');
    await app.getByLabel('Each bin may hold').fill('0');
    await app.getByLabel('Each bin may hold').blur();
    await expect(app.getByText('Enter a whole number from 1 to 4095.')).toBeVisible();
    await expect(notYet).toBeVisible();
    await expect(app.getByRole('button', { name: 'Show what would go' })).toBeDisabled();
    await app.getByLabel('Each bin may hold').fill('1');
    await expect(notYet).toHaveCount(0);
    await app.getByLabel('Remove first').selectOption('The largest files');
    await app.getByLabel('Files with certain extensions').check();
    await expect(notYet).toBeVisible();
    await app.getByLabel(/^Extensions/).fill('.pdf, docx');
    await expect(notYet).toHaveCount(0);
    await app.getByLabel('By age').check();
    await app.getByLabel('In the bin for more than').fill('0');
    await expect(notYet).toBeVisible();
    await app.getByLabel('In the bin for more than').fill('1');
    await app.getByRole('button', { name: 'Show what would go' }).click();
    await expect(app.getByText('0 files would be removed')).toBeVisible();
    await app.getByLabel('Everything').check();
    await app.getByRole('button', { name: 'Show what would go' }).click();
    await app.getByRole('button', { name: /would stay/ }).click();
    await expect(app.getByRole('grid', { name: /would stay/ })).toContainText('of its extension');

    await create(app, 'Clean up');
    const { data } = await appliance.call('get', { id: 1 });
    expect(data).toMatchObject({
        type: 'recycle',
        action: 'Empty recycle bins: "documents" "public"',
        extra: {
            clean_share_policy: { clean_all: false, shares: ['documents', 'public'] },
            clean_file_policy: {
                policy: 'clean_all',
                reserve_policy: {
                    extension_check: true,
                    extension: [{ file_ext: 'pdf' }, { file_ext: 'docx' }],
                },
            },
        },
    });
    const { data: shares } = await appliance.call('shares', {}, 'Appliance');
    expect(shares).toMatchObject({
        shares: [{ name: 'documents' }, { name: 'home', recycle: false }, {}, { recycle: true }],
    });

    await rename(app, 'Clean up', 'Clean up bins');
    await expect(await runNow(app, 'Clean up bins')).toContainText('Succeeded');
    await openOutput(app, 'Clean up bins');
    await expect(app.getByRole('region', { name: 'Output' })).toContainText('documents: removed');
    await disableAndDelete(app, 'Clean up bins');
});

test('a service task is made, changed, run and deleted', async ({ app, appliance }) => {
    await app.getByRole('link', { name: 'Services' }).click();
    await tab(app, 'Settings');
    await app.getByLabel('Start', { exact: true }).check();
    await app.getByLabel('Find a service').fill('windows');
    await expect(app.getByRole('checkbox')).toHaveCount(1);
    await app.getByLabel('Windows file service').check();
    await app.getByLabel('Find a service').press('Enter');
    await expect(app.getByText('Enter a name.')).toHaveCount(0);
    await app.getByLabel('Find a service').fill('');
    await app.getByLabel('Note Server').check();
    await expect(app.getByText('2 chosen')).toBeVisible();
    await create(app, 'Morning');
    const { data } = await appliance.call('get', { id: 1 });
    const { services, action } = (data as { extra: { services: { enable: boolean }[]; action: string } }).extra;
    expect(action).toBe('start');
    expect(services.filter(({ enable }) => enable)).toMatchObject([
        { id: 'Samba', type: 'service' },
        { id: 'note-server', type: 'package' },
    ]);

    await rename(app, 'Morning', 'Good morning');
    await runNow(app, 'Good morning');
    await openOutput(app, 'Good morning');
    await disableAndDelete(app, 'Good morning');
});

test('a task that starts again and again on a date is shown in words before it is saved', async ({
    app,
}) => {
    await openNewFromEmpty(app);
    await tab(app, 'Schedule');
    await app.getByLabel('On a date').check();
    await app.getByLabel(/^Date/).fill('2027-03-28');
    await app.getByLabel('Repeat').selectOption('Every month');
    await app.getByLabel('Time').fill('02:30');
    await expect(app.getByText('Every month from March 28, 2027 on, at 2:30 AM')).toBeVisible();
    const starts = app.getByRole('list', { name: 'Next starts' }).getByRole('listitem');
    await expect(starts).toHaveCount(10);
    await expect(starts.first()).toContainText('Sun, Mar 28, 2027');
    await expect(starts.first()).toContainText('Moved by a clock change');
    await expect(starts.nth(1)).toHaveText('Wed, Apr 28, 2027, 2:30 AM');

    // The hour that comes twice has starts in both passes.
    await app.getByLabel(/^Date/).fill('2027-10-31');
    await app.getByLabel('Start again during the day').check();
    for (const pass of ['first', 'second']) {
        const note = `The clock shows this time twice: the ${pass}`;
        await expect(starts.getByText(note, { exact: true })).toHaveCount(1);
    }

    await app.getByLabel(/^Every\b/).fill('20');
    await app.getByLabel('Unit').selectOption('minutes');
    await app.getByLabel('Last start of the day').fill('02:00');
    await app.getByLabel('Last start of the day').blur();
    await expect(app.getByText('The last start is before the first.')).toBeVisible();
    await app.getByLabel('Last start of the day').fill('03:30');
    await expect(app.getByText('every 20 minutes from 2:30 AM to 3:30 AM')).toBeVisible();
});

async function openNewFromEmpty(page: Page): Promise<void> {
    await page.getByRole('link', { name: 'Beep' }).click();
    await expect(page.getByRole('textbox', { name: 'Name', exact: true })).toBeVisible();
}

test('every kind is offered from the list too', async ({ app, appliance }) => {
    await appliance.script('First', 'true');
    for (const kind of ['Beep', 'Script', 'Recycle bins', 'Services']) {
        await openNew(app, kind);
        await expect(app.getByRole('heading', { name: `New task: ${kind}` })).toBeVisible();
        await app.getByRole('button', { name: 'Cancel' }).click();
    }
});
