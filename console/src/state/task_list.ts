/// The list of tasks that a page shows: loaded page by page as it is scrolled, and kept up to date by
/// the feed and by what is known to run and wait.
import { useCallback, useEffect, useRef, useState } from 'preact/hooks';
import { type Problem, asProblem } from '../api/problem';
import { type TaskFilter, askTasks } from '../api/tasks';
import type { TaskSummary } from '../api/types';
import { feedEpoch, onFeed } from '../live/feed';
import { work } from '../live/work';
import { useStore } from './store';

const pageSize = 500;

export interface TaskListState {
    tasks: readonly TaskSummary[];
    problem?: Problem;
    isLoading: boolean;
    isComplete: boolean;
    more: () => void;
    reload: () => void;
}

export function satisfies(task: TaskSummary, filter: TaskFilter): boolean {
    return (!filter.state || task.state === filter.state) && (!filter.product || task.product === filter.product) &&
        (!filter.command || task.command === filter.command) && (!filter.since || task.accepted >= filter.since);
}

const number = (task: TaskSummary): number => Number(task.id.slice(task.id.lastIndexOf('-') + 1));

/// Newest first. A task that is there already gives way to its newer state, and goes if it no longer
/// satisfies the filter.
export function merged(tasks: readonly TaskSummary[], news: readonly TaskSummary[], filter: TaskFilter): readonly TaskSummary[] {
    if (news.length === 0) return tasks;
    const byId = new Map(news.map((task) => [task.id, task]));
    const kept: TaskSummary[] = [];
    for (const task of tasks) {
        const newer = byId.get(task.id);
        byId.delete(task.id);
        const shown = newer ?? task;
        if (!newer || satisfies(shown, filter)) kept.push(shown);
    }
    // Nothing that is older than what has been loaded belongs before its page.
    const oldest = tasks.at(-1);
    const fresh = [...byId.values()].filter((task) => satisfies(task, filter) && (!oldest || number(task) > number(oldest)));
    if (fresh.length === 0) return kept;
    return [...fresh, ...kept].sort((a, b) => number(b) - number(a));
}

export function useTaskList(filter: TaskFilter): TaskListState {
    const [state, setState] = useState<{ tasks: readonly TaskSummary[]; next: number | null; problem?: Problem; isLoading: boolean }>(
        { tasks: [], next: null, isLoading: true });
    const epoch = useStore(feedEpoch);
    const inHand = useStore(work);
    const controller = useRef<AbortController | undefined>(undefined);
    const inputs = [filter.state, filter.product, filter.command, filter.since];
    const load = useCallback((after?: number) => {
        controller.current?.abort();
        const own = new AbortController();
        controller.current = own;
        setState((old) => ({ tasks: old.tasks, next: old.next, isLoading: true }));
        askTasks(filter, pageSize, after, own.signal).then(
            (list) => setState((old) => ({ tasks: after === undefined ? list.tasks : [...old.tasks, ...list.tasks], next: list.next, isLoading: false })),
            (error: unknown) => {
                if (!own.signal.aborted) setState((old) => ({ ...old, problem: asProblem(error), isLoading: false }));
            },
        );
    }, inputs);
    useEffect(() => {
        load();
        return () => controller.current?.abort();
    }, [load, epoch]);
    useEffect(() => onFeed((items) => {
        const ended = items.flatMap((item) => (item.content.kind === 'task' ? [item.content.task] : []));
        setState((old) => ({ ...old, tasks: merged(old.tasks, ended, filter) }));
    }), inputs);
    useEffect(() => {
        if (inHand && !state.isLoading) setState((old) => ({ ...old, tasks: merged(old.tasks, inHand, filter) }));
    }, [inHand, state.isLoading, ...inputs]);
    const { next, isLoading, problem } = state;
    const more = useCallback(() => {
        if (next !== null && !isLoading && !problem) load(next);
    }, [next, isLoading, problem, load]);
    return { tasks: state.tasks, ...(problem ? { problem } : {}), isLoading, isComplete: next === null, more, reload: () => load() };
}
