import assert from 'node:assert/strict';
import { test } from 'node:test';

test('what waits and runs is asked for no more after failures in a row, until somebody wants it', async () => {
    const original = globalThis.setTimeout;
    let asked = 0;
    let isThere = false;
    const page = { visibilityState: 'visible', addEventListener: () => undefined };
    const answer = () => new Response(JSON.stringify({ tasks: [], next: null }));
    Object.assign(globalThis, {
        document: page,
        addEventListener: () => undefined,
        // Every pause is over at once.
        setTimeout: (act: () => void) => original(act, 0),
        fetch: async () => {
            ++asked;
            if (!isThere) throw new TypeError('nobody answers');
            return answer();
        },
    });
    const passed = async (isTrue: () => boolean) => {
        for (let tries = 0; !isTrue() && tries < 500; ++tries) await new Promise((done) => original(done, 2));
        assert.ok(isTrue());
    };
    const { lookAtWork, retryWork, startWork, work, workProblem } = await import('../../src/live/work');
    startWork();
    await passed(() => workProblem.get() !== undefined);
    assert.equal(asked, 10, 'five times two lists');
    lookAtWork();
    await new Promise((done) => original(done, 30));
    assert.equal(asked, 10);
    isThere = true;
    retryWork();
    await passed(() => work.get() !== undefined);
    assert.equal(workProblem.get(), undefined);
    await passed(() => asked > 12);
    // Nobody looks any more, so nothing is asked.
    page.visibilityState = 'hidden';
    globalThis.setTimeout = original;
});
