import assert from 'node:assert/strict';
import { test } from 'node:test';
import { type DiffLine, diffLines, folded, isChange, linesOf } from '../../src/words/diff';

const sideOf = (lines: readonly DiffLine[], other: string): string[] => lines.filter((line) => line.kind !== other).map((line) => line.text);
const shown = (before: string, after: string): string =>
    diffLines(before, after).map((line) => ({ same: ' ', removed: '-', added: '+' })[line.kind] + line.text).join('\n');

test('equal texts have no change', () => {
    assert.equal(isChange(diffLines('a\nb\n', 'a\nb\n')), false);
    assert.equal(isChange(diffLines('', '')), false);
});

test('a changed line goes and comes where it was', () => {
    assert.equal(shown('a\nb\nc\n', 'a\nB\nc\n'), ' a\n-b\n+B\n c');
});

test('lines come at the beginning, in the middle and at the end', () => {
    assert.equal(shown('b\nd\n', 'a\nb\nc\nd\ne\n'), '+a\n b\n+c\n d\n+e');
    assert.equal(shown('', 'a\n'), '+a');
    assert.equal(shown('a\n', ''), '-a');
});

test('lines are numbered in both texts', () => {
    assert.deepEqual(diffLines('a\nb\n', 'b\n'), [{ kind: 'removed', text: 'a', before: 1 }, { kind: 'same', text: 'b', before: 2, after: 1 }]);
});

test('both texts can be read from the difference, and no shorter one exists, for all short texts', () => {
    const letters = ['a', 'b', 'c'];
    const all = [''];
    for (let i = 0; i < all.length && (all[i] as string).length < 8; ++i) for (const letter of letters) if (all.length < 120) all.push(`${all[i]}${letter}\n`);
    const longest = (a: string[], b: string[]): number => {
        const table = a.map(() => b.map(() => 0));
        a.forEach((x, i) => b.forEach((y, j) => {
            const at = (r: number, c: number): number => table[r]?.[c] ?? 0;
            (table[i] as number[])[j] = x === y ? at(i - 1, j - 1) + 1 : Math.max(at(i - 1, j), at(i, j - 1));
        }));
        return table.at(-1)?.at(-1) ?? 0;
    };
    for (const before of all) {
        for (const after of all) {
            const lines = diffLines(before, after);
            assert.deepEqual(sideOf(lines, 'added'), linesOf(before));
            assert.deepEqual(sideOf(lines, 'removed'), linesOf(after));
            assert.equal(lines.filter((line) => line.kind === 'same').length, longest(linesOf(before), linesOf(after)));
        }
    }
});

test('texts that have nothing in common take no time', () => {
    const text = (letter: string): string => Array.from({ length: 20_000 }, (_, i) => `${letter}${i}\n`).join('');
    const began = Date.now();
    assert.equal(diffLines(text('a'), text('b')).length, 40_000);
    assert.ok(Date.now() - began < 5_000);
});

test('unchanged lines far from a change are counted', () => {
    const before = Array.from({ length: 20 }, (_, i) => `${i}\n`).join('');
    const lines = folded(diffLines(before, before.replace('10\n', 'ten\n')), 2);
    assert.deepEqual(lines.map((line) => (typeof line === 'number' ? line : line.text)), [8, '8', '9', '10', 'ten', '11', '12', 7]);
});
