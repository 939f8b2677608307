/// Tasks: asking for them, looking at them, cancelling them.
import { ask, withQuery } from './client';
import { Problem } from './problem';
import type { Task, TaskList, TaskState } from './types';

/// What a task is asked for with. Empty members are not sent.
export interface TaskRequest {
    command: string;
    product: string;
    version?: string;
    targetmsn?: string;
    optional?: string;
    context?: string;
    uaconfig?: string;
    uascript?: string;
    force?: boolean;
}

export interface TaskFilter {
    state?: string;
    product?: string;
    command?: string;
    since?: string;
}

export const isOver = (state: TaskState): boolean => state !== 'queued' && state !== 'running';

/// A name for a request that no other has. zavctl knows such names and leaves them out of its lists.
export function makeTransid(): string {
    const bytes = crypto.getRandomValues(new Uint8Array(8));
    return `zavctl-console-${Array.from(bytes, (byte) => byte.toString(16).padStart(2, '0')).join('')}`;
}

export const isMadeUp = (transid: string): boolean => /^zavctl-.*-[0-9a-f]{16}$/.test(transid);

const pause = (milliseconds: number): Promise<void> => new Promise((done) => setTimeout(done, milliseconds));

/// The task, as soon as the host has it on disk. When the answer is lost the request is repeated,
/// which does nothing if the host has it already. Throws a Problem.
export async function askForTask(request: TaskRequest): Promise<Task> {
    const entries = Object.entries(request).filter(([, value]) => value !== '' && value !== undefined && value !== false);
    const body = { ...Object.fromEntries(entries), transid: makeTransid(), once: true };
    for (let attempt = 1; ; ++attempt) {
        try {
            return await ask<Task>('/v1/tasks', { body });
        } catch (error) {
            const isWorthRepeating = error instanceof Problem && error.isLost && attempt < 4;
            if (!isWorthRepeating) throw error;
            await pause(250 * 2 ** attempt);
        }
    }
}

export const askTask = (id: string, signal?: AbortSignal): Promise<Task> =>
    ask(`/v1/tasks/${encodeURIComponent(id)}`, signal ? { signal } : {});

export const cancelTask = (id: string): Promise<Task> =>
    ask(`/v1/tasks/${encodeURIComponent(id)}/cancel`, { method: 'POST' });

export const askTasks = (filter: TaskFilter, limit: number, after?: number, signal?: AbortSignal): Promise<TaskList> =>
    ask(withQuery('/v1/tasks', { ...filter, limit, after }), signal ? { signal } : {});
