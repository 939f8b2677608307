import assert from 'node:assert/strict';
import { test } from 'node:test';
import { EventParser, type ServerEvent } from '../../src/live/parser';

function parsed(pieces: readonly string[], start = ''): ServerEvent[] {
    const events: ServerEvent[] = [];
    const parser = new EventParser((event) => events.push(event), start);
    for (const piece of pieces) parser.feed(piece);
    return events;
}

const stream = 'id: j-1\ndata: {"a":1}\n\n:\n\nid: j-2\r\nevent: task\r\ndata: one\r\ndata:two\r\n\r\nevent: gap\ndata: {}\n\ndata: cut off';
const wanted = [
    { type: 'message', data: '{"a":1}', id: 'j-1' },
    { type: 'task', data: 'one\ntwo', id: 'j-2' },
    { type: 'gap', data: '{}', id: 'j-2' },
];

test('events come with their name and position', () => {
    assert.deepEqual(parsed([stream]), wanted);
});

test('it does not matter where the stream is cut', () => {
    assert.deepEqual(parsed([...stream]), wanted);
    for (let at = 0; at <= stream.length; ++at) assert.deepEqual(parsed([stream.slice(0, at), stream.slice(at)]), wanted);
});

test('an event before the first identifier has the position of the stream', () => {
    assert.deepEqual(parsed(['data: x\n\n'], 'j-7'), [{ type: 'message', data: 'x', id: 'j-7' }]);
});

test('an identifier without data moves the position on', () => {
    assert.deepEqual(parsed(['id: j-8\n\ndata: x\n\n']), [{ type: 'message', data: 'x', id: 'j-8' }]);
});
