// Every page in light and dark, on a desk and on a phone: it can be used by everybody, it keeps to
// the policy, it is no wider than the window, and it has its picture taken.
import path from 'node:path';
import { after, before, test } from 'node:test';
import { press, untilText } from '../support/browser.mjs';
import { dropPaths, folderOf } from '../support/drop.mjs';
import { looksRight } from '../support/looks.mjs';
import { raise, shots } from '../support/stage.mjs';

let stage;
before(async () => (stage = await raise()));
after(() => stage.strike());

const running = 'a0a99408e7707b3d-41';
const failed = 'a0a99408e7707b3d-23';

/// Name, address, what is there once the page is.
const pages = [
    ['overview', '/', 'should run'],
    ['agents', '/agents', 'db1:db7:UX'],
    ['tasks', '/tasks', 'nightly-35'],
    ['task-running', `/tasks/${running}`, 'line 1'],
    ['task-failed', `/tasks/${failed}`, 'ux runs already'],
    ['configuration', '/configuration?product=ux', 'No difference'],
    ['depot', '/depot', 'package.tar'],
    ['events', '/events', 'ZAV1024E'],
    ['doctor', '/doctor', 'JAVA_HOME'],
    ['lost', '/nowhere', 'nothing at this address'],
];

for (const scheme of ['light', 'dark']) {
    for (const [width, height] of [[1280, 860], [360, 740]]) {
        test(`every page is fit to be used, ${scheme}, ${width} pixels wide`, async () => {
            const view = await stage.open({ scheme, width, height });
            view.fake.slow(60_000);
            view.fake.accept({ command: 'RESTART', product: 'ux', transid: 'patch-7' });
            view.fake.accept({ command: 'START', product: 'um', transid: 'patch-8' });
            for (const [name, address, text] of pages) {
                await view.go(address);
                await untilText(view.tab, text).catch((error) => {
                    throw new Error(`${name}: "${text}" does not come (${error.message})`);
                });
                await untilText(view.tab, 'live', '.top');
                await looksRight(view, name);
                await view.tab.screenshot({ path: path.join(shots, `${name}-${scheme}-${width}.png`) });
            }
            await view.end();
        });
    }
}

test('windows and drafts are fit to be used as well', async () => {
    for (const scheme of ['light', 'dark']) {
        const view = await stage.open({ scheme });
        await view.go('/agents');
        await untilText(view.tab, 'db1:db7:UX');
        await view.tab.keyboard.press('?');
        await untilText(view.tab, 'Keys of one letter', 'dialog');
        await looksRight(view, 'help');
        await view.tab.keyboard.press('Escape');
        await view.tab.waitForSelector('dialog', { hidden: true });
        await (await view.tab.waitForSelector('aria/Stop db7:UX')).click();
        await untilText(view.tab, 'zavctl stop ux', 'dialog');
        await looksRight(view, 'stop');
        await view.tab.screenshot({ path: path.join(shots, `dialog-${scheme}-1280.png`) });
        await view.go('/configuration?product=ux');
        const editor = await view.tab.waitForSelector('.editor');
        await editor.click();
        await view.tab.keyboard.type('INTERVAL=10\n');
        await untilText(view.tab, '1 line added');
        await looksRight(view, 'difference');
        await view.tab.screenshot({ path: path.join(shots, `difference-${scheme}-1280.png`) });
        await view.end();
    }
});

test('a folder on its way into the depot is fit to be used as well', async () => {
    const { folder, remove } = await folderOf({ 'install.sh': '#!/bin/sh\n', 'lib/agent.tar': 'x', 'lib/install.sh.tar': 'x' });
    try {
        for (const [scheme, width, height] of [['light', 1280, 860], ['dark', 360, 740]]) {
            const view = await stage.open({ scheme, width, height });
            await view.go('/depot?path=ux/7.2');
            await dropPaths(view.tab, folder);
            await untilText(view.tab, 'Where do its 3 files', '.push');
            await looksRight(view, 'where a folder goes');
            await press(view.tab, 'Into ux/7.2/');
            await untilText(view.tab, 'so none is sent', '.push');
            await (await view.tab.waitForSelector('summary')).click();
            await untilText(view.tab, 'install.sh', '.sums');
            await looksRight(view, 'a folder that is not taken');
            await view.tab.screenshot({ path: path.join(shots, `folder-${scheme}-${width}.png`) });
            await view.end();
        }
    } finally {
        await remove();
    }
});

test('a host that has nothing yet is told what to do first', async () => {
    const view = await stage.open({ host: { isEmpty: true } });
    for (const [address, text] of [['/', 'Nothing runs, and nothing waits'], ['/agents', 'No products are installed'], ['/tasks', 'has not been asked for anything yet'],
        ['/depot', 'The depot is empty'], ['/events', 'Nothing has happened yet'], ['/configuration', 'No agent has a configuration yet']]) {
        await view.go(address);
        await untilText(view.tab, text, 'main');
        await looksRight(view, `empty ${address}`);
    }
    await view.end();
});
