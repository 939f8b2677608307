/// What the depot holds.
import { useEffect, useMemo, useRef, useState } from 'preact/hooks';
import { type DepotPath, askListing, askSums, childOf, encodedPath, removeFromDepot, shownPath } from '../../api/depot';
import { type Problem, asProblem } from '../../api/problem';
import type { DepotEntry } from '../../api/types';
import { CommandLine, CopyButton, Empty, PageHead, Panel, ProblemBox, Search, Time } from '../../parts/basics';
import { Dialog } from '../../parts/dialog';
import { PushPanel } from '../../parts/push_panel';
import { WindowList } from '../../parts/window_list';
import { Link } from '../../route/link';
import { go, rawParameter, usePlace } from '../../route/route';
import { mayAct, whoami } from '../../state/host';
import { notify } from '../../state/notices';
import { arrivals } from '../../state/pushes';
import { useResource } from '../../state/resource';
import { commandPrefix } from '../../state/session';
import { useStore } from '../../state/store';
import { removeLine, sumLine } from '../../words/lines';
import { printable } from '../../words/printable';
import { bytesText, counted } from '../../words/size';

/// The path stays as it is encoded: names that are no text would not survive being decoded.
const addressOf = (path: DepotPath): string => (path === '' ? '/depot' : `/depot?path=${path}`);

const columns = [
    { name: 'Name', class: 'c-main' },
    { name: 'Size', class: 'c-size' },
    { name: 'Changed', class: 'c-time' },
    { name: 'Actions', class: 'c-actions' },
];

/// The sums of files in one directory at most, as many as one request can carry.
const mostSums = 100;

function Trail({ path }: { path: DepotPath }) {
    const parts = path === '' ? [] : path.split('/');
    return (
        <nav class="trail" aria-label="Folder">
            <Link to="/depot">depot</Link>
            {parts.map((part, i) => <span key={i}> / <Link to={addressOf(parts.slice(0, i + 1).join('/'))}>{printable(shownPath(part))}</Link></span>)}
        </nav>
    );
}

function RemoveDialog({ path, isFolder, onClose, onRemoved }: { path: DepotPath; isFolder: boolean; onClose: () => void; onRemoved: () => void }) {
    const [problem, setProblem] = useState<Problem>();
    const [isBusy, setBusy] = useState(false);
    const name = shownPath(path);
    const remove = async (event: Event) => {
        event.preventDefault();
        setBusy(true);
        try {
            await removeFromDepot(path, isFolder);
            notify({ tone: 'good', text: `depot rm ${name}: done` });
            onRemoved();
            onClose();
        } catch (error) {
            setProblem(asProblem(error));
            setBusy(false);
        }
    };
    return (
        <Dialog title={`depot rm ${printable(name)}`} onClose={onClose} isBusy={isBusy}>
            <form onSubmit={(event) => void remove(event)}>
                <p>{isFolder ? 'Remove the folder with everything in it.' : 'Remove the file from the depot.'}</p>
                <CommandLine line={removeLine(commandPrefix(), name, isFolder)} />
                {problem && <ProblemBox problem={problem} />}
                <footer><button type="button" disabled={isBusy} onClick={onClose}>Back</button><button type="submit" class="grave" disabled={isBusy}>Remove</button></footer>
            </form>
        </Dialog>
    );
}

function SumsDialog({ paths, onClose }: { paths: readonly DepotPath[]; onClose: () => void }) {
    const { value, problem, reload } = useResource(() => askSums(paths), [paths]);
    const text = (value ?? []).filter((sum) => sum.sha256).map((sum) => `${sum.sha256}  ${printable(sum.path)}`).join('\n');
    return (
        <Dialog title="depot sum" onClose={onClose} wide>
            <CommandLine line={sumLine(commandPrefix(), paths.map(shownPath))} />
            {problem && <ProblemBox problem={problem} retry={reload} />}
            {!value && !problem && <p class="faint">Reading…</p>}
            {value && (
                <ul class="sums">{value.map((sum) => (
                    <li key={sum.path}><code class="sum">{sum.sha256 ?? printable(sum.error ?? '')}</code> {printable(sum.path)}</li>
                ))}</ul>
            )}
            <footer>{text !== '' && <CopyButton text={`${text}\n`} label="Copy the sums" />}<button type="button" onClick={onClose}>Close</button></footer>
        </Dialog>
    );
}

export function DepotPage() {
    const { search } = usePlace();
    const raw = rawParameter(search, 'path');
    // An address that somebody has typed may hold a path as it is.
    const path = /%|^[\w./-]*$/.test(raw) ? raw : encodedPath(raw);
    const who = useStore(whoami);
    const arrived = useStore(arrivals);
    const listing = useResource((signal) => askListing(path, signal), [path]);
    const seen = useRef(arrived);
    useEffect(() => {
        if (seen.current === arrived) return;
        seen.current = arrived;
        listing.reload();
    }, [arrived]);
    const [text, setText] = useState('');
    const [removing, setRemoving] = useState<{ path: DepotPath; isFolder: boolean }>();
    const [summing, setSumming] = useState<readonly DepotPath[]>();
    useEffect(() => setText(''), [path]);
    const isMine = mayAct(who);
    const entries = listing.value?.entries ?? [];
    const shown = useMemo(() => entries.filter((entry) => entry.name.toLowerCase().includes(text.toLowerCase())), [entries, text]);
    const files = shown.filter((entry) => entry.type === 'file').slice(0, mostSums).map((entry) => childOf(path, entry));
    const cells = (entry: DepotEntry) => {
        const own = listing.value?.type === 'file' ? path : childOf(path, entry);
        const name = printable(entry.name);
        return [
            entry.type === 'directory' ? <Link to={addressOf(own)}><strong>{name}/</strong></Link> : <span class="name">{name}{entry.type !== 'file' && <span class="faint"> ({entry.type})</span>}</span>,
            entry.type === 'file' ? <span title={counted(entry.bytes, 'byte')}>{bytesText(entry.bytes)}</span> : '',
            <Time value={entry.modified} />,
            <>
                {entry.type === 'file' && <button type="button" class="small" aria-label={`Sum of ${name}`} onClick={() => setSumming([own])}>Sum</button>}
                {isMine && <button type="button" class="small" aria-label={`Remove ${name}`} onClick={() => setRemoving({ path: own, isFolder: entry.type === 'directory' })}>Remove…</button>}
            </>,
        ];
    };
    return (
        <>
            <PageHead title="Depot" about={<Trail path={path} />}>
                <Search value={text} label="Search this folder" onChange={setText} />
                {files.length > 0 && <button type="button" onClick={() => setSumming(files)}>Sums of {counted(files.length, 'file')}</button>}
            </PageHead>
            {isMine && listing.value?.type !== 'file' && <PushPanel directory={path} />}
            {listing.problem && <ProblemBox problem={listing.problem} retry={listing.reload} />}
            {!listing.value && listing.isLoading && <p class="faint">Reading…</p>}
            {listing.value && entries.length === 0 && (
                <Empty title={path === '' ? 'The depot is empty' : 'This folder is empty'}>
                    <p>Drop a file or a folder above, or run <code>zavctl push package.tar</code>. A product to install lies in <code>PRODUCT/VERSION</code>; <code>zavctl push FOLDER PRODUCT/VERSION</code> brings a whole folder.</p>
                </Empty>
            )}
            {entries.length > 0 && (
                <Panel title={counted(entries.length, 'entry', 'entries')} aside={listing.value?.complete === false && <span class="state attention">there are more</span>}>
                    {shown.length === 0 ? <Empty title="No name is like that" /> : <WindowList label="Depot" columns={columns} rows={shown} keyOf={(entry) => entry.escaped ?? entry.name} cells={cells} />}
                </Panel>
            )}
            {removing && <RemoveDialog {...removing} onClose={() => setRemoving(undefined)} onRemoved={() => { listing.reload(); go(addressOf(path)); }} />}
            {summing && <SumsDialog paths={summing} onClose={() => setSumming(undefined)} />}
        </>
    );
}
