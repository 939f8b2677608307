/// How things ended, in the words of zavctl.
import type { Command, Row, Task } from '../api/types';
import { messages } from '../generated/messages';
import { printable, redacted } from './printable';

const textOf = (row: Row, column: string): string => {
    const value = (row as Record<string, unknown>)[column];
    return value === undefined || value === null ? '' : String(value);
};

/// A row's return code; undefined if it has none that makes sense.
export function returnCodeOf(row: Row): number | undefined {
    const value = (row as Record<string, unknown>)['RETVAL'];
    return typeof value === 'number' && Number.isInteger(value) ? value : undefined;
}

/// "ZAV1019E: the product is not installed [ux]".
export function describeRow(row: Row): string {
    const code = returnCodeOf(row);
    const id = textOf(row, 'RETMSGID');
    const parameter = textOf(row, 'RETMSGPARM');
    if (id === '' && code === undefined) return 'the host gave no return code';
    let text = id === '' ? `return code ${code}` : printable(id);
    if (messages[id] !== undefined) text += `: ${messages[id]}`;
    if (parameter !== '') text += ` [${redacted(parameter)}]`;
    return text;
}

/// "exit code 0", "killed by signal 9", "not known".
export function endText(command: Command): string {
    if (command.error !== undefined) return `could not be run: ${redacted(command.error)}`;
    if (command.signal !== undefined) {
        return `${command.timed_out ? 'given up after its time-out, ' : ''}killed by signal ${command.signal}`;
    }
    if (command.exit !== undefined) return `exit code ${command.exit}`;
    return command.ended === null ? 'runs' : 'not known';
}

export const endedBadly = (command: Command): boolean =>
    command.error !== undefined || command.signal !== undefined || (command.exit !== undefined && command.exit !== 0);

const usualReasons: Readonly<Record<string, string>> = {
    interrupted: 'the host ended in the middle of it: it may have run in part',
    expired: 'its turn came too late',
    refused: 'the host did not hand it over',
};

/// Why a task ended as it did; empty if there is nothing to say.
export function reasonOf(task: Partial<Task> & Pick<Task, 'state'>): string {
    if (task.reason) return redacted(task.reason);
    const row = task.events?.at(-1) ?? task.reply;
    if (row && (returnCodeOf(row) !== 0 || textOf(row, 'RETMSGID') !== '')) return describeRow(row);
    if (task.state === 'failed') {
        const dead = task.details?.commands.find((command) => command.error !== undefined || command.signal !== undefined);
        if (dead) return `reported as done, but the command ${dead.error === undefined ? 'was ' : ''}${endText(dead)}`;
    }
    return usualReasons[task.state] ?? '';
}

/// "START ux db1:host:UX".
export function requestText(task: { command: string; product: string; version?: string; targetmsn?: string }): string {
    return [task.command, task.product, task.version, task.targetmsn].filter((part) => part).map((part) => printable(part ?? '')).join(' ');
}
