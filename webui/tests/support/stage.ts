import { execFileSync } from 'node:child_process';
import { existsSync, mkdirSync, rmSync } from 'node:fs';
import { join } from 'node:path';

import { buildFolder, pictureFolder, stageFolder } from './places';

/** Installs what was built once; each test's appliance is a copy. */
export default function stage(): void {
    rmSync(stageFolder, { recursive: true, force: true });
    mkdirSync(pictureFolder, { recursive: true });
    execFileSync('cmake', ['--install', buildFolder, '--prefix', join(stageFolder, 'usr/orva')], {
        stdio: ['ignore', 'ignore', 'inherit'],
    });
    if (!existsSync(join(stageFolder, 'usr/orva/webui/index.html'))) {
        throw new Error('the page is not built: ./dev build');
    }
}
