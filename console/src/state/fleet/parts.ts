/// The hosts of one roll-out as a page shows them: asked for once, and then as the feed tells.
import { useEffect, useState } from 'preact/hooks';
import { askFailures, askParts, askRollout } from '../../api/fleet/centre';
import type { OrderNews, Rollout, RolloutCounts, RolloutPart } from '../../api/fleet/types';
import { type Problem, asProblem } from '../../api/problem';
import { firstContact } from '../../live/connection';
import { type FleetNews, fleetEpoch, onFleetNews } from '../../live/fleet_feed';
import { isPartOver } from '../../words/fleet/rollouts';
import { useStore } from '../store';

export interface RolloutSight {
    rollout?: Rollout;
    parts: readonly RolloutPart[];
    failures: readonly RolloutPart[];
    problem?: Problem;
}

/// Failures are asked for again when there are more or less of them, and no more often than this.
const askFailuresEvery = 1_000;
/// When nothing has been told for so long, the hosts are compared with the roll-out's counts.
const checkAfter = 1_500;

/// The parts with what was told of their hosts since.
export function partsWithNews(parts: readonly RolloutPart[], news: ReadonlyMap<string, OrderNews>, rollout: string): readonly RolloutPart[] {
    const byHost = new Map<string, OrderNews>();
    for (const one of news.values()) if (one.rollout === rollout) byHost.set(one.host, one);
    if (byHost.size === 0) return parts;
    return parts.map((part) => {
        const one = byHost.get(part.host);
        if (!one || (one.state === part.state && !part.away && !part.unconfirmed)) return part;
        return { ...part, order: one.order, state: one.state, failure: false, away: false, unconfirmed: false };
    });
}

const sameCounts = (parts: readonly RolloutPart[], counts: RolloutCounts): boolean => {
    const states = new Map(countedStates(parts));
    const told = new Map(Object.entries({ waiting: counts.waiting, released: counts.released, ...counts.over }).filter(([, count]) => count > 0));
    return states.size === told.size && [...told].every(([state, count]) => states.get(state) === count);
};

/// One roll-out while somebody looks at it.
class RolloutWatch {
    private readonly controller = new AbortController();
    private readonly stop: () => void;
    private sight: RolloutSight = { parts: [], failures: [] };
    /// What was told while the hosts were on their way, which may be older.
    private missed: Map<string, OrderNews> | undefined = new Map();
    private askingFailures: ReturnType<typeof setTimeout> | undefined;
    private checking: ReturnType<typeof setTimeout> | undefined;

    constructor(private readonly id: string, private readonly show: (sight: RolloutSight) => void) {
        this.stop = onFleetNews((news) => this.take(news));
        this.load().catch(this.fail);
    }

    close(): void {
        this.stop();
        this.controller.abort();
        clearTimeout(this.askingFailures);
        clearTimeout(this.checking);
    }

    private put(changes: Partial<RolloutSight>): void {
        this.sight = { ...this.sight, ...changes };
        this.show(this.sight);
    }

    private readonly fail = (error: unknown): void => {
        if (!this.controller.signal.aborted) this.put({ problem: asProblem(error) });
    };

    private async load(): Promise<void> {
        await firstContact();
        this.put({ rollout: await askRollout(this.id, this.controller.signal) });
        await Promise.all([this.askParts(), this.askFailures()]);
    }

    private async askParts(): Promise<void> {
        const { rollout } = this.sight;
        if (!rollout) return;
        this.missed ??= new Map();
        const parts = await askParts(rollout, this.controller.signal);
        const { missed } = this;
        this.missed = undefined;
        this.put({ parts: missed ? partsWithNews(parts, missed, this.id) : parts });
    }

    private async askFailures(): Promise<void> {
        this.put({ failures: await askFailures(this.id, this.controller.signal) });
    }

    private take(news: FleetNews): void {
        for (const [order, one] of news.orders) this.missed?.set(order, one);
        const rollout = news.rollouts.get(this.id);
        const hasOtherFailures = rollout !== undefined && rollout.failures !== this.sight.rollout?.failures;
        const parts = partsWithNews(this.sight.parts, news.orders, this.id);
        if (!rollout && parts === this.sight.parts) return;
        this.put({ ...(rollout ? { rollout } : {}), parts });
        if (hasOtherFailures) {
            this.askingFailures ??= setTimeout(() => {
                this.askingFailures = undefined;
                this.askFailures().catch(this.fail);
            }, askFailuresEvery);
        }
        clearTimeout(this.checking);
        this.checking = setTimeout(() => this.check(), checkAfter);
    }

    /// Nobody tells which hosts wait again because their orders were taken back or signed anew; but the
    /// counts of the roll-out are others then. Whoever sees only some of its hosts cannot compare.
    private check(): void {
        const { rollout, parts } = this.sight;
        if (!rollout || this.missed) return;
        const seesAll = parts.length === rollout.hosts;
        if (!seesAll || !sameCounts(parts, rollout.counts)) this.askParts().catch(this.fail);
    }
}

export function useRollout(id: string): RolloutSight & { reload: () => void } {
    const [sight, setSight] = useState<RolloutSight>({ parts: [], failures: [] });
    const [turn, setTurn] = useState(0);
    const epoch = useStore(fleetEpoch);
    useEffect(() => {
        const watch = new RolloutWatch(id, setSight);
        return () => watch.close();
    }, [id, epoch, turn]);
    return { ...sight, reload: () => setTurn((count) => count + 1) };
}

/// How many of the parts are in which state, the most frequent first.
export function countedStates(parts: readonly RolloutPart[]): (readonly [string, number])[] {
    const counts = new Map<string, number>();
    for (const { state } of parts) counts.set(state, (counts.get(state) ?? 0) + 1);
    return [...counts].sort((a, b) => Number(isPartOver(a[0])) - Number(isPartOver(b[0])) || b[1] - a[1]);
}
