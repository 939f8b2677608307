// Writes src/generated: what the page takes from other places of the project, so that each fact has
// one place. The types of the host's interface come from docs/openapi.json, those of the centre's from
// docs/fleet-openapi.json, the words for message identifiers from zavctl's catalogue.
import { mkdir, readFile, writeFile } from 'node:fs/promises';
import path from 'node:path';
import { fileURLToPath, pathToFileURL } from 'node:url';
import openapi, { astToString } from 'openapi-typescript';

const here = path.dirname(fileURLToPath(import.meta.url));

/// The rows of the C++ table, as a TypeScript one. An unfamiliar form of the file is an error: a page
/// that has quietly lost its words would be worse.
export function messagesOf(source) {
    const stated = /std::array<Message, (\d+)>/.exec(source);
    const rows = [...source.matchAll(/\{\s*"(ZAV\w+)",\s*((?:"(?:[^"\\]|\\.)*"\s*)+)\}/g)];
    if (!stated || Number(stated[1]) !== rows.length) {
        throw new Error('the message catalogue has another form than expected');
    }
    const words = rows.map(([, id, texts]) => {
        const text = [...texts.matchAll(/"((?:[^"\\]|\\.)*)"/g)].map((part) => JSON.parse(part[0])).join('');
        return `    ${id}: ${JSON.stringify(text)},\n`;
    });
    return `export const messages: Readonly<Record<string, string>> = {\n${words.join('')}};\n`;
}

/// `project` is the root of the repository.
export async function generate(project) {
    const target = path.join(here, '..', 'src', 'generated');
    await mkdir(target, { recursive: true });
    for (const [description, name] of [['openapi.json', 'host.ts'], ['fleet-openapi.json', 'centre.ts']]) {
        const types = await openapi(pathToFileURL(path.join(project, 'docs', description)));
        await writeFile(path.join(target, name), astToString(types));
    }
    const catalogue = path.join(project, 'ctl', 'show', 'message_catalogue.cpp');
    await writeFile(path.join(target, 'messages.ts'), messagesOf(await readFile(catalogue, 'utf8')));
}
