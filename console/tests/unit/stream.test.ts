import assert from 'node:assert/strict';
import { test } from 'node:test';
import { EventStream } from '../../src/live/stream';

/// The pauses that a stream takes before it is opened again, while its first connections end as the
/// bodies given here.
async function pausesAfter(bodies: readonly string[]): Promise<number[]> {
    const pauses: number[] = [];
    const originals = { fetch: globalThis.fetch, setTimeout: globalThis.setTimeout };
    const left = [...bodies];
    // Only the pauses pass, and at once: no connection grows old.
    const soon = (act: () => void, time: number) => (time < 5_000 ? originals.setTimeout(act, 0) : 0);
    Object.assign(globalThis, {
        addEventListener: () => undefined, removeEventListener: () => undefined,
        setTimeout: soon, fetch: async () => new Response(left.shift() ?? ''),
    });
    try {
        await new Promise<void>((done) => {
            const keep = setInterval(() => undefined, 1_000);
            const stream = new EventStream('/v1/events', {
                onEvent: () => undefined,
                onBreak: (_problem, pause) => {
                    pauses.push(pause);
                    if (pauses.length < bodies.length) return;
                    stream.close();
                    clearInterval(keep);
                    done();
                },
            });
        });
    } finally {
        Object.assign(globalThis, originals);
    }
    return pauses;
}

test('a host that ends each stream at once is asked less and less often', async () => {
    const pauses = await pausesAfter(['', '', ': nothing\n\n', '']);
    pauses.forEach((pause, i) => assert.ok(pause >= 500 * 2 ** i * 0.75 && pause <= 500 * 2 ** i * 1.25, `pause ${i}: ${pause}`));
});

test('after an event the next break is the first one', async () => {
    const pauses = await pausesAfter(['', '', 'id: a-1\ndata: {}\n\n']);
    assert.ok((pauses.at(-1) ?? Infinity) <= 625, `${pauses}`);
});
