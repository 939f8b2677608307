// A host that puts a script into every text that it can fill. It is shown, and does not run.
import assert from 'node:assert/strict';
import { after, before, test } from 'node:test';
import { untilText } from '../support/browser.mjs';
import { raise } from '../support/stage.mjs';

let stage;
before(async () => (stage = await raise()));
after(() => stage.strike());

test('scripts in whatever a host says are text', async () => {
    const view = await stage.open({ host: { isHostile: true } });
    const { tab, faults, fake, go, own } = view;
    own.isDisturbed = true;
    fake.slow(60_000);
    const task = fake.accept({ command: 'START', product: 'um' });
    const past = 'a0a99408e7707b3d-24';
    for (const address of ['/', '/agents', '/tasks', `/tasks/${past}`, `/tasks/${task.id}`, '/configuration?product=ux', '/depot', '/events', '/doctor', `/tasks/${encodeURIComponent('<img src=x onerror=reportFault(1)>')}`]) {
        await go(address);
        await untilText(tab, '<script>', address.startsWith('/tasks/%') ? 'body' : 'main').catch(async (error) => {
            if (address.startsWith('/configuration')) {
                assert.match(await tab.$eval('.editor', (editor) => editor.value), /<script>/);
            } else if (!address.startsWith('/tasks/%')) throw new Error(`${address}: ${error.message}`);
        });
        const own = await tab.evaluate(() => document.querySelectorAll('main img, main script, .notices img, .notices script').length);
        assert.equal(own, 0, `${address} has made elements of a host's text`);
    }
    await go('/agents');
    await tab.evaluate(() => [...document.querySelectorAll('button')].find((one) => one.textContent === 'Stop').click());
    await tab.evaluate(async () => {
        const dialog = document.querySelector('dialog');
        dialog?.querySelector('button[type=submit]')?.click();
    });
    await untilText(tab, 'accepted', '.notices').catch(() => undefined);
    assert.deepEqual(faults.filter((fault) => /script of the host|policy|dialog/.test(fault)), []);
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
