/// What happens in a fleet, as all pages of its console hear of it. Ten thousand hosts that come back
/// at once are told in a few pieces: of what changes often only the latest is kept.
import type { HostNews, OrderNews, Rollout } from '../api/fleet/types';
import { Store } from '../state/store';
import { startConnection } from './connection';
import type { ServerEvent } from './parser';

/// What has come since the last time, the latest of each.
export interface FleetNews {
    /// By the host.
    hosts: ReadonlyMap<string, HostNews>;
    /// By the order.
    orders: ReadonlyMap<string, OrderNews>;
    /// By the roll-out's identifier.
    rollouts: ReadonlyMap<string, Rollout>;
}

/// Pages are drawn as often as this at most: it is seldom enough for a slow machine, and often enough
/// for whoever looks.
const flushEvery = 100;

/// Counts what forces everybody to look anew: the centre does not keep what was missed.
export const fleetEpoch = new Store(0);
/// Events since the page was opened.
export const eventsHeard = new Store(0);

type Listener = (news: FleetNews) => void;
const listeners = new Set<Listener>();

/// Calls the listener with what has come. Returns how to stop that.
export function onFleetNews(listener: Listener): () => void {
    listeners.add(listener);
    return () => listeners.delete(listener);
}

interface Pending {
    hosts: Map<string, HostNews>;
    orders: Map<string, OrderNews>;
    rollouts: Map<string, Rollout>;
    count: number;
    hasGap: boolean;
}

const nothing = (): Pending => ({ hosts: new Map(), orders: new Map(), rollouts: new Map(), count: 0, hasGap: false });

let pending = nothing();
let flushing: ReturnType<typeof setTimeout> | undefined;

function flush(): void {
    flushing = undefined;
    const news = pending;
    pending = nothing();
    eventsHeard.update((count) => count + news.count);
    if (news.hasGap) fleetEpoch.update((count) => count + 1);
    for (const listener of [...listeners]) listener(news);
}

function note(event: ServerEvent): void {
    if (event.type === 'gap') {
        pending.hasGap = true;
        return;
    }
    const data = JSON.parse(event.data) as never;
    if (event.type === 'host') pending.hosts.set((data as HostNews).host, data);
    else if (event.type === 'order') pending.orders.set((data as OrderNews).order, data);
    else if (event.type === 'rollout') pending.rollouts.set((data as Rollout).id, data);
}

function take(event: ServerEvent): void {
    try {
        note(event);
    } catch {
        // What is no JSON is no event of this interface.
        return;
    }
    ++pending.count;
    flushing ??= setTimeout(flush, flushEvery);
}

export const startFleetFeed = (): void => startConnection({ path: '/v1/events', onEvent: take });
