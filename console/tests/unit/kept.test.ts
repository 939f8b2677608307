import assert from 'node:assert/strict';
import { test } from 'node:test';
import { isInPart, whatIsMissing } from '../../src/words/kept';

test('what is as long as the host keeps may have been cut', () => {
    assert.equal(isInPart('x'.repeat(4096)), true);
    assert.equal(isInPart('x'.repeat(4000)), false);
    assert.equal(isInPart('/bin/sh'), false);
});

test('bytes count, and not characters', () => {
    assert.equal(isInPart('é'.repeat(2048)), true);
    assert.equal(isInPart(`x${'é'.repeat(2047)}`), true);
    assert.equal(isInPart('é'.repeat(2000)), false);
});

test('a cut value is not sent as it is', () => {
    const cut = 'x'.repeat(4096);
    assert.equal(whatIsMissing('context', cut, cut), 'The context is cut: give the whole of it.');
    assert.equal(whatIsMissing('context', cut, ' '), 'Give the context.');
    assert.equal(whatIsMissing('context', cut, `${cut}y`), '');
});

test('a masked value is not sent before its secret is there', () => {
    assert.equal(isInPart('--password=***'), true);
    assert.equal(whatIsMissing('context', '--password=***', '--password=*** -q'), 'Replace *** in the context by what stood there.');
    assert.equal(whatIsMissing('context', '--password=***', '--password=a'), '');
});
