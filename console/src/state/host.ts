/// What does not change while the page is open, or hardly ever: which host this is, and who asks.
import { askHealth, askSession, askWhoami } from '../api/host';
import { type Problem, asProblem } from '../api/problem';
import type { Health, Session, Whoami } from '../api/types';
import { feedEpoch, feedStatus } from '../live/feed';
import { Store } from './store';

export const session = new Store<Session | undefined>(undefined);
export const health = new Store<Health | undefined>(undefined);
export const whoami = new Store<Whoami | undefined>(undefined);
/// Why the session could not even be asked for.
export const sessionProblem = new Store<Problem | undefined>(undefined);

/// Whether this user may change anything. Until that is known nothing is offered.
export const mayAct = (who: Whoami | undefined): boolean => who?.access === 'act';

/// What stands before a verb in a line to copy.
export const commandPrefix = (): readonly string[] => session.get()?.command ?? ['zavctl'];

async function learn(): Promise<void> {
    try {
        session.set(await askSession());
        sessionProblem.set(undefined);
        const [how, who] = await Promise.all([askHealth(), askWhoami()]);
        health.set(how);
        whoami.set(who);
        document.title = `${how.origin_node} · zavctl console`;
    } catch (error) {
        const problem = asProblem(error);
        if (!session.get() || problem.status === 401) sessionProblem.set(problem);
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
}
