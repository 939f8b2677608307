/// What this console is for: one host, or a fleet.
import { askSession } from '../api/host';
import { type Problem, asProblem } from '../api/problem';
import type { Session } from '../api/types';
import { Store, useStore } from './store';

export const session = new Store<Session | undefined>(undefined);
/// Why the session could not even be asked for.
export const sessionProblem = new Store<Problem | undefined>(undefined);

export const isFleet = (of: Session | undefined): boolean => of?.mode === 'fleet';

/// Whether nothing can be done from here, and only the lines that do it are shown.
export const useOnlyLooks = (): boolean => useStore(session)?.onlyLooks === true;

/// What stands before a verb in a line to copy.
export function commandPrefix(): readonly string[] {
    const of = session.get();
    if (!of) return ['zavctl'];
    return typeof of.command === 'string' ? ['zavctl', '--fleet', of.address] : of.command;
}

/// Asks for the session. A session that is known stays, unless it is over.
export async function learnSession(): Promise<void> {
    try {
        session.set(await askSession());
        sessionProblem.set(undefined);
    } catch (error) {
        const problem = asProblem(error);
        if (!session.get() || problem.status === 401) sessionProblem.set(problem);
    }
}
