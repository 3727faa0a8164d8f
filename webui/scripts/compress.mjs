// Puts a .gz beside every text file of the built page, for the server to send as it stands.
import { readdirSync, readFileSync, writeFileSync } from 'node:fs';
import { join } from 'node:path';
import { constants, gzipSync } from 'node:zlib';

const folder = new URL('../dist/', import.meta.url).pathname;
for (const entry of readdirSync(folder, { recursive: true, withFileTypes: true })) {
    if (entry.isFile() && /\.(html|js|css|svg|json)$/.test(entry.name)) {
        const path = join(entry.parentPath, entry.name);
        writeFileSync(`${path}.gz`, gzipSync(readFileSync(path), { level: constants.Z_BEST_COMPRESSION }));
    }
}
