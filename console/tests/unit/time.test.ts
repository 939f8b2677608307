import assert from 'node:assert/strict';
import { test } from 'node:test';
import { elapsedText, exactText, localText, parsedTime, relativeText, spanText, timeSince } from '../../src/words/time';

const noon = new Date('2026-03-05T12:00:00.250Z');

test('spans are told in their largest unit, as in zavctl', () => {
    assert.deepEqual([0, 59.9, 60, 3599, 3600, 86_399, 86_400, 200_000, -5].map(spanText),
        ['0 s', '59 s', '1 min', '59 min', '1 h', '23 h', '1 day', '2 days', '0 s']);
});

test('what took long is told exactly enough', () => {
    assert.deepEqual([0, 1_449, 12_900, 185_000, 7_380_000].map(elapsedText), ['0.0 s', '1.4 s', '12 s', '3 min 5 s', '2 h 3 min']);
});

test('times are local, with the date unless it is today', () => {
    assert.equal(localText(noon, noon), '17:45:00');
    assert.equal(localText(noon, new Date('2026-03-05T18:20:00Z')), '2026-03-05 17:45:00');
});

test('the exact time says where it holds', () => {
    assert.equal(exactText(noon), '2026-03-05 17:45:00.250 +05:45 (2026-03-05T12:00:00.250Z)');
});

test('relative times look back and forth', () => {
    assert.equal(relativeText(noon, new Date(noon.getTime() + 185_000)), '3 min ago');
    assert.equal(relativeText(noon, new Date(noon.getTime() - 7_200_000)), 'in 2 h');
});

test('a word such as 2h leads back', () => {
    assert.equal(timeSince('2h', noon)?.toISOString(), '2026-03-05T10:00:00.250Z');
    assert.equal(timeSince('15min', noon)?.toISOString(), '2026-03-05T11:45:00.250Z');
    assert.equal(timeSince('2026-01-01T00:00:00Z', noon)?.toISOString(), '2026-01-01T00:00:00.000Z');
});

test('what is no time is none', () => {
    for (const word of ['', 'soon', '2 weeks', '-1h', '99999999999h']) assert.equal(timeSince(word, noon), undefined);
    assert.equal(parsedTime('yesterday'), undefined);
    assert.equal(parsedTime(null), undefined);
});
