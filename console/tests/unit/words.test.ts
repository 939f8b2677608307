import assert from 'node:assert/strict';
import { test } from 'node:test';
import { problemOf } from '../../src/api/problem';
import { bucketsOf } from '../../src/words/buckets';
import { printable, printableLines } from '../../src/words/printable';
import { describeRow, endText, reasonOf } from '../../src/words/results';
import { bytesText, counted } from '../../src/words/size';
import { doubtAboutInstall, doubtAboutState, doubtAboutUninstall, isSameVersion } from '../../src/words/verification';

const row = (more: object): never => ({ RETVAL: 0, RETMSGID: '', RETMSGPARM: '', ...more }) as never;

test('characters that nobody sees are shown', () => {
    assert.equal(printable('a\u001b[31m\u0000\u202eb\n'), 'a\\x1B[31m\\x00\\u202Eb\\x0A');
    assert.equal(printableLines('a\r\nb\tc\u0007'), 'a\nb\tc\\x07');
    assert.equal(printable('größer 漢字 🙂'), 'größer 漢字 🙂');
});

test('results have the words of zavctl', () => {
    assert.equal(describeRow(row({ RETVAL: 8, RETMSGID: 'ZAV1019E', RETMSGPARM: 'ux' })), 'ZAV1019E: the product is not installed [ux]');
    assert.equal(describeRow(row({ RETVAL: 8 })), 'return code 8');
    assert.equal(describeRow({} as never), 'the host gave no return code');
});

test('ends of commands have the words of zavctl', () => {
    const command = (more: object): never => ({ command: 'x', started: '', ended: '', ...more }) as never;
    assert.equal(endText(command({ exit: 4 })), 'exit code 4');
    assert.equal(endText(command({ signal: 9, timed_out: true })), 'given up after its time-out, killed by signal 9');
    assert.equal(endText(command({ error: 'no such file' })), 'could not be run: no such file');
    assert.equal(endText(command({ ended: null })), 'runs');
});

test('a reason comes from the host first, then from its row, then from what is usual', () => {
    assert.equal(reasonOf({ state: 'refused', reason: 'not here' }), 'not here');
    assert.equal(reasonOf({ state: 'failed', events: [row({ RETVAL: 4, RETMSGID: 'ZAV1024E' })] }), 'ZAV1024E: the start or stop command ended with a bad return code');
    assert.equal(reasonOf({ state: 'expired' }), 'its turn came too late');
    assert.equal(reasonOf({ state: 'done', events: [row({})] }), '');
});

test('a problem has the words, the guard and the hint of the host', () => {
    const problem = problemOf(409, '{"error":"no","guard":"product","hint":"try ax"}');
    assert.deepEqual([problem.message, problem.status, problem.guard, problem.hint], ['no', 409, 'product', 'try ax']);
    assert.equal(problemOf(500, '<html>').message, 'the answer has the status 500');
    assert.equal(problemOf(502, '{"error":"away"}').isLost, true);
    assert.equal(problemOf(401, '').message, 'this session is over');
});

test('sizes and counts read well', () => {
    assert.deepEqual([0, 1023, 1024, 1536, 10_240, 3_400_000].map(bytesText), ['0 B', '1023 B', '1.0 KiB', '1.5 KiB', '10 KiB', '3.2 MiB']);
    assert.deepEqual([counted(1, 'task'), counted(2, 'entry', 'entries')], ['1 task', '2 entries']);
});

test('tasks are counted where they were accepted', () => {
    const task = (seconds: number, state: string): never => ({ accepted: new Date(seconds * 1000).toISOString(), state }) as never;
    const buckets = bucketsOf([task(1000, 'done'), task(1119, 'failed'), task(1120, 'queued'), task(900, 'done'), task(5000, 'done')], 1150, 2, 60);
    assert.deepEqual(buckets, { starts: [1080, 1140], done: [0, 0], bad: [1, 0], other: [1, 0] });
});

const instance = (more: object): never => ({ product: 'ux', instance: '', target: 'h:UX', state: 'running', user: null, pid: null, ...more }) as never;

test('a success that the host does not show is doubted', () => {
    assert.equal(doubtAboutState({ command: 'STOP', product: 'ux' }, [instance({})]).doubt, 'the host reported success, but h:UX still runs');
    assert.equal(doubtAboutState({ command: 'START', product: 'ux', targetmsn: 'DB1:h:ux' }, [instance({ instance: 'db1', target: 'db1:h:UX', state: 'missing' })]).doubt,
        'the host reported success, but db1:h:UX does not run');
    assert.deepEqual(doubtAboutState({ command: 'STOP', product: 'ux' }, []), {});
    assert.match(doubtAboutState({ command: 'START', product: 'ux' }, null).note ?? '', /no way to ask/);
});

test('an inventory confirms installs and removals', () => {
    const listed = { products: [{ product: 'ux', version: '063000000', release: '', platform: '', description: '' }], warnings: [] };
    assert.deepEqual(doubtAboutInstall({ command: 'INSTALL', product: 'ux', version: '6.3' }, listed), {});
    assert.match(doubtAboutInstall({ command: 'INSTALL', product: 'ux', version: '7.1' }, listed).doubt ?? '', /ux 7.1 is not in the inventory, which lists 063000000/);
    assert.match(doubtAboutUninstall({ command: 'UNINSTALL', product: 'ux' }, listed).doubt ?? '', /still in the inventory/);
    assert.equal(isSameVersion('06.30', '063000000'), true);
    assert.equal(isSameVersion('6.31', '063000000'), false);
});
