// A fleet that puts a script into every text that hosts, operators and the centre can fill. It is shown,
// and does not run.
import assert from 'node:assert/strict';
import { after, before, test } from 'node:test';
import { press, untilText } from '../support/browser.mjs';
import { script } from '../support/fake_host.mjs';
import { raise } from '../support/stage.mjs';

let stage;
before(async () => (stage = await raise()));
after(() => stage.strike());

const open = () => stage.open({ centre: { hosts: 12, isHostile: true } });

async function hasNoElements(tab, where) {
    const made = await tab.evaluate(() => document.querySelectorAll('main img, main script, dialog img, dialog script, .notices img, .notices script').length);
    assert.equal(made, 0, `${where} has made elements of a text`);
}

test('scripts in whatever a fleet says are text', async () => {
    const view = await open();
    const { tab, faults, go } = view;
    for (const [address, where] of [['/', '.panel.attention'], ['/', '.matrix'], ['/hosts', '.list'], ['/hosts/UHOST00004', '.instances'], ['/hosts/UHOST00002', '.box'],
        ['/agents', '.matrix'], ['/rollouts', '.list'], ['/rollouts/rollout00001', '.failures'], ['/configuration?product=ux&on=*', '.diff']]) {
        await go(address);
        await untilText(tab, '<script>', where);
        await untilText(tab, '<script>', '.top');
        await hasNoElements(tab, address);
    }
    assert.deepEqual(faults, []);
    await view.end();
});

test('scripts in previews, refusals, notices and answers of hosts are text', async () => {
    const view = await open();
    const { tab, faults, go, own } = view;
    await go('/agents?on=*');
    await untilText(tab, 'Monitoring agent', '.matrix');
    await (await tab.waitForSelector('.matrix tbody tr:last-child button')).click();
    await press(tab, 'Preview the hosts');
    await untilText(tab, '<script>', 'dialog .preview');
    await hasNoElements(tab, 'a preview');
    await tab.click('dialog footer button[type=submit]');
    await untilText(tab, '<script>', '.notices');
    await hasNoElements(tab, 'a notice');
    await press(tab, 'Pause…');
    await press(tab, 'Pause the roll-out');
    await untilText(tab, 'paused by anna<img', 'main .box');
    await hasNoElements(tab, 'a reason');
    await go('/configuration?product=ux&on=*');
    await (await tab.waitForSelector('.same-ones button')).click();
    await tab.waitForFunction(() => document.querySelector('.editor')?.value.includes('<script>'));
    await tab.type('.editor', 'A=1\n');
    await untilText(tab, '<script>', '.diff');
    await hasNoElements(tab, 'a difference');
    own.isDisturbed = true;
    own.answers.push(true);
    await go(`/rollouts/${encodeURIComponent('<img src=x onerror=reportFault(1)>')}`);
    await untilText(tab, 'there is no roll-out "<img', '[role=alert]');
    await hasNoElements(tab, 'a roll-out that is not there');
    assert.deepEqual(faults, []);
    await view.end();
});

test('scripts in what a task writes are text', async () => {
    const view = await open();
    const { tab, faults, fake, go, own } = view;
    fake.tellOutput('UHOST00004', 'a0-7', 'message', { stream: 'stdout', text: `one${script}\n` });
    fake.tellOutput('UHOST00004', 'a0-7', 'message', { stream: 'stderr', text: `two${script}\n` });
    await go('/hosts/UHOST00004/tasks/a0-7');
    await untilText(tab, 'two<img', '.output .stderr');
    await untilText(tab, 'ux runs on web-00004<img', 'main');
    await hasNoElements(tab, 'an output');
    own.isDisturbed = true;
    fake.refuseOutput(502, { error: `it is away${script}`, hint: script });
    fake.tellOutput('UHOST00004', 'a0-7', 'break', { error: script, hint: script });
    await untilText(tab, 'it is away<img', 'main');
    await hasNoElements(tab, 'a break');
    fake.refuseOutput();
    await go('/hosts/UHOST00004/tasks/none');
    await untilText(tab, 'there is no task', '[role=alert]');
    await hasNoElements(tab, 'a refusal');
    assert.deepEqual(faults, []);
    await view.end();
});

test('scripts in an address of a fleet do not run', async () => {
    const view = await stage.open({ centre: { hosts: 12 } });
    const evil = encodeURIComponent(`"><img src=x onerror="reportFault('a script of the address ran')">`);
    view.own.isDisturbed = true;
    for (const address of [`/hosts?on=${evil}&text=${evil}&is=${evil}`, `/agents?on=${evil}&product=${evil}&version=${evil}`, `/configuration?product=${evil}&target=${evil}&on=${evil}`,
        `/rollouts/rollout00001?state=${evil}`, '/hosts?is=__proto__', '/__proto__/x', '/constructor', `/hosts/${evil}`, `/rollouts/${evil}`,
        `/hosts/UHOST00004/tasks/${evil}`, `/hosts/${evil}/tasks/x`, '/hosts/UHOST00004/__proto__/x', '/constructor/x/y/z']) {
        await view.go(address);
        await view.tab.waitForSelector('h1');
        await untilText(view.tab, 'live', '.top');
        await hasNoElements(view.tab, address);
    }
    assert.deepEqual(view.faults, []);
    await view.end();
});
