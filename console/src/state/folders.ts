/// Folders on their way into the depot. Their files are pushes as others are, and belong together: if the
/// host does not take one of them, none is sent.
import { type DepotPath, askCheck, shownPath } from '../api/depot';
import { Problem, asProblem } from '../api/problem';
import type { DepotCheck } from '../api/types';
import type { FolderCounts } from '../words/folder';
import type { FoundFolder } from './found_files';
import { type Push, changeMany, dropPushes, enter, pathBelow, pushes, verdictOn } from './pushes';
import { Store } from './store';

export interface PushFolder {
    key: number;
    name: string;
    /// Into which directory of the depot it was dropped.
    directory: DepotPath;
    /// What is in it; undefined while it is read.
    found?: FoundFolder;
    /// Where its files go, once somebody has said so.
    destination?: DepotPath;
    /// What of it is not sent, a sentence each.
    skipped: readonly string[];
    problem?: Problem;
}

export const folders = new Store<readonly PushFolder[]>([]);

/// What one question to the host can hold.
const mostPaths = 100;
const mostLetters = 6000;

let keys = 0;

const change = (key: number, changes: Partial<PushFolder>): void => folders.update((all) => all.map((one) => (one.key === key ? { ...one, ...changes } : one)));

/// A folder that is being read. Nothing of it is sent before somebody has said where it goes.
export async function addFolder(directory: DepotPath, name: string, read: () => Promise<FoundFolder>): Promise<void> {
    const key = ++keys;
    folders.update((all) => [...all, { key, name, directory, skipped: [] }]);
    try {
        const found = await read();
        change(key, { found, skipped: found.skipped });
    } catch (error) {
        change(key, { problem: asProblem(error) });
    }
}

/// The two places where a folder can go: as one of its name, and only what is in it.
export const namedPlace = ({ directory, name }: PushFolder): DepotPath | undefined => pathBelow(directory, [name]);
export const barePlace = ({ directory }: PushFolder): DepotPath => directory;

/// Pushes in pieces of which one question each can be asked.
function* questions(list: readonly Push[]): Generator<Push[]> {
    let some: Push[] = [];
    let letters = 0;
    for (const push of list) {
        const own = push.path.length + 'path=&'.length;
        if (some.length > 0 && (some.length >= mostPaths || letters + own > mostLetters)) {
            yield some;
            some = [];
            letters = 0;
        }
        some.push(push);
        letters += own;
    }
    if (some.length > 0) yield some;
}

const bytesOf = (list: readonly Push[]): number => list.reduce((sum, { bytes }) => sum + bytes, 0);

interface Verdicts {
    each: [number, Partial<Push>][];
    answer?: DepotCheck;
}

async function verdictsOn(some: readonly Push[]): Promise<Verdicts> {
    try {
        const answer = await askCheck(some.map(({ path }) => path), bytesOf(some));
        return { each: some.map(({ key }, place) => [key, verdictOn(answer, place)]), answer };
    } catch (error) {
        return { each: some.map(({ key }) => [key, { state: 'refused', problem: asProblem(error) }]) };
    }
}

/// Why so many bytes do not fit, by what the host has said of their parts.
function wantOfRoom(bytes: number, answers: readonly DepotCheck[]): Problem | undefined {
    const free = Math.min(...answers.map(({ free_bytes }) => free_bytes));
    const room = free + answers.reduce((sum, { replaced_bytes }) => sum + replaced_bytes, 0);
    if (answers.every(({ guarded }) => !guarded) || bytes <= room) return undefined;
    return new Problem(`the folder needs ${bytes} bytes, and the depot has room for ${room}`, 409, 'depot-space', 'Make room on its file system; zavctl depot rm removes what is no longer needed.');
}

/// Asks the host whether it would take all of them, before anything is sent.
async function checkAll(folder: number, list: readonly Push[]): Promise<void> {
    const verdicts = new Map<number, Partial<Push>>();
    const answers: DepotCheck[] = [];
    for (const some of questions(list)) {
        const { each, answer } = await verdictsOn(some);
        for (const [key, verdict] of each) verdicts.set(key, verdict);
        if (answer) answers.push(answer);
    }
    const problem = wantOfRoom(bytesOf(list), answers);
    if (problem) change(folder, { problem });
    const isTaken = !problem && [...verdicts.values()].every(({ state }) => state === 'ready');
    if (!isTaken) verdicts.forEach((verdict, key) => verdict.state === 'ready' && verdicts.set(key, { ...verdict, state: 'held' }));
    changeMany(verdicts);
}

/// Has the files of a folder go to that directory of the depot.
export function place(folder: PushFolder, destination: DepotPath): void {
    const named = (folder.found?.files ?? []).map(({ file, names }) => ({ file, names, path: pathBelow(destination, names) }));
    const fit = named.filter((one): one is typeof one & { path: DepotPath } => one.path !== undefined);
    const others = named.filter(({ path }) => path === undefined).map(({ names }) => `${names.join('/')}: its name is no text`);
    const { found, ...rest } = folder;
    folders.update((all) => all.map((one) => (one.key === folder.key ? { ...rest, destination, skipped: [...folder.skipped, ...others] } : one)));
    void checkAll(folder.key, enter(fit, folder.key));
}

/// Gives a folder up, or puts its result away.
export function dropFolder(key: number): void {
    dropPushes((push) => push.folder === key);
    if (!pushes.get().some((push) => push.folder === key)) folders.update((all) => all.filter((one) => one.key !== key));
}

export const countsOf = (list: readonly Push[]): FolderCounts => ({
    files: list.length,
    arrived: list.filter(({ state }) => state === 'arrived').length,
    verified: list.filter(({ arrival }) => arrival?.verified === true).length,
    refused: list.filter(({ state }) => state === 'refused').length,
    replaced: list.filter(({ replaces }) => replaces).length,
    converted: list.filter(({ converted }) => converted).length,
});

/// Its path as people read it, as one that is a folder.
export const shownFolder = (path: DepotPath): string => (path === '' ? 'the depot' : `${shownPath(path)}/`);
