import assert from 'node:assert/strict';
import { test } from 'node:test';
import { Problem } from '../../src/api/problem';
import { droppedIn, filesIn, mostFiles } from '../../src/state/found_files';
import { arrivedText, folderNotes } from '../../src/words/folder';

const file = (name: string) => ({ name, isFile: true, isDirectory: false, file: (done: (file: unknown) => void) => done({ name, size: 1 }) });

/// A folder that a browser hands out in pieces.
const folder = (name: string, entries: unknown[], piece = 100) => ({
    name, isFile: false, isDirectory: true,
    createReader: () => {
        let next = 0;
        return { readEntries: (done: (some: unknown[]) => void) => done(entries.slice(next, (next += piece))) };
    },
}) as unknown as FileSystemDirectoryEntry;

const isTooMuch = (error: unknown) => error instanceof Problem && /holds more than this page takes/.test(error.message);

test('a folder is read to its end, in the order of its names', async () => {
    const found = await filesIn(folder('bundle', [file('b'), folder('lib', [file('c')]), file('a')], 1));
    assert.equal(found.name, 'bundle');
    assert.deepEqual(found.files.map(({ names }) => names.join('/')), ['a', 'b', 'lib/c']);
    assert.deepEqual(found.skipped, []);
});

test('what cannot be read is noted, and the rest is taken', async () => {
    const broken = { name: 'x', isFile: true, isDirectory: false, file: (_: unknown, failed: (error: Error) => void) => failed(new Error('it has gone')) };
    const closed = { name: 'shut', isFile: false, isDirectory: true, createReader: () => ({ readEntries: (_: unknown, failed: (error: Error) => void) => failed(new Error('not for you')) }) };
    const found = await filesIn(folder('bundle', [broken, closed, folder('empty', []), file('a')]));
    assert.deepEqual(found.files.map(({ names }) => names.join('/')), ['a']);
    assert.deepEqual(found.skipped, ['bundle/empty is empty', 'bundle/shut: not for you', 'bundle/x: it has gone']);
});

test('a folder with too many files, with too many folders or too deep is refused', async () => {
    const files = (count: number) => Array.from({ length: count }, (_, i) => file(String(i)));
    assert.equal((await filesIn(folder('all', files(mostFiles)))).files.length, mostFiles);
    await assert.rejects(filesIn(folder('all', files(mostFiles + 1))), isTooMuch);
    await assert.rejects(filesIn(folder('all', Array.from({ length: 5 * mostFiles }, (_, i) => folder(String(i), [])))), isTooMuch);
    const circle: { name: string; isDirectory: boolean; createReader?: () => unknown } = { name: 'again', isDirectory: true };
    circle.createReader = () => {
        let isTold = false;
        return { readEntries: (done: (some: unknown[]) => void) => { done(isTold ? [] : [circle]); isTold = true; } };
    };
    await assert.rejects(filesIn(circle as unknown as FileSystemDirectoryEntry), isTooMuch);
});

test('files and folders that are dropped are told apart, and text is neither', () => {
    const item = (kind: string, entry: unknown, content: unknown) => ({ kind, webkitGetAsEntry: () => entry, getAsFile: () => content });
    const items = [item('string', null, null), item('file', file('a'), { name: 'a' }), item('file', folder('b', []), { name: 'b' }), item('file', null, { name: 'made' })];
    const dropped = droppedIn({ items } as unknown as DataTransfer);
    assert.deepEqual(dropped.files.map(({ name }) => name), ['a', 'made']);
    assert.deepEqual(dropped.folders.map(({ name }) => name), ['b']);
    assert.deepEqual(droppedIn(null), { files: [], folders: [] });
});

test('how far a folder is', () => {
    const counts = { files: 12, arrived: 0, verified: 0, refused: 0, replaced: 0, converted: 0 };
    assert.equal(arrivedText(counts), '0 of 12 files arrived');
    assert.equal(arrivedText({ ...counts, arrived: 7, verified: 7 }), '7 of 12 files arrived, all of them verified');
    assert.equal(arrivedText({ ...counts, arrived: 7, verified: 5, refused: 1 }), '7 of 12 files arrived, 5 verified, 1 not there');
    assert.deepEqual(folderNotes(counts), []);
    assert.equal(folderNotes({ ...counts, replaced: 2, converted: 1 }).length, 2);
});
