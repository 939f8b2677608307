/// The small things that all pages are made of.
import type { ComponentChildren } from 'preact';
import { useEffect, useState } from 'preact/hooks';
import type { Problem } from '../api/problem';
import type { TaskState } from '../api/types';
import { Store, useStore } from '../state/store';
import { holdsHidden, printable, printableLines, redacted } from '../words/printable';
import { exactText, localText, parsedTime, relativeText } from '../words/time';

/// The time as the page shows it. All relative times step together.
export const now = new Store(new Date());
setInterval(() => {
    if (document.visibilityState === 'visible') now.set(new Date());
}, 5_000);
addEventListener('visibilitychange', () => now.set(new Date()));

/// Local time and how long ago, exact on hover. A missing time is a dash.
export function Time({ value, brief = false }: { value: string | Date | null | undefined; brief?: boolean }) {
    const current = useStore(now);
    const time = value instanceof Date ? value : parsedTime(value);
    if (!time) return <span class="faint">–</span>;
    const latest = current < time ? time : current;
    return (
        <time dateTime={time.toISOString()} title={exactText(time)}>
            {!brief && <span class="clock">{localText(time, current)}<span class="faint">, </span></span>}
            <span class={brief ? '' : 'faint'}>{relativeText(time, time.getTime() - current.getTime() > 60_000 ? current : latest)}</span>
        </time>
    );
}

const stateTones: Readonly<Record<string, string>> = {
    done: 'good', running: 'busy', queued: 'quiet', failed: 'bad', refused: 'bad', interrupted: 'attention',
    expired: 'attention', cancelled: 'quiet', missing: 'bad', stopped: 'quiet', ok: 'good', warning: 'attention', error: 'bad',
};

/// A state as a word with a mark before it: never by colour alone.
export function StateMark({ state, text }: { state: TaskState | string; text?: string }) {
    return <span class={`state ${stateTones[state] ?? 'quiet'}`}>{printable(text ?? state)}</span>;
}

/// What went wrong, in the host's words.
export function ProblemBox({ problem, retry }: { problem: Problem; retry?: (() => void) | undefined }) {
    return (
        <div class="box bad" role="alert">
            <p>{redacted(problem.message)}</p>
            {problem.guard !== '' && <p class="faint">Refused by the guard <code>{printable(problem.guard)}</code>; nothing was changed.</p>}
            {problem.hint !== '' && <p>{printable(problem.hint)}</p>}
            {retry && <p><button type="button" onClick={retry}>Try again</button></p>}
        </div>
    );
}

/// What to do first where there is nothing to show.
export function Empty({ title, children }: { title: string; children?: ComponentChildren }) {
    return <div class="empty"><p class="empty-title">{title}</p>{children}</div>;
}

/// A section with a heading and, at its right, what can be done with it.
export function Panel({ title, aside, children, name }: { title: string; aside?: ComponentChildren; children: ComponentChildren; name?: string }) {
    return (
        <section class={`panel ${name ?? ''}`}>
            <header><h2>{title}</h2>{aside}</header>
            {children}
        </section>
    );
}

export function PageHead({ title, children, about }: { title: ComponentChildren; children?: ComponentChildren; about?: ComponentChildren }) {
    return (
        <header class="page-head">
            <div><h1 tabIndex={-1}>{title}</h1>{about && <p class="faint">{about}</p>}</div>
            {children && <div class="tools">{children}</div>}
        </header>
    );
}

/// Copies a text, and says that it has.
export function CopyButton({ text, label }: { text: string; label: string }) {
    const [said, setSaid] = useState('');
    useEffect(() => {
        if (said === '') return undefined;
        const timer = setTimeout(() => setSaid(''), 2_000);
        return () => clearTimeout(timer);
    }, [said]);
    const copy = () => navigator.clipboard.writeText(text).then(() => setSaid('Copied'), () => setSaid('Cannot copy'));
    return <button type="button" class="small" onClick={() => void copy()} aria-label={said || label} aria-live="polite">{said || 'Copy'}</button>;
}

/// The line that does the same in a terminal. Where there are several, each has a name.
export function CommandLine({ line, name = 'The same on the command line' }: { line: string; name?: string }) {
    // Words are spelled out; the text of a here-document cannot be.
    const isCopied = !holdsHidden(line);
    return (
        <div class="command-line">
            <pre tabIndex={0} role="region" aria-label={name}><code>{printableLines(line)}</code></pre>
            {isCopied ? <CopyButton text={line} label="Copy the command line" />
                : <span class="faint">Not to be copied: it holds characters that a terminal would obey.</span>}
        </div>
    );
}

/// A field that narrows down what a page shows; `/` leads into it.
export function Search({ value, onChange, label }: { value: string; onChange: (text: string) => void; label: string }) {
    return (
        <input type="search" class="search" data-search value={value} aria-label={label} placeholder={`${label}  ( / )`}
            spellcheck={false} autocomplete="off" onInput={(event) => onChange(event.currentTarget.value)} />
    );
}
