/// Brings a file to the depots of many hosts, after having shown which ones.
import { useEffect, useRef, useState } from 'preact/hooks';
import { encodedPath } from '../../api/depot';
import { hostPages } from '../../api/fleet/centre';
import { type Preview, pushToMany } from '../../api/fleet/run';
import { type Problem, asProblem } from '../../api/problem';
import { go } from '../../route/route';
import { noteBeginning } from '../../state/fleet/actions';
import { commandPrefix, useOnlyLooks } from '../../state/session';
import { fleetLine } from '../../words/fleet/lines';
import { rolloutAddress } from '../../words/fleet/rollouts';
import { bytesText, counted } from '../../words/size';
import { CommandLine, ProblemBox } from '../basics';
import { Dialog } from '../dialog';
import { HostsPreview } from './hosts_preview';
import { Elsewhere } from './only_looks';

/// The hosts of a selector, as the preview of a roll-out has them.
async function hostsOf(on: string, signal: AbortSignal): Promise<Preview> {
    const hosts: Preview['hosts'] = [];
    for await (const page of hostPages(on, signal)) hosts.push(...page.map(({ name, state }) => ({ name, state })));
    return { hosts, kind: 'PUSH', product: '', seconds: 0 };
}

export function FleetPushDialog({ on: first, onClose }: { on: string; onClose: () => void }) {
    const onlyLooks = useOnlyLooks();
    const [on, setOn] = useState(first);
    const [file, setFile] = useState<File>();
    const [path, setPath] = useState('');
    const [known, setKnown] = useState<{ on: string; preview: Preview }>();
    const [sent, setSent] = useState<number>();
    const [isLooking, setLooking] = useState(false);
    const [problem, setProblem] = useState<Problem>();
    const work = useRef(new AbortController());
    useEffect(() => () => work.current.abort(), []);
    const selector = on.trim();
    const destination = path.trim() || (file?.name ?? '');
    const missing = !file ? 'Choose a file.' : selector === '' ? 'Say which hosts are meant.' : '';
    const shown = known?.on === selector ? known.preview : undefined;
    const { signal } = work.current;
    const look = async () => {
        setLooking(true);
        try {
            setKnown({ on: selector, preview: await hostsOf(selector, signal) });
        } catch (error) {
            if (!signal.aborted) setProblem(asProblem(error));
        }
        setLooking(false);
    };
    const send = async (chosen: File, hosts: number) => {
        setSent(0);
        try {
            const asked = pushToMany(encodedPath(destination), selector, chosen, setSent, signal);
            const id = await noteBeginning(asked, `push ${destination}`, counted(hosts, 'host'));
            onClose();
            go(rolloutAddress(id));
        } catch (error) {
            setProblem(asProblem(error));
            setKnown(undefined);
            setSent(undefined);
        }
    };
    const submit = (event: Event) => {
        event.preventDefault();
        if (onlyLooks) return;
        setProblem(undefined);
        void (shown && file ? send(file, shown.hosts.length) : look());
    };
    const line = fleetLine(commandPrefix(), { verb: 'push', arguments: file ? [file.name, ...(destination === file.name ? [] : [destination])] : [], options: { on: selector } });
    return (
        <Dialog title="push" onClose={onClose} wide isBusy={sent !== undefined}>
            <form onSubmit={submit}>
                <div class="about"><p>Send a file to the depots of many hosts. It goes to the centre once, and each host fetches it from there.</p></div>
                <label class="field">File
                    <input type="file" name="file" onChange={(event) => setFile(event.currentTarget.files?.[0])} />
                </label>
                <label class="field">Name in the depot, as <code>ux/7.2/package.tar</code>; the file's own if not given
                    <input class="mono" name="path" value={path} spellcheck={false} autocomplete="off" onInput={(event) => setPath(event.currentTarget.value)} />
                </label>
                <label class="field">Hosts: a selector; <code>*</code> means all
                    <input class="mono" name="on" value={on} spellcheck={false} autocomplete="off" onInput={(event) => setOn(event.currentTarget.value)} />
                </label>
                {missing === '' && <CommandLine line={line} />}
                {problem && <ProblemBox problem={problem} />}
                {shown && <HostsPreview preview={shown} />}
                {sent !== undefined && file && (
                    <p role="status">
                        <progress max={Math.max(file.size, 1)} value={sent} aria-label="Sent" />
                        {sent < file.size ? `${bytesText(sent)} of ${bytesText(file.size)}` : 'The centre takes it…'}
                    </p>
                )}
                <Elsewhere />
                <footer>
                    <p class="faint">{missing || (onlyLooks || shown ? '' : 'First see which hosts get it; that sends nothing.')}</p>
                    <button type="button" disabled={sent !== undefined} onClick={onClose}>Back</button>
                    {!onlyLooks && <button type="submit" class="main" disabled={missing !== '' || isLooking || sent !== undefined || shown?.hosts.length === 0}>
                        {sent !== undefined ? 'Sending…' : shown ? `Push it to ${counted(shown.hosts.length, 'host')}` : 'Preview the hosts'}
                    </button>}
                </footer>
            </form>
        </Dialog>
    );
}
