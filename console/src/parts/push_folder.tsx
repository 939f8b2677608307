/// A folder on its way into the depot.
import { useState } from 'preact/hooks';
import { shownPath } from '../api/depot';
import { type PushFolder, barePlace, countsOf, dropFolder, namedPlace, place, shownFolder } from '../state/folders';
import { type Push, canDrop, destinationOf } from '../state/pushes';
import { commandPrefix } from '../state/session';
import { arrivedText, folderNotes } from '../words/folder';
import { pushLine } from '../words/lines';
import { printable } from '../words/printable';
import { bytesText, counted } from '../words/size';
import { CommandLine, ProblemBox, StateMark } from './basics';

/// The reasons of so many files are shown; others are in the list of all.
const mostReasons = 5;
const mostSkipped = 10;

const isIn = (...states: readonly Push['state'][]) => ({ state }: Push): boolean => states.includes(state);

/// How the folder as a whole stands: a word, and the state whose mark it has.
function standingOf(list: readonly Push[]): readonly [string, string] {
    if (list.length === 0) return ['nothing to send', 'failed'];
    if (list.some(isIn('checking'))) return ['asking', 'queued'];
    if (list.some(isIn('held'))) return ['not taken', 'failed'];
    if (list.some(isIn('sending', 'verifying'))) return ['on its way', 'running'];
    if (list.some(isIn('waiting'))) return ['waits', 'queued'];
    if (list.some(isIn('ready'))) return ['ready', 'queued'];
    return list.some(isIn('refused')) ? ['not all there', 'failed'] : ['arrived', 'done'];
}

/// Nothing is sent before it is clear where that goes.
function Places({ folder }: { folder: PushFolder }) {
    const files = folder.found?.files ?? [];
    const named = namedPlace(folder);
    if (files.length === 0) return <p class="line-detail">There is no file in it.</p>;
    return (
        <>
            <p>Where do its {counted(files.length, 'file')} ({bytesText(files.reduce((sum, { file }) => sum + file.size, 0))}) go?</p>
            <p class="places">
                {named !== undefined && <button type="button" onClick={() => place(folder, named)}>Into {printable(shownFolder(named))}</button>}
                <button type="button" onClick={() => place(folder, barePlace(folder))}>Into {printable(shownFolder(barePlace(folder)))}</button>
            </p>
        </>
    );
}

function Reasons({ list }: { list: readonly Push[] }) {
    const refused = list.filter(isIn('refused'));
    return (
        <>
            {list.some(isIn('held')) && <p class="line-detail">The host does not take all of its files, so none is sent.</p>}
            {refused.slice(0, mostReasons).map((push) => (
                <div key={push.key}><code>{printable(destinationOf(push))}</code>{push.problem && <ProblemBox problem={push.problem} />}</div>
            ))}
            {refused.length > mostReasons && <p class="line-detail">and {counted(refused.length - mostReasons, 'other file')}</p>}
        </>
    );
}

/// There may be a thousand of them, and each step of each would be drawn.
function Files({ list }: { list: readonly Push[] }) {
    const [isOpen, setOpen] = useState(false);
    return (
        <details open={isOpen} onToggle={(event) => setOpen(event.currentTarget.open)}>
            <summary>All files</summary>
            <ul class="sums">
                {isOpen && list.map((push) => (
                    <li key={push.key}>
                        <code>{printable(destinationOf(push))}</code> <span class="faint">{bytesText(push.bytes)}, {push.state}</span>
                        {push.arrival && <span class="line-detail">{push.arrival.verified ? 'verified' : 'not verified'}: <code class="sum">{printable(push.arrival.sha256)}</code></span>}
                        {push.arrival?.notes.map((note) => <span key={note} class="line-detail">note: {printable(note)}</span>)}
                    </li>
                ))}
            </ul>
        </details>
    );
}

/// A folder whose place is known, and how far its files are.
function Placed({ folder, list }: { folder: PushFolder; list: readonly Push[] }) {
    const destination = folder.destination ?? '';
    const isUnderWay = list.some(isIn('waiting', 'sending', 'verifying'));
    const bytes = list.reduce((sum, push) => sum + push.bytes, 0);
    const sent = list.reduce((sum, push) => sum + (push.state === 'arrived' ? push.bytes : push.sent), 0);
    const counts = countsOf(list);
    return (
        <>
            <span class="faint"> to {printable(shownFolder(destination))}, {bytesText(bytes)}</span>
            <span class="line-detail" role="status">{arrivedText(counts)}</span>
            {isUnderWay && <progress max={Math.max(bytes, 1)} value={sent} aria-label={`Sent of ${printable(folder.name)}/`} />}
            {folderNotes(counts).map((note) => <span key={note} class="line-detail">{note}</span>)}
            <Reasons list={list} />
            {list.some(isIn('ready')) && destination !== '' && <CommandLine line={pushLine(commandPrefix(), `${folder.name}/`, shownPath(destination))} />}
            <Files list={list} />
        </>
    );
}

/// A folder that was dropped, from the question where it goes to its arrival.
export function PushFolderRow({ folder, list }: { folder: PushFolder; list: readonly Push[] }) {
    const name = `${printable(folder.name)}/`;
    const isAsked = folder.found !== undefined;
    const isRead = isAsked || folder.destination !== undefined;
    const [word, state] = folder.problem ? ['not taken', 'failed'] : !isRead ? ['reading', 'queued'] : isAsked ? ['where to?', 'queued'] : standingOf(list);
    // What is being read may never end, on a disk that does not answer.
    const mayGo = folder.problem !== undefined || isAsked || !isRead || list.every(canDrop);
    return (
        <li class="line push">
            <StateMark state={state} text={word} />
            <div class="grow">
                <code>{name}</code>
                {folder.problem && <ProblemBox problem={folder.problem} />}
                {isAsked && <Places folder={folder} />}
                {folder.destination !== undefined && <Placed folder={folder} list={list} />}
                {folder.skipped.slice(0, mostSkipped).map((one) => <span key={one} class="line-detail">note: {printable(one)}</span>)}
                {folder.skipped.length > mostSkipped && <span class="line-detail">and {counted(folder.skipped.length - mostSkipped, 'other note')}</span>}
            </div>
            {mayGo && <button type="button" class="plain" aria-label={`${list.some(isIn('waiting', 'sending')) ? 'Give up' : 'Put away'} ${name}`} onClick={() => dropFolder(folder.key)}>✕</button>}
        </li>
    );
}
