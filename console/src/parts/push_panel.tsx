import { useEffect, useRef, useState } from 'preact/hooks';
import type { DepotPath } from '../api/depot';
import { commandPrefix } from '../state/session';
import { type PushFolder, addFolder, folders } from '../state/folders';
import { chosenFolder, droppedIn, filesIn } from '../state/found_files';
import { notify } from '../state/notices';
import { type Push, addFiles, canDrop, destinationOf, dropPushes, pushes, sendAll } from '../state/pushes';
import { useStore } from '../state/store';
import { pushLine } from '../words/lines';
import { printable } from '../words/printable';
import { bytesText, counted } from '../words/size';
import { CommandLine, Panel, ProblemBox, StateMark } from './basics';
import { PushFolderRow } from './push_folder';

const words: Readonly<Record<Push['state'], string>> = {
    checking: 'asking', held: 'not sent', ready: 'ready', waiting: 'waits', sending: 'on its way', verifying: 'verifying', arrived: 'arrived', refused: 'not there',
};
const tones: Readonly<Record<Push['state'], string>> = {
    checking: 'queued', held: 'queued', ready: 'queued', waiting: 'queued', sending: 'running', verifying: 'running', arrived: 'done', refused: 'failed',
};

function PushRow({ push }: { push: Push }) {
    const isUnderWay = push.state === 'sending' || push.state === 'verifying';
    const name = printable(destinationOf(push));
    return (
        <li class="line push">
            <StateMark state={tones[push.state]} text={words[push.state]} />
            <div class="grow">
                <code>{name}</code> <span class="faint">{bytesText(push.bytes)}</span>
                {isUnderWay && <progress max={Math.max(push.bytes, 1)} value={push.sent} aria-label={`Sent of ${name}`} />}
                {push.notes.map((note) => <span key={note} class="line-detail">{printable(note)}</span>)}
                {push.arrival?.notes.map((note) => <span key={note} class="line-detail">note: {printable(note)}</span>)}
                {push.arrival && <span class="line-detail">{push.arrival.verified ? 'verified' : 'not verified'}: <code class="sum">{printable(push.arrival.sha256)}</code></span>}
                {push.problem && <ProblemBox problem={push.problem} />}
                {push.state === 'ready' && <CommandLine line={pushLine(commandPrefix(), push.name, destinationOf(push))} />}
            </div>
            {canDrop(push) && <button type="button" class="plain" aria-label={isUnderWay ? `Give up ${name}` : `Put away ${name}`} onClick={() => dropPushes(({ key }) => key === push.key)}>✕</button>}
        </li>
    );
}

/// Files that belong to no folder are rows of their own, those of a folder are one together.
function Rows({ all, open }: { all: readonly Push[]; open: readonly PushFolder[] }) {
    if (all.length + open.length === 0) return null;
    const ofFolder = new Map<number, Push[]>(open.map(({ key }) => [key, []]));
    for (const push of all) ofFolder.get(push.folder ?? 0)?.push(push);
    return (
        <ul class="lines">
            {open.map((folder) => <PushFolderRow key={`folder ${folder.key}`} folder={folder} list={ofFolder.get(folder.key) ?? []} />)}
            {all.map((push) => push.folder === undefined && <PushRow key={push.key} push={push} />)}
        </ul>
    );
}

/// Adds files, and says which of them cannot be named.
function take(directory: DepotPath, list: readonly File[]): void {
    for (const name of addFiles(directory, list)) notify({ tone: 'bad', text: `${name} is not taken: its name is no text` });
}

/// Takes files and folders, shows what would happen, and sends them when that is wanted.
export function PushPanel({ directory }: { directory: DepotPath }) {
    const all = useStore(pushes);
    const open = useStore(folders);
    const [isOver, setOver] = useState(false);
    const chooser = useRef<HTMLInputElement>(null);
    const folderChooser = useRef<HTMLInputElement>(null);
    // It is no property that markup can set.
    useEffect(() => folderChooser.current?.setAttribute('webkitdirectory', ''), []);
    const ready = all.filter((push) => push.state === 'ready');
    const drop = (event: DragEvent) => {
        event.preventDefault();
        setOver(false);
        const dropped = droppedIn(event.dataTransfer);
        take(directory, dropped.files);
        for (const folder of dropped.folders) void addFolder(directory, folder.name, () => filesIn(folder));
    };
    const chosen = (event: { currentTarget: HTMLInputElement }) => {
        take(directory, [...(event.currentTarget.files ?? [])]);
        event.currentTarget.value = '';
    };
    const folderChosen = (event: { currentTarget: HTMLInputElement }) => {
        const list = [...(event.currentTarget.files ?? [])];
        const name = list[0]?.webkitRelativePath.split('/')[0] ?? '';
        if (name !== '') void addFolder(directory, name, async () => chosenFolder(list));
        event.currentTarget.value = '';
    };
    return (
        <Panel title="Push" aside={ready.length > 0 && <button type="button" class="main" onClick={() => void sendAll()}>Push {counted(ready.length, 'file')}</button>}>
            <div class={`drop ${isOver ? 'over' : ''}`} onDragOver={(event) => { event.preventDefault(); setOver(true); }} onDragLeave={() => setOver(false)} onDrop={drop}>
                <p>
                    Drop files or a folder here, or{' '}
                    <button type="button" onClick={() => chooser.current?.click()}>choose files…</button>{' '}
                    <button type="button" onClick={() => folderChooser.current?.click()}>choose a folder…</button>
                </p>
                <input ref={chooser} type="file" multiple hidden onChange={chosen} aria-label="Files to push" />
                <input ref={folderChooser} type="file" hidden onChange={folderChosen} aria-label="Folder to push" />
            </div>
            <Rows all={all} open={open} />
        </Panel>
    );
}
