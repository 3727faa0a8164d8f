import { test as base, expect, type Locator, type Page } from '@playwright/test';

import { Appliance } from './appliance';

interface Fixtures {
    /** How the appliance begins: with the example's tasks, with none, or with these. */
    tasks: 'example' | 'none' | { documents: object[] };
    /** Whether the appliance serves by TLS. */
    tls: boolean;
    /** Lines for its settings. */
    settings: string;
    appliance: Appliance;
    /** The page, signed in, showing the list. */
    app: Page;
    /** What the browser complained about; nothing of it is allowed. */
    complaints: string[];
}

const IGNORED = [
    // A lost connection or session is part of some tests, and the browser says so itself.
    /Failed to load resource/,
];

export const test = base.extend<Fixtures>({
    tasks: ['example', { option: true }],

    tls: [false, { option: true }],
    settings: ['', { option: true }],

    appliance: async ({ tasks, tls, settings }, use) => {
        const appliance = new Appliance();
        try {
            appliance.configure(settings);
            if (tls) {
                appliance.useTls();
            }
            if (tasks === 'example') {
                appliance.fillWithExample();
            } else if (tasks !== 'none') {
                appliance.fill(tasks.documents);
            }
            await appliance.start();
            await use(appliance);
        } finally {
            await appliance.stop();
        }
    },

    complaints: [
        async ({ page }, use) => {
            const complaints: string[] = [];
            page.on('pageerror', (error) => complaints.push(`error: ${error.message}`));
            page.on('console', (message) => {
                const text = message.text();
                const loud = message.type() === 'error' || /Content.Security.Policy/i.test(text);
                if (loud && !IGNORED.some((pattern) => pattern.test(text))) {
                    complaints.push(text);
                }
            });
            await use(complaints);
            expect(complaints).toEqual([]);
        },
        { auto: true },
    ],

    app: async ({ page, appliance }, use) => {
        await page.goto(appliance.link());
        await expect(page.getByRole('heading', { name: 'Scheduled tasks' })).toBeVisible();
        await use(page);
    },
});

export { expect };

export function rowOf(page: Page, name: string): Locator {
    return page.getByRole('row').filter({ has: page.getByText(name, { exact: true }) });
}

/** The names in the list, from top to bottom. */
export async function names(page: Page): Promise<string[]> {
    return page.locator('td[data-label="Name"]').allInnerTexts();
}

export async function choose(page: Page, menu: string | RegExp, item: string): Promise<void> {
    await page.getByRole('button', { name: menu }).click();
    await page.getByRole('menuitem', { name: item, exact: true }).click();
}

/** Opens the menu of a task's row and picks from it. */
export async function pick(page: Page, task: string, item: string | RegExp): Promise<void> {
    await page.getByRole('button', { name: `Actions for ${task}` }).click();
    await page.getByRole('menuitem', { name: item }).click();
}

export async function openNew(page: Page, kind: string): Promise<void> {
    await page.getByRole('button', { name: 'New task' }).click();
    await page.getByRole('menuitem', { name: kind }).click();
    await expect(page.getByRole('textbox', { name: 'Name', exact: true })).toBeVisible();
}

export async function tab(page: Page, name: string): Promise<void> {
    await page.getByRole('tab', { name }).click();
}

/** Waits until the task's newest run is over; gives how it is told. */
export async function runNow(page: Page, task: string): Promise<Locator> {
    await pick(page, task, 'Run now');
    await page.getByRole('dialog').getByRole('button', { name: 'Run now' }).click();
    await expect(page.getByRole('dialog')).toHaveCount(0);
    const result = rowOf(page, task).locator('td[data-label="Last result"]');
    await expect(result).toHaveText(/Succeeded|Failed|signal|Could not/);
    return result;
}
