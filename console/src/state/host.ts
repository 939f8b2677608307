/// What does not change while the page is open, or hardly ever: which host this is, and who asks.
import { askHealth, askWhoami } from '../api/host';
import { asProblem } from '../api/problem';
import type { Health, Whoami } from '../api/types';
import { feedStatus } from '../live/connection';
import { feedEpoch, startFeed } from '../live/feed';
import { startWork } from '../live/work';
import { learnSession, sessionProblem } from './session';
import { Store } from './store';

export const health = new Store<Health | undefined>(undefined);
export const whoami = new Store<Whoami | undefined>(undefined);

/// Whether this user may change anything. Until that is known nothing is offered.
export const mayAct = (who: Whoami | undefined): boolean => who?.access === 'act';

async function learn(): Promise<void> {
    try {
        const [how, who] = await Promise.all([askHealth(), askWhoami(), learnSession()]);
        health.set(how);
        whoami.set(who);
        document.title = `${how.origin_node} · zavctl console`;
    } catch (error) {
        const problem = asProblem(error);
        if (problem.status === 401) sessionProblem.set(problem);
    }
}

/// Asks now, and again whenever the host has come back, since another one may have taken its place.
export function startHost(): void {
    let wasLive = false;
    feedStatus.subscribe(() => {
        const isLive = feedStatus.get().kind === 'live';
        if (isLive && !wasLive) void learn();
        wasLive = isLive;
    });
    feedEpoch.subscribe(() => void learn());
    void learn();
    startFeed();
    startWork();
}
