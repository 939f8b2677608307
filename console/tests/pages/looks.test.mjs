// Every page in light and dark, on a desk and on a phone: it can be used by everybody, it keeps to
// the policy, it is no wider than the window, and it has its picture taken.
import assert from 'node:assert/strict';
import { readFile } from 'node:fs/promises';
import path from 'node:path';
import { after, before, test } from 'node:test';
import { createRequire } from 'node:module';
import { untilText } from '../support/browser.mjs';
import { raise, shots } from '../support/stage.mjs';

const axe = await readFile(createRequire(import.meta.url).resolve('axe-core/axe.min.js'), 'utf8');

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

async function violations(tab) {
    // Through the debugger: the page's own policy lets no such script in.
    await tab.evaluate(axe);
    return tab.evaluate(async () => {
        const { violations: found } = await globalThis.axe.run(document, { runOnly: ['wcag2a', 'wcag2aa', 'wcag21a', 'wcag21aa', 'wcag22aa', 'best-practice'] });
        return found.map((one) => `${one.id}: ${one.nodes.map((node) => node.html.slice(0, 160)).join(' | ')}`);
    });
}

async function looksRight(view, name) {
    const { tab, faults } = view;
    assert.deepEqual(await violations(tab), [], `${name}: accessibility`);
    const { wide, window } = await tab.evaluate(() => ({ wide: document.documentElement.scrollWidth, window: innerWidth }));
    assert.ok(wide <= window, `${name}: ${wide} pixels in a window of ${window}`);
    assert.deepEqual(faults, [], name);
}

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
