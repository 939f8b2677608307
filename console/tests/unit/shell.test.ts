import assert from 'node:assert/strict';
import { execFileSync } from 'node:child_process';
import { test } from 'node:test';
import { shellLine, shellQuoted, withInput } from '../../src/words/shell';

const through = (line: string): string => execFileSync('bash', ['-c', line], { encoding: 'utf8' });

test('plain words stay as they are, as in zavctl', () => {
    assert.equal(shellQuoted('db1:myhost:UX'), 'db1:myhost:UX');
    assert.equal(shellQuoted('ux/7.1'), 'ux/7.1');
    assert.equal(shellQuoted('50%+1,a=b@c_d'), '50%+1,a=b@c_d');
});

test('all others stand in single quotes', () => {
    assert.equal(shellQuoted(''), "''");
    assert.equal(shellQuoted("it's"), "'it'\\''s'");
    assert.equal(shellQuoted('|DEPLOYDIR|/install.sh'), "'|DEPLOYDIR|/install.sh'");
});

test('a shell takes each word for one, whatever is in it', () => {
    const words = ['$(reboot)', '`id`', "a'b", '"', '\\', '~', '*', ' ', 'é', 'two\nlines', '!', '#', '{a,b}', '-n', '\t'];
    const output = through(shellLine(['printf', '%s\\0', ...words]));
    assert.deepEqual(output.split('\0').slice(0, -1), words);
});

test('what a terminal would obey is spelled out, and arrives as it was', () => {
    const words = ['v\x1b[201~\nx', "\u202e'gpj\\.exe", 'a\rb', '\x7f\x9b1m', '\ufeffé', "\t'", '\u200bff'];
    const line = shellLine(['printf', '%s\\0', ...words]);
    assert.doesNotMatch(line, /[\u0000-\u001f\u007f-\u009f\u200b-\u200f\u2028-\u202e\u2060-\u2069\ufeff]/);
    assert.deepEqual(through(line).split('\0').slice(0, -1), words);
    assert.deepEqual(execFileSync('bash', ['-c', line], { encoding: 'utf8', env: { LC_ALL: 'C' } }).split('\0').slice(0, -1), words);
});

test('an input arrives whole, also one that holds the mark of its end', () => {
    for (const text of ["A=1\nEND\nEND_\n$HOME `id` 'x'\n", '\n', 'a\n\n\nb\n']) {
        assert.equal(through(withInput('cat', text)), text);
    }
});

test('an input gets the line feed that it lacks', () => {
    assert.equal(through(withInput('cat', 'A=1')), 'A=1\n');
});
