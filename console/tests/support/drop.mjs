// Files and folders of this machine, and dropping them on a page.
import { mkdir, mkdtemp, rm, writeFile } from 'node:fs/promises';
import os from 'node:os';
import path from 'node:path';

/// Drops files and folders of this machine, as a hand would.
export async function dropPaths(tab, ...files) {
    const box = await (await tab.waitForSelector('.drop')).boundingBox();
    const session = await tab.createCDPSession();
    const data = { items: [], files, dragOperationsMask: 1 };
    for (const type of ['dragEnter', 'dragOver', 'drop']) await session.send('Input.dispatchDragEvent', { type, x: box.x + 20, y: box.y + 10, data });
    await session.detach();
}

/// A folder of this machine with these files, by their paths in it.
export async function folderOf(contents) {
    const scratch = await mkdtemp(path.join(os.tmpdir(), 'console-'));
    const folder = path.join(scratch, 'bundle');
    await mkdir(folder);
    for (const [name, content] of Object.entries(contents)) {
        await mkdir(path.dirname(path.join(folder, name)), { recursive: true });
        await writeFile(path.join(folder, name), content);
    }
    return { folder, remove: () => rm(scratch, { recursive: true }) };
}
