/// What the centre knows: hosts, what is installed on them, roll-outs.
import { ask, withQuery } from '../client';
import type { FleetHost, FleetOrder, HostPage, Operator, Rollout, RolloutPart } from './types';

const hostPage = 1000;
const inventoryPage = 100;
const partPage = 1000;
const latestRollouts = 100;
const latestOrders = 20;
const mostFailures = 200;

const hostTarget = (host: string): string => `/v1/hosts/${encodeURIComponent(host)}`;
const rolloutTarget = (id: string): string => `/v1/rollouts/${encodeURIComponent(id)}`;

export const askOperator = (signal?: AbortSignal): Promise<Operator> => ask('/v1/whoami', signal ? { signal } : {});

async function* pages(path: string, selector: string, limit: number, signal: AbortSignal): AsyncGenerator<FleetHost[]> {
    let after: string | undefined;
    do {
        const page: HostPage = await ask(withQuery(path, { selector, after, limit }), { signal });
        yield page.hosts;
        after = page.next;
    } while (after !== undefined);
}

/// The hosts of a selector, page by page; an empty one means all. Throws a Problem.
export const hostPages = (selector: string, signal: AbortSignal): AsyncGenerator<FleetHost[]> =>
    pages('/v1/hosts', selector, hostPage, signal);

/// The same with what the hosts have told about themselves.
export const inventoryPages = (selector: string, signal: AbortSignal): AsyncGenerator<FleetHost[]> =>
    pages('/v1/inventory', selector, inventoryPage, signal);

/// A host by its name or its key.
export const askHost = (host: string, signal?: AbortSignal): Promise<FleetHost> => ask(hostTarget(host), signal ? { signal } : {});

export async function askOrders(host: string, signal?: AbortSignal): Promise<FleetOrder[]> {
    return (await ask<{ orders: FleetOrder[] }>(withQuery(`${hostTarget(host)}/orders`, { limit: latestOrders }), signal ? { signal } : {})).orders;
}

/// The newest first.
export async function askRollouts(signal?: AbortSignal): Promise<Rollout[]> {
    return (await ask<{ rollouts: Rollout[] }>(withQuery('/v1/rollouts', { limit: latestRollouts }), signal ? { signal } : {})).rollouts;
}

export const askRollout = (id: string, signal?: AbortSignal): Promise<Rollout> => ask(rolloutTarget(id), signal ? { signal } : {});

/// All of a roll-out's hosts that one may see, in their places.
export async function askParts(rollout: Rollout, signal: AbortSignal): Promise<RolloutPart[]> {
    const parts: RolloutPart[] = [];
    for (let from = 0; from < rollout.hosts; from += partPage) {
        const page = await ask<{ hosts: RolloutPart[] }>(withQuery(`${rolloutTarget(rollout.id)}/hosts`, { from, limit: partPage }), { signal });
        parts.push(...page.hosts);
    }
    return parts;
}

/// Where a roll-out failed, those that count first.
export async function askFailures(id: string, signal?: AbortSignal): Promise<RolloutPart[]> {
    return (await ask<{ hosts: RolloutPart[] }>(withQuery(`${rolloutTarget(id)}/failures`, { limit: mostFailures }), signal ? { signal } : {})).hosts;
}
