/// A host's outcomes, as all pages of its console hear of them.
import { askHealth } from '../api/host';
import type { Row, Task } from '../api/types';
import { Store } from '../state/store';
import { startConnection } from './connection';
import type { ServerEvent } from './parser';

export interface FeedItem {
    /// No two items of this page have the same.
    key: number;
    /// The host's identifier of the event.
    id: string;
    heard: Date;
    content:
        | { kind: 'row'; row: Row }
        | { kind: 'task'; task: Task }
        /// Events that the host does not keep any more; null: nobody knows how many.
        | { kind: 'gap'; missing: number | null };
}

export const mostItems = 10_000;
/// So many events from before the page was opened are shown.
const eventsBefore = 500;
/// Events that come faster are shown together.
const flushEvery = 100;

const path = '/v1/events?table=KAGDYST&tasks=1';

/// The newest first.
export const feedItems = new Store<readonly FeedItem[]>([]);
/// Counts what forces everybody to look anew: events that were lost, another journal.
export const feedEpoch = new Store(0);

type BatchListener = (items: readonly FeedItem[]) => void;
const listeners = new Set<BatchListener>();

/// Calls the listener with what has come, the oldest first. Returns how to stop that.
export function onFeed(listener: BatchListener): () => void {
    listeners.add(listener);
    return () => listeners.delete(listener);
}

let keys = 0;
let pending: FeedItem[] = [];
let flushing: ReturnType<typeof setTimeout> | undefined;

function flush(): void {
    flushing = undefined;
    const batch = pending;
    pending = [];
    feedItems.update((items) => [...batch.slice(-mostItems).reverse(), ...items].slice(0, mostItems));
    if (batch.some((item) => item.content.kind === 'gap')) feedEpoch.update((count) => count + 1);
    for (const listener of [...listeners]) listener(batch);
}

/// Ten thousand tasks with their output would be a lot to keep. Who wants that asks for the task.
function withoutOutput(task: Task): Task {
    const commands = task.details.commands.map(({ stdout: _out, stderr: _err, ...command }) => command);
    return { ...task, details: { ...task.details, commands } } as Task;
}

function contentOf(event: ServerEvent): FeedItem['content'] | undefined {
    try {
        const data = JSON.parse(event.data) as never;
        if (event.type === 'message') return { kind: 'row', row: data };
        if (event.type === 'task') return { kind: 'task', task: withoutOutput(data) };
        if (event.type === 'gap') return { kind: 'gap', missing: (data as { missing: number | null }).missing };
    } catch {
        // What is no JSON is no event of this interface.
    }
    return undefined;
}

function take(event: ServerEvent): void {
    const content = contentOf(event);
    if (!content) return;
    pending.push({ key: ++keys, id: event.id, heard: new Date(), content });
    flushing ??= setTimeout(flush, flushEvery);
}

/// Some events before the last one.
async function startPosition(): Promise<string> {
    const journal = (await askHealth()).journal;
    const probe = new AbortController();
    const answer = await fetch(path, { signal: probe.signal });
    const now = answer.headers.get('Last-Event-ID') ?? '';
    probe.abort();
    const number = Number(now.slice(now.lastIndexOf('-') + 1));
    if (!answer.ok || now === '' || !Number.isSafeInteger(number)) return '';
    return `${journal}-${Math.max(number - eventsBefore, 0)}`;
}

export const startFeed = (): void => startConnection({ path, onEvent: take, beginAt: startPosition });
