// Runs the tests of pure functions: bundles them, because Node knows no TypeScript, and gives them to
// Node's own test runner. node tools/unit.mjs [--project DIR]
import { spawnSync } from 'node:child_process';
import { mkdir, readdir, rm } from 'node:fs/promises';
import path from 'node:path';
import { fileURLToPath } from 'node:url';
import { parseArgs } from 'node:util';
import { build } from 'esbuild';
import { generate } from './generate.mjs';

const root = path.join(path.dirname(fileURLToPath(import.meta.url)), '..');
const { values } = parseArgs({ options: { project: { type: 'string', default: path.join(root, '..') } } });
const out = path.join(root, 'out', 'unit');

await generate(values.project);
await rm(out, { recursive: true, force: true });
await mkdir(out, { recursive: true });
const sources = (await readdir(path.join(root, 'tests', 'unit'))).filter((name) => name.endsWith('.test.ts'));
await build({
    entryPoints: sources.map((name) => path.join(root, 'tests', 'unit', name)),
    outdir: out, bundle: true, format: 'esm', platform: 'node', target: 'node18', outExtension: { '.js': '.mjs' },
    external: ['node:*'], jsx: 'automatic', jsxImportSource: 'preact', logLevel: 'warning',
});
const files = sources.map((name) => path.join(out, name.replace(/\.ts$/, '.mjs')));
// In another zone than UTC, so that a time that is not made local does not pass.
const { status } = spawnSync(process.execPath, ['--test', ...files], { stdio: 'inherit', env: { ...process.env, TZ: 'Asia/Kathmandu' } });
process.exit(status ?? 1);
