import { expect, pick, rowOf, runNow, test } from './support/test';

test.use({ tasks: 'none' });

test('a running task shows what it prints, and can be stopped', async ({ app, appliance }) => {
    await appliance.script('Count up', 'for i in $(seq 100); do echo line $i; sleep 0.5; done');
    await pick(app, 'Count up', 'Run now');
    await app.getByRole('dialog').getByRole('button', { name: 'Run now' }).click();
    const result = rowOf(app, 'Count up').locator('td[data-label="Last result"]');
    await expect(result).toContainText('Running');
    await result.getByRole('link').click();
    const output = app.getByRole('region', { name: 'Output' });
    await expect(output).toContainText('line 2');
    const before = (await output.innerText()).length;
    await expect(async () =>
        expect((await output.innerText()).length).toBeGreaterThan(before),
    ).toPass();

    await app.getByRole('button', { name: 'Stop Count up' }).click();
    await app.getByRole('dialog').getByRole('button', { name: 'Stop' }).click();
    await expect(app.locator('td[data-label="Result"]')).toContainText('Ended by signal 15');
    await expect(app.getByRole('button', { name: 'Stop Count up' })).toHaveCount(0);
});

test('of a long output the first and the last part are shown', async ({ app, appliance }) => {
    await appliance.script('Talk', 'echo the beginning; seq 200000; echo the end; exit 3');
    await expect(await runNow(app, 'Talk')).toContainText('Failed (exit status 3)');
    await rowOf(app, 'Talk').locator('td[data-label="Last result"] a').click();
    await expect(app.getByRole('region', { name: 'First part of the output' })).toContainText(
        'the beginning',
    );
    await expect(app.getByRole('region', { name: 'Last part of the output' })).toContainText(
        'the end',
    );
    await expect(app.getByText('in between were not kept')).toBeVisible();
});

test('what a script prints is shown as text', async ({ app, appliance }) => {
    await appliance.script('Markup', `echo '<img src=x onerror=alert(1)>'; printf '\\377\\n'`);
    await runNow(app, 'Markup');
    await rowOf(app, 'Markup').locator('td[data-label="Last result"] a').click();
    const output = app.getByRole('region', { name: 'Output' });
    await expect(output).toContainText('<img src=x onerror=alert(1)>');
    await expect(output).toContainText('\ufffd');
});

test('the history of all tasks is filtered, charted and narrowed to one', async ({
    app,
    appliance,
}) => {
    await appliance.script('Good', 'echo fine');
    await appliance.script('Bad', 'exit 1');
    await runNow(app, 'Good');
    await runNow(app, 'Bad');
    await app.getByRole('link', { name: 'History' }).click();
    await expect(app.getByRole('img', { name: /1 succeeded, 1 failed/ })).toBeVisible();
    await expect(app.locator('td[data-label="Result"]')).toHaveText([
        'Failed (exit status 1)',
        'Succeeded',
    ]);
    await expect(app.locator('td[data-label="Reason"]').first()).toHaveText('By hand');
    await app.getByRole('button', { name: 'State: All states' }).click();
    await app.getByRole('menuitem', { name: 'Skipped' }).click();
    await expect(app.getByRole('heading', { name: 'No runs' })).toBeVisible();
    await app.getByRole('button', { name: 'State: Skipped' }).click();
    await app.getByRole('menuitem', { name: 'All states' }).click();
    await app.getByRole('button', { name: 'Good' }).click();
    await expect(app.getByRole('heading', { name: 'History of Good' })).toBeVisible();
    await expect(app.locator('td[data-label="Result"]')).toHaveText(['Succeeded']);
    await app.getByRole('button', { name: 'Show all tasks' }).click();
    await expect(app.locator('td[data-label="Result"]')).toHaveCount(2);
});

test('the history of a task that never ran is empty', async ({ app, appliance }) => {
    await appliance.script('Idle', 'true');
    await pick(app, 'Idle', 'History');
    await expect(app.getByRole('heading', { name: 'No runs' })).toBeVisible();
    await expect(app.getByRole('heading', { name: 'History of Idle' })).toBeVisible();
});
