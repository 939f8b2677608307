import assert from 'node:assert/strict';
import { test } from 'node:test';
import type { FleetHost, Rollout, RolloutPart } from '../../src/api/fleet/types';
import { hostTones, labelsText, openOrders, troubleOf } from '../../src/words/fleet/hosts';
import { inventoryOf, spreadOf, targetsOf } from '../../src/words/fleet/inventory';
import { fleetLine, fleetTitle } from '../../src/words/fleet/lines';
import { countsText, partMark, partText, planText, progressText, rolloutTone } from '../../src/words/fleet/rollouts';

const prefix = ['zavctl', '--fleet', 'https://centre.example'];

const host = (more: Partial<FleetHost> = {}): FleetHost => ({ host: 'UA', name: 'web-1', labels: {}, state: 'here', blocked: '', ...more });

test('a line has the arguments, then the options, then what stands behind the dashes', () => {
    assert.equal(fleetLine(prefix, { verb: 'start', arguments: ['ux'], options: { on: 'env=test', waves: '', force: true, target: undefined } }),
        'zavctl --fleet https://centre.example start ux --on env=test --force');
    assert.equal(fleetLine(prefix, { verb: 'install', arguments: ['ux', '7.1'], trailing: ['/bin/sh x'], options: { on: '*' } }),
        "zavctl --fleet https://centre.example install ux 7.1 --on '*' -- '/bin/sh x'");
});

test('words that would be options are kept from being some', () => {
    assert.equal(fleetLine(prefix, { verb: 'start', arguments: ['--force'], options: { on: '-x' } }),
        'zavctl --fleet https://centre.example start --on=-x -- --force');
});

test('a configuration is the input of its line', () => {
    assert.equal(fleetLine(prefix, { verb: 'config set', arguments: ['ux', '-'], options: { on: 'a' }, input: 'A=1\n' }),
        "zavctl --fleet https://centre.example config set ux - --on a <<'END'\nA=1\nEND");
});

test('titles leave the dash out', () => {
    assert.equal(fleetTitle({ verb: 'config set', arguments: ['ux', '-'], options: {} }), 'config set ux');
    assert.equal(fleetTitle({ verb: 'rollout pause', arguments: ['r1'], options: {} }), 'rollout pause r1');
});

test('named hosts come by the standard input, unless that is taken', () => {
    assert.equal(fleetLine(prefix, { verb: 'stop', arguments: ['ux'], options: { force: true }, hosts: ['web-1', "a'b"] }),
        "printf '%s\\n' web-1 'a'\\''b' | zavctl --fleet https://centre.example stop ux --force --on @/dev/stdin");
    assert.equal(fleetLine(prefix, { verb: 'config set', arguments: ['ux', '-'], options: {}, hosts: ['web-1'], input: 'A=1\n' }),
        "zavctl --fleet https://centre.example config set ux - --on @FILE <<'END'\nA=1\nEND");
});

test('trouble is told in the words of zavctl', () => {
    assert.equal(troubleOf(host()), '');
    assert.equal(troubleOf(host({ stopped: 'two machines claim to be this host', skew: -300 })), 'stopped: two machines claim to be this host; its clock is 5 min behind');
    assert.equal(troubleOf(host({ unpublished: 'no key', blocked: 'full', skew: 59 })), 'blocked: full; unpublished: no key');
});

test('every state of a host has a mark', () => {
    for (const state of ['here', 'away', 'stopped', 'unknown']) assert.ok(hostTones[state], state);
});

test('labels and open orders of a host are counted and named', () => {
    assert.equal(labelsText({ env: 'test', site: 'a' }), 'env=test, site=a');
    assert.equal(openOrders(host({ last: 7, taken: 4 })), 3);
    assert.equal(openOrders(host({ last: 4, taken: 7 })), 0);
});

test('an inventory may be anything', () => {
    for (const inventory of [undefined, null, 'x', 7, [], [1]]) {
        const known = inventoryOf(host({ facts: { inventory: inventory as never } }));
        assert.equal(known.age, undefined);
        assert.deepEqual(known.products, []);
    }
    const odd = inventoryOf(host({ facts: { inventory: { age: 'old', products: [null, 3, { PRODUCT: {}, VERSION: 7 }], instances: 'none', warnings: [1, 'half'], leftOut: 2 } } }));
    assert.equal(odd.age, 0);
    assert.deepEqual(odd.products, [{ product: '', version: '7', release: '', platform: '', description: '' }]);
    assert.deepEqual(odd.instances, []);
    assert.deepEqual(odd.warnings, ['half', 'the inventory is too long to be told; 2 entries are left out']);
});

test('a host counts once for each version that it has', () => {
    const has = (...versions: string[]) => inventoryOf(host({ facts: { inventory: {
        age: 1, products: versions.map((version) => ({ PRODUCT: 'ux', VERSION: version, PRODDESC: 'Load' })), instances: [{ product: 'ux', state: 'running' }, { product: 'ux', state: 'missing' }],
    } } }));
    const [ux, ...others] = spreadOf([has('1', '1'), has('1', '2'), has('2'), has('2')]);
    assert.deepEqual(others, []);
    assert.deepEqual(ux, { product: 'ux', description: 'Load', hosts: 4, running: 4, missing: 4, versions: [['2', 3], ['1', 2]] });
});

const rollout = (more: Partial<Rollout> = {}): Rollout => ({
    id: 'r', operator: 'anna', kind: 'START', product: 'ux', selector: '*', created: '', state: 'running', cause: '', reason: '', since: '',
    plan: { waves: '1,100%', maxFailures: '2%', pause: 60, wait: 600, parallel: 5 }, hosts: 12, mostFailures: 0, wave: 1, waves: [],
    counts: { waiting: 1, released: 2, over: { done: 8, failed: 1, expired: 0 } }, failures: 1, away: 1, unconfirmed: 0, expired: 3, ...more,
});

test('the progress of a roll-out is told in the words of zavctl', () => {
    assert.equal(progressText(rollout()), '9 of 12 over: 8 done, 1 failed; 2 under way; 1 waiting; waiting for 1 host that is away; 3 to be signed anew');
    assert.equal(countsText({ waiting: 0, released: 0, over: {} }, 0), '0 of 0 over');
    assert.equal(planText(rollout().plan), 'waves 1,100%, at most 2% failures, a pause of 1 min between them, each at most 10 min, at most 5 hosts at the same time');
});

test('a roll-out that has finished with failures is not marked as good', () => {
    assert.equal(rolloutTone(rollout({ state: 'finished', failures: 1 })), 'error');
    assert.equal(rolloutTone(rollout({ state: 'finished', failures: 0 })), 'ok');
    assert.equal(rolloutTone(rollout({ state: 'paused' })), 'warning');
});

const part = (state: string, more: Partial<RolloutPart> = {}): RolloutPart => ({
    place: 0, host: 'UA', name: 'web-1', wave: 1, order: 'o', number: 1, tries: 1, state, reason: '', failure: false, away: false, unconfirmed: false, ...more,
});

test('parts are marked by how they stand; an end that nobody has heard of is a bad one', () => {
    const marks = ['waiting', 'released', 'done', 'failed', 'refused', 'expired', 'cancelled', 'unknown', 'burnt'].map((state) => partMark(part(state)));
    assert.deepEqual(marks, ['quiet', 'busy', 'good', 'bad', 'bad', 'attention', 'quiet', 'attention', 'bad']);
    assert.equal(partMark(part('released', { away: true })), 'attention');
    assert.equal(partText(part('released', { away: true, unconfirmed: true })), 'released, away, expired, not confirmed');
});

test('named instances are counted by their targets, and the default one is none', () => {
    const has = (name: string, ...instances: readonly (readonly [string, string, string])[]) => ({
        ...inventoryOf(host({ facts: { inventory: { age: 1, instances: instances.map(([instance, target, state]) => ({ product: 'ux', instance, target, state, user: null })) } as never } })), name,
    });
    const inventories = [has('web-1', ['', 'web-1:UX', 'running'], ['db1', 'db1:web-1:UX', 'running']), has('web-2', ['db1', 'db1:web-2:UX', 'missing']), has('web-3', ['db1', 'db1:web-1:UX', 'stopped'], ['a', '', 'running'])];
    assert.deepEqual(targetsOf(inventories, 'ux'), [
        { instance: 'db1', target: 'db1:web-1:UX', hosts: ['web-1', 'web-3'], running: 1, missing: 0 },
        { instance: 'db1', target: 'db1:web-2:UX', hosts: ['web-2'], running: 0, missing: 1 },
    ]);
    assert.deepEqual(targetsOf(inventories, 'ne'), []);
});
