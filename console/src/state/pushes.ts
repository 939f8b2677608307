/// Files on their way into the depot. They go on while other pages are looked at.
import { askCheck, encodedPath, pushFile, shownPath, type DepotPath } from '../api/depot';
import { Problem, asProblem } from '../api/problem';
import type { Arrival, DepotCheck } from '../api/types';
import { Store } from './store';

export interface Push {
    key: number;
    name: string;
    path: DepotPath;
    bytes: number;
    sent: number;
    /// `held`: it could be sent, but others of its folder could not.
    state: 'checking' | 'held' | 'ready' | 'waiting' | 'sending' | 'verifying' | 'arrived' | 'refused';
    /// What the host said before anything was sent.
    notes: string[];
    /// There is a file of that name already.
    replaces: boolean;
    /// Its line ends are converted.
    converted: boolean;
    /// The folder that it came with; see folders.ts.
    folder?: number;
    problem?: Problem;
    arrival?: Arrival;
}

export const pushes = new Store<readonly Push[]>([]);
/// Counts arrivals, so that listings are made anew.
export const arrivals = new Store(0);

const files = new Map<number, { file: File; abort: AbortController }>();
let keys = 0;

function change(key: number, changes: Partial<Push>): void {
    changeMany(new Map([[key, changes]]));
}

/// All at once: each change is drawn.
export function changeMany(changes: ReadonlyMap<number, Partial<Push>>): void {
    pushes.update((all) => all.map((push) => (changes.has(push.key) ? { ...push, ...changes.get(push.key) } : push)));
}

/// What the host has answered about the file in that place of its question.
export function verdictOn({ taken, error, guard, hint, files: rows }: DepotCheck, place: number): Partial<Push> {
    const row = rows[place];
    const refused = row && !row.taken ? row : !taken && rows.every((one) => one.taken) ? { error, guard, hint } : undefined;
    if (refused) return { state: 'refused', problem: new Problem(refused.error ?? 'the host does not take it', 409, refused.guard ?? '', refused.hint ?? '') };
    const notes = [
        ...(row?.replaces ? ['There is a file of that name: it is gone once this one is on its way.'] : []),
        ...(row?.converted ? ['Line ends are converted: carriage returns and Ctrl-Z are dropped from it.'] : []),
    ];
    return { state: 'ready', notes, replaces: row?.replaces === true, converted: row?.converted === true };
}

/// Asks the host whether it would take the file, before anything is sent.
async function check(push: Push): Promise<void> {
    try {
        change(push.key, verdictOn(await askCheck([push.path], push.bytes), 0));
    } catch (error) {
        change(push.key, { state: 'refused', problem: asProblem(error) });
    }
}

/// The names as a path below the directory; undefined if one of them is no text.
export function pathBelow(directory: DepotPath, names: readonly string[]): DepotPath | undefined {
    try {
        const below = encodedPath(names.join('/'));
        return directory === '' ? below : `${directory}/${below}`;
    } catch {
        return undefined;
    }
}

/// Files at their places in the depot, which the host has yet to be asked about.
export function enter(list: readonly { file: File; path: DepotPath }[], folder?: number): Push[] {
    const made = list.map(({ file, path }): Push => ({
        key: ++keys, name: file.name, path, bytes: file.size, sent: 0, state: 'checking', notes: [], replaces: false, converted: false, ...(folder === undefined ? {} : { folder }),
    }));
    made.forEach((push, i) => files.set(push.key, { file: list[i]!.file, abort: new AbortController() }));
    pushes.update((all) => [...all, ...made]);
    return made;
}

/// Files that are to go into a directory of the depot. Nothing is sent yet. Returns the names of those
/// whose names are no text.
export function addFiles(directory: DepotPath, list: readonly File[]): string[] {
    const named = list.map((file) => ({ file, path: pathBelow(directory, [file.name]) }));
    const fit = named.filter((one): one is { file: File; path: DepotPath } => one.path !== undefined);
    for (const push of enter(fit)) void check(push);
    return named.filter(({ path }) => path === undefined).map(({ file }) => file.name);
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
    if (!hasFollowers(push)) arrivals.update((count) => count + 1);
}

/// Whether others of its folder come next: the listing is made anew once for all of them.
const hasFollowers = ({ folder }: Push): boolean => folder !== undefined && pushes.get().some((one) => one.folder === folder && one.state === 'waiting');

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

/// Gives pushes up, or puts their results away. What is just being sent is given up only.
export function dropPushes(isMeant: (push: Push) => boolean): void {
    const meant = pushes.get().filter((push) => canDrop(push) && isMeant(push));
    for (const { key } of meant) files.get(key)?.abort.abort();
    const gone = new Set(meant.filter(({ state }) => state !== 'sending').map(({ key }) => key));
    for (const key of gone) files.delete(key);
    pushes.update((all) => all.filter(({ key }) => !gone.has(key)));
}

export const destinationOf = (push: Push): string => shownPath(push.path);

addEventListener('beforeunload', (event) => {
    if (pushes.get().some((push) => push.state === 'sending' || push.state === 'verifying')) event.preventDefault();
});
