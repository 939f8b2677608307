// Whether a page can be used by everybody, and is no wider than its window.
import assert from 'node:assert/strict';
import { readFile } from 'node:fs/promises';
import { createRequire } from 'node:module';

const axe = await readFile(createRequire(import.meta.url).resolve('axe-core/axe.min.js'), 'utf8');

async function violations(tab) {
    // Through the debugger: the page's own policy lets no such script in.
    await tab.evaluate(axe);
    return tab.evaluate(async () => {
        const { violations: found } = await globalThis.axe.run(document, { runOnly: ['wcag2a', 'wcag2aa', 'wcag21a', 'wcag21aa', 'wcag22aa', 'best-practice'] });
        return found.map((one) => `${one.id}: ${one.nodes.map((node) => node.html.slice(0, 160)).join(' | ')}`);
    });
}

/// `view` is a tab with what must not happen in it, as the stage opens it.
export async function looksRight(view, name) {
    const { tab, faults } = view;
    assert.deepEqual(await violations(tab), [], `${name}: accessibility`);
    const { wide, window } = await tab.evaluate(() => ({ wide: document.documentElement.scrollWidth, window: innerWidth }));
    assert.ok(wide <= window, `${name}: ${wide} pixels in a window of ${window}`);
    assert.deepEqual(faults, [], name);
}
