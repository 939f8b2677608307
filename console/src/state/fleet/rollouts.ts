/// The latest roll-outs: asked for once, and then as the feed tells them.
import { askRollouts } from '../../api/fleet/centre';
import type { Rollout } from '../../api/fleet/types';
import { type Problem, asProblem } from '../../api/problem';
import { firstContact } from '../../live/connection';
import { fleetEpoch, onFleetNews } from '../../live/fleet_feed';
import { Store } from '../store';

export interface RolloutList {
    /// The newest first; undefined until the centre has said it.
    value?: readonly Rollout[];
    problem?: Problem;
}

/// More are not kept: the older ones are over.
const most = 500;

export const rollouts = new Store<RolloutList>({});

export function mergedRollouts(known: readonly Rollout[], news: ReadonlyMap<string, Rollout>): readonly Rollout[] {
    if (news.size === 0) return known;
    const ids = new Set(known.map((rollout) => rollout.id));
    const fresh = [...news.values()].filter((rollout) => !ids.has(rollout.id));
    const all = [...fresh, ...known.map((rollout) => news.get(rollout.id) ?? rollout)];
    if (fresh.length > 0) all.sort((a, b) => Date.parse(b.created) - Date.parse(a.created));
    return all.slice(0, most);
}

export async function loadRollouts(): Promise<void> {
    await firstContact();
    try {
        rollouts.set({ value: await askRollouts() });
    } catch (error) {
        rollouts.update((list) => ({ ...list, problem: asProblem(error) }));
    }
}

/// Keeps a roll-out that an answer has brought.
export function noteRollout(rollout: Rollout): void {
    rollouts.update((list) => ({ ...list, value: mergedRollouts(list.value ?? [], new Map([[rollout.id, rollout]])) }));
}

export function startRollouts(): void {
    onFleetNews((news) => {
        rollouts.update((list) => (list.value ? { ...list, value: mergedRollouts(list.value, news.rollouts) } : list));
    });
    fleetEpoch.subscribe(() => void loadRollouts());
    void loadRollouts();
}
