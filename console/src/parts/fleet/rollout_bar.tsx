import type { Rollout } from '../../api/fleet/types';
import { overCount } from '../../words/fleet/rollouts';

/// How many of its hosts are over.
export function RolloutBar({ rollout }: { rollout: Rollout }) {
    return <progress max={Math.max(rollout.hosts, 1)} value={overCount(rollout.counts)} aria-label={`${overCount(rollout.counts)} of ${rollout.hosts} over`} />;
}
