/// Compares an agent's configuration on many hosts, and replaces it after having shown what changes.
import { useEffect, useRef, useState } from 'preact/hooks';
import { type ConfigurationChoice, type Configurations, type SameOnes, askConfigurations, configGet, hostsOf } from '../../api/fleet/configuration';
import type { FleetRequest } from '../../api/fleet/run';
import { CommandLine, Empty, PageHead, Panel, ProblemBox, StateMark } from '../../parts/basics';
import { DiffView } from '../../parts/diff_view';
import { Elsewhere } from '../../parts/fleet/only_looks';
import { RolloutDialog } from '../../parts/fleet/rollout_dialog';
import { askBeforeLeaving, go, parameter, usePlace, withParameters } from '../../route/route';
import { mayOrder, operator } from '../../state/fleet/centre';
import { useResource } from '../../state/resource';
import { commandPrefix, useOnlyLooks } from '../../state/session';
import { useStore } from '../../state/store';
import { fleetLine } from '../../words/fleet/lines';
import { printable, printableLines, redacted } from '../../words/printable';
import { counted } from '../../words/size';

const mostNamed = 20;

const withEnd = (text: string): string => (text === '' || text.endsWith('\n') ? text : `${text}\n`);

function ChoiceForm({ choice }: { choice: ConfigurationChoice }) {
    const here = usePlace();
    const submit = (event: SubmitEvent) => {
        event.preventDefault();
        const given = new FormData(event.currentTarget as HTMLFormElement);
        const of = (name: string) => String(given.get(name) ?? '').trim();
        go(withParameters({ path: here.path, search: '' }, { product: of('product'), target: of('target'), on: of('host') === '' ? of('on') : '', host: of('host') }));
    };
    const field = (name: keyof ConfigurationChoice) => ({ name, key: `${name} ${choice[name]}`, defaultValue: choice[name], spellcheck: false, autocomplete: 'off' as const });
    return (
        <form class="filters" aria-label="Whose configuration" onSubmit={submit}>
            <label>Product <input size={8} {...field('product')} /></label>
            <label>Instance <input size={14} placeholder="the default one" {...field('target')} /></label>
            <label>Selector <input class="mono selector" placeholder="env=test or *" {...field('on')} /></label>
            <label>or one host <input size={14} {...field('host')} /></label>
            <button type="submit" class="main">Compare</button>
        </form>
    );
}

function Group({ group, first, mayEdit, onEdit }: { group: SameOnes; first: SameOnes; mayEdit: boolean; onEdit: () => void }) {
    const isFirst = group === first;
    const names = group.hosts.slice(0, mostNamed).map(printable).join(', ');
    return (
        <Panel title={`${counted(group.hosts.length, 'host')}${isFirst ? ' with the same' : ' that differ'}`} name="same-ones"
            aside={mayEdit && <button type="button" aria-label={`Edit that of ${names}`} onClick={onEdit}>Edit…</button>}>
            <p class="faint">{names}{group.hosts.length > mostNamed && ` and ${group.hosts.length - mostNamed} more`}</p>
            {isFirst ? <pre class="output short" tabIndex={0} role="region" aria-label="Configuration">{printableLines(group.text)}</pre>
                : <DiffView before={withEnd(first.text)} after={withEnd(group.text)} />}
        </Panel>
    );
}

/// Whoever leaves a text that no host has is asked. Returns what ends that at once, for good.
function useWarning(isChanged: boolean): () => void {
    const isDone = useRef(false);
    useEffect(() => {
        if (!isChanged) return undefined;
        const warn = (event: BeforeUnloadEvent) => {
            if (!isDone.current) event.preventDefault();
        };
        addEventListener('beforeunload', warn);
        const stopAsking = askBeforeLeaving(() => isDone.current || confirm('What you have written is on no host, and would be lost. Leave it?'));
        return () => {
            removeEventListener('beforeunload', warn);
            stopAsking();
        };
    }, [isChanged]);
    return () => {
        isDone.current = true;
    };
}

function Editor({ choice, from, onClose }: { choice: ConfigurationChoice; from: SameOnes; onClose: () => void }) {
    const before = withEnd(from.text);
    const [text, setText] = useState(before);
    const [isSending, setSending] = useState(false);
    const after = withEnd(text);
    const isChanged = after !== before;
    const stopWarning = useWarning(isChanged);
    const { product, target } = choice;
    const { on, hosts } = hostsOf(choice);
    const giveUp = () => {
        if (!isChanged || confirm('What you have written is on no host, and would be lost. Leave it?')) onClose();
    };
    return (
        <div class="columns even">
            <Panel title="Text" aside={<button type="button" onClick={giveUp}>Back to the comparison</button>}>
                <textarea class="editor" aria-label="Configuration" rows={22} spellcheck={false} autocomplete="off" value={text} onInput={(event) => setText(event.currentTarget.value)} />
            </Panel>
            <Panel title={`Difference to what ${counted(from.hosts.length, 'host has', 'hosts have')}`} aside={(
                <span class="buttons">
                    <button type="button" disabled={!isChanged} onClick={() => setText(before)}>Undo all</button>
                    <button type="button" class="main" disabled={after.trim() === ''} onClick={() => setSending(true)}>Send…</button>
                </span>
            )}>
                <DiffView before={before} after={after} />
            </Panel>
            {isSending && (
                <RolloutDialog on={on} hosts={hosts} mayForce onClose={() => setSending(false)} onBegun={stopWarning}
                    request={{ verb: 'config set', arguments: [product, '-'], options: { target }, input: after }}
                    about={<p>Replace a configuration. The agent takes it when it is started again.</p>}>
                    <DiffView before={before} after={after} />
                </RolloutDialog>
            )}
        </div>
    );
}

function Comparison({ choice }: { choice: ConfigurationChoice }) {
    const who = useStore(operator);
    const request = configGet(choice);
    const { value, problem, isLoading, reload } = useResource<Configurations>((signal) => askConfigurations(request, signal), [choice.product, choice.target, choice.on, choice.host]);
    const [edited, setEdited] = useState<SameOnes>();
    const [first] = value?.groups ?? [];
    if (edited) return <Editor choice={choice} from={edited} onClose={() => setEdited(undefined)} />;
    return (
        <>
            <CommandLine line={fleetLine(commandPrefix(), request)} />
            {problem && <ProblemBox problem={problem} retry={reload} />}
            {isLoading && <p class="faint" role="status">The hosts are asked…</p>}
            {value && value.failed.length > 0 && (
                <Panel title={`Not known of ${counted(value.failed.length, 'host')}`}>
                    <ul class="lines">{value.failed.slice(0, mostNamed).map((one) => <li key={one.host} class="line"><StateMark state="warning" text={one.host} /><span class="grow">{redacted(one.error)}</span></li>)}</ul>
                    {value.failed.length > mostNamed && <p class="faint">and {value.failed.length - mostNamed} more</p>}
                </Panel>
            )}
            {value && value.groups.length === 0 && <Empty title="No host has told a configuration"><p>Hosts that are away are not waited for.</p></Empty>}
            {first && value?.groups.map((group) => <Group key={group.hosts[0]} group={group} first={first} mayEdit={mayOrder(who, 'SETCONFIG')} onEdit={() => setEdited(group)} />)}
        </>
    );
}

/// How it is compared and replaced where the operator's key is.
function Lines({ choice }: { choice: ConfigurationChoice }) {
    const who = useStore(operator);
    const { on, hosts } = hostsOf(choice);
    const set: FleetRequest = { verb: 'config set', arguments: [choice.product], options: { on, target: choice.target, file: 'FILE' }, hosts };
    return (
        <>
            <Elsewhere />
            <CommandLine name="To compare them" line={fleetLine(commandPrefix(), configGet(choice))} />
            {mayOrder(who, 'SETCONFIG') && <CommandLine name="To replace them" line={fleetLine(commandPrefix(), set)} />}
        </>
    );
}

export function FleetConfigurationPage() {
    const onlyLooks = useOnlyLooks();
    const { search } = usePlace();
    const who = useStore(operator);
    const of = (name: string) => parameter(search, name);
    const choice: ConfigurationChoice = { product: of('product'), target: of('target'), on: of('on'), host: of('host') };
    const isComplete = choice.product !== '' && (choice.on !== '' || choice.host !== '');
    const isImport = choice.product.toLowerCase() === 'um';
    return (
        <>
            <PageHead title="Configuration" about="See where hosts differ, change it on many, and see what changes before anything is sent" />
            <ChoiceForm choice={choice} />
            {isImport && <p class="box attention">The universal agent's configuration is the import of a metafile: <code>zavctl ua-config</code> with <code>--on</code> does it.</p>}
            {who && !mayOrder(who, 'GETCONFIG') && <p class="box attention">Your certificate does not allow GETCONFIG.</p>}
            {!isComplete && <Empty title="Name a product and the hosts"><p>They are asked now, as <code>zavctl config get</code> with <code>--diff</code> does.</p></Empty>}
            {isComplete && !isImport && mayOrder(who, 'GETCONFIG') && (onlyLooks ? <Lines choice={choice} /> : <Comparison key={Object.values(choice).join('\n')} choice={choice} />)}
        </>
    );
}
