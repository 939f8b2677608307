import assert from 'node:assert/strict';
import { test } from 'node:test';
import { type Piece, appended } from '../../src/words/output';
import { redactedLines } from '../../src/words/printable';

const from = (texts: readonly string[], most: number): Piece[] =>
    texts.reduce<Piece[]>((pieces, text) => appended(pieces, { stream: 'stdout', text }, most), []);
const textOf = (pieces: readonly Piece[]): string => pieces.map((piece) => piece.text).join('');

test('pieces of one stream are one, those of another stand apart', () => {
    const pieces = appended(from(['a\n', 'b\n'], 100), { stream: 'stderr', text: 'c\n' }, 100);
    assert.deepEqual(pieces, [{ stream: 'stdout', text: 'a\nb\n' }, { stream: 'stderr', text: 'c\n' }]);
});

test('the beginning goes first, by whole lines', () => {
    assert.equal(textOf(from(['one\ntwo\nthree\n'], 12)), 'two\nthree\n');
    assert.equal(textOf(from(['one\n', 'two\n'], 4)), 'two\n');
    assert.equal(textOf(from(['one\ntwo\n'], 6)), 'two\n');
});

test('no cut leaves a secret without the name that tells of it', () => {
    const text = 'first\npassword=hunter2 -q\nlast\n';
    for (let most = 0; most <= text.length; ++most) {
        assert.doesNotMatch(redactedLines(textOf(from([text], most))), /unter2|nter2|ter2|er2|r2/, `${most}`);
    }
});

test('a line that is longer than all that is kept is left out up to its end', () => {
    const pieces = from(['password=', 'x'.repeat(50), 'hunter2', ' more\nnext\n'], 20);
    assert.equal(textOf(pieces), 'next\n');
});

test('never more is kept than may be', () => {
    let pieces: Piece[] = [];
    for (let i = 0; i < 500; ++i) {
        pieces = appended(pieces, { stream: i % 3 === 0 ? 'stderr' : 'stdout', text: `${'y'.repeat(i % 17)}\n` }, 64);
        assert.ok(textOf(pieces).length <= 64);
    }
});
