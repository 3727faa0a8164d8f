import { expect, openNew, pick, rowOf, tab, test } from './support/test';

test('what is missing is told at its field, and the first one gets the focus', async ({ app }) => {
    await openNew(app, 'Recycle bins');
    await tab(app, 'Settings');
    await app.getByLabel('Only these shares').check();
    await app.getByLabel('By size').check();
    await app.getByLabel('Each bin may hold').fill('4096');
    await tab(app, 'Schedule');
    await app.getByRole('button', { name: 'Mon', exact: true }).click();
    await app.getByRole('button', { name: 'Create task' }).click();
    await expect(app.getByText('Enter a name.')).toBeVisible();
    await expect(app.getByRole('textbox', { name: 'Name', exact: true })).toBeFocused();
    await expect(app.getByRole('tab', { name: 'Settings' })).toContainText('needs a correction');

    await app.getByRole('textbox', { name: 'Name', exact: true }).fill('Bins');
    await app.getByRole('button', { name: 'Create task' }).click();
    await expect(app.getByText('Choose at least one share.')).toBeVisible();
    await expect(app.getByText('Enter a whole number from 1 to 4095.')).toBeVisible();
    await app.getByLabel('media').check();
    await app.getByLabel('Each bin may hold').fill('4095');
    await app.getByRole('button', { name: 'Create task' }).click();
    await expect(rowOf(app, 'Bins')).toContainText('Empty recycle bins: "media"');
});

test('a refusal of the appliance stands where it belongs, and nothing typed is lost', async ({
    app,
    appliance,
}) => {
    await openNew(app, 'Script');
    await app.getByRole('textbox', { name: 'Name', exact: true }).fill('Refused');
    await tab(app, 'Settings');
    await app.getByLabel('Commands').fill('echo kept');
    // The appliance itself refuses: the owner has gone between choosing and saving.
    await app.route('**/create*', async (route) => {
        const body = JSON.parse(route.request().postData() ?? '{}') as object;
        await route.continue({ postData: JSON.stringify({ ...body, owner: 'nobody-at-all' }) });
    });
    await app.getByRole('button', { name: 'Create task' }).click();
    await expect(app.getByRole('tab', { name: 'General' })).toHaveAttribute(
        'aria-selected',
        'true',
    );
    await expect(app.getByText('Invalid (basic) object (code 117)')).toBeVisible();
    await expect(app.getByRole('textbox', { name: 'Name', exact: true })).toHaveValue('Refused');
    await app.unroute('**/create*');
    await app.getByRole('button', { name: 'Create task' }).click();
    await expect(rowOf(app, 'Refused')).toBeVisible();
    const { data } = await appliance.call('get', { id: 9 });
    expect(data).toMatchObject({ extra: { script: 'echo kept' } });
});

test('a refused change stands where it belongs too, and changes nothing', async ({
    app,
    appliance,
}) => {
    await app.getByRole('link', { name: 'Lunch signal' }).click();
    await app.getByRole('textbox', { name: 'Name', exact: true }).fill('Never stored');
    await tab(app, 'Settings');
    await app.route('**/set?*', async (route) => {
        const body = JSON.parse(route.request().postData() ?? '{}') as object;
        await route.continue({ postData: JSON.stringify({ ...body, schedule: { hour: 24 } }) });
    });
    await app.getByRole('button', { name: 'Save' }).click();
    await expect(app.getByRole('tab', { name: 'Schedule' })).toHaveAttribute(
        'aria-selected',
        'true',
    );
    await expect(app.getByText('Invalid (schedule) object (code 117)')).toBeVisible();
    const { data } = await appliance.call('get', { id: 1 });
    expect(data).toMatchObject({ name: 'Lunch signal', schedule: { hour: 12 } });
    await app.unroute('**/set?*');
    await app.getByRole('button', { name: 'Save' }).click();
    await expect(rowOf(app, 'Never stored')).toBeVisible();
});

test('a new recycle-bin task removes what is old; all at once comes with a warning', async ({
    app,
    appliance,
}) => {
    await openNew(app, 'Recycle bins');
    await app.getByRole('textbox', { name: 'Name', exact: true }).fill('One click');
    await tab(app, 'Settings');
    await expect(app.getByLabel('By age')).toBeChecked();
    await expect(app.getByLabel('In the bin for more than')).toHaveValue('30');
    const warning = app.getByText('Each start empties the bins');
    await expect(warning).toHaveCount(0);
    await app.getByLabel('Everything').check();
    await expect(warning).toContainText('Each start empties the bins of all shares');
    await app.getByLabel('Only these shares').check();
    await expect(warning).toContainText('Each start empties the bins of these shares');
    await app.getByLabel('All shares').check();
    await app.getByLabel('By age').check();
    await expect(warning).toHaveCount(0);
    await app.getByRole('button', { name: 'Create task' }).click();
    await expect(rowOf(app, 'One click')).toBeVisible();
    const { data } = await appliance.call('get', { id: 9 });
    expect(data).toMatchObject({
        extra: {
            clean_share_policy: { clean_all: true },
            clean_file_policy: { policy: 'time', time: 30 },
        },
    });
});

test('a stored extension that the page would refuse is shown as it is, with the problem', async ({
    app,
    appliance,
}) => {
    const { data: old } = await appliance.call('get', { id: 4 });
    const { extra } = old as { extra: { clean_file_policy: { reserve_policy: object } } };
    Object.assign(extra.clean_file_policy.reserve_policy, {
        extension_check: true,
        extension: [{ file_ext: 'pdf' }, { file_ext: 'old files' }],
    });
    expect(await appliance.call('set', { ...old, extra })).toMatchObject({ success: true });

    await app.getByRole('link', { name: 'Empty old bins' }).click();
    await app.getByRole('textbox', { name: 'Name', exact: true }).fill('Renamed');
    await expect(app.getByRole('tab', { name: 'Settings' })).toContainText('needs a correction');
    await app.getByRole('button', { name: 'Save' }).click();
    const extensions = app.getByLabel(/^Extensions/);
    await expect(extensions).toHaveValue('pdf, old files');
    await expect(extensions).toBeFocused();
    await expect(app.getByText('“old files” is no extension')).toBeVisible();
    const kept = await appliance.call('get', { id: 4 });
    expect(kept.data).toMatchObject({ name: 'Empty old bins', extra });

    await extensions.fill('pdf, c++, a-b_c');
    await app.getByRole('button', { name: 'Save' }).click();
    await expect(rowOf(app, 'Renamed')).toBeVisible();
    const { data } = await appliance.call('get', { id: 4 });
    expect(data).toMatchObject({
        extra: {
            clean_file_policy: {
                reserve_policy: {
                    extension: [{ file_ext: 'pdf' }, { file_ext: 'c++' }, { file_ext: 'a-b_c' }],
                },
            },
        },
    });
});

test('that no buzzer can sound is said where a beep is made and where it is run', async ({
    app,
}) => {
    let buzzer = false;
    await app.route('**/info*', async (route) => {
        const response = await route.fetch();
        const answer = (await response.json()) as { data: object };
        await route.fulfill({ response, json: { ...answer, data: { ...answer.data, buzzer } } });
    });
    await app.reload();
    const notice = app.getByText('This appliance has no buzzer that can sound.');
    await expect(rowOf(app, 'Lunch signal')).toBeVisible();
    await expect(notice).toHaveCount(0);
    await openNew(app, 'Beep');
    for (const part of ['General', 'Schedule', 'Settings']) {
        await tab(app, part);
        await expect(notice).toBeVisible();
    }
    await app.getByRole('button', { name: 'Cancel' }).click();
    await pick(app, 'Lunch signal', 'Run now');
    await expect(app.getByRole('dialog').getByText('no buzzer')).toBeVisible();
    await app.getByRole('dialog').getByRole('button', { name: 'Cancel' }).click();
    await pick(app, 'Report free space', 'Run now');
    await expect(app.getByRole('dialog')).toContainText('Report free space');
    await expect(notice).toHaveCount(0);

    buzzer = true;
    await app.reload();
    await pick(app, 'Lunch signal', 'Run now');
    await expect(app.getByRole('dialog')).toContainText('Lunch signal');
    await expect(notice).toHaveCount(0);
});

test('a task that another client deletes while it is edited cannot be saved', async ({
    app,
    appliance,
}) => {
    await app.getByRole('link', { name: 'Lunch signal' }).click();
    await app.getByRole('textbox', { name: 'Name', exact: true }).fill('Too late');
    await appliance.call('delete', { task: 1 });
    await expect(app.getByText('Somebody deleted this task meanwhile.')).toBeVisible();
    await expect(app.getByRole('button', { name: 'Save' })).toBeDisabled();
    await expect(app.getByRole('textbox', { name: 'Name', exact: true })).toHaveValue('Too late');
});

test('the address of a task that does not exist says so', async ({ app }) => {
    await app.evaluate(() => {
        window.location.hash = '#/tasks/4711';
    });
    const heading = app.getByRole('heading', { level: 1 });
    await expect(heading.getByText('The task could not be read')).toBeFocused();
    await expect(app.getByText('There is no such task, or not any more.')).toBeVisible();
    await app.getByRole('button', { name: 'Back to the tasks' }).click();
    await expect(rowOf(app, 'Lunch signal')).toBeVisible();
});

test('a kind of task that does not exist leads back to the list', async ({ app }) => {
    await app.evaluate(() => {
        window.location.hash = '#/tasks/new/teapot';
    });
    await expect(app.getByText('There is no such kind of task.')).toBeVisible();
    await app.getByRole('button', { name: 'Back to the tasks' }).click();
    await expect(rowOf(app, 'Lunch signal')).toBeVisible();
});

test('a change by another client is told while a task is edited', async ({ app, appliance }) => {
    await app.getByRole('link', { name: 'Lunch signal' }).click();
    await app.getByRole('textbox', { name: 'Name', exact: true }).fill('Mine');
    const { data } = await appliance.call('get', { id: 1 });
    await appliance.call('set', { ...data, name: 'Theirs' });
    await expect(app.getByText('Somebody changed this task meanwhile')).toBeVisible();
    await expect(app.getByRole('textbox', { name: 'Name', exact: true })).toHaveValue('Mine');
    await app.getByRole('button', { name: /Load their version/ }).click();
    await expect(app.getByRole('textbox', { name: 'Name', exact: true })).toHaveValue('Theirs');
    await expect(app.getByText('Somebody changed this task meanwhile')).toHaveCount(0);
});

test('another language of the page is no change of the task that is edited', async ({
    app,
    appliance,
}) => {
    await app.getByRole('link', { name: 'Lunch signal' }).click();
    await app.getByRole('textbox', { name: 'Name', exact: true }).fill('Mine');
    const read = app.waitForResponse(/\/get\?lang=de/);
    await app.getByRole('button', { name: 'Language: English' }).click();
    await app.getByRole('menuitem', { name: 'Deutsch' }).click();
    await expect(app.getByRole('heading', { name: 'Lunch signal' })).toBeVisible();
    await read;
    await expect(app.getByRole('button', { name: 'Speichern' })).toBeVisible();
    const changed = app.getByText('Jemand hat diese Aufgabe inzwischen geändert');
    await expect(changed).toHaveCount(0);

    const { data } = await appliance.call('get', { id: 1 });
    await appliance.call('set', { ...data, name: 'Theirs' });
    await expect(changed).toBeVisible();
});

test('signing out with unsaved work asks first', async ({ app }) => {
    await app.getByRole('link', { name: 'Lunch signal' }).click();
    const name = app.getByRole('textbox', { name: 'Name', exact: true });
    await name.fill('Unsaved');
    const dialog = app.getByRole('dialog', { name: 'Leave without saving?' });
    for (let time = 0; time < 2; time += 1) {
        await app.getByRole('button', { name: 'Sign out' }).click();
        await dialog.getByRole('button', { name: 'Stay' }).click();
        await expect(dialog).toHaveCount(0);
        await expect(name).toHaveValue('Unsaved');
    }
    await app.getByRole('button', { name: 'Sign out' }).click();
    await dialog.getByRole('button', { name: 'Leave' }).click();
    await expect(app.getByLabel('Access token')).toBeVisible();
});

test('unsaved work is not left without a question', async ({ app }) => {
    await app.getByRole('link', { name: 'Lunch signal' }).click();
    await app.getByRole('textbox', { name: 'Name', exact: true }).fill('Unsaved');
    await app.getByRole('link', { name: 'History' }).click();
    const dialog = app.getByRole('dialog', { name: 'Leave without saving?' });
    await dialog.getByRole('button', { name: 'Stay' }).click();
    await expect(app.getByRole('textbox', { name: 'Name', exact: true })).toHaveValue('Unsaved');
    await app.getByRole('button', { name: 'Cancel' }).click();
    await dialog.getByRole('button', { name: 'Leave' }).click();
    await expect(rowOf(app, 'Lunch signal')).toBeVisible();
});

test('going back from unsaved work asks each time, and the history of the browser stays', async ({
    app,
}) => {
    const back = () => app.evaluate(() => history.back());
    await app.getByRole('link', { name: 'Lunch signal' }).click();
    const name = app.getByRole('textbox', { name: 'Name', exact: true });
    await name.fill('Unsaved');
    const dialog = app.getByRole('dialog', { name: 'Leave without saving?' });
    for (let time = 0; time < 3; time++) {
        await back();
        await dialog.getByRole('button', { name: 'Stay' }).click();
        await expect(dialog).toHaveCount(0);
        await expect(app).toHaveURL(/#\/tasks\/1$/);
        await expect(name).toHaveValue('Unsaved');
    }
    await back();
    await dialog.getByRole('button', { name: 'Leave' }).click();
    await expect(rowOf(app, 'Lunch signal')).toBeVisible();
    await expect(app).toHaveURL(/#\/tasks$/);
});

test('going back after saving or cancelling does not open the form again', async ({ app }) => {
    await app.getByRole('link', { name: 'History' }).click();
    await expect(app.getByRole('heading', { name: 'History' })).toBeVisible();
    await app.getByRole('link', { name: 'Tasks' }).click();
    await app.getByRole('link', { name: 'Lunch signal' }).click();
    await app.getByRole('button', { name: 'Cancel' }).click();
    await app.getByRole('link', { name: 'Lunch signal' }).click();
    await app.getByRole('textbox', { name: 'Name', exact: true }).fill('Saved signal');
    await app.getByRole('button', { name: 'Save' }).click();
    await expect(rowOf(app, 'Saved signal')).toBeVisible();
    await app.evaluate(() => history.back());
    await expect(app.getByRole('heading', { name: 'History' })).toBeVisible();
});

test('an editor that was opened by its address gives way to the list', async ({ app }) => {
    await app.getByRole('link', { name: 'History' }).click();
    await expect(app.getByRole('heading', { name: 'History' })).toBeVisible();
    await app.evaluate(() => {
        window.location.hash = '#/tasks/1';
    });
    await app.getByRole('textbox', { name: 'Name', exact: true }).fill('Unsaved');
    await app.getByRole('button', { name: 'Cancel' }).click();
    await app.getByRole('dialog').getByRole('button', { name: 'Leave' }).click();
    await expect(rowOf(app, 'Lunch signal')).toBeVisible();
    await app.evaluate(() => history.back());
    await expect(app.getByRole('heading', { name: 'History' })).toBeVisible();
});

test('what may not be edited is disabled with the reason', async ({ app }) => {
    await app.getByRole('link', { name: 'Back up documents' }).click();
    await expect(app.getByLabel('Owner')).toBeDisabled();
    await expect(app.getByText('Only scripts can run as another account.')).toBeVisible();
    await tab(app, 'Settings');
    await expect(app.getByText('This task belongs to another application')).toBeVisible();
    await tab(app, 'Schedule');
    await app.getByLabel('Time').fill('02:45');
    await app.getByRole('button', { name: 'Save' }).click();
    await expect(rowOf(app, 'Back up documents')).toContainText('2:45 AM');
});
