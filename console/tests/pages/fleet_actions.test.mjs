// Everything that can be done in a fleet's pages, from the click to what the operator's zavctl is asked for.
import assert from 'node:assert/strict';
import { mkdtemp, rm, writeFile } from 'node:fs/promises';
import os from 'node:os';
import path from 'node:path';
import { after, before, test } from 'node:test';
import { press, untilText } from '../support/browser.mjs';
import { raise } from '../support/stage.mjs';

let stage;
before(async () => (stage = await raise()));
after(() => stage.strike());

const on = (address, act, centre = {}) => stage.on(address, { centre: { hosts: 60, ...centre } }, act);
const at = (tab, address) => tab.waitForFunction((wanted) => location.pathname + location.search === wanted, {}, address);

const fill = async (tab, selector, text) => {
    const field = await tab.waitForSelector(selector);
    await field.click({ count: 3 });
    await field.type(text);
};

const line = (tab) => tab.$eval('dialog .command-line code', (code) => code.textContent);

test('an agent is started on many hosts after a preview, and leads to its roll-out', async () => {
    await on('/agents', async ({ tab, fake }) => {
        await press(tab, 'Start ux');
        await untilText(tab, 'Say which hosts are meant.', 'dialog');
        await fill(tab, 'dialog input[name=on]', 'env=test');
        await (await tab.waitForSelector('dialog summary')).click();
        await fill(tab, 'dialog input[name=waves]', '1,10%,100%');
        await fill(tab, 'dialog input[name=max-failures]', '2%');
        await fill(tab, 'dialog input[name=pause]', '60s');
        await fill(tab, 'dialog input[name=wait]', '10m');
        await fill(tab, 'dialog input[name=parallel]', '5');
        await fill(tab, 'dialog input[name=expires]', '2h');
        assert.equal(await line(tab), 'zavctl --fleet https://centre.example:8443 start ux --on env=test --waves 1,10%,100% --max-failures 2% --pause 60s --wait 10m --parallel 5 --expires 2h');
        await press(tab, 'Preview the hosts');
        await untilText(tab, '15 hosts would get START ux, good for 1 day', 'dialog');
        await untilText(tab, 'web-00004', 'dialog .preview');
        const options = { on: 'env=test', waves: '1,10%,100%', 'max-failures': '2%', pause: '60s', wait: '10m', parallel: '5', expires: '2h' };
        assert.deepEqual(fake.runs, [{ verb: 'start', arguments: ['ux'], options: { ...options, 'dry-run': true } }]);
        await press(tab, 'Send start ux to 15 hosts');
        await at(tab, '/rollouts/rollout00003');
        await untilText(tab, 'start ux: begun on 15 hosts', '.notices');
        await untilText(tab, '0 of 15 over; 15 waiting', 'main');
        assert.deepEqual(fake.runs[1], { verb: 'start', arguments: ['ux'], options });
    });
});

test('a preview that no longer fits what is asked for cannot be sent', async () => {
    await on('/agents?on=env%3Dtest', async ({ tab, fake }) => {
        await press(tab, 'Stop ux');
        await press(tab, 'Preview the hosts');
        await untilText(tab, 'Send stop ux to 15 hosts', 'dialog');
        await fill(tab, 'dialog input[name=on]', 'env=live');
        assert.equal(await tab.$('dialog .preview'), null);
        await press(tab, 'Preview the hosts');
        await untilText(tab, 'Send stop ux to 45 hosts', 'dialog');
        await (await tab.waitForSelector('dialog .check input')).click();
        await untilText(tab, 'Preview the hosts', 'dialog footer');
        assert.match(await line(tab), / --force$/);
        assert.ok(fake.runs.every((run) => run.options['dry-run'] === true));
    });
});

test('restart and uninstall are asked for with the same windows', async () => {
    await on('/agents?on=env%3Dtest', async ({ tab, fake }) => {
        for (const [name, verb] of [['Restart ux', 'restart'], ['Uninstall… ux', 'uninstall']]) {
            await press(tab, name);
            await press(tab, 'Preview the hosts');
            await press(tab, `Send ${verb} ux to 15 hosts`);
            await untilText(tab, `${verb} ux: begun on 15 hosts`, '.notices');
            assert.deepEqual(fake.runs.at(-1), { verb, arguments: ['ux'], options: { on: 'env=test' } });
            await tab.goBack();
        }
    });
});

test('an install sends its command as one word behind the dashes', async () => {
    await on('/agents', async ({ tab, fake }) => {
        await press(tab, 'Install…');
        await fill(tab, 'dialog input[name=product]', 'ux');
        await fill(tab, 'dialog input[name=version]', '7.2');
        await fill(tab, 'dialog input[name=on]', '*');
        assert.equal(await line(tab), "zavctl --fleet https://centre.example:8443 install ux 7.2 --on '*' -- '/bin/sh |DEPLOYDIR|/install.sh -h |TOVRINHOME|'");
        await (await tab.waitForSelector('dialog .check input')).click();
        await press(tab, 'Preview the hosts');
        await press(tab, 'Send install ux to 60 hosts');
        await untilText(tab, 'install ux: begun on 60 hosts', '.notices');
        assert.deepEqual(fake.runs.at(-1), { verb: 'install', arguments: ['ux', '7.2', '/bin/sh |DEPLOYDIR|/install.sh -h |TOVRINHOME|'], options: { on: '*', restart: true } });
    });
});

test('a file is brought to the depots of many hosts', async () => {
    const folder = await mkdtemp(path.join(os.tmpdir(), 'fleet-push-'));
    const file = path.join(folder, 'package.tar');
    await writeFile(file, 'x'.repeat(70_000));
    await on('/agents?on=env%3Dtest', async ({ tab, fake }) => {
        await press(tab, 'Push…');
        await (await tab.waitForSelector('dialog input[type=file]')).uploadFile(file);
        await fill(tab, 'dialog input[name=path]', 'ux/7.2/package.tar');
        assert.equal(await line(tab), 'zavctl --fleet https://centre.example:8443 push package.tar ux/7.2/package.tar --on env=test');
        await press(tab, 'Preview the hosts');
        await press(tab, 'Push it to 15 hosts');
        await untilText(tab, 'push ux/7.2/package.tar: begun on 15 hosts', '.notices');
        await at(tab, '/rollouts/rollout00003');
        assert.deepEqual(fake.runs, [{ path: 'ux/7.2/package.tar', on: 'env=test', bytes: 70_000 }]);
    });
    await rm(folder, { recursive: true });
});

test('a refusal is shown in its own words, and nothing is lost that was written', async () => {
    await on('/agents', async ({ tab }) => {
        await press(tab, 'Start ux');
        await fill(tab, 'dialog input[name=on]', 'env=(');
        await press(tab, 'Preview the hosts');
        await untilText(tab, 'the selector\'s term "env=(" has no label\'s name', 'dialog [role=alert]');
        await fill(tab, 'dialog input[name=on]', 'web-9*');
        await press(tab, 'Preview the hosts');
        await untilText(tab, 'there are no such hosts', 'dialog [role=alert]');
        assert.equal(await tab.$eval('dialog input[name=on]', (field) => field.value), 'web-9*');
    });
});

test('an answer that is lost is not asked for again by itself', async () => {
    await stage.on('/agents?on=env%3Dtest', { centre: { hosts: 60 } }, async ({ tab, fake, front, own }) => {
        own.isDisturbed = true;
        await press(tab, 'Start ux');
        await press(tab, 'Preview the hosts');
        await untilText(tab, 'Send start ux to 15 hosts', 'dialog');
        front.state.isDeaf = true;
        await press(tab, 'Send start ux to 15 hosts');
        await untilText(tab, 'It may have begun all the same', 'dialog [role=alert]');
        assert.equal(fake.runs.filter((run) => !run.options['dry-run']).length, 1);
        await untilText(tab, 'Preview the hosts', 'dialog footer');
    });
});

test('a roll-out is paused, goes on, and tries again where it failed', async () => {
    await on('/rollouts/rollout00002', async ({ tab, fake }) => {
        await press(tab, 'Pause…');
        assert.equal(await line(tab), 'zavctl --fleet https://centre.example:8443 rollout pause rollout00002');
        await press(tab, 'Pause the roll-out');
        await untilText(tab, 'paused: paused by anna', 'main');
        await press(tab, 'Resume…');
        await press(tab, 'Resume the roll-out');
        await untilText(tab, 'rollout resume rollout00002: goes on', '.notices');
        await press(tab, 'Abort…');
        await press(tab, 'Abort the roll-out');
        await untilText(tab, 'aborted: aborted by anna', 'main');
        assert.equal(await tab.$('.page-head .tools button'), null);
        assert.deepEqual(fake.runs.map((run) => [run.verb, run.arguments, run.options]), [
            ['rollout pause', ['rollout00002'], {}], ['rollout resume', ['rollout00002'], {}], ['rollout abort', ['rollout00002'], {}],
        ]);
    });
});

test('what nobody knows is tried again only if somebody insists', async () => {
    await on('/rollouts/rollout00001', async ({ tab, fake }) => {
        await untilText(tab, 'TovrinAgent: ux did not start, process 4711 has ended', '.failures');
        await press(tab, 'Retry failed…');
        await (await tab.waitForSelector('dialog .check input')).click();
        await untilText(tab, 'rollout retry-failed rollout00001 --force', 'dialog');
        await press(tab, 'Retry failed the roll-out');
        await untilText(tab, '6 waiting', '.legend');
        assert.deepEqual(fake.runs, [{ verb: 'rollout retry-failed', arguments: ['rollout00001'], options: { force: true } }]);
    });
});

test('a configuration is compared, edited, shown as a difference and sent to the selector', async () => {
    await on('/configuration', async ({ tab, fake }) => {
        await fill(tab, 'main input[name=product]', 'ux');
        await fill(tab, 'main input[name=on]', 'env=test');
        await press(tab, 'Compare');
        await untilText(tab, '3 hosts that differ', 'main');
        assert.deepEqual(fake.runs, [{ verb: 'config get', arguments: ['ux'], options: { on: 'env=test', diff: true } }]);
        await (await tab.waitForSelector('.same-ones button')).click();
        const editor = await tab.waitForSelector('.editor');
        await editor.click();
        await tab.keyboard.down('Control');
        await tab.keyboard.press('Home');
        await tab.keyboard.up('Control');
        await tab.keyboard.type('A=1\n');
        await untilText(tab, '1 line added', '.diff');
        await press(tab, 'Send…');
        await untilText(tab, '1 line added', 'dialog .diff');
        await press(tab, 'Preview the hosts');
        await press(tab, 'Send config set ux to 15 hosts');
        await untilText(tab, 'config set ux: begun on 15 hosts', '.notices');
        assert.deepEqual(fake.runs.at(-1), { verb: 'config set', arguments: ['ux', '-'], options: { on: 'env=test' }, input: 'A=1\nINTERVAL=5\n# A larger file is rotated.\nMAX_KB=1024\n' });
    });
});

test('what is written and on no host is not left without a question', async () => {
    await on('/configuration?product=ux&on=env%3Dtest', async ({ tab, own }) => {
        await (await tab.waitForSelector('.same-ones button')).click();
        await tab.type('.editor', 'A=1\n');
        await untilText(tab, '1 line added', '.diff');
        own.answers.push(false);
        await tab.click('nav a[href="/hosts"]');
        assert.equal(await tab.evaluate(() => location.pathname), '/configuration');
        own.answers.push(true);
        await tab.click('nav a[href="/hosts"]');
        await at(tab, '/hosts');
    });
});

test('one host is asked for its tasks, and its agents are acted on alone', async () => {
    await on('/hosts/UHOST00004', async ({ tab, fake }) => {
        await press(tab, 'Ask the host');
        await untilText(tab, 'ux runs on web-00004 already', 'main');
        assert.deepEqual(fake.runs, [{ verb: 'tasks', arguments: [], options: { limit: '20' }, hosts: ['web-00004'] }]);
        await press(tab, 'Start db1:h4:UX');
        assert.equal(await line(tab), "printf '%s\\n' web-00004 | zavctl --fleet https://centre.example:8443 start ux --on @/dev/stdin --target db1:h4:UX");
        await press(tab, 'Preview the hosts');
        await untilText(tab, 'Send start ux to 1 host', 'dialog');
        assert.deepEqual(fake.runs.at(-1), { verb: 'start', arguments: ['ux'], options: { target: 'db1:h4:UX', 'dry-run': true }, hosts: ['web-00004'] });
        await press(tab, 'Back');
        await press(tab, 'Remove… db1:h4:UX');
        await press(tab, 'Preview the hosts');
        await press(tab, 'Send remove-instance ux to 1 host');
        await untilText(tab, 'remove-instance ux: begun on 1 host', '.notices');
        assert.deepEqual(fake.runs.at(-1), { verb: 'remove-instance', arguments: ['ux', 'db1:h4:UX'], options: {}, hosts: ['web-00004'] });
    });
});

test('the hosts that have a version are acted on by their names', async () => {
    await on('/agents?product=ux&version=070200000', async ({ tab, fake }) => {
        await press(tab, 'Restart ux on these hosts');
        await untilText(tab, 'On 6 hosts', 'dialog');
        await press(tab, 'Preview the hosts');
        await press(tab, 'Send restart ux to 6 hosts');
        await untilText(tab, 'restart ux: begun on 6 hosts', '.notices');
        const hosts = ['web-00003', 'web-00013', 'web-00023', 'web-00033', 'web-00043', 'web-00053'];
        assert.deepEqual(fake.runs.at(-1), { verb: 'restart', arguments: ['ux'], options: {}, hosts });
    });
});

test('a named instance is acted on where it is, by its target', async () => {
    await on('/agents?product=ux', async ({ tab, fake }) => {
        await untilText(tab, 'Instances of ux: 60', 'main');
        await press(tab, 'Start db1:h0:UX');
        assert.equal(await line(tab), "printf '%s\\n' web-00000 | zavctl --fleet https://centre.example:8443 start ux --on @/dev/stdin --target db1:h0:UX");
        await press(tab, 'Preview the hosts');
        await press(tab, 'Send start ux to 1 host');
        await untilText(tab, 'start ux: begun on 1 host', '.notices');
        assert.deepEqual(fake.runs.at(-1), { verb: 'start', arguments: ['ux'], options: { target: 'db1:h0:UX' }, hosts: ['web-00000'] });
    });
});

test('the configuration of one host is asked for by its name', async () => {
    await on('/hosts/UHOST00004', async ({ tab, fake }) => {
        await press(tab, 'Configuration of web-00004', 'link');
        await fill(tab, 'main input[name=product]', 'ux');
        await press(tab, 'Compare');
        await untilText(tab, '1 host with the same', 'main');
        assert.deepEqual(fake.runs, [{ verb: 'config get', arguments: ['ux'], options: { diff: true }, hosts: ['web-00004'] }]);
    });
});

test('an admin changes the labels that the centre gives', async () => {
    await on('/hosts/UHOST00004', async ({ tab, fake }) => {
        await press(tab, 'Labels…');
        await fill(tab, 'dialog input[name=labels]', 'env=live site-');
        await press(tab, 'Change the labels');
        await untilText(tab, 'env=live', '.facts');
        assert.deepEqual(fake.runs, [{ verb: 'hosts label', arguments: ['web-00004', 'env=live', 'site-'], options: {} }]);
    });
});

test('an operator is offered what the certificate allows', async () => {
    await on('/agents', async ({ tab }) => {
        await tab.waitForSelector('aria/Start ux');
        const names = await tab.$$eval('main button', (buttons) => buttons.map((one) => one.getAttribute('aria-label') ?? one.textContent));
        assert.deepEqual(names.filter((name) => /ux|Install/.test(name)), ['Start ux', 'Stop ux']);
    }, { role: 'operator' });
});

test('a viewer is offered nothing that changes anything, and a refusal has its words', async () => {
    await stage.on('/agents', { centre: { hosts: 60, role: 'viewer' } }, async ({ tab, fake, go, own }) => {
        await untilText(tab, 'You may look, and change nothing', 'main');
        const actions = /push|start|stop|install|configure|send|pause|resume|abort|retry failed|labels|remove|edit|ask the host|compare with/i;
        for (const [address, text] of [['/', 'Versions'], ['/hosts', 'web-00004'], ['/hosts/UHOST00004', 'should run, does not'], ['/agents', '070200000'],
            ['/rollouts', 'INSTALL'], ['/rollouts/rollout00002', 'under way'], ['/configuration?product=ux&on=*', 'does not allow GETCONFIG'],
            ['/hosts/UHOST00004/tasks/order-4', 'does not allow OUTPUT']]) {
            await go(address);
            await untilText(tab, text, 'main');
            await untilText(tab, 'may only look', '.top');
            const names = await tab.$$eval('main button, dialog button', (buttons) => buttons.map((one) => one.getAttribute('aria-label') ?? one.textContent));
            assert.deepEqual(names.filter((name) => actions.test(name)), [], address);
        }
        assert.deepEqual(fake.runs, []);
        own.isDisturbed = true;
        const answer = await tab.evaluate(async () => {
            const body = JSON.stringify({ verb: 'start', arguments: ['ux'], options: { on: '*' } });
            const reply = await fetch('/console/run', { method: 'POST', headers: { 'Content-Type': 'application/json', 'X-Zav-Console': '1' }, body });
            return [reply.status, (await reply.json()).error];
        });
        assert.deepEqual(answer, [403, 'a viewer changes nothing']);
        assert.equal(fake.rollouts.length, 2);
    });
});

test('a certificate that ends meanwhile is told in the words of the refusal', async () => {
    await stage.on('/agents?on=env%3Dtest', { centre: { hosts: 60 } }, async ({ tab, front, own }) => {
        own.isDisturbed = true;
        await press(tab, 'Start ux');
        await untilText(tab, 'Preview the hosts', 'dialog');
        front.state.refusal = 'your certificate is over';
        await press(tab, 'Preview the hosts');
        await untilText(tab, 'your certificate is over', 'dialog [role=alert]');
    });
});

test('a page that only looks offers lines, and asks for nothing that changes anything', async () => {
    await stage.on('/agents?on=env%3Dtest&product=ux', { centre: { hosts: 60, onlyLooks: true } }, async ({ tab, fake, front, go }) => {
        await untilText(tab, 'here only to look', '.top');
        for (const [address, text, least] of [['/agents?on=env%3Dtest&product=ux', 'Hosts with ux', 8], ['/hosts/UHOST00004', 'should run, does not', 4], ['/rollouts/rollout00002', 'under way', 2]]) {
            await go(address);
            await untilText(tab, text, 'main');
            await tab.waitForFunction(() => /Start|Labels|Abort/.test(document.querySelector('main').innerText));
            const names = await tab.$$eval('main button', (buttons) => buttons.map((one) => one.getAttribute('aria-label') ?? one.textContent));
            const actions = names.filter((name) => /start|stop|install|push|pause|abort|retry|labels|remove/i.test(name));
            assert.ok(actions.length >= least, `${address}: ${actions}`);
            for (const name of actions) {
                await press(tab, name);
                await untilText(tab, 'This page only looks.', 'dialog');
                assert.equal(await tab.$('dialog button[type=submit]'), null, name);
                // A form is also sent with the key for the end of a line.
                const field = await tab.$('dialog .field input:not([type]):not(details *)');
                await field?.press('Enter');
                await press(tab, 'Back');
            }
        }
        await go('/agents?on=env%3Dtest');
        await press(tab, 'Stop ux');
        assert.equal(await line(tab), 'zavctl --fleet https://centre.example:8443 stop ux --on env=test');
        await go('/hosts/UHOST00004');
        await untilText(tab, 'tells them to whoever holds an operator\'s key', 'main');
        await (await tab.waitForSelector('a[href="/hosts/UHOST00004/tasks/order-4"]')).click();
        await untilText(tab, 'shows its output to whoever holds an operator\'s key', 'main');
        await untilText(tab, 'This page only looks.', 'main');
        await untilText(tab, 'zavctl --fleet https://centre.example:8443 task output -f order-4 --on web-00004', 'main .command-line');
        assert.deepEqual(front.state.requests.filter((one) => one.includes('/console/output')), []);
        await go('/configuration?product=ux&on=env%3Dtest');
        await untilText(tab, 'zavctl --fleet https://centre.example:8443 config set ux --on env=test --file FILE', 'main');
        assert.deepEqual(fake.runs, []);
        assert.deepEqual(front.state.requests.filter((request) => !request.startsWith('GET ')), []);
    });
});

test('what is being written stays on the page when the session ends', async () => {
    await stage.on('/configuration?product=ux&on=env%3Dtest', { centre: { hosts: 60 } }, async ({ tab, fake, front, own }) => {
        await (await tab.waitForSelector('.same-ones button')).click();
        await tab.type('.editor', 'A=1\n');
        own.isDisturbed = true;
        front.state.isOver = true;
        // What the centre does not keep has the page ask who it is, and hear that its session is over.
        fake.tell('gap', { missing: null });
        await untilText(tab, 'this session is over', 'main > [role=alert]');
        assert.match(await tab.$eval('.editor', (editor) => editor.value), /^A=1$/m);
        front.state.isOver = false;
        fake.tell('gap', { missing: null });
        await tab.waitForFunction(() => !document.querySelector('main > [role=alert]'));
        assert.match(await tab.$eval('.editor', (editor) => editor.value), /^A=1$/m);
    });
});
