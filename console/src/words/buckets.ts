/// Tasks counted by the time at which they were accepted.
import type { TaskSummary } from '../api/types';

export interface Buckets {
    /// The beginnings of the buckets, in seconds since 1970.
    starts: number[];
    done: number[];
    /// Failed, refused, interrupted and expired ones.
    bad: number[];
    /// Those that are not over, and cancelled ones.
    other: number[];
}

const badStates: ReadonlySet<string> = new Set(['failed', 'refused', 'interrupted', 'expired']);

export const isBad = (state: string): boolean => badStates.has(state);

/// `count` buckets of `width` seconds; the last one holds `end`.
export function bucketsOf(tasks: readonly TaskSummary[], end: number, count: number, width: number): Buckets {
    const first = (Math.floor(end / width) - count + 1) * width;
    const zeros = (): number[] => new Array<number>(count).fill(0);
    const buckets: Buckets = { starts: zeros().map((_, i) => first + i * width), done: zeros(), bad: zeros(), other: zeros() };
    for (const task of tasks) {
        const at = Math.floor((Date.parse(task.accepted) / 1000 - first) / width);
        if (!(at >= 0 && at < count)) continue;
        const row = task.state === 'done' ? buckets.done : isBad(task.state) ? buckets.bad : buckets.other;
        row[at] = (row[at] ?? 0) + 1;
    }
    return buckets;
}
