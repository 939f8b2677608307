/// Roll-outs in the words of zavctl.
import type { Rollout, RolloutCounts, RolloutPart } from '../../api/fleet/types';
import { printable, redacted } from '../printable';
import { counted } from '../size';
import { spanText } from '../time';

export const rolloutAddress = (id: string): string => `/rollouts/${encodeURIComponent(id)}`;

export const workText = (rollout: Pick<Rollout, 'kind' | 'product'>): string =>
    [rollout.kind, rollout.product].filter((text) => text).map(printable).join(' ');

const sum = (counts: Readonly<Record<string, number>>): number => Object.values(counts).reduce((total, count) => total + count, 0);

export const overCount = (counts: RolloutCounts): number => sum(counts.over);

/// "10 of 12 over: 9 done, 1 failed; 2 under way".
export function countsText(counts: RolloutCounts, hosts: number): string {
    const ends = Object.entries(counts.over).filter(([, count]) => count > 0).map(([state, count]) => `${count} ${printable(state)}`).join(', ');
    const rest = [counts.released > 0 ? `${counts.released} under way` : '', counts.waiting > 0 ? `${counts.waiting} waiting` : ''];
    return [`${overCount(counts)} of ${hosts} over${ends === '' ? '' : `: ${ends}`}`, ...rest.filter((text) => text !== '')].join('; ');
}

export function progressText(rollout: Rollout): string {
    const { away, unconfirmed, expired } = rollout;
    return [
        countsText(rollout.counts, rollout.hosts),
        away > 0 ? `waiting for ${counted(away, 'host')} that ${away === 1 ? 'is' : 'are'} away` : '',
        unconfirmed > 0 ? `${unconfirmed} expired, not confirmed` : '',
        expired > 0 ? `${expired} to be signed anew` : '',
    ].filter((text) => text !== '').join('; ');
}

export function planText(plan: Rollout['plan']): string {
    return [
        `waves ${plan.waves}`, `at most ${plan.maxFailures} failures`,
        plan.pause ? `a pause of ${spanText(plan.pause)} between them` : '',
        plan.wait ? `each at most ${spanText(plan.wait)}` : '',
        plan.parallel ? `at most ${counted(plan.parallel, 'host')} at the same time` : '',
    ].filter((text) => text !== '').map(printable).join(', ');
}

export const reasonText = (rollout: Rollout): string => redacted(rollout.reason);

/// How a roll-out stands, for its mark.
export function rolloutTone(rollout: Pick<Rollout, 'state' | 'failures'>): string {
    if (rollout.state === 'running') return 'running';
    if (rollout.state === 'paused') return 'warning';
    if (rollout.state === 'aborted') return 'quiet';
    return rollout.failures > 0 ? 'error' : 'ok';
}

export const partName = (part: RolloutPart): string => part.name || part.host;

/// Marks of parts: each has a form of its own, so that the colour need not be seen.
export type PartMark = 'good' | 'bad' | 'attention' | 'busy' | 'quiet';

const partMarks: Readonly<Record<string, PartMark>> = {
    waiting: 'quiet', released: 'busy', done: 'good', cancelled: 'quiet', expired: 'attention', unknown: 'attention', interrupted: 'attention',
};

export function partMark(part: Pick<RolloutPart, 'state' | 'away' | 'unconfirmed'>): PartMark {
    if (part.away || part.unconfirmed) return 'attention';
    return partMarks[part.state] ?? 'bad';
}

/// "released, away".
export const partText = (part: Pick<RolloutPart, 'state' | 'away' | 'unconfirmed'>): string =>
    [part.state, part.away ? 'away' : '', part.unconfirmed ? 'expired, not confirmed' : ''].filter((text) => text !== '').join(', ');

const overStates: ReadonlySet<string> = new Set(['waiting', 'released']);

export const isPartOver = (state: string): boolean => !overStates.has(state);
