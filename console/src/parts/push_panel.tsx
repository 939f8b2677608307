import { useRef, useState } from 'preact/hooks';
import type { DepotPath } from '../api/depot';
import { commandPrefix } from '../state/host';
import { type Push, addFiles, canDrop, destinationOf, dropPush, pushes, sendAll } from '../state/pushes';
import { useStore } from '../state/store';
import { pushLine } from '../words/lines';
import { printable } from '../words/printable';
import { bytesText, counted } from '../words/size';
import { CommandLine, Panel, ProblemBox, StateMark } from './basics';

const words: Readonly<Record<Push['state'], string>> = {
    checking: 'asking', ready: 'ready', waiting: 'waits', sending: 'on its way', verifying: 'verifying', arrived: 'arrived', refused: 'not there',
};
const tones: Readonly<Record<Push['state'], string>> = {
    checking: 'queued', ready: 'queued', waiting: 'queued', sending: 'running', verifying: 'running', arrived: 'done', refused: 'failed',
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
            {canDrop(push) && <button type="button" class="plain" aria-label={isUnderWay ? `Give up ${name}` : `Put away ${name}`} onClick={() => dropPush(push.key)}>✕</button>}
        </li>
    );
}

/// Takes files, shows what would happen, and sends them when that is wanted.
export function PushPanel({ directory }: { directory: DepotPath }) {
    const all = useStore(pushes);
    const [isOver, setOver] = useState(false);
    const chooser = useRef<HTMLInputElement>(null);
    const ready = all.filter((push) => push.state === 'ready');
    const drop = (event: DragEvent) => {
        event.preventDefault();
        setOver(false);
        addFiles(directory, [...(event.dataTransfer?.files ?? [])]);
    };
    const chosen = (event: { currentTarget: HTMLInputElement }) => {
        addFiles(directory, [...(event.currentTarget.files ?? [])]);
        event.currentTarget.value = '';
    };
    return (
        <Panel title="Push" aside={ready.length > 0 && <button type="button" class="main" onClick={() => void sendAll()}>Push {counted(ready.length, 'file')}</button>}>
            <div class={`drop ${isOver ? 'over' : ''}`} onDragOver={(event) => { event.preventDefault(); setOver(true); }} onDragLeave={() => setOver(false)} onDrop={drop}>
                <p>Drop files here, or <button type="button" onClick={() => chooser.current?.click()}>choose files…</button></p>
                <input ref={chooser} type="file" multiple hidden onChange={chosen} aria-label="Files to push" />
            </div>
            {all.length > 0 && <ul class="lines">{all.map((push) => <PushRow key={push.key} push={push} />)}</ul>}
        </Panel>
    );
}
