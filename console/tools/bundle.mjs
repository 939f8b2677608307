// Makes the page: node tools/bundle.mjs [--project DIR] [--out DIR] [--debug]
// Leaves index.html, app.js, app.css and icon.svg in the output directory, and nothing else.
import { copyFile, mkdir, rm } from 'node:fs/promises';
import path from 'node:path';
import { fileURLToPath } from 'node:url';
import { parseArgs } from 'node:util';
import { build } from 'esbuild';
import { generate } from './generate.mjs';

const root = path.join(path.dirname(fileURLToPath(import.meta.url)), '..');
const { values } = parseArgs({
    options: {
        project: { type: 'string', default: path.join(root, '..') },
        out: { type: 'string', default: path.join(root, 'out', 'page') },
        debug: { type: 'boolean', default: false },
    },
});

await generate(values.project);
await rm(values.out, { recursive: true, force: true });
await mkdir(values.out, { recursive: true });
await build({
    entryPoints: { app: path.join(root, 'src', 'main.tsx') },
    outdir: values.out,
    bundle: true,
    format: 'esm',
    target: ['chrome109', 'firefox115', 'safari16.4'],
    minify: !values.debug,
    legalComments: 'none',
    jsx: 'automatic',
    jsxImportSource: 'preact',
    logLevel: 'warning',
});
for (const name of ['index.html', 'icon.svg']) {
    await copyFile(path.join(root, 'static', name), path.join(values.out, name));
}
