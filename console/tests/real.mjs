// The console against a real server and a real host. CONSOLE_LINK holds the link that `zavctl console`
// has printed; it works once. CONSOLE_PRODUCT is an agent that may be started, stopped and configured
// (ux if not given). Ends with status 0 if all of it worked, 77 without a Chromium.
import assert from 'node:assert/strict';
import { createHash, randomBytes } from 'node:crypto';
import { mkdtemp, rm, writeFile } from 'node:fs/promises';
import os from 'node:os';
import path from 'node:path';
import { chromium, launch, openTab, press } from './support/browser.mjs';

const link = process.env.CONSOLE_LINK;
const product = process.env.CONSOLE_PRODUCT ?? 'ux';
const patience = 60_000;

if (!link) {
    console.error('CONSOLE_LINK is missing: the link that zavctl console prints');
    process.exit(2);
}
if (!(await chromium())) {
    console.error('there is no chromium');
    process.exit(77);
}

const origin = new URL(link).origin;
const browser = await launch();
const { tab, faults, own } = await openTab(browser);
tab.setDefaultTimeout(patience);

const go = (address) => tab.goto(origin + address, { waitUntil: 'domcontentloaded' });
const until = (text, selector = 'body') =>
    tab.waitForFunction((wanted, where) => document.querySelector(where)?.innerText.includes(wanted), { timeout: patience }, text, selector)
        .catch(async () => {
            throw new Error(`"${text}" does not come; the page says:\n${await tab.evaluate(() => document.body.innerText)}`);
        });

async function step(name, act) {
    const began = Date.now();
    await act();
    console.log(`ok: ${name} (${((Date.now() - began) / 1000).toFixed(1)} s)`);
}

/// Asks for the state and waits until the host has shown it.
async function change(verb) {
    await go('/agents');
    await until('live', '.top');
    const name = `${verb[0].toUpperCase()}${verb.slice(1)}`;
    const target = await tab.waitForFunction((wanted, code) => {
        const labels = [...document.querySelectorAll('.agent')].filter((card) => card.querySelector('h2 code')?.textContent === code)
            .flatMap((card) => [...card.querySelectorAll('button')].map((button) => button.getAttribute('aria-label') ?? ''));
        return labels.find((label) => label.startsWith(`${wanted} `));
    }, {}, name, product);
    await press(tab, await target.jsonValue());
    await until(`${verb} ${product}`, 'dialog .command-line');
    await press(tab, `Send ${verb} ${product}`);
    await until(`${verb} ${product}: done`, '.notices');
}

async function isRunning() {
    return tab.evaluate(async (code) => {
        const { instances } = await (await fetch('/v1/instances')).json();
        return instances.find((one) => one.product === code && one.instance === '').state === 'running';
    }, product);
}

try {
    await step('the link opens the console', async () => {
        const answer = await tab.goto(link, { waitUntil: 'domcontentloaded' });
        assert.equal(answer.status(), 200);
        assert.match(answer.headers()['content-security-policy'], /default-src 'none'; script-src 'self'/);
        await until('Overview', 'h1');
        await until('live', '.top');
    });
    await step('the link works once', async () => {
        own.isDisturbed = true;
        assert.equal((await fetch(link, { redirect: 'manual' })).status, 403);
        assert.equal((await fetch(`${origin}/v1/health`)).status, 401);
    });
    await step('a request of another page is refused', async () => {
        const status = await tab.evaluate(async () => (await fetch('/v1/tasks', { method: 'POST', body: '{}' })).status);
        assert.equal(status, 403);
        own.isDisturbed = false;
    });
    if (await isRunning()) await step('the agent is stopped first', () => change('stop'));
    await step('an agent is started, and its task is watched to its end', async () => {
        await change('start');
        await tab.waitForSelector('.notice a');
        await tab.click('.notice a');
        await until('START', 'h1');
        await until('done', '.page-head');
        await until('exit code 0', '.commands');
        assert.equal(await isRunning(), true);
    });
    await step('the agent is stopped', async () => {
        await change('stop');
        assert.equal(await isRunning(), false);
    });
    await step('the events have told it', async () => {
        await go('/events');
        await until(`STOP ${product}`, 'main');
    });
    await step('a file is pushed, and is in the depot', async () => {
        const scratch = await mkdtemp(path.join(os.tmpdir(), 'console-'));
        const name = `console-${randomBytes(4).toString('hex')}.bin`;
        const content = randomBytes(3_000_000);
        await writeFile(path.join(scratch, name), content);
        try {
            await go('/depot');
            const chooser = await tab.waitForSelector('input[type=file]');
            await chooser.uploadFile(path.join(scratch, name));
            await press(tab, 'Push 1 file');
            await until(`verified: ${createHash('sha256').update(content).digest('hex')}`);
            await until(name, '.list');
            await press(tab, `Remove ${name}`);
            await press(tab, 'Remove');
            await until(`depot rm ${name}: done`, '.notices');
        } finally {
            await rm(scratch, { recursive: true });
        }
    });
    await step('a configuration is changed, and changed back', async () => {
        const address = `/configuration?product=${product}`;
        const edit = async (change) => {
            await go(address);
            await tab.waitForSelector('.editor');
            await tab.$eval('.editor', (editor, added) => {
                editor.value = added.isAdded ? `${editor.value}${added.line}\n` : editor.value.replace(`${added.line}\n`, '');
                editor.dispatchEvent(new Event('input', { bubbles: true }));
            }, change);
            await until(change.isAdded ? '0 lines removed, 1 line added' : '1 line removed, 0 lines added');
            await press(tab, 'Send…');
            await until(`config set ${product} - <<'END'`, 'dialog');
            await press(tab, `Send config set ${product}`);
            await until(`config set ${product}: done`, '.notices');
        };
        const line = `CONSOLE_MARK=${randomBytes(4).toString('hex')}`;
        await edit({ isAdded: true, line });
        await go(address);
        await tab.waitForFunction((wanted) => document.querySelector('.editor')?.value.includes(wanted), {}, line);
        await edit({ isAdded: false, line });
    });
    await step('the doctor answers', async () => {
        await go('/doctor');
        await until('in order', '.page-head');
    });
    assert.deepEqual(faults, []);
    console.log('all of it worked');
} catch (error) {
    console.error(`failed: ${error.message}`);
    for (const fault of faults) console.error(`  ${fault}`);
    process.exitCode = 1;
} finally {
    await browser.close();
}
