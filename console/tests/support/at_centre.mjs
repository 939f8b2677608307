// The console that a centre serves itself, in a browser: it shows the fleet live, and nothing can be changed with it.
import assert from 'node:assert/strict';
import { execFile } from 'node:child_process';
import { createHash } from 'node:crypto';
import { readFile } from 'node:fs/promises';
import tls from 'node:tls';
import { promisify } from 'node:util';
import { launch, openTab, press, untilText } from './browser.mjs';

const { CONSOLE_ZAVCTL: zavctl = '', CONSOLE_AUTHORITY: authority = '', CONSOLE_HELD_HOST: held = '', CONSOLE_HELD_PROCESS: process_ = '' } = process.env;
const awayWithin = 200_000;

/// What the operator's zavctl prints.
async function run(...words) {
    const { stdout } = await promisify(execFile)('/bin/sh', ['-c', `${zavctl} "$@"`, 'sh', ...words], { timeout: 60_000 });
    return stdout;
}

/// The option by which Chromium takes the centre's key, and no other. That the fleet's authority vouches for it is
/// seen to here.
async function trustOption(origin) {
    const { hostname, port } = new URL(origin);
    const ca = await readFile(authority);
    const certificate = await new Promise((done, failed) => {
        const connection = tls.connect({ host: hostname, port: Number(port), servername: hostname, ca }, () => {
            done(connection.getPeerX509Certificate());
            connection.end();
        });
        connection.on('error', failed);
    });
    const key = certificate.publicKey.export({ type: 'spki', format: 'der' });
    return `--ignore-certificate-errors-spki-list=${createHash('sha256').update(key).digest('base64')}`;
}

/// Opens what can be opened on a page: no window of it has a button that sends something.
async function expectOnlyLines(tab) {
    const buttons = await tab.$$eval('main button', (all) => all.map((one) => one.getAttribute('aria-label') ?? one.textContent));
    const actions = buttons.filter((name) => /start|stop|install|push|pause|resume|abort|retry|labels|remove/i.test(name));
    for (const name of actions) {
        await press(tab, name);
        await untilText(tab, 'This page only looks', 'dialog');
        assert.deepEqual(await tab.$$eval('dialog button[type=submit], dialog button:not([type])', (all) => all.map((one) => one.textContent)), [], name);
        await press(tab, 'Back');
        await tab.waitForFunction(() => !document.querySelector('dialog'));
    }
    return actions;
}

/// Asks, with the session of the page, for everything that the interface describes.
const walk = (tab) => tab.evaluate(async () => {
    const { paths } = await (await fetch('/v1/openapi.json')).json();
    const answers = [];
    for (const [path, operations] of Object.entries(paths)) {
        for (const [method, { 'x-access': access, responses, parameters = [] }] of Object.entries(operations)) {
            const name = method.toUpperCase();
            if (!responses || (name === 'GET' && access !== 'act')) continue;
            const query = parameters.filter((one) => one.in === 'query' && one.required).map((one) => `${one.name}=1`).join('&');
            const target = `${path.replace(/\{\w+\}/g, 'x')}${query === '' ? '' : `?${query}`}`;
            const body = name === 'GET' ? {} : { body: '{}', headers: { 'Content-Type': 'application/json', 'X-Zav-Console': '1' } };
            answers.push([`${name} ${path}`, (await fetch(target, { method: name, ...body })).status]);
        }
    }
    return answers;
});

/// Looks at all of it, but for a host that goes away: `finish()` waits for that, on a page that was open meanwhile.
export async function openAtCentre(step) {
    const link = (await run('console', '--at-centre')).match(/^console: (.*)$/m)?.[1] ?? '';
    const { origin } = new URL(link);
    const browser = await launch([await trustOption(origin)]);
    process.on('exit', () => browser.process()?.kill());
    const { tab, faults, own } = await openTab(browser);
    const changes = [];
    tab.on('request', (request) => request.method() !== 'GET' && changes.push(`${request.method()} ${request.url()}`));
    const go = (address) => tab.goto(origin + address, { waitUntil: 'domcontentloaded' });

    await step('the centre opens its own console, live, by a link that works once', async () => {
        await tab.goto(link, { waitUntil: 'domcontentloaded' });
        await untilText(tab, 'live', '.top');
        await untilText(tab, 'here only to look', '.top');
        const [cookie, ...others] = await browser.cookies();
        assert.equal(others.length, 0);
        assert.match(cookie.name, /^__Host-/);
        assert.deepEqual([cookie.secure, cookie.httpOnly, cookie.sameSite, cookie.path, cookie.session], [true, true, 'Strict', '/', true]);
        const stranger = await browser.createBrowserContext();
        const second = await stranger.newPage();
        assert.equal((await second.goto(link)).status(), 403);
        assert.equal((await second.goto(`${origin}/`)).status(), 401);
        await stranger.close();
    });
    await step('its pages show the fleet, and lines in the place of actions', async () => {
        const { hosts } = JSON.parse(await run('--json', 'hosts'));
        const { rollouts } = JSON.parse(await run('--json', 'rollout', 'ls'));
        const seen = [];
        for (const [address, text] of [['/', 'Versions'], ['/hosts', `${hosts.length} hosts`], [`/hosts/${hosts[0].host}`, hosts[0].name], ['/agents', 'ux'],
            ['/rollouts', 'INSTALL'], [`/rollouts/${rollouts[0].id}`, rollouts[0].kind], ['/configuration?product=ux&on=*', 'config get ux']]) {
            await go(address);
            await untilText(tab, text, 'main');
            await untilText(tab, 'live', '.top');
            seen.push(...await expectOnlyLines(tab));
        }
        assert.ok(seen.length > 5, seen.join());
        assert.deepEqual(changes, []);
    });
    await step('its session changes nothing, whatever is asked for', async () => {
        own.isDisturbed = true;
        const answers = await walk(tab);
        assert.ok(answers.length > 15, answers.join());
        assert.deepEqual(answers.filter(([, status]) => status !== 403), []);
        assert.equal(changes.length, answers.filter(([name]) => !name.startsWith('GET ')).length);
        own.isDisturbed = false;
    });
    await step('a roll-out that begins elsewhere is there by itself', async () => {
        await go('/rollouts');
        await untilText(tab, 'live', '.top');
        await run('stop', 'ux', '--on', 'role=web', '--no-wait');
        await untilText(tab, 'STOP ux', 'main');
    });
    await go('/');
    await untilText(tab, 'live', '.top');
    const counts = (text) => tab.waitForFunction((wanted) => document.querySelector('main > .facts')?.innerText.replace(/\s+/g, ' ').includes(wanted), { timeout: awayWithin }, text);
    await counts('here 5');
    const opened = await tab.evaluate(() => performance.timeOrigin);
    process.kill(Number(process_), 'SIGSTOP');

    const finish = async () => {
        await step('a host that goes away and comes back is told by the stream', async () => {
            await counts('away 1');
            await untilText(tab, held, '.panel.attention');
            process.kill(Number(process_), 'SIGCONT');
            await counts('here 5');
            assert.equal(await tab.evaluate(() => performance.timeOrigin), opened);
        });
        assert.deepEqual(faults, []);
        await browser.close();
    };
    return { finish };
}
