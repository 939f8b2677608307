import assert from 'node:assert/strict';
import { test } from 'node:test';
import type { TaskSummary } from '../../src/api/types';
import { merged } from '../../src/state/task_list';

const task = (number: number, state = 'done'): TaskSummary => ({ id: `j-${number}`, state, product: 'ux', command: 'START', accepted: `2026-03-05T12:00:${String(number).padStart(2, '0')}Z` }) as TaskSummary;
const numbers = (tasks: readonly TaskSummary[]): string => tasks.map((one) => `${one.id.slice(2)} ${one.state}`).join(', ');

test('a newer state takes the place of the older one', () => {
    assert.equal(numbers(merged([task(2, 'running'), task(1)], [task(2, 'failed')], {})), '2 failed, 1 done');
});

test('new tasks come where they belong, each once', () => {
    assert.equal(numbers(merged([task(4), task(2), task(1)], [task(5), task(3), task(5, 'failed')], {})), '5 failed, 4 done, 3 done, 2 done, 1 done');
});

test('a task that no longer satisfies the filter goes', () => {
    assert.equal(numbers(merged([task(2, 'running'), task(1, 'running')], [task(2)], { state: 'running' })), '1 running');
});

test('what the filter leaves out does not come', () => {
    assert.equal(numbers(merged([task(1)], [task(2, 'failed'), { ...task(3), product: 'um' }], { state: 'done', product: 'ux' })), '1 done');
});

test('what is older than all that has been loaded comes with its page', () => {
    assert.equal(numbers(merged([task(9), task(8)], [task(3)], {})), '9 done, 8 done');
});

test('without news the list stays the same', () => {
    const tasks = [task(1)];
    assert.equal(merged(tasks, [], {}), tasks);
});
