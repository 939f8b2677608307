import assert from 'node:assert/strict';
import { test } from 'node:test';
import { masked } from '../../src/words/masked';

test('a text has no secret values, by the rules of zavctl', () => {
    assert.equal(masked('./install.sh --password=hunter2 -q'), './install.sh --password=*** -q');
    assert.equal(masked("DB_KEY: 'a b'\nPORT=5"), 'DB_KEY: ***\nPORT=5');
    assert.equal(masked('token=a token=b'), 'token=*** token=***');
    assert.equal(masked(''), '');
    assert.equal(masked('nothing = secret'), 'nothing = secret');
    assert.equal(masked(`a "api_secret"  =hunter2 b`), `a "api_secret"  =*** b`);
    assert.equal(masked('key=a"b c"d e'), 'key=*** e');
    assert.equal(masked('pwd="never closed\nnext'), 'pwd=***\nnext');
    assert.equal(masked('password => hunter2 b'), 'password => *** b');
    assert.equal(masked('password := hunter2 b'), 'password := *** b');
    assert.equal(masked('pwd=a\\ b c'), 'pwd=*** c');
    assert.equal(masked('pwd="a\\" b" c'), 'pwd=*** c');
    assert.equal(masked('{\\"key\\": \\"a b\\", d'), '{\\"key\\": *** d');
});

test('a masked text stays the same', () => {
    const once = masked('pwd=x; "secret": "y" rest');
    assert.equal(masked(once), once);
});

test('long texts take no time', () => {
    const began = Date.now();
    masked('key '.repeat(100_000) + 'password '.repeat(50_000) + `"${' '.repeat(200_000)}`);
    assert.ok(Date.now() - began < 5_000);
});
