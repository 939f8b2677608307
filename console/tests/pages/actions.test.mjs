// Everything that can be done, from the click to what the host shows afterwards.
import assert from 'node:assert/strict';
import { createHash } from 'node:crypto';
import { mkdir, mkdtemp, rm, writeFile } from 'node:fs/promises';
import os from 'node:os';
import path from 'node:path';
import { after, before, test } from 'node:test';
import { press, untilText } from '../support/browser.mjs';
import { dropPaths, folderOf } from '../support/drop.mjs';
import { raise } from '../support/stage.mjs';

let stage;
before(async () => (stage = await raise()));
after(() => stage.strike());

const on = (...given) => stage.on(...given);

const fill = async (tab, selector, text) => {
    const field = await tab.waitForSelector(selector);
    await field.click({ count: 3 });
    await field.type(text);
};
const notice = (tab, text) => untilText(tab, text, '.notices');
const last = (fake) => fake.tasks.at(-1);

test('an agent is stopped, started and restarted, and the page follows', async () => {
    await on('/agents', { command: ['zavctl', '--socket', '/tmp/a b'] }, async ({ tab, fake }) => {
        await press(tab, 'Stop db7:UX');
        await untilText(tab, "zavctl --socket '/tmp/a b' stop ux", 'dialog');
        await press(tab, 'Copy the command line');
        await untilText(tab, 'Copied', 'dialog');
        assert.equal(await tab.evaluate(() => navigator.clipboard.readText()), "zavctl --socket '/tmp/a b' stop ux");
        await press(tab, 'Send stop ux');
        await notice(tab, 'stop ux: done');
        await press(tab, 'Start db7:UX');
        await press(tab, 'Send start ux');
        await notice(tab, 'start ux: done');
        await press(tab, 'Restart db7:UX');
        await press(tab, 'Send restart ux');
        await notice(tab, 'restart ux: done');
        assert.deepEqual(fake.tasks.slice(-3).map((task) => task.command), ['STOP', 'START', 'RESTART']);
    });
});

test('a named instance is started by its target, and removed', async () => {
    await on('/agents', {}, async ({ tab, fake }) => {
        await press(tab, 'Start db1:db7:UX');
        await untilText(tab, 'zavctl start --target db1:db7:UX ux', 'dialog');
        await press(tab, 'Send start ux db1:db7:UX');
        await notice(tab, 'start ux db1:db7:UX: done');
        await press(tab, 'Remove… db1:db7:UX');
        await press(tab, 'Send remove-instance ux db1:db7:UX');
        await notice(tab, 'remove-instance ux db1:db7:UX: done');
        await tab.waitForFunction(() => !document.querySelector('main').innerText.includes('db1:db7:UX'));
        assert.equal(last(fake).command, 'REMOVEINSTANCE');
    });
});

test('a success that the host does not show is no success', async () => {
    await on('/agents', {}, async ({ tab, fake }) => {
        Object.defineProperty(fake.instances[0], 'state', { get: () => 'running', set: () => undefined, enumerable: true });
        await press(tab, 'Stop db7:UX');
        await press(tab, 'Send stop ux');
        await notice(tab, 'the host reported success, but db7:UX still runs');
    });
});

test('a product is installed from the depot, and uninstalled', async () => {
    await on('/agents', {}, async ({ tab, fake }) => {
        await press(tab, 'Install…');
        await fill(tab, 'input[list="depot-products"]', 'ny');
        await fill(tab, 'input[list="depot-versions"]', '7.1');
        await untilText(tab, "zavctl install ny 7.1 -- '/bin/sh |DEPLOYDIR|/install.sh -h |TOVRINHOME|'", 'dialog');
        await press(tab, 'Send install ny');
        await notice(tab, 'install ny: done');
        await press(tab, 'Uninstall… ny');
        await press(tab, 'Send uninstall ny');
        await notice(tab, 'uninstall ny: done');
        assert.equal(last(fake).command, 'UNINSTALL');
    });
});

test('a refusal has the words, the guard and the way out', async () => {
    await on('/agents', {}, async (view) => {
        const { tab } = view;
        view.own.isDisturbed = true;
        await press(tab, 'Install…');
        await fill(tab, 'input[list="depot-products"]', 'zz');
        await fill(tab, 'input[list="depot-versions"]', '1');
        await press(tab, 'Send install zz');
        for (const text of ['zz is not installed here', 'product', 'installed: ax, um, ux']) await untilText(tab, text, 'dialog [role=alert]');
    });
});

test('a request whose answer was lost is no second task when it is sent again', async () => {
    await on('/agents', {}, async (view) => {
        const { tab, fake, front } = view;
        view.own.isDisturbed = true;
        const known = fake.tasks.length;
        // The host takes it, and nobody hears of that.
        front.state.isDeaf = true;
        await press(tab, 'Stop db7:UX');
        await press(tab, 'Send stop ux');
        await untilText(tab, 'It may have been accepted all the same.', 'dialog [role=alert]');
        front.state.isDeaf = false;
        await press(tab, 'Send stop ux');
        await notice(tab, 'stop ux: done');
        assert.deepEqual(fake.tasks.slice(known).map((task) => task.command), ['STOP']);
    });
});

test('a window stays until what it has asked for is answered', async () => {
    await on('/agents', {}, async (view) => {
        const { tab, front } = view;
        view.own.isDisturbed = true;
        let letGo;
        const held = new Promise((done) => (letGo = done));
        front.state.hold = (request) => (request.method === 'POST' && request.url === '/v1/tasks' ? held : undefined);
        await press(tab, 'Install…');
        await fill(tab, 'input[list="depot-products"]', 'zz');
        await fill(tab, 'input[list="depot-versions"]', '1');
        await press(tab, 'Send install zz');
        await untilText(tab, 'Asking…', 'dialog');
        const closers = await tab.$$eval('dialog button:not([type=submit])', (buttons) => buttons.filter((one) => /Back|✕/.test(one.textContent)).map((one) => one.disabled));
        assert.deepEqual(closers, [true, true]);
        for (let times = 0; times < 3; ++times) await tab.keyboard.press('Escape');
        await tab.waitForSelector('dialog:modal');
        letGo();
        await untilText(tab, 'zz is not installed here', 'dialog [role=alert]');
        await tab.keyboard.press('Escape');
        await tab.waitForSelector('dialog', { hidden: true });
    });
});

test('what becomes of a request is told also when its page has been left', async () => {
    await on('/', {}, async (view) => {
        const { tab, front } = view;
        view.own.isDisturbed = true;
        let letGo;
        const held = new Promise((done) => (letGo = done));
        front.state.hold = (request) => (request.method === 'POST' && request.url === '/v1/tasks' ? held : undefined);
        await tab.click('nav a[href="/agents"]');
        await press(tab, 'Install…');
        await fill(tab, 'input[list="depot-products"]', 'zz');
        await fill(tab, 'input[list="depot-versions"]', '1');
        await press(tab, 'Send install zz');
        await untilText(tab, 'Asking…', 'dialog');
        await tab.evaluate(() => history.back());
        await tab.waitForFunction(() => location.pathname === '/');
        letGo();
        await notice(tab, 'install zz: not accepted');
        await notice(tab, 'zz is not installed here');
    });
});

test('a running task is watched and cancelled, and done again', async () => {
    await on('/tasks', {}, async ({ tab, fake, go }) => {
        fake.slow(20_000);
        const task = fake.accept({ command: 'START', product: 'um' });
        await untilText(tab, 'running', '.list');
        await go(`/tasks/${task.id}`);
        await untilText(tab, 'line 2', '.output');
        await press(tab, 'Cancel…');
        await untilText(tab, `zavctl task cancel ${task.id}`, 'dialog');
        await press(tab, 'Cancel the task');
        await untilText(tab, 'cancelled', '.page-head');
        fake.slow(200);
        await press(tab, 'Do again…');
        await press(tab, 'Send start um');
        await notice(tab, 'start um: done');
        await untilText(tab, last(fake).id, '.page-head');
        await untilText(tab, 'done', '.page-head');
    });
});

test('doing a change of a configuration again asks for the text', async () => {
    await on('/tasks/a0a99408e7707b3d-5', {}, async ({ tab, fake }) => {
        await press(tab, 'Do again…');
        await untilText(tab, 'Give the text of the configuration.', 'dialog');
        assert.equal(await tab.$eval('dialog [type=submit]', (button) => button.disabled), true);
        await fill(tab, 'dialog textarea', 'INTERVAL=7');
        await tab.click('dialog [type=submit]');
        await notice(tab, 'config set ux');
        await notice(tab, 'done');
        assert.equal(fake.configurations.get('ux'), 'INTERVAL=7');
    });
});

test('a command that the host has cut is not sent before the whole of it is given', async () => {
    await on('/tasks', {}, async ({ tab, fake, go }) => {
        const command = `/bin/sh |DEPLOYDIR|/install.sh ${'x'.repeat(5_000)}`;
        const task = fake.accept({ command: 'INSTALL', product: 'ny', version: '7.1', context: command.slice(0, 4096) });
        await go(`/tasks/${task.id}`);
        await untilText(tab, 'done', '.page-head');
        await press(tab, 'Do again…');
        await untilText(tab, 'The context is cut: give the whole of it.', 'dialog');
        assert.equal(await tab.$eval('dialog [type=submit]', (button) => button.disabled), true);
        await tab.$eval('dialog textarea', (field, whole) => {
            field.value = whole;
            field.dispatchEvent(new Event('input', { bubbles: true }));
        }, command);
        await tab.waitForFunction(() => !document.querySelector('dialog [type=submit]').disabled);
        await tab.click('dialog [type=submit]');
        await notice(tab, 'install ny: done');
        assert.equal(last(fake).context, command);
    });
});

test('a configuration is changed after its difference has been shown', async () => {
    await on('/configuration?product=ux', {}, async ({ tab, fake }) => {
        await tab.waitForSelector('.editor');
        await tab.$eval('.editor', (editor) => {
            editor.value = editor.value.replace('INTERVAL=5', 'INTERVAL=30');
            editor.dispatchEvent(new Event('input', { bubbles: true }));
        });
        await untilText(tab, '1 line removed, 1 line added');
        const before = fake.tasks.filter((task) => task.command === 'SETCONFIG').length;
        await press(tab, 'Send…');
        await untilText(tab, "zavctl config set ux - <<'END'", 'dialog');
        assert.equal(fake.tasks.filter((task) => task.command === 'SETCONFIG').length, before);
        await press(tab, 'Send config set ux');
        await notice(tab, 'config set ux: done');
        assert.match(fake.configurations.get('ux'), /INTERVAL=30\n/);
        await untilText(tab, 'No difference to what is there.');
    });
});

test('a changed configuration stays in the editor until its task has ended', async () => {
    await on('/configuration?product=ux', {}, async ({ tab, fake }) => {
        fake.slow(60_000);
        await fill(tab, '.editor', 'INTERVAL=44\n');
        await press(tab, 'Send…');
        await press(tab, 'Send config set ux');
        await notice(tab, 'config set ux: accepted');
        await untilText(tab, 'is on its way');
        await new Promise((done) => setTimeout(done, 1_500));
        assert.equal(await tab.$eval('.editor', (editor) => editor.value.includes('INTERVAL=44')), true);
        assert.equal(await tab.$$eval('main .columns button.main', ([button]) => button.disabled), true);
        last(fake).finish('failed');
        await notice(tab, 'config set ux: failed');
        await tab.waitForFunction(() => !document.querySelector('main .columns button.main').disabled);
        assert.equal(await tab.$eval('.editor', (editor) => editor.value.includes('INTERVAL=44')), true);
        fake.slow(200);
        await press(tab, 'Send…');
        await press(tab, 'Send config set ux');
        await notice(tab, 'config set ux: done');
        await untilText(tab, 'No difference to what is there.');
        assert.match(fake.configurations.get('ux'), /INTERVAL=44\n/);
    });
});

test('what is written and not sent is not lost without a question', async () => {
    await on('/agents', {}, async (view) => {
        const { tab, own } = view;
        await tab.click('nav a[href="/configuration"]');
        await tab.waitForSelector('main select option[value="/configuration?product=ux"]');
        await tab.select('main select', '/configuration?product=ux');
        await fill(tab, '.editor', 'INTERVAL=77\n');
        const address = () => tab.evaluate(() => location.pathname + location.search);
        const isKept = async () => {
            await tab.waitForFunction(() => location.search === '?product=ux');
            assert.equal(await tab.$eval('.editor', (editor) => editor.value.includes('INTERVAL=77')), true);
            assert.deepEqual(own.answers, []);
        };
        own.answers = [false];
        await press(tab, 'Read again');
        await isKept();
        own.answers = [false];
        await tab.click('nav a[href="/agents"]');
        await isKept();
        own.answers = [false];
        await tab.evaluate(() => document.activeElement.blur());
        await tab.keyboard.type('go');
        await isKept();
        own.answers = [false];
        await tab.select('main select', '');
        await isKept();
        assert.equal(await tab.$eval('main select', (field) => field.value), '/configuration?product=ux');
        own.answers = [false];
        await tab.evaluate(() => history.back());
        for (let tries = 0; own.answers.length > 0 && tries < 800; ++tries) await new Promise((done) => setTimeout(done, 50));
        await isKept();
        own.answers = [true];
        await tab.click('nav a[href="/agents"]');
        await tab.waitForFunction(() => location.pathname === '/agents');
        assert.equal(await address(), '/agents');
        await tab.click('nav a[href="/"]');
        await tab.waitForFunction(() => location.pathname === '/');
    });
});

test('a line that a terminal would obey is shown, and not offered for copying', async () => {
    await on('/agents', {}, async ({ tab, fake, go }) => {
        fake.configurations.set('ux', 'INTERVAL=5\n# \u001b[201~ \u202e\n');
        await go('/configuration?product=ux');
        await tab.waitForSelector('.editor');
        await tab.$eval('.editor', (editor) => {
            editor.value = editor.value.replace('INTERVAL=5', 'INTERVAL=6');
            editor.dispatchEvent(new Event('input', { bubbles: true }));
        });
        await press(tab, 'Send…');
        await untilText(tab, '# \\x1B[201~ \\u202E', 'dialog .command-line');
        await untilText(tab, 'Not to be copied', 'dialog .command-line');
        assert.equal(await tab.$('dialog .command-line button'), null);
    });
});

test('what somebody else has set meanwhile is not overwritten', async () => {
    await on('/configuration?product=ux', {}, async ({ tab, fake }) => {
        await fill(tab, '.editor', 'INTERVAL=1\n');
        fake.configurations.set('ux', 'INTERVAL=99\n');
        await press(tab, 'Send…');
        await press(tab, 'Send config set ux');
        await untilText(tab, 'the configuration has changed on the host while it was edited', 'dialog');
        assert.equal(fake.configurations.get('ux'), 'INTERVAL=99\n');
    });
});

test('files are pushed, summed and removed', async () => {
    const scratch = await mkdtemp(path.join(os.tmpdir(), 'console-'));
    const content = Buffer.alloc(300_000, 'push');
    await writeFile(path.join(scratch, 'new agent.tar'), content);
    await writeFile(path.join(scratch, 'install.sh.tar'), 'archive');
    try {
        await on('/depot?path=ux/7.2', {}, async ({ tab, fake }) => {
            const chooser = await tab.waitForSelector('input[type=file]');
            await chooser.uploadFile(path.join(scratch, 'new agent.tar'), path.join(scratch, 'install.sh.tar'));
            await untilText(tab, 'call it package.tar');
            await untilText(tab, "zavctl push 'new agent.tar' 'ux/7.2/new agent.tar'");
            await press(tab, 'Push 1 file');
            const sum = createHash('sha256').update(content).digest('hex');
            await untilText(tab, `verified: ${sum}`);
            assert.deepEqual(fake.depot.get('ux/7.2/new agent.tar').content, content);
            await press(tab, 'Sum of new agent.tar');
            await untilText(tab, sum, 'dialog');
            await tab.keyboard.press('Escape');
            await press(tab, 'Remove new agent.tar');
            await untilText(tab, "zavctl depot rm 'ux/7.2/new agent.tar'", 'dialog');
            await press(tab, 'Remove');
            await notice(tab, 'depot rm ux/7.2/new agent.tar: done');
            assert.equal(fake.depot.has('ux/7.2/new agent.tar'), false);
        });
    } finally {
        await rm(scratch, { recursive: true });
    }
});

test('a whole folder is dropped, checked, pushed and verified', async () => {
    const { folder, remove } = await folderOf({ 'install.sh': '#!/bin/sh\n', 'lib/agent 1.tar': 'x'.repeat(200_000), 'lib/deep/note.txt': 'read me' });
    await mkdir(path.join(folder, 'nothing'));
    try {
        await on('/depot?path=ux/7.1', {}, async ({ tab, fake, front }) => {
            const kept = String(fake.depot.get('ux/7.1/install.sh').content);
            await dropPaths(tab, folder);
            await untilText(tab, 'Where do its 3 files (195 KiB) go?', '.push');
            await untilText(tab, 'note: bundle/nothing is empty', '.push');
            assert.equal(front.state.requests.some((one) => one.includes('/depot/check')), false, 'nothing is asked before that is known');
            await press(tab, 'Into ux/7.1/');
            await untilText(tab, 'zavctl push bundle/ ux/7.1', '.push');
            await untilText(tab, '1 file of these names is there', '.push');
            await untilText(tab, 'Line ends of 1 file are converted', '.push');
            assert.equal(front.state.requests.filter((one) => one.includes('/depot/check')).length, 1, 'one question is enough');
            assert.equal(String(fake.depot.get('ux/7.1/install.sh').content), kept, 'nothing is sent yet');
            await press(tab, 'Push 3 files');
            await untilText(tab, '3 of 3 files arrived, all of them verified', '.push');
            assert.equal(String(fake.depot.get('ux/7.1/lib/deep/note.txt').content), 'read me');
            assert.equal(fake.depot.get('ux/7.1/lib/agent 1.tar').content.length, 200_000);
            await untilText(tab, 'lib/', '.list');
            await (await tab.waitForSelector('summary')).click();
            await untilText(tab, createHash('sha256').update('read me').digest('hex'), '.sums');
            await press(tab, 'Put away bundle/');
            await tab.waitForFunction(() => !document.querySelector('.push'));
        });
    } finally {
        await remove();
    }
});

test('a folder goes as one of its name, and not at all if one of its files is not taken', async () => {
    const { folder, remove } = await folderOf({ 'a.tar': 'a', 'b/install.sh.tar': 'b' });
    try {
        await on('/depot?path=ux', {}, async ({ tab, fake }) => {
            const before = fake.depot.size;
            await dropPaths(tab, folder);
            await press(tab, 'Into ux/bundle/');
            await untilText(tab, 'The host does not take all of its files, so none is sent.', '.push');
            await untilText(tab, 'ux/bundle/b/install.sh.tar', '.push');
            await untilText(tab, 'call it package.tar', '.push [role=alert]');
            assert.equal(await tab.$('.panel > header .main'), null, 'there is nothing to push');
            await press(tab, 'Put away bundle/');
            await rm(path.join(folder, 'b'), { recursive: true });
            await dropPaths(tab, folder);
            await press(tab, 'Into ux/bundle/');
            await untilText(tab, 'zavctl push bundle/ ux/bundle', '.push');
            await press(tab, 'Push 1 file');
            await untilText(tab, '1 of 1 file arrived, all of them verified', '.push');
            assert.equal(String(fake.depot.get('ux/bundle/a.tar').content), 'a');
            assert.equal(fake.depot.size, before + 1);
        });
    } finally {
        await remove();
    }
});

test('a folder is chosen without dragging, and one that is too deep is not begun', async () => {
    const { folder, remove } = await folderOf(Object.fromEntries(Array.from({ length: 120 }, (_, i) => [`many/${String(i).padStart(3, '0')}.txt`, String(i)])));
    try {
        await on('/depot', {}, async ({ tab, fake, front }) => {
            const chooser = await tab.waitForSelector('input[webkitdirectory]');
            await chooser.uploadFile(folder);
            await press(tab, 'Into bundle/');
            await press(tab, 'Push 120 files');
            await untilText(tab, '120 of 120 files arrived, all of them verified', '.push');
            assert.equal(String(fake.depot.get('bundle/many/119.txt').content), '119');
            const checks = front.state.requests.filter((one) => one.includes('/depot/check'));
            assert.ok(checks.length === 2 && checks.every((one) => one.length < 8_000), `${checks.length} questions`);
            await mkdir(path.join(folder, 'deep/'.repeat(20)), { recursive: true });
            await dropPaths(tab, folder);
            await untilText(tab, 'bundle holds more than this page takes', '.push [role=alert]');
            assert.equal(await tab.$('.places'), null);
        });
    } finally {
        await remove();
    }
});

test('a push whose last byte has gone is not offered to be given up', async () => {
    await on('/depot', {}, async ({ tab, front, fake }) => {
        let letGo;
        const held = new Promise((done) => (letGo = done));
        front.state.hold = (request) => (request.method === 'PUT' ? held : undefined);
        await tab.waitForSelector('.drop');
        await tab.evaluate(() => {
            const dataTransfer = new DataTransfer();
            dataTransfer.items.add(new File(['late'], 'late.tar'));
            document.querySelector('.drop').dispatchEvent(new DragEvent('drop', { dataTransfer, bubbles: true, cancelable: true }));
        });
        await tab.waitForSelector('aria/Put away late.tar');
        await press(tab, 'Push 1 file');
        await untilText(tab, 'verifying', '.push');
        assert.equal(await tab.$('.push > button'), null);
        letGo();
        await untilText(tab, 'verified:');
        assert.equal(String(fake.depot.get('late.tar').content), 'late');
        await press(tab, 'Put away late.tar');
    });
});

test('files can be dropped, and folders removed', async () => {
    await on('/depot', {}, async ({ tab, fake }) => {
        await tab.waitForSelector('.drop');
        await tab.evaluate(() => {
            const dataTransfer = new DataTransfer();
            dataTransfer.items.add(new File(['dropped'], 'dropped.tar'));
            document.querySelector('.drop').dispatchEvent(new DragEvent('drop', { dataTransfer, bubbles: true, cancelable: true }));
        });
        await press(tab, 'Push 1 file');
        await untilText(tab, 'verified:');
        assert.equal(String(fake.depot.get('dropped.tar').content), 'dropped');
        await press(tab, 'Remove um');
        await untilText(tab, 'zavctl depot rm -r um', 'dialog');
        await press(tab, 'Remove');
        await notice(tab, 'depot rm um: done');
        assert.equal(fake.depot.has('um/7.1/install.sh'), false);
    });
});

test('a folder that is still read does not show the rows of another', async () => {
    await on('/depot', {}, async ({ tab, front }) => {
        await untilText(tab, 'package.tar', '.list');
        let letGo;
        const held = new Promise((done) => (letGo = done));
        front.state.hold = (request, url) => (url.pathname === '/v1/depot' && url.searchParams.get('path') === 'um' ? held : undefined);
        await tab.click('.list a[href="/depot?path=um"]');
        await untilText(tab, 'um', '.trail');
        await untilText(tab, 'Reading…');
        assert.equal(await tab.$('.list'), null);
        letGo();
        await untilText(tab, '7.1', '.list');
    });
});

test('who may only look is offered nothing else', async () => {
    await on('/agents', { host: { access: 'read' } }, async ({ tab, go, front }) => {
        await untilText(tab, 'You may look, and change nothing');
        for (const address of ['/agents', '/tasks/a0a99408e7707b3d-5', '/depot', '/configuration?product=ux']) {
            await go(address);
            await untilText(tab, 'may only look', '.top');
            const names = await tab.$$eval('main button', (buttons) => buttons.filter((button) => !button.disabled).map((button) => button.textContent));
            assert.deepEqual(names.filter((name) => /Start|Stop|Restart|nstall|Remove|Cancel|again…|Send|choose|Import/.test(name)), [], address);
        }
        assert.deepEqual(front.state.requests.filter((request) => !/^GET |^POST \/v1\/query$/.test(request)), []);
    });
});
