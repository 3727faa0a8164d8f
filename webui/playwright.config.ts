import { existsSync } from 'node:fs';
import { join } from 'node:path';

import { defineConfig } from '@playwright/test';

import { buildFolder } from './tests/support/places';

const CHROMIUM = process.env['ORVA_CHROMIUM'] ?? '/usr/bin/chromium';
if (!existsSync(CHROMIUM)) {
    throw new Error(`there is no ${CHROMIUM}; ./dev test installs it`);
}

export default defineConfig({
    testDir: 'tests',
    testMatch: '*.browser.ts',
    outputDir: join(buildFolder, 'page-tests', 'results'),
    globalSetup: './tests/support/stage.ts',
    // Every test has an appliance of its own and waits for it half of the time.
    workers: 2,
    timeout: 90_000,
    expect: { timeout: 15_000 },
    reporter: [['list']],
    use: {
        browserName: 'chromium',
        launchOptions: { executablePath: CHROMIUM },
        viewport: { width: 1280, height: 900 },
        locale: 'en-US',
        contextOptions: { reducedMotion: 'reduce' },
        actionTimeout: 15_000,
        screenshot: 'only-on-failure',
        trace: 'off',
    },
});
