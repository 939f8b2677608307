/// Files on their way into the depot. They go on while other pages are looked at.
import { askCheck, encodedPath, pushFile, shownPath, type DepotPath } from '../api/depot';
import { Problem, asProblem } from '../api/problem';
import type { Arrival } from '../api/types';
import { Store } from './store';

export interface Push {
    key: number;
    name: string;
    path: DepotPath;
    bytes: number;
    sent: number;
    state: 'checking' | 'ready' | 'waiting' | 'sending' | 'verifying' | 'arrived' | 'refused';
    /// What the host said before anything was sent.
    notes: string[];
    problem?: Problem;
    arrival?: Arrival;
}

export const pushes = new Store<readonly Push[]>([]);
/// Counts arrivals, so that listings are made anew.
export const arrivals = new Store(0);

const files = new Map<number, { file: File; abort: AbortController }>();
let keys = 0;

function change(key: number, changes: Partial<Push>): void {
    pushes.update((all) => all.map((push) => (push.key === key ? { ...push, ...changes } : push)));
}

/// Asks the host whether it would take the file, before anything is sent.
async function check(push: Push): Promise<void> {
    try {
        const answer = await askCheck(push.path, push.bytes);
        const row = answer.files[0];
        const refused = row && !row.taken ? row : answer;
        if (!answer.taken) {
            throw new Problem(refused.error ?? 'the host does not take it', 409, refused.guard ?? '', refused.hint ?? '');
        }
        const notes = [
            ...(row?.replaces ? ['There is a file of that name: it is gone once this one is on its way.'] : []),
            ...(row?.converted ? ['Line ends are converted: carriage returns and Ctrl-Z are dropped from it.'] : []),
        ];
        change(push.key, { state: 'ready', notes });
    } catch (error) {
        change(push.key, { state: 'refused', problem: asProblem(error) });
    }
}

/// Files that are to go into a directory of the depot. Nothing is sent yet.
export function addFiles(directory: DepotPath, list: readonly File[]): void {
    for (const file of list) {
        const path = `${directory === '' ? '' : `${directory}/`}${encodedPath(file.name)}`;
        const push: Push = { key: ++keys, name: file.name, path, bytes: file.size, sent: 0, state: 'checking', notes: [] };
        files.set(push.key, { file, abort: new AbortController() });
        pushes.update((all) => [...all, push]);
        void check(push);
    }
}

async function send(push: Push): Promise<void> {
    const held = files.get(push.key);
    if (!held) return;
    change(push.key, { state: 'sending' });
    try {
        const arrival = await pushFile(push.path, held.file,
            (sent) => change(push.key, { sent, state: sent >= push.bytes ? 'verifying' : 'sending' }), held.abort.signal);
        change(push.key, { state: 'arrived', sent: push.bytes, arrival });
    } catch (error) {
        const isGivenUp = held.abort.signal.aborted;
        change(push.key, { state: 'refused', problem: isGivenUp ? new Problem('given up', 0) : asProblem(error) });
    }
    files.delete(push.key);
    arrivals.update((count) => count + 1);
}

let isSending = false;

/// Sends what is ready, one after the other.
export async function sendAll(): Promise<void> {
    pushes.update((all) => all.map((push) => (push.state === 'ready' ? { ...push, state: 'waiting' } : push)));
    if (isSending) return;
    isSending = true;
    for (let next = pushes.get().find(isWaiting); next; next = pushes.get().find(isWaiting)) await send(next);
    isSending = false;
}

const isWaiting = (push: Push): boolean => push.state === 'waiting';

/// Once its last byte has gone nothing stops a push: the console hands it to the host, which puts it in
/// its place, whether or not somebody still listens.
export const canDrop = (push: Push): boolean => push.state !== 'verifying';

/// Gives a push up, or puts its result away.
export function dropPush(key: number): void {
    const push = pushes.get().find((one) => one.key === key);
    if (!push || !canDrop(push)) return;
    files.get(key)?.abort.abort();
    if (push.state === 'sending') return;
    files.delete(key);
    pushes.update((all) => all.filter((one) => one.key !== key));
}

export const destinationOf = (push: Push): string => shownPath(push.path);

addEventListener('beforeunload', (event) => {
    if (pushes.get().some((push) => push.state === 'sending' || push.state === 'verifying')) event.preventDefault();
});
