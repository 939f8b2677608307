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

/// The names of what one window asks for: the same content keeps its name while nobody knows what has
/// become of it, so that it is no second task when it is sent again.
export class RequestNames {
    private readonly names = new Map<string, string>();

    nameOf(request: TaskRequest): string {
        const content = JSON.stringify(request);
        const name = this.names.get(content) ?? makeTransid();
        this.names.set(content, name);
        return name;
    }

    /// The host has answered: what is sent next is another request.
    forget(request: TaskRequest): void {
        this.names.delete(JSON.stringify(request));
    }
}

/// What is added when the last answer was lost as well.
function lostProblem(problem: Problem): Problem {
    const hint = 'It may have been accepted all the same. Sending it again from here is harmless: the host takes it once.';
    return new Problem(problem.message, problem.status, problem.guard, problem.hint === '' ? hint : `${problem.hint} ${hint}`);
}

/// The task, as soon as the host has it on disk. When the answer is lost the request is repeated,
/// which does nothing if the host has it already. Throws a Problem.
export async function askForTask(request: TaskRequest, transid: string): Promise<Task> {
    const entries = Object.entries(request).filter(([, value]) => value !== '' && value !== undefined && value !== false);
    const body = { ...Object.fromEntries(entries), transid, once: true };
    for (let attempt = 1; ; ++attempt) {
        try {
            return await ask<Task>('/v1/tasks', { body });
        } catch (error) {
            if (!(error instanceof Problem) || !error.isLost) throw error;
            if (attempt === 4) throw lostProblem(error);
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
