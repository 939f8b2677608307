/// What waits and what runs. The interface has no stream that tells of a task's acceptance and
/// beginning, so this, and only this, is asked for again and again, while somebody looks.
import { type Problem, asProblem } from '../api/problem';
import { askTasks, isOver } from '../api/tasks';
import type { Task, TaskSummary } from '../api/types';
import { Store } from '../state/store';
import { feedStatus } from './connection';
import { onFeed } from './feed';

const askEvery = 4_000;
/// After something has ended the next task begins at once; a burst of ends is one question.
const askAfterEnd = 250;
const most = 1000;
/// After so many failures in a row nobody is asked any more: the console may have ended.
const mostFailures = 5;

/// Running first, then the queue in its order; undefined until the host has said it.
export const work = new Store<readonly TaskSummary[] | undefined>(undefined);

/// Why it is no longer asked for; undefined: it is.
export const workProblem = new Store<Problem | undefined>(undefined);

let failures = 0;
let timer: ReturnType<typeof setTimeout> | undefined;
let isAsking = false;

function schedule(pause: number): void {
    clearTimeout(timer);
    timer = setTimeout(() => void look(), pause);
}

const sameWork = (a: readonly TaskSummary[] | undefined, b: readonly TaskSummary[]): boolean =>
    a !== undefined && a.length === b.length &&
    a.every((task, i) => task.id === b[i]?.id && task.state === b[i]?.state && task.cancelling === b[i]?.cancelling);

async function look(): Promise<void> {
    if (document.visibilityState === 'hidden' || workProblem.get()) return;
    if (isAsking) return schedule(askAfterEnd);
    isAsking = true;
    try {
        const [running, queued] = await Promise.all([
            askTasks({ state: 'running' }, most),
            askTasks({ state: 'queued' }, most),
        ]);
        const inHand = new Set(running.tasks.map((task) => task.id));
        const all = [...running.tasks, ...queued.tasks.filter((task) => !inHand.has(task.id)).reverse()];
        // What looks the same stays the same, so that nothing is drawn anew.
        if (!sameWork(work.get(), all)) work.set(all);
        failures = 0;
    } catch (error) {
        // The feed tells of a host that is away. What was known is shown until it is back.
        const problem = asProblem(error);
        if (problem.status === 401 || ++failures >= mostFailures) workProblem.set(problem);
    } finally {
        isAsking = false;
        schedule(askEvery);
    }
}

/// Asks again after it has been given up.
export function retryWork(): void {
    if (!workProblem.get()) return;
    failures = 0;
    workProblem.set(undefined);
    void look();
}

/// Something has been asked for or has ended.
export function lookAtWork(): void {
    schedule(askAfterEnd);
}

/// A task of which this page knows before it asks.
export function noteWork(task: Task): void {
    if (!isOver(task.state)) work.update((tasks = []) => [...tasks.filter((other) => other.id !== task.id), task]);
    lookAtWork();
}

export function startWork(): void {
    document.addEventListener('visibilitychange', () => void look());
    feedStatus.subscribe(() => {
        if (feedStatus.get().kind === 'live') retryWork();
    });
    onFeed((items) => {
        if (items.some((item) => item.content.kind === 'task')) lookAtWork();
    });
    void look();
}
