/// Begins a roll-out after having shown what is asked for and which hosts get it.
import type { ComponentChildren } from 'preact';
import { useEffect, useRef, useState } from 'preact/hooks';
import { type FleetRequest, type Preview, preview } from '../../api/fleet/run';
import { type Problem, asProblem } from '../../api/problem';
import { go } from '../../route/route';
import { beginRollout } from '../../state/fleet/actions';
import { notify } from '../../state/notices';
import { commandPrefix, useOnlyLooks } from '../../state/session';
import { fleetLine, fleetTitle } from '../../words/fleet/lines';
import { rolloutAddress } from '../../words/fleet/rollouts';
import { counted } from '../../words/size';
import { CommandLine, ProblemBox } from '../basics';
import { Dialog } from '../dialog';
import { HostsPreview } from './hosts_preview';
import { Elsewhere } from './only_looks';
import { type Plan, PlanFields, emptyPlan } from './plan_fields';

export interface RolloutDialogProps {
    /// Without what the plan says.
    request: FleetRequest;
    /// What it does, in zavctl's words.
    about: ComponentChildren;
    /// The selector of the hosts that are meant at first.
    on?: string;
    /// Hosts that are named, in the place of a selector.
    hosts?: readonly string[] | undefined;
    /// Whether what it does is hard to undo.
    isGrave?: boolean;
    /// Fields of the request that are filled in here.
    children?: ComponentChildren;
    /// Why it cannot be sent yet; empty: it can.
    missing?: string;
    /// Whether the product need not be in the inventories, if somebody insists.
    mayForce?: boolean;
    onClose: () => void;
    onBegun?: () => void;
}

interface Previewed {
    /// What it was made for.
    line: string;
    preview: Preview;
}

export function RolloutDialog(props: RolloutDialogProps) {
    const onlyLooks = useOnlyLooks();
    const [plan, setPlan] = useState<Plan>({ ...emptyPlan, on: props.on ?? '' });
    const [force, setForce] = useState(false);
    const [known, setKnown] = useState<Previewed>();
    const [busy, setBusy] = useState<'preview' | 'send'>();
    const [problem, setProblem] = useState<Problem>();
    const looking = useRef<AbortController | undefined>(undefined);
    const isThere = useRef(true);
    useEffect(() => () => {
        isThere.current = false;
        looking.current?.abort();
    }, []);
    const given = Object.fromEntries(Object.entries(plan).map(([name, value]) => [name, value.trim()]));
    const { hosts } = props;
    const request: FleetRequest = { ...props.request, options: { ...given, ...(hosts ? { on: '' } : {}), ...props.request.options, ...(force ? { force } : {}) }, hosts };
    const title = fleetTitle(request);
    const line = fleetLine(commandPrefix(), request);
    const missing = props.missing || (!hosts && given['on'] === '' ? 'Say which hosts are meant.' : '');
    // What was changed since then may mean other hosts.
    const shown = known?.line === line ? known.preview : undefined;
    const look = async () => {
        const { signal } = (looking.current = new AbortController());
        try {
            setKnown({ line, preview: await preview(request, signal) });
        } catch (error) {
            if (!signal.aborted) setProblem(asProblem(error));
        }
        setBusy(undefined);
    };
    const begin = async (hosts: number) => {
        try {
            const id = await beginRollout(request, counted(hosts, 'host'));
            props.onBegun?.();
            props.onClose();
            go(rolloutAddress(id));
        } catch (error) {
            const found = asProblem(error);
            // The page may have been left meanwhile, and its window with it.
            if (!isThere.current) notify({ tone: 'bad', text: `${title}: ${found.isLost ? 'nobody knows whether it has begun' : 'not begun'}`, detail: found.message, hint: found.hint });
            setProblem(found);
            // The next one is looked at anew: whether this one has begun may show there.
            setKnown(undefined);
            setBusy(undefined);
        }
    };
    const submit = (event: Event) => {
        event.preventDefault();
        if (onlyLooks) return;
        setProblem(undefined);
        setBusy(shown ? 'send' : 'preview');
        void (shown ? begin(shown.hosts.length) : look());
    };
    return (
        <Dialog title={title} onClose={props.onClose} wide isBusy={busy === 'send'}>
            <form onSubmit={submit}>
                <div class="about">{props.about}</div>
                {props.children}
                <PlanFields plan={plan} hosts={hosts} onChange={setPlan} />
                {props.mayForce && (
                    <label class="check">
                        <input type="checkbox" checked={force} onChange={(event) => setForce(event.currentTarget.checked)} />
                        Send it also where the inventory does not list the product
                    </label>
                )}
                {!missing && <CommandLine line={line} />}
                {problem && <ProblemBox problem={problem} />}
                {shown && <HostsPreview preview={shown} />}
                <Elsewhere />
                <footer>
                    <p class="faint">{missing || (onlyLooks || shown ? '' : 'First see which hosts get it; that sends nothing.')}</p>
                    <button type="button" disabled={busy === 'send'} onClick={props.onClose}>Back</button>
                    {!shown && !onlyLooks && <button type="submit" class="main" disabled={busy !== undefined || missing !== ''}>{busy ? 'Looking…' : 'Preview the hosts'}</button>}
                    {shown && (
                        <button type="submit" class={props.isGrave ? 'grave' : 'main'} disabled={busy !== undefined || shown.hosts.length === 0}>
                            {busy ? 'Asking…' : `Send ${title} to ${counted(shown.hosts.length, 'host')}`}
                        </button>
                    )}
                </footer>
            </form>
        </Dialog>
    );
}
