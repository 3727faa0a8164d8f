import { violations } from './support/axe';
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
    await expect(app.getByRole('dialog', { name: 'Stop Count up?' })).toBeVisible();
    expect(await violations(app)).toEqual([]);
    await app.getByRole('dialog').getByRole('button', { name: 'Stop' }).click();
    // A person wanted that: it is shown as no failure.
    await expect(app.locator('td[data-label="Result"]')).toHaveText('Stopped by hand');
    await expect(app.getByRole('img', { name: /^0 succeeded, 0 failed,? and 1 stopped/ })).toBeVisible();
    await expect(app.locator('.orva-bar-stopped')).toHaveCount(1);
    await expect(app.locator('.orva-outcome-failed')).toHaveCount(0);
    await expect(app.getByRole('button', { name: 'Stop Count up' })).toHaveCount(0);
});

test('what a running task prints is followed, unless a person has gone back in it', async ({
    app,
    appliance,
}) => {
    await appliance.script(
        'Count up',
        'seq 100; for i in $(seq 400); do echo line $i; sleep 0.2; done',
    );
    await appliance.call('run', { task: [1] });
    await app.getByRole('link', { name: 'History' }).click();
    await app.getByRole('button', { name: 'Output of run 1' }).click();
    const output = app.getByRole('region', { name: 'Output' });
    const size = () => output.evaluate((box) => box.scrollHeight);
    const left = () =>
        output.evaluate((box) => box.scrollHeight - box.scrollTop - box.clientHeight);
    const grown = async () => {
        const before = await size();
        await expect(async () => expect(await size()).toBeGreaterThan(before)).toPass();
    };
    await expect(output).toContainText('line 2');
    expect(await left()).toBeLessThan(2);
    await grown();
    expect(await left()).toBeLessThan(2);

    await output.evaluate((box) => box.scrollTo(0, 40));
    await grown();
    expect(await output.evaluate((box) => box.scrollTop)).toBe(40);

    await output.evaluate((box) => box.scrollTo(0, box.scrollHeight));
    await grown();
    expect(await left()).toBeLessThan(2);
});

test('a run that was asked to stop says so until it has', async ({ app, appliance }) => {
    await appliance.script('Stubborn', "trap '' TERM; while true; do sleep 0.1; done");
    await appliance.call('run', { task: [1] });
    await app.getByRole('link', { name: 'History' }).click();
    const result = app.locator('td[data-label="Result"]');
    await app.getByRole('button', { name: 'Stop Stubborn' }).click();
    await app.getByRole('dialog').getByRole('button', { name: 'Stop' }).click();
    await expect(result).toHaveText(/Running\s*Being stopped/);
    await expect(app.getByRole('button', { name: 'Stop Stubborn' })).toHaveCount(0);
    await expect(app.getByRole('button', { name: 'Output of run 1' })).toBeFocused();
    await expect(
        app.getByRole('img', { name: /^0 succeeded, 0 failed,? and 1 running/ }),
    ).toBeVisible();
    await expect(result).toHaveText('Stopped by hand', { timeout: 30_000 });
});

test.describe('where one run goes on at a time', () => {
    test.use({ settings: 'schedmaxruns="1"\n' });

    test('one that waits can be stopped before it starts', async ({ app, appliance }) => {
        await appliance.script('First', 'sleep 1000');
        await appliance.script('Second', 'echo never');
        await appliance.call('run', { task: [1, 2] });
        await app.getByRole('link', { name: 'History' }).click();
        const results = app.locator('td[data-label="Result"]');
        await expect(results).toHaveText(['Waiting', 'Running']);
        await app.getByRole('button', { name: 'Stop Second' }).click();
        const dialog = app.getByRole('dialog', { name: 'Stop Second?' });
        await expect(dialog).toContainText('It has not started yet');
        await dialog.getByRole('button', { name: 'Stop' }).click();
        await expect(app.getByText('Second will not start')).toBeVisible();
        await expect(results).toHaveText(['Stopped before it started', 'Running']);
        await expect(app.getByRole('button', { name: /^Stop / })).toHaveCount(1);
        await app.getByRole('button', { name: 'Stop First' }).click();
        await app.getByRole('dialog').getByRole('button', { name: 'Stop' }).click();
        await expect(results).toHaveText(['Stopped before it started', 'Stopped by hand']);
    });
});

test('the history of a deleted task keeps its name, whatever of it is shown', async ({
    app,
    appliance,
}) => {
    await appliance.script('Gone for good', 'true');
    await runNow(app, 'Gone for good');
    await appliance.call('delete', { task: 1 });
    await app.evaluate(() => {
        window.location.hash = '#/history?task=1';
    });
    const heading = app.getByRole('heading', { name: 'History of Gone for good' });
    await expect(heading).toBeVisible();
    await app.getByRole('button', { name: 'State: All states' }).click();
    await app.getByRole('menuitem', { name: 'Lost' }).click();
    await expect(app.getByRole('heading', { name: 'No runs' })).toBeVisible();
    await expect(heading).toBeVisible();
    await expect(app).toHaveTitle(/^History of Gone for good/);
});

test('the history of a renamed task has its present name', async ({ app, appliance }) => {
    const id = await appliance.script('Old name', 'true');
    await runNow(app, 'Old name');
    const { data } = await appliance.call('get', { id });
    await appliance.call('set', { ...data, name: 'New name' });
    await rowOf(app, 'New name').locator('td[data-label="Last result"] a').click();
    await expect(app.getByRole('heading', { name: 'History of New name' })).toBeVisible();
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
    await expect(app.getByRole('img', { name: /1 succeeded and 1 failed/ })).toBeVisible();
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
