// Fails if the page has become too large: node tools/size.mjs DIR
import assert from 'node:assert/strict';
import { readFile, readdir } from 'node:fs/promises';
import path from 'node:path';
import { gzipSync } from 'node:zlib';

const most = 150 * 1024;
const directory = process.argv[2];
const names = (await readdir(directory)).sort();
assert.deepEqual(names, ['app.css', 'app.js', 'icon.svg', 'index.html']);
let sum = 0;
for (const name of names) {
    const content = await readFile(path.join(directory, name));
    const bytes = gzipSync(content, { level: 9 }).length;
    sum += bytes;
    console.log(`${String(bytes).padStart(8)}  ${name}`);
    // The namespace of SVG is a name, and nothing is asked of it.
    const addresses = (content.toString().match(/(https?:)?\/\/[\w-]+\.[\w.-]+/g) ?? []).filter((one) => !/www\.w3\.org$/.test(one));
    assert.deepEqual(addresses, [], `${name} names other places`);
    if (name === 'index.html') assert.doesNotMatch(content.toString(), /<style|\sstyle=|\son\w+=|<script(?![^>]*\ssrc=)/, 'index.html has inline code');
    assert.doesNotMatch(content.toString(), /dangerouslySetInnerHTML\s*[:=]\s*\{/, `${name} makes markup of texts`);
}
console.log(`${String(sum).padStart(8)}  in all, of ${most}`);
assert.ok(sum <= most, 'the page is too large');
