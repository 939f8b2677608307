/// The one stream of events that all of the page listens to. It is open as long as somebody can see
/// the page: browsers allow few connections to one server, and a hidden page catches up when it is
/// looked at again.
import { type Problem, asProblem } from '../api/problem';
import { Store } from '../state/store';
import type { ServerEvent } from './parser';
import { EventStream } from './stream';

export type FeedStatus =
    | { kind: 'connecting' }
    | { kind: 'live' }
    | { kind: 'paused' }
    /// `isGivenUp`: it is not tried again by itself.
    | { kind: 'broken'; problem: Problem; since: Date; isGivenUp: boolean };

/// What is listened to.
export interface Source {
    path: string;
    onEvent(event: ServerEvent): void;
    /// Where a page begins that has seen nothing yet; empty: at what comes next.
    beginAt?(): Promise<string>;
}

/// A page that is hidden for so long gives its connection up.
const hiddenFor = 60_000;

/// After so many failures in a row in which nobody answered at all, about a minute and a half, the
/// console has ended: another one has another session.
const mostSilences = 12;

export const feedStatus = new Store<FeedStatus>({ kind: 'connecting' });

let source: Source | undefined;
let stream: EventStream | undefined;
let position = '';
let silences = 0;

function take(event: ServerEvent): void {
    position = event.id;
    source?.onEvent(event);
}

function broken(problem: Problem, isRefused = false): void {
    const old = feedStatus.get();
    silences = problem.status === 0 ? silences + 1 : 0;
    const isGivenUp = isRefused || problem.status === 401 || silences >= mostSilences;
    if (isGivenUp) stream?.close();
    feedStatus.set({ kind: 'broken', problem, since: old.kind === 'broken' ? old.since : new Date(), isGivenUp });
}

function open(): void {
    if (!source) return;
    stream?.close();
    stream = new EventStream(
        source.path,
        {
            onEvent: take,
            onOpen: (where) => {
                position = where;
                silences = 0;
                feedStatus.set({ kind: 'live' });
            },
            onBreak: (problem) => broken(problem),
            onRefusal: (problem) => broken(problem, true),
        },
        position,
    );
}

async function begin(): Promise<void> {
    try {
        position = (await source?.beginAt?.()) ?? '';
    } catch (error) {
        broken(asProblem(error));
    }
    open();
}

/// Opens the connection again at once, when it is broken.
export function retryFeed(): void {
    if (feedStatus.get().kind !== 'broken') return;
    silences = 0;
    open();
}

/// Resolves once it is known whether there is a stream. What is asked for after that misses nothing that
/// the stream tells.
export function firstContact(): Promise<void> {
    return new Promise((resolve) => {
        const isDecided = () => feedStatus.get().kind !== 'connecting';
        if (isDecided()) return resolve();
        const stop = feedStatus.subscribe(() => {
            if (!isDecided()) return;
            stop();
            resolve();
        });
    });
}

/// To be called once.
export function startConnection(from: Source): void {
    source = from;
    let hiding: ReturnType<typeof setTimeout> | undefined;
    document.addEventListener('visibilitychange', () => {
        clearTimeout(hiding);
        if (document.visibilityState === 'hidden') {
            hiding = setTimeout(() => {
                stream?.close();
                feedStatus.set({ kind: 'paused' });
            }, hiddenFor);
        } else if (feedStatus.get().kind === 'paused') {
            feedStatus.set({ kind: 'connecting' });
            open();
        }
    });
    addEventListener('online', retryFeed);
    void begin();
}
