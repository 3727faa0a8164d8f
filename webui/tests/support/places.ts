import { join, resolve } from 'node:path';

/** Where CMake built what the tests drive. */
export const buildFolder = resolve(
    process.env['ORVA_BUILD_DIR'] ?? join(import.meta.dirname, '../../../build/release'),
);
export const sourceFolder = resolve(import.meta.dirname, '../../..');
export const stageFolder = join(buildFolder, 'page-tests', 'stage');
/** The main views as they look now, for people to see. */
export const pictureFolder = join(buildFolder, 'page-tests', 'pictures');
