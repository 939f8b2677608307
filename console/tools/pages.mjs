// Runs the tests in Chromium, two files at a time; status 77 if there is no Chromium. With "host" or
// "fleet" only those of the pages of one host, or of a fleet.
// CONSOLE_PAGE is the directory of the page, CONSOLE_SHOTS where pictures are put.
import { spawnSync } from 'node:child_process';
import { readdir } from 'node:fs/promises';
import path from 'node:path';
import { fileURLToPath } from 'node:url';
import { chromium } from '../tests/support/browser.mjs';

const directory = path.join(path.dirname(fileURLToPath(import.meta.url)), '..', 'tests', 'pages');
if (!(await chromium())) {
    console.error('there is no chromium: the pages are not tested');
    process.exit(77);
}
const [, , only] = process.argv;
const isMeant = (name) => only === undefined || name.startsWith('fleet_') === (only === 'fleet');
const files = (await readdir(directory)).filter((name) => name.endsWith('.test.mjs') && isMeant(name)).sort();
const { status } = spawnSync(process.execPath, ['--test', '--test-reporter=spec', '--test-concurrency=2', ...files.map((name) => path.join(directory, name))], { stdio: 'inherit' });
process.exit(status ?? 1);
