/// Which fleet this is, who asks, and what their certificate allows.
import { askOperator } from '../../api/fleet/centre';
import type { Operator } from '../../api/fleet/types';
import { asProblem } from '../../api/problem';
import { feedStatus } from '../../live/connection';
import { fleetEpoch, startFleetFeed } from '../../live/fleet_feed';
import { learnSession, session, sessionProblem } from '../session';
import { Store } from '../store';
import { startRollouts } from './rollouts';

export const operator = new Store<Operator | undefined>(undefined);

const fits = (pattern: string, text: string): boolean =>
    new RegExp(`^${pattern.split('*').map((part) => part.replace(/[^\w]/g, '\\$&')).join('.*')}$`, 's').test(text);

/// Whether the certificate allows an order of this kind, such as "START". Until that is known nothing is
/// offered. The centre and the hosts decide for themselves.
export function mayOrder(who: Operator | undefined, kind: string): boolean {
    if (!who || who.role === 'viewer') return false;
    return who.commands.some((pattern) => fits(pattern, kind));
}

export const mayChangeRollouts = (who: Operator | undefined): boolean => who !== undefined && who.role !== 'viewer';
export const isAdmin = (who: Operator | undefined): boolean => who?.role === 'admin';

async function learn(): Promise<void> {
    try {
        const [who] = await Promise.all([askOperator(), learnSession()]);
        operator.set(who);
    } catch (error) {
        const problem = asProblem(error);
        if (problem.status === 401) sessionProblem.set(problem);
    }
    document.title = `${session.get()?.fleet || 'Fleet'} · zavctl console`;
}

/// Asks now, and again whenever the centre has come back: a certificate may have changed meanwhile. What
/// the feed may have missed while it was broken, the centre tells or says that it cannot.
export function startFleet(): void {
    let wasLive = false;
    feedStatus.subscribe(() => {
        const isLive = feedStatus.get().kind === 'live';
        if (isLive && !wasLive) void learn();
        wasLive = isLive;
    });
    fleetEpoch.subscribe(() => void learn());
    void learn();
    startFleetFeed();
    startRollouts();
}
