import assert from 'node:assert/strict';
import { test } from 'node:test';
import { RequestNames } from '../../src/api/tasks';

const stop = { command: 'STOP', product: 'ux' };

test('the same content keeps its name, another has its own', () => {
    const names = new RequestNames();
    const name = names.nameOf(stop);
    assert.notEqual(names.nameOf({ ...stop, force: true }), name);
    assert.equal(names.nameOf({ ...stop }), name);
});

test('what the host has answered has another name the next time', () => {
    const names = new RequestNames();
    const name = names.nameOf(stop);
    names.forget({ ...stop });
    assert.notEqual(names.nameOf(stop), name);
});

test('two windows never share a name', () => {
    assert.notEqual(new RequestNames().nameOf(stop), new RequestNames().nameOf(stop));
});
