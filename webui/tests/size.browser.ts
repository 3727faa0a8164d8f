import { readdirSync, readFileSync } from 'node:fs';
import { join } from 'node:path';
import { gzipSync } from 'node:zlib';

import { expect, test } from '@playwright/test';

import { stageFolder } from './support/places';

const KILOBYTE = 1024;

/** All files of the page with this ending, compressed, however many of them a visit needs. */
function compressed(ending: string): number {
    const assets = join(stageFolder, 'usr/orva/webui/assets');
    return readdirSync(assets)
        .filter((name) => name.endsWith(ending))
        .map((name) => gzipSync(readFileSync(join(assets, name))).length)
        .reduce((sum, size) => sum + size, 0);
}

test('the page is small', () => {
    const script = compressed('.js') / KILOBYTE;
    const styles = compressed('.css') / KILOBYTE;
    console.log(`compressed: ${script.toFixed(1)} KB of JavaScript, ${styles.toFixed(1)} KB of CSS`);
    expect(script).toBeLessThan(220);
    expect(styles).toBeLessThan(110);
});
