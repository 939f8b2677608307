import assert from 'node:assert/strict';
import { afterEach, test } from 'node:test';
import { preview, rolloutIn, run } from '../../src/api/fleet/run';
import type { FleetHost, HostNews, OrderNews, Rollout, RolloutPart } from '../../src/api/fleet/types';
import { Problem } from '../../src/api/problem';
import { mayOrder } from '../../src/state/fleet/centre';
import { changedHost } from '../../src/state/fleet/hosts';
import { countedStates, partsWithNews } from '../../src/state/fleet/parts';
import { mergedRollouts } from '../../src/state/fleet/rollouts';

const usual = globalThis.fetch;
afterEach(() => {
    globalThis.fetch = usual;
});

/// Has the console's server answer this, and returns what it was asked.
function serve(document: unknown, status = 200): unknown[] {
    const asked: unknown[] = [];
    globalThis.fetch = (async (_path: unknown, init: RequestInit) => {
        asked.push(JSON.parse(String(init.body)));
        return new Response(JSON.stringify(document), { status });
    }) as typeof fetch;
    return asked;
}

const start = { verb: 'start', arguments: ['ux'], options: { on: '*', waves: '', force: false } };

async function problemOf(work: Promise<unknown>): Promise<Problem> {
    try {
        await work;
    } catch (error) {
        if (error instanceof Problem) return error;
        throw error;
    }
    throw new Error('there was no problem');
}

test('empty options are not sent, and what stands behind the dashes is an argument', async () => {
    const asked = serve({ exit: 0, command: '', output: {}, messages: '' });
    await run({ ...start, trailing: ['-x'] });
    assert.deepEqual(asked, [{ verb: 'start', arguments: ['ux', '-x'], options: { on: '*' } }]);
});

test('a refusal has its words, its guard and its hint', async () => {
    serve({ exit: 1, command: '', output: { error: 'it is not allowed', guard: 'role', hint: 'ask anna' }, messages: 'zavctl: it is not allowed\n' });
    const problem = await problemOf(run(start));
    assert.deepEqual([problem.message, problem.guard, problem.hint, problem.isLost], ['it is not allowed', 'role', 'ask anna', false]);
});

test('a program that has ended without a document is told by its messages', async () => {
    serve({ exit: 2, command: '', output: null, messages: 'zavctl: the centre is away\nzavctl-fleet: try later\n' });
    assert.equal((await problemOf(run(start))).message, 'the centre is away\ntry later');
    serve({ exit: 9, command: '', output: null, messages: '' });
    assert.equal((await problemOf(run(start))).message, 'zavctl ended with the status 9');
});

test('a document with a bad end is kept, with what was said of it', async () => {
    serve({ exit: 3, command: '', output: { hosts: [] }, messages: 'zavctl: web-1: it is away\n' });
    assert.deepEqual(await run(start), { output: { hosts: [] }, messages: 'web-1: it is away', isWhole: false });
});

test('a preview sends nothing', async () => {
    const asked = serve({ exit: 0, command: '', output: { hosts: [{ host: 'UA', name: 'web-1', state: 'here' }, { host: 'UB' }], order: { kind: 'START', body: { product: 'ux' }, seconds: 60 } }, messages: '' });
    const shown = await preview(start, new AbortController().signal);
    assert.deepEqual(shown, { hosts: [{ name: 'web-1', state: 'here' }, { name: 'UB', state: '' }], kind: 'START', product: 'ux', seconds: 60 });
    assert.deepEqual((asked[0] as { options: unknown }).options, { on: '*', 'dry-run': true });
});

test('a roll-out is found in each form of an answer', () => {
    assert.equal(rolloutIn({ rollout: 'a1' }), 'a1');
    assert.equal(rolloutIn({ rollout: { id: 'a2' } }), 'a2');
    assert.equal(rolloutIn({ id: 'a3' }), 'a3');
    assert.equal(rolloutIn({}), undefined);
    assert.equal(rolloutIn(null), undefined);
});

test('a certificate allows what its patterns fit, and a viewer nothing', () => {
    const who = (role: string, ...commands: string[]) => ({ operator: 'anna', role, commands, products: ['*'], selector: '*', fleet: 'shop' });
    assert.equal(mayOrder(who('operator', 'START'), 'START'), true);
    assert.equal(mayOrder(who('operator', 'START'), 'RESTART'), false);
    assert.equal(mayOrder(who('operator', '*START'), 'RESTART'), true);
    assert.equal(mayOrder(who('operator', 'ST.RT'), 'START'), false);
    assert.equal(mayOrder(who('admin', '*'), 'UNINSTALL'), true);
    assert.equal(mayOrder(who('viewer', '*'), 'START'), false);
    assert.equal(mayOrder(undefined, 'START'), false);
});

test('a host that is told of keeps what is not told', () => {
    const known: FleetHost = { host: 'UA', name: 'web-1', labels: { env: 'test' }, state: 'here', heard: 'early', blocked: 'full' };
    const news: HostNews = { host: 'UA', name: 'web-2', state: 'away', since: 'late', blocked: 'full' };
    assert.deepEqual(changedHost(known, news), { ...known, name: 'web-2', state: 'away', since: 'late' });
    assert.equal(changedHost(known, { ...news, state: 'here' }).heard, 'late');
    assert.equal(changedHost(known, { ...news, blocked: '' }).blocked, '');
});

const rollout = (id: string, created: string, state = 'running'): Rollout => ({ id, created, state }) as Rollout;

test('roll-outs that are told of take the place of older ones, and new ones come first', () => {
    const known = [rollout('b', '2026-01-02T00:00:00Z'), rollout('a', '2026-01-01T00:00:00Z')];
    const merged = mergedRollouts(known, new Map([['a', rollout('a', '2026-01-01T00:00:00Z', 'paused')], ['c', rollout('c', '2026-01-03T00:00:00Z')]]));
    assert.deepEqual(merged.map((one) => [one.id, one.state]), [['c', 'running'], ['b', 'running'], ['a', 'paused']]);
    assert.equal(mergedRollouts(known, new Map()), known);
});

const part = (host: string, state: string, away = false): RolloutPart => ({ host, state, away, order: 'old', unconfirmed: false, failure: false }) as RolloutPart;
const order = (host: string, of: string | null, state: OrderNews['state']): OrderNews => ({ order: `o-${host}`, host, name: host, rollout: of, kind: 'START', product: 'ux', state });

test('parts follow the orders of their own roll-out', () => {
    const parts = [part('UA', 'released', true), part('UB', 'waiting'), part('UC', 'waiting')];
    const news = new Map([['1', order('UA', 'r', 'done')], ['2', order('UB', 'other', 'done')], ['3', order('UC', null, 'done')]]);
    const followed = partsWithNews(parts, news, 'r');
    assert.deepEqual(followed.map((one) => [one.state, one.away, one.order]), [['done', false, 'o-UA'], ['waiting', false, 'old'], ['waiting', false, 'old']]);
    assert.equal(partsWithNews(parts, new Map([['2', order('UB', 'other', 'done')]]), 'r'), parts);
});

test('states of parts are counted, those that are not over first', () => {
    const parts = ['done', 'done', 'released', 'failed', 'waiting'].map((state, i) => part(String(i), state));
    assert.deepEqual(countedStates(parts), [['released', 1], ['waiting', 1], ['done', 2], ['failed', 1]]);
});
