// A host that puts a script into every text that it can fill. It is shown, and does not run.
import assert from 'node:assert/strict';
import { after, before, test } from 'node:test';
import { press, untilText } from '../support/browser.mjs';
import { raise } from '../support/stage.mjs';

let stage;
before(async () => (stage = await raise()));
after(() => stage.strike());

const evilName = encodeURIComponent('<img src=x onerror=reportFault(1)>');

/// The address of a page, and where on it a text of the host must be seen.
const places = (past, running) => [
    ['/', 'main'], ['/agents', 'main'], ['/tasks', '.list'], [`/tasks/${past}`, '.commands'], [`/tasks/${running}`, '.output'],
    ['/depot', '.list'], ['/events', '.list'], ['/doctor', 'main'],
];

async function hasNoElements(tab, address) {
    const made = await tab.evaluate(() => document.querySelectorAll('main img, main script, dialog img, dialog script, .notices img, .notices script').length);
    assert.equal(made, 0, `${address} has made elements of a host's text`);
}

test('scripts in whatever a host says are text', async () => {
    const view = await stage.open({ host: { isHostile: true } });
    const { tab, faults, fake, go } = view;
    fake.slow(60_000);
    const running = fake.accept({ command: 'START', product: 'um' });
    for (const [address, where] of places('a0a99408e7707b3d-24', running.id)) {
        await go(address);
        await untilText(tab, '<script>', where);
        await hasNoElements(tab, address);
    }
    await go('/configuration?product=ux');
    await tab.waitForFunction(() => document.querySelector('.editor')?.value.includes('<script>'));
    await tab.type('.editor', 'A=1\n');
    await untilText(tab, '<script>', '.diff');
    await hasNoElements(tab, 'the difference');
    assert.deepEqual(faults, []);
    await view.end();
});

test('scripts in refusals and outcomes are text', async () => {
    const view = await stage.open({ host: { isHostile: true } });
    const { tab, faults, go } = view;
    view.own.isDisturbed = true;
    await go(`/tasks/${evilName}`);
    await untilText(tab, 'there is no task "<img', '[role=alert]');
    await hasNoElements(tab, 'a task that is not there');
    await go('/agents');
    await untilText(tab, 'live', '.top');
    await press(tab, 'Install…');
    await tab.type('input[list="depot-products"]', 'zz');
    await tab.type('input[list="depot-versions"]', '1');
    await press(tab, 'Send install zz');
    await untilText(tab, '<script>', 'dialog [role=alert]');
    await hasNoElements(tab, 'a refusal');
    await press(tab, 'Back');
    await press(tab, 'Uninstall… um');
    await press(tab, 'Send uninstall um');
    await untilText(tab, 'uninstall um: done', '.notices');
    await hasNoElements(tab, 'an outcome');
    assert.deepEqual(faults, []);
    await view.end();
});

test('scripts in an address do not run', async () => {
    const view = await stage.open();
    const evil = encodeURIComponent(`"><img src=x onerror="reportFault('a script of the address ran')">`);
    for (const address of [`/tasks?state=${evil}&text=${evil}&since=${evil}`, `/configuration?product=${evil}&target=${evil}`, `/depot?path=${evil}`, `/agents?text=${evil}`, `/events?kind=${evil}`, `/${evil}`]) {
        view.own.isDisturbed = true;
        await view.go(address);
        await view.tab.waitForSelector('h1');
        await untilText(view.tab, 'live', '.top');
    }
    assert.deepEqual(view.faults, []);
    await view.end();
});
