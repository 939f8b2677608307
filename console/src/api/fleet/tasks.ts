/// A host's own tasks. The operator's zavctl asks it for them.
import { Problem } from '../problem';
import type { TaskSummary } from '../types';
import { type FleetRequest, run } from './run';

const entriesOf = (document: unknown, name: string): Record<string, unknown>[] => {
    const list = document !== null && typeof document === 'object' ? (document as Record<string, unknown>)[name] : undefined;
    return Array.isArray(list) ? list.filter((one) => one !== null && typeof one === 'object') : [];
};

/// The latest tasks of the host of that name.
export const tasksRequest = (name: string, limit: number): FleetRequest => ({ verb: 'tasks', arguments: [], options: { limit: String(limit) }, hosts: [name] });

/// What the one host that is meant has answered. Throws a Problem with its reason.
export async function askTasks(name: string, limit: number, signal: AbortSignal): Promise<TaskSummary[]> {
    const { output } = await run(tasksRequest(name, limit), signal);
    const host = entriesOf(output, 'hosts').find((one) => one['host'] === name);
    if (!host) throw new Problem('it has not answered', 200);
    if (typeof host['error'] === 'string') throw new Problem(host['error'], 200);
    return entriesOf(host, 'tasks') as unknown as TaskSummary[];
}
