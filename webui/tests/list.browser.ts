import { expect, names, pick, rowOf, test } from './support/test';

const BY_NAME = [
    'Back up documents',
    'Count documents',
    'Empty old bins',
    'File services off at night',
    'Lunch signal',
    'Rebuild the photo index',
    'Report free space',
    'Switch off on Fridays',
];

test('the list says what there is to know', async ({ app }) => {
    const row = rowOf(app, 'Lunch signal');
    await expect(row.locator('td[data-label="Kind"]')).toHaveText('Beep');
    await expect(row.locator('td[data-label="Action"]')).toHaveText('Beep for 2 seconds');
    // A long one is cut, and can be read in full.
    await expect(row.getByTitle('Beep for 2 seconds', { exact: true })).toBeVisible();
    await expect(row.locator('td[data-label="Next start"]')).toContainText('12:00 PM');
    await expect(row.locator('td[data-label="Last result"]')).toHaveText('Never ran');
    await expect(rowOf(app, 'Rebuild the photo index')).toContainText('Photo index');
    await expect(rowOf(app, 'Switch off on Fridays')).toContainText('–');
});

test('every column that can be sorted sorts both ways', async ({ app, appliance }) => {
    const columns = [
        ['Enabled', 'enable'],
        ['No.', 'id'],
        ['Name', 'name'],
        ['Kind', 'type'],
        ['Action', 'action'],
        ['Next start', 'next_trigger_time'],
    ] as const;
    for (const [title, key] of columns) {
        const header = app.getByRole('columnheader', { name: title, exact: true });
        for (const direction of ['asc', 'desc']) {
            const wanted = direction === 'asc' ? 'ascending' : 'descending';
            // The list begins sorted by the next start.
            if ((await header.getAttribute('aria-sort')) !== wanted) {
                await header.getByRole('button').click();
            }
            await expect(header).toHaveAttribute('aria-sort', wanted);
            const { data } = await appliance.call('list', {
                sort_by: key,
                sort_direction: direction,
            });
            const tasks = (data as { tasks: { name: string }[] }).tasks;
            await expect(async () =>
                expect(await names(app)).toEqual(tasks.map(({ name }) => name)),
            ).toPass();
        }
    }
});

test('pages hold as many tasks as asked for, and the address remembers them', async ({
    app,
    appliance,
}) => {
    for (let count = 1; count <= 30; count += 1) {
        await appliance.script(`Job ${String(count).padStart(2, '0')}`, 'true');
    }
    await app.getByRole('columnheader', { name: 'No.' }).getByRole('button').click();
    await app.getByRole('button', { name: '1 - 38 of 38' }).last().click();
    await app.getByRole('menuitem', { name: '20 per page' }).click();
    await expect(async () => expect(await names(app)).toHaveLength(20)).toPass();
    await app.getByRole('button', { name: 'Next page' }).last().click();
    await expect(async () => expect((await names(app))[0]).toBe('Job 13')).toPass();
    await app.reload();
    await expect(async () => expect((await names(app))[0]).toBe('Job 13')).toPass();
    await expect(app.getByText('21 - 38 of 38').last()).toBeVisible();
});

test('a filter finds by words of the name and by kind', async ({ app }) => {
    const search = app.getByRole('textbox', { name: 'Find' });
    await search.fill('documents');
    await expect(async () =>
        expect((await names(app)).toSorted()).toEqual([
            'Back up documents',
            'Count documents',
            'Empty old bins',
        ]),
    ).toPass();
    await app.getByRole('button', { name: 'Kind: All kinds' }).click();
    await app.getByRole('menuitem', { name: 'Script' }).click();
    await expect(async () => expect(await names(app)).toEqual(['Count documents'])).toPass();
    await search.fill('nothing like this');
    await expect(app.getByRole('heading', { name: 'No task matches' })).toBeVisible();
    await app.getByRole('button', { name: 'Clear filter' }).last().click();
    await expect(async () => expect((await names(app)).toSorted()).toEqual(BY_NAME)).toPass();
});

test('typing in the filter reads the list once', async ({ app }) => {
    const lists: string[] = [];
    app.on('request', (request) => {
        if (request.url().includes('/list')) {
            lists.push(request.postData() ?? '');
        }
    });
    await app.getByRole('textbox', { name: 'Find' }).pressSequentially('documents');
    await expect(async () => expect(await names(app)).toHaveLength(3)).toPass();
    expect(lists).toEqual(['{"sort_by":"next_trigger_time","sort_direction":"asc"}']);
});

test('several tasks are changed together after a question that names them', async ({
    app,
    appliance,
}) => {
    await app.getByRole('checkbox', { name: 'Select Lunch signal' }).check();
    await app.getByRole('checkbox', { name: 'Select Report free space' }).check();
    await expect(app.getByText('2 selected')).toBeVisible();
    await app.getByRole('button', { name: 'Selected tasks' }).click();
    await app.getByRole('menuitem', { name: 'Disable' }).click();
    const dialog = app.getByRole('dialog');
    await expect(dialog.getByRole('listitem')).toHaveText(['Report free space', 'Lunch signal']);
    await dialog.getByRole('button', { name: 'Disable' }).click();
    await expect(rowOf(app, 'Lunch signal').getByRole('switch')).not.toBeChecked();
    await expect(rowOf(app, 'Report free space').getByRole('switch')).not.toBeChecked();

    await app.getByRole('button', { name: 'Selected tasks' }).click();
    await app.getByRole('menuitem', { name: 'Disable' }).click();
    await expect(app.getByText('The selected tasks are so already.')).toBeVisible();
    await app.getByRole('button', { name: 'Selected tasks' }).click();
    await app.getByRole('menuitem', { name: 'Enable' }).click();
    await dialog.getByRole('button', { name: 'Enable' }).click();
    await expect(rowOf(app, 'Lunch signal').getByRole('switch')).toBeChecked();

    await app.getByRole('button', { name: 'Selected tasks' }).click();
    await app.getByRole('menuitem', { name: 'Delete' }).click();
    await expect(dialog.getByRole('listitem')).toHaveText(['Report free space', 'Lunch signal']);
    await dialog.getByRole('button', { name: 'Cancel' }).click();
    await expect(app.getByText('2 selected')).toBeVisible();
    await app.getByRole('button', { name: 'Selected tasks' }).click();
    await app.getByRole('menuitem', { name: 'Delete' }).click();
    await dialog.getByRole('button', { name: 'Delete' }).click();
    await expect(app.getByText('2 tasks are deleted')).toBeVisible();
    await expect(rowOf(app, 'Lunch signal')).toHaveCount(0);
    await expect(rowOf(app, 'Report free space')).toHaveCount(0);
    await expect(app.getByRole('button', { name: 'Selected tasks' })).toBeDisabled();
    const { data } = await appliance.call('list', {});
    expect(data).toMatchObject({ total: 6 });
});

test('several tasks are run together after a question that names them', async ({ app }) => {
    await app.getByRole('checkbox', { name: 'Select Count documents' }).check();
    await app.getByRole('checkbox', { name: 'Select Report free space' }).check();
    await app.getByRole('checkbox', { name: 'Select Switch off on Fridays' }).check();
    await app.getByRole('button', { name: 'Selected tasks' }).click();
    await app.getByRole('menuitem', { name: 'Run now' }).click();
    const dialog = app.getByRole('dialog', { name: 'Run these 2 tasks now?' });
    await expect(
        dialog.getByRole('list', { name: 'Run these 2 tasks now?' }).getByRole('listitem'),
    ).toHaveText(['Report free space', 'Count documents']);
    await expect(dialog.getByRole('list', { name: 'Left out' })).toHaveText(
        'Switch off on Fridays',
    );
    await dialog.getByRole('button', { name: 'Run now' }).click();
    await expect(app.getByText('2 tasks are started')).toBeVisible();
    const result = (name: string) => rowOf(app, name).locator('td[data-label="Last result"]');
    await expect(result('Count documents')).toContainText('Succeeded');
    await expect(result('Report free space')).toContainText('Succeeded');
    await expect(result('Switch off on Fridays')).toHaveText('Never ran');
});

test('what may not be done is left out, with the reason', async ({ app }) => {
    await app.getByRole('button', { name: 'Select tasks' }).click();
    await app.getByRole('menuitem', { name: 'Select all (8 tasks)' }).click();
    await expect(app.getByText('8 selected')).toBeVisible();
    await app.getByRole('button', { name: 'Selected tasks' }).click();
    await app.getByRole('menuitem', { name: 'Delete' }).click();
    const dialog = app.getByRole('dialog');
    await expect(dialog).toContainText('may not be deleted');
    await expect(dialog.getByRole('list', { name: 'Left out' })).toContainText(
        'Back up documents',
    );
    await dialog.getByRole('button', { name: 'Cancel' }).click();

    await app.getByRole('button', { name: 'Actions for Switch off on Fridays' }).click();
    await expect(app.getByRole('menuitem', { name: 'Run now' })).toHaveAttribute(
        'aria-disabled',
        'true',
    );
    await expect(app.getByText('This task may not be started from here.')).toBeVisible();
});

test('the change of another client appears and disturbs nothing', async ({ app, appliance }) => {
    await app.getByRole('checkbox', { name: 'Select Lunch signal' }).check();
    const search = app.getByRole('textbox', { name: 'Find' });
    await search.focus();
    await appliance.script('From elsewhere', 'true', { schedule: { hour: 0, minute: 1 } });
    await appliance.call('set_enable', { status: [{ id: 2, enable: false }] });
    let asked = 0;
    app.on('request', (request) => {
        asked += request.url().includes('/revision') ? 1 : 0;
    });
    await expect(rowOf(app, 'From elsewhere')).toBeVisible();
    // It asks every two seconds; the second answer is there within four.
    expect(asked).toBeLessThanOrEqual(2);
    await expect(rowOf(app, 'Report free space').getByRole('switch')).not.toBeChecked();
    await expect(search).toBeFocused();
    await expect(app.getByRole('checkbox', { name: 'Select Lunch signal' })).toBeChecked();
    await expect(app.getByText('1 selected')).toBeVisible();

    // A row that moves keeps the focus that is in it.
    const own = rowOf(app, 'Lunch signal').getByRole('switch');
    await own.focus();
    await appliance.call('set_enable', { status: [{ id: 6, enable: false }] });
    await expect(rowOf(app, 'Back up documents').getByRole('switch')).not.toBeChecked();
    await expect(own).toBeFocused();

    // Nor does a menu that is open close.
    await app.getByRole('button', { name: 'Actions for Lunch signal' }).click();
    await appliance.call('delete', { task: 3 });
    await expect(rowOf(app, 'Count documents')).toHaveCount(0);
    await expect(app.getByRole('menuitem', { name: 'Run now' })).toBeVisible();
});

test('a task that somebody else deleted is told about', async ({ app, appliance }) => {
    await app.route('**/revision*', (route) => route.abort());
    await expect(app.getByText('No connection to the appliance')).toBeVisible();
    await appliance.call('delete', { task: 1 });
    await pick(app, 'Lunch signal', 'Run now');
    const dialog = app.getByRole('dialog');
    await dialog.getByRole('button', { name: 'Run now' }).click();
    await expect(dialog).toContainText('Failed to run task (code 4803)');
});
