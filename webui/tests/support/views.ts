import type { Page } from '@playwright/test';

import { expect, tab } from './test';

interface View {
    name: string;
    open(page: Page): Promise<void>;
    /** Takes back what would keep the page from going on to another view. */
    close?(page: Page): Promise<void>;
}

async function show(page: Page, fragment: string): Promise<void> {
    // A dialog that is open covers the rest.
    await page.keyboard.press('Escape');
    await page.evaluate((to) => {
        window.location.hash = to;
    }, fragment);
}

async function editor(page: Page, kind: string, part: string): Promise<void> {
    await show(page, '#/tasks');
    await expect(page.getByRole('heading', { name: 'Scheduled tasks' })).toBeVisible();
    await show(page, `#/tasks/new/${kind}`);
    await expect(page.getByRole('heading', { name: /^New task/ })).toBeVisible();
    await tab(page, part);
}

function settings(kind: string, label: string | RegExp): View {
    return {
        name: kind,
        open: async (page) => {
            await editor(page, kind, 'Settings');
            await expect(page.getByLabel(label).first()).toBeVisible();
        },
    };
}

/** Every view, in the order in which a person comes to them. A run must have ended before. */
export const VIEWS: readonly View[] = [
    {
        name: 'list',
        open: async (page) => {
            await show(page, '#/tasks');
            await expect(page.getByText('Succeeded').first()).toBeVisible();
        },
    },
    {
        name: 'no-match',
        open: async (page) => {
            await show(page, '#/tasks?q=nothing-like-this');
            await expect(page.getByRole('heading', { name: 'No task matches' })).toBeVisible();
        },
    },
    {
        name: 'general',
        open: async (page) => {
            await editor(page, 'script', 'General');
            await page.getByRole('button', { name: 'Create task' }).click();
            await expect(page.getByText('Enter a name.')).toBeVisible();
        },
    },
    {
        name: 'schedule',
        open: async (page) => {
            await editor(page, 'script', 'Schedule');
            await page.getByLabel('Start again during the day').check();
            await expect(
                page.getByRole('list', { name: 'Next starts' }).getByRole('listitem'),
            ).toHaveCount(10);
            await page.getByLabel('Start again during the day').uncheck();
        },
    },
    settings('beep', 'Duration'),
    settings('script', 'Commands'),
    {
        name: 'recycle',
        open: async (page) => {
            await settings('recycle', 'All shares').open(page);
            await page.getByRole('button', { name: 'Show what would go' }).click();
            const part = page.getByRole('button', { name: /would stay/ });
            await part.click();
            await expect(page.getByRole('grid', { name: /would stay/ })).toBeVisible();
        },
    },
    {
        name: 'everything',
        open: async (page) => {
            await settings('recycle', 'All shares').open(page);
            await page.getByLabel('Everything').check();
            await expect(page.getByText('Each start empties the bins')).toBeVisible();
        },
        close: (page) => page.getByLabel('By age').check(),
    },
    {
        name: 'other',
        open: async (page) => {
            await show(page, '#/tasks/6');
            await tab(page, 'Settings');
            await expect(page.getByText('belongs to another application')).toBeVisible();
        },
    },
    settings('service', 'Find a service'),
    {
        name: 'history',
        open: async (page) => {
            await show(page, '#/history');
            await expect(page.getByRole('img', { name: /succeeded/ })).toBeVisible();
        },
    },
    {
        name: 'output',
        open: async (page) => {
            await show(page, '#/history?run=1');
            await expect(page.getByRole('region', { name: 'Output' })).toBeVisible();
        },
    },
    {
        name: 'question',
        open: async (page) => {
            await show(page, '#/tasks');
            await page.getByRole('button', { name: 'Actions for Lunch signal' }).click();
            await page.getByRole('menuitem', { name: 'Run now' }).click();
            await expect(page.getByRole('dialog')).toBeVisible();
        },
    },
    {
        name: 'leave',
        open: async (page) => {
            await settings('beep', 'Duration').open(page);
            await page.getByLabel('Duration').fill('7');
            await page.getByRole('button', { name: 'Cancel' }).click();
            await expect(page.getByRole('dialog')).toContainText('Leave without saving?');
        },
        close: (page) => page.getByRole('button', { name: 'Leave', exact: true }).click(),
    },
];
