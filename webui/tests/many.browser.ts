import { readFileSync } from 'node:fs';
import { join } from 'node:path';

import { sourceFolder } from './support/places';
import { expect, names, test } from './support/test';

const EXAMPLE = join(sourceFolder, 'example/tasks.json');
const [, script] = JSON.parse(readFileSync(EXAMPLE, 'utf8')) as { basic: object }[];
const MANY = Array.from({ length: 10_000 }, (_, index) => ({
    ...script,
    basic: { ...script?.basic, task_name: `Job ${String(index + 1).padStart(5, '0')}` },
}));

test.use({ tasks: { documents: MANY } });

test('ten thousand tasks are listed, found, selected and switched', async ({ app, appliance }) => {
    test.setTimeout(240_000);
    await app.reload();
    await expect(app.getByText('1 - 50 of 10,000').last()).toBeVisible();
    const seen = await app.evaluate(() => performance.now());
    console.log(`ten thousand tasks: the list is seen ${seen.toFixed(0)} ms after loading begins`);

    await app.getByRole('textbox', { name: 'Find' }).pressSequentially('0777');
    await expect(async () =>
        expect((await names(app)).slice(0, 2)).toEqual(['Job 00777', 'Job 07770']),
    ).toPass();
    await app.getByRole('button', { name: 'Clear filter' }).click();
    await app.getByRole('button', { name: 'Select tasks' }).click();
    await app.getByRole('menuitem', { name: 'Select all (10,000 tasks)' }).click();
    await expect(app.getByText('10,000 selected')).toBeVisible();
    await app.getByRole('button', { name: 'Selected tasks' }).click();
    await app.getByRole('menuitem', { name: 'Disable' }).click();
    const dialog = app.getByRole('dialog');
    await expect(dialog).toContainText('and 9,800 more');
    await dialog.getByRole('button', { name: 'Disable' }).click();
    await expect(app.getByText('10,000 tasks are disabled')).toBeVisible({
        timeout: 150_000,
    });
    const { data } = await appliance.call('get', { id: 10_000 });
    expect(data).toMatchObject({ enable: false });

    await appliance.call('delete', { task: 10_000 });
    await expect(app.getByText('1 - 50 of 9,999').last()).toBeVisible();
});
