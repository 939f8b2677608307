// A browser, a made-up host and the console between them, for one file of tests.
import assert from 'node:assert/strict';
import { mkdir } from 'node:fs/promises';
import path from 'node:path';
import { fileURLToPath } from 'node:url';
import { launch, openTab, untilText } from './browser.mjs';
import { makeFakeCentre } from './fake_centre.mjs';
import { makeFakeHost } from './fake_host.mjs';
import { startFront } from './front.mjs';

const root = path.join(path.dirname(fileURLToPath(import.meta.url)), '..', '..');
export const page = process.env.CONSOLE_PAGE ?? path.join(root, 'out', 'page');
export const shots = process.env.CONSOLE_SHOTS ?? path.join(root, 'out', 'shots');

export async function raise() {
    await mkdir(shots, { recursive: true });
    const browser = await launch();
    const fronts = [];
    /// A host of its own, or a fleet if `centre` is given, and a tab on its console. `faults` must be empty
    /// in the end.
    const open = async ({ host = {}, centre, command, ...view } = {}) => {
        const fake = centre ? makeFakeCentre(centre) : makeFakeHost(host);
        const { host: answers, push, run, session } = fake;
        const front = await startFront({ page, host: answers, depot: push, run, session, ...(command ? { command } : {}) });
        fronts.push(front);
        const context = await browser.createBrowserContext();
        await context.overridePermissions(front.origin, ['clipboard-read', 'clipboard-write', 'clipboard-sanitized-write']);
        const opened = await openTab(context, view);
        await opened.tab.goto(front.link, { waitUntil: 'domcontentloaded' });
        const go = (address) => opened.tab.goto(front.origin + address, { waitUntil: 'domcontentloaded' });
        return { ...opened, fake, front, go, end: () => context.close() };
    };
    /// Opens a console at an address, does something with it, and sees that nothing went wrong meanwhile.
    const on = async (address, options, act) => {
        const view = await open(options);
        await view.go(address);
        await untilText(view.tab, 'live', '.top');
        await act(view);
        assert.deepEqual(view.faults, []);
        await view.end();
    };
    const strike = async () => {
        await browser.close();
        for (const front of fronts) await front.close();
    };
    return { open, on, strike };
}
