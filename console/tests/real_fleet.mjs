// The console of a fleet against a real server, a real centre and real hosts. CONSOLE_LINK holds the link that
// `zavctl --fleet URL console` has printed; it works once. CONSOLE_PRODUCT is an agent that is installed on some
// hosts and may be started and stopped there, and CONSOLE_ON a selector of some of these. CONSOLE_PAGE, if it is
// given, is a directory with another page than the one that the program has in it. With CONSOLE_ZAVCTL, the words
// with which the operator's zavctl is called, and CONSOLE_AUTHORITY, the file of the fleet's authority, the centre's
// own console is looked at as well: while CONSOLE_HELD_PROCESS, the link of CONSOLE_HELD_HOST, is held up. Ends with
// status 0 if all of it worked, 77 without a Chromium.
import assert from 'node:assert/strict';
import { readFile } from 'node:fs/promises';
import path from 'node:path';
import { openAtCentre } from './support/at_centre.mjs';
import { chromium, launch, openTab, press } from './support/browser.mjs';

const link = process.env.CONSOLE_LINK;
const product = process.env.CONSOLE_PRODUCT ?? 'ux';
const selector = process.env.CONSOLE_ON ?? 'role=web';
const patience = 90_000;

if (!link) {
    console.error('CONSOLE_LINK is missing: the link that zavctl --fleet URL console prints');
    process.exit(2);
}
if (!(await chromium())) {
    console.error('there is no chromium');
    process.exit(77);
}

const origin = new URL(link).origin;
const browser = await launch();
const { tab, faults } = await openTab(browser);
tab.setDefaultTimeout(patience);

const types = { 'app.js': 'text/javascript', 'app.css': 'text/css' };

/// Has the browser take the page from a directory.
async function takePage(directory) {
    await tab.setRequestInterception(true);
    tab.on('request', (request) => {
        const name = new URL(request.url()).pathname.slice(1);
        if (!Object.hasOwn(types, name)) return void request.continue();
        void readFile(path.join(directory, name)).then((body) => request.respond({ status: 200, contentType: types[name], body }));
    });
}

const go = (address) => tab.goto(origin + address, { waitUntil: 'domcontentloaded' });
const until = (text, where = 'main') =>
    tab.waitForFunction((wanted, selected) => document.querySelector(selected)?.innerText.includes(wanted), { timeout: patience }, text, where)
        .catch(async () => {
            throw new Error(`"${text}" does not come; the page says:\n${await tab.evaluate(() => document.body.innerText)}`);
        });
const ask = (path) => tab.evaluate(async (target) => (await fetch(target)).json(), path);

async function step(name, act) {
    const began = Date.now();
    await act().catch((error) => {
        console.error(`failed: ${name}`, error);
        throw error;
    });
    console.log(`ok: ${name} (${((Date.now() - began) / 1000).toFixed(1)} s)`);
}

/// The roll-out once it is over. Its page shows how it goes by itself: it is neither opened anew nor does it ask for
/// the roll-out again.
async function ended(id) {
    const asked = [];
    const note = (request) => asked.push(new URL(request.url()).pathname);
    await tab.waitForFunction(() => document.querySelector('.page-head .state'));
    tab.on('request', note);
    await tab.waitForFunction(() => !document.querySelector('.page-head').innerText.includes('running'), { timeout: patience });
    tab.off('request', note);
    assert.deepEqual(asked.filter((path) => path === `/v1/rollouts/${id}` || path === '/v1/rollouts'), []);
    await until('live', '.top');
    return ask(`/v1/rollouts/${id}`);
}

/// Begins a roll-out from the page of agents, and waits for its end on its own page.
async function rollOut(verb) {
    await go(`/agents?on=${encodeURIComponent(selector)}`);
    await press(tab, `${verb[0].toUpperCase()}${verb.slice(1)} ${product}`);
    await press(tab, 'Preview the hosts');
    await until(`would get ${verb.toUpperCase()} ${product}`, 'dialog');
    const button = await tab.$eval('dialog button[type=submit]', (one) => one.textContent);
    assert.match(button, new RegExp(`^Send ${verb} ${product} to \\d+ hosts?$`));
    await press(tab, button);
    await until(`${verb.toUpperCase()} ${product}`, 'h1');
    const id = await tab.evaluate(() => location.pathname.split('/').at(-1));
    return ended(id);
}

try {
    if (process.env.CONSOLE_PAGE) await takePage(process.env.CONSOLE_PAGE);
    await tab.goto(link, { waitUntil: 'domcontentloaded' });
    const centre = process.env.CONSOLE_ZAVCTL ? await openAtCentre(step) : undefined;
    await step('the page is live', () => until('live', '.top'));
    await step('the overview shows the hosts of the centre', async () => {
        const { hosts } = await ask('/v1/hosts');
        await until('Needs attention');
        await until(String(hosts.length), '.facts');
    });
    await step('every page is there', async () => {
        const { hosts } = await ask(`/v1/hosts?selector=${encodeURIComponent(selector)}`);
        const { rollouts } = await ask('/v1/rollouts');
        for (const [address, text] of [[`/hosts?on=${encodeURIComponent(selector)}`, `${hosts.length} hosts`], [`/hosts/${hosts[0].host}`, hosts[0].name],
            ['/agents', product], ['/rollouts', `${rollouts.length} roll-outs`], [`/rollouts/${rollouts[0].id}`, rollouts[0].kind]]) {
            await go(address);
            await until(text);
        }
    });
    await step('a roll-out is begun, and followed to its end', async () => {
        for (const verb of ['start', 'stop']) {
            const rollout = await rollOut(verb);
            assert.equal(rollout.counts.over.done, rollout.hosts, JSON.stringify(rollout.counts));
            await until(`${rollout.hosts} done`, '.legend');
        }
    });
    await step('where it failed is told in the words of the hosts', async () => {
        const rollout = await rollOut('stop');
        assert.equal(rollout.counts.over.failed, rollout.hosts, JSON.stringify(rollout.counts));
        await until(`${rollout.hosts} failed`, '.legend');
        const { hosts } = await ask(`/v1/rollouts/${rollout.id}/failures`);
        assert.notEqual(hosts[0].reason, '');
        // A browser shows several blanks as one.
        await until(hosts[0].reason.replace(/\s+/g, ' '), '.failures');
    });
    await step('a host is asked for its tasks', async () => {
        const { hosts } = await ask(`/v1/hosts?selector=${encodeURIComponent(selector)}`);
        await go(`/hosts/${hosts[0].host}`);
        await press(tab, 'Ask the host');
        await until(`START ${product}`);
    });
    await step('what a task of a host has written comes through the bus', async () => {
        // A roll-out's order is a task of its host.
        const { rollouts } = await ask('/v1/rollouts');
        const started = rollouts.find((rollout) => rollout.kind === 'START' && rollout.product === product);
        const [part] = (await ask(`/v1/rollouts/${started.id}/hosts`)).hosts;
        await go(`/hosts/${part.host}`);
        await press(tab, 'Ask the host');
        await tab.waitForSelector(`a[href^="/hosts/${part.host}/tasks/"]`);
        await go(`/hosts/${part.host}/tasks/${part.order}`);
        await until('over', '.panel header');
        await until(product, '.output');
        await until(`START ${product}`);
        await until('done');
    });
    await step('the configurations of the hosts are compared', async () => {
        await go(`/configuration?product=${product}&on=${encodeURIComponent(selector)}`);
        await until('with the same');
        await until('INTERVAL=');
    });
    await step('a host gets another label', async () => {
        const { hosts } = await ask(`/v1/hosts?selector=${encodeURIComponent(selector)}`);
        await go(`/hosts/${hosts[0].host}`);
        await press(tab, 'Labels…');
        await tab.type('dialog input[name=labels]', 'site=north');
        await press(tab, 'Change the labels');
        await until('site=north', '.facts');
        const found = await ask('/v1/hosts?selector=site%3Dnorth');
        assert.deepEqual(found.hosts.map((host) => host.host), [hosts[0].host]);
    });
    await step('a refusal of the centre has its words', async () => {
        await go('/hosts?on=%3D');
        await until('the selector', '.box.bad');
    });
    await centre?.finish();
    // Chromium tells of each refusal.
    assert.deepEqual(faults.filter((fault) => !/^console: Failed to load resource/.test(fault)), []);
} finally {
    await browser.close();
}
