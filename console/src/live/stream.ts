/// A stream of events that is opened again when it breaks, behind the last event that came.
import { ownHeader } from '../api/client';
import { Problem, asProblem, problemOf } from '../api/problem';
import { EventParser, type ServerEvent } from './parser';

export interface StreamWatch {
    onEvent(event: ServerEvent): void;
    /// The stream is there. `position` is where it begins, if the host says so.
    onOpen?(position: string): void;
    /// It broke, and is tried again in so many milliseconds.
    onBreak?(problem: Problem, pause: number): void;
    /// The host does not serve it, and will not.
    onRefusal?(problem: Problem): void;
}

/// The host sends a comment at least every 15 seconds. After this long without a byte the connection
/// is dead, although nobody has closed it.
const longestSilence = 40_000;
/// A stream that ends sooner, and without an event, is no better than one that could not be opened.
const shortestLife = 5_000;
const shortestPause = 500;
const longestPause = 10_000;

const pauseAfter = (failures: number): number =>
    Math.min(shortestPause * 2 ** Math.min(failures, 10), longestPause) * (0.75 + Math.random() / 2);

/// Whether asking again could help. A 4xx says that it could not, but for "too many".
const isFinal = (problem: Problem): boolean => problem.status >= 400 && problem.status < 500 && problem.status !== 429;

/// Runs until `close()`, or until the watcher has closed it from within an event.
export class EventStream {
    private stopped = false;
    private isResting = false;
    private failures = 0;
    private connection = new AbortController();
    private wake: () => void = () => undefined;

    constructor(
        private readonly path: string,
        private readonly watch: StreamWatch,
        private position = '',
    ) {
        addEventListener('pagehide', this.rest);
        addEventListener('pageshow', this.resume);
        void this.run();
    }

    close(): void {
        this.stopped = true;
        removeEventListener('pagehide', this.rest);
        removeEventListener('pageshow', this.resume);
        this.connection.abort();
        this.wake();
    }

    /// A browser may keep a page that has been left, and its connections with it, of which there are
    /// few: the page that is looked at now would have none.
    private readonly rest = (): void => {
        this.isResting = true;
        this.connection.abort();
    };

    private readonly resume = (): void => {
        this.isResting = false;
        this.wake();
    };

    /// The stream is of use: the next break is the first one.
    private readonly prove = (): void => {
        this.failures = 0;
    };

    private async run(): Promise<void> {
        while (!this.stopped) {
            const problem = await this.once();
            if (this.stopped) return;
            if (isFinal(problem)) {
                this.close();
                return this.watch.onRefusal?.(problem);
            }
            const pause = pauseAfter(this.failures++);
            this.watch.onBreak?.(problem, pause);
            await new Promise<void>((done) => {
                this.wake = done;
                if (!this.isResting) setTimeout(done, pause);
            });
        }
    }

    /// Reads one connection to its end, and says why it ended.
    private async once(): Promise<Problem> {
        this.connection = new AbortController();
        let silence: ReturnType<typeof setTimeout> | undefined;
        let proving: ReturnType<typeof setTimeout> | undefined;
        const listen = () => {
            clearTimeout(silence);
            silence = setTimeout(() => this.connection.abort(), longestSilence);
        };
        listen();
        try {
            const answer = await fetch(this.path, {
                headers: { ...ownHeader, ...(this.position === '' ? {} : { 'Last-Event-ID': this.position }) },
                signal: this.connection.signal,
            });
            if (!answer.ok || !answer.body) return problemOf(answer.status, await answer.text());
            this.position = answer.headers.get('Last-Event-ID') ?? this.position;
            this.watch.onOpen?.(this.position);
            proving = setTimeout(this.prove, shortestLife);
            await this.read(answer.body, listen);
            return new Problem('the host has ended the stream', 0);
        } catch (error) {
            return asProblem(error);
        } finally {
            clearTimeout(silence);
            clearTimeout(proving);
        }
    }

    private async read(body: ReadableStream<Uint8Array>, listen: () => void): Promise<void> {
        const parser = new EventParser((event) => {
            if (this.stopped) return;
            this.prove();
            this.position = event.id;
            this.watch.onEvent(event);
        }, this.position);
        const reader = body.getReader();
        const decoder = new TextDecoder();
        for (;;) {
            const { done, value } = await reader.read();
            if (done || this.stopped) return;
            listen();
            parser.feed(decoder.decode(value, { stream: true }));
        }
    }
}
