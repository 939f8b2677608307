// Debian's Chromium, and pages in it on which nothing goes wrong unnoticed.
import { access } from 'node:fs/promises';
import puppeteer from 'puppeteer-core';

const places = [process.env.CHROMIUM, '/usr/bin/chromium', '/usr/bin/chromium-browser', '/usr/bin/google-chrome'];

/// The program; undefined if there is none.
export async function chromium() {
    for (const place of places) {
        if (!place) continue;
        try {
            await access(place);
            return place;
        } catch {
            // The next one, then.
        }
    }
    return undefined;
}

/// `more` are further options of the program.
export async function launch(more = []) {
    return puppeteer.launch({
        executablePath: await chromium(),
        // Containers have neither the kernel's leave for a sandbox nor room in /dev/shm.
        args: ['--no-sandbox', '--disable-dev-shm-usage', '--disable-gpu', '--force-color-profile=srgb', '--lang=en-GB', ...more],
    });
}

/// How long a text may take that is to come: the machine may be busy with other tests.
const patience = 40_000;

/// A tab that collects what must not happen: errors, violations of the policy, scripts of a host.
export async function openTab(browser, { width = 1280, height = 860, scheme = 'light' } = {}) {
    const tab = await browser.newPage();
    const faults = [];
    /// `answers` are given to questions that are expected, in their order.
    const own = { isDisturbed: false, answers: [] };
    await tab.setViewport({ width, height });
    await tab.emulateMediaFeatures([{ name: 'prefers-color-scheme', value: scheme }, { name: 'prefers-reduced-motion', value: 'reduce' }]);
    await tab.exposeFunction('reportFault', (text) => faults.push(text));
    await tab.evaluateOnNewDocument(() => {
        addEventListener('securitypolicyviolation', (event) => globalThis.reportFault(`policy: ${event.violatedDirective} ${event.blockedURI}`));
    });
    tab.on('pageerror', (error) => faults.push(`error: ${error.message ?? error}`));
    tab.on('dialog', (dialog) => {
        const answer = dialog.type() === 'confirm' ? own.answers.shift() : undefined;
        if (answer === false) return void dialog.dismiss();
        if (dialog.type() !== 'beforeunload' && answer === undefined) faults.push(`dialog: ${dialog.message()}`);
        void dialog.accept();
    });
    tab.on('console', (message) => {
        // Chromium says so of each answer that tells of a refusal; tests of refusals expect it.
        const isRefusal = /Failed to load resource/.test(message.text()) && own.isDisturbed;
        if (message.type() === 'error' && !isRefusal) faults.push(`console: ${message.text()} ${message.location().url ?? ''}`);
    });
    tab.setDefaultTimeout(patience);
    return { tab, faults, own };
}

/// Waits until a text is on the page.
export function untilText(tab, text, selector = 'body') {
    return tab.waitForFunction((wanted, where) => document.querySelector(where)?.innerText.includes(wanted), { timeout: patience }, text, selector);
}

/// Clicks the button or link with this name, as assistive technology knows it.
export async function press(tab, name, role = 'button') {
    const element = await tab.waitForSelector(`aria/${name}[role="${role}"]`, { visible: true });
    await element.click();
    await element.dispose();
}

/// A meter of what the page itself does: asked, it gives the milliseconds of processor time that scripts,
/// styles and layout have taken since it was made, each. Processor time, because the machine may be busy
/// with other tests.
export async function meterOf(tab) {
    const session = await tab.createCDPSession();
    await session.send('Performance.enable', { timeDomain: 'threadTicks' });
    const read = async () => {
        const { metrics } = await session.send('Performance.getMetrics');
        const all = Object.fromEntries(metrics.map(({ name, value }) => [name, value * 1000]));
        return { script: all.ScriptDuration, style: all.RecalcStyleDuration, layout: all.LayoutDuration };
    };
    const before = await read();
    return async () => {
        const now = await read();
        const spent = Object.fromEntries(Object.keys(now).map((name) => [name, now[name] - before[name]]));
        return { ...spent, whole: spent.script + spent.style + spent.layout };
    };
}
