/// Reads an agent's configuration, and replaces it after having shown what changes.
import { useEffect, useRef, useState } from 'preact/hooks';
import { askConfiguration } from '../../api/configuration';
import { askInstances, askInventory } from '../../api/host';
import { Problem } from '../../api/problem';
import type { Task } from '../../api/types';
import { work } from '../../live/work';
import { ActionDialog } from '../../parts/action_dialog';
import { Empty, PageHead, Panel, ProblemBox } from '../../parts/basics';
import { DiffView } from '../../parts/diff_view';
import { ImportPanel } from '../../parts/import_panel';
import { taskAddress } from '../../parts/task_line';
import { Link } from '../../route/link';
import { askBeforeLeaving, go, parameter, usePlace } from '../../route/route';
import { whenOver } from '../../state/actions';
import { health, mayAct, whoami } from '../../state/host';
import { useResource } from '../../state/resource';
import { useStore } from '../../state/store';
import { printable } from '../../words/printable';

interface Choice {
    product: string;
    target: string;
    name: string;
}

/// Default instances are known by their product alone.
async function choices(signal: AbortSignal): Promise<Choice[]> {
    const [inventory, instances] = await Promise.all([askInventory(signal), askInstances(signal)]);
    const listed = (instances ?? []).map((one) => ({
        product: one.product, target: one.instance === '' ? '' : one.target, name: `${one.product}  ${one.target}` }));
    const codes = new Set(listed.map((one) => one.product));
    const others = inventory.products.filter((one) => !codes.has(one.product) && instances === null)
        .map((one) => ({ product: one.product, target: '', name: one.product }));
    return [...listed, ...others];
}

const addressOf = (product: string, target: string): string =>
    `/configuration?product=${encodeURIComponent(product)}${target === '' ? '' : `&target=${encodeURIComponent(target)}`}`;

const withEnd = (text: string): string => (text.endsWith('\n') ? text : `${text}\n`);

function cutProblem(product: string, text: string): Problem {
    const bytes = new TextEncoder().encode(text).length;
    return new Problem(`config edit ${product}: the host gives no more than ${bytes} bytes of the configuration as text, so the rest would be lost`,
        200, '', `Write the whole text to a file and use: zavctl config set ${product} --file FILE`);
}

/// What somebody else has set since the text was read would be lost without a word.
async function refuseIfChanged(product: string, target: string, before: string): Promise<void> {
    if (health.get()?.guarded !== true) return;
    const current = await askConfiguration(product, target, true);
    if (current.text === before) return;
    throw new Problem(`config edit ${product}: the configuration has changed on the host while it was edited`, 200, '',
        'Copy what you have written, and read the configuration again to see it as it is now.');
}

/// A change of this configuration that waits or runs, whoever has asked for it. Until it has ended nobody
/// knows what the next one would replace.
function useOpenChange(product: string, target: string): { id: string } | undefined {
    return useStore(work)?.find((task) => task.command === 'SETCONFIG' &&
        task.product.toLowerCase() === product.toLowerCase() && (task.targetmsn ?? '') === target);
}

/// The browser's own question, as it has for a page that is closed: it can be asked while the browser
/// goes back.
const mayLose = (question: string): boolean => confirm(`What you have written is not on the host, and would be lost. ${question}`);

function Editor({ product, target }: { product: string; target: string }) {
    const guarded = health.get()?.guarded === true;
    const { value, problem, isLoading, reload } = useResource(() => askConfiguration(product, target, guarded), [product, target]);
    const [text, setText] = useState<string>();
    const [isSending, setSending] = useState(false);
    const [sent, setSent] = useState<{ task: Task; text: string | undefined }>();
    /// What need not be kept once the configuration has been read anew.
    const spent = useRef<string | undefined>(undefined);
    useEffect(() => {
        setText((current) => (current === spent.current ? undefined : current));
        spent.current = undefined;
    }, [value]);
    useEffect(() => {
        if (!sent) return undefined;
        let isWanted = true;
        void whenOver(sent.task).then((task) => {
            if (!isWanted) return;
            setSent(undefined);
            if (task.state !== 'done') return;
            spent.current = sent.text;
            reload();
        });
        return () => {
            isWanted = false;
        };
    }, [sent]);
    const open = useOpenChange(product, target) ?? sent?.task;
    const readAgain = () => {
        if (isChanged && !mayLose('Read the configuration again?')) return;
        spent.current = text;
        reload();
    };
    const before = value ? withEnd(value.text) : '';
    const after = text ?? before;
    const isChanged = withEnd(after) !== before;
    useEffect(() => {
        if (!isChanged) return undefined;
        const warn = (event: BeforeUnloadEvent) => event.preventDefault();
        addEventListener('beforeunload', warn);
        const stopAsking = askBeforeLeaving(() => mayLose('Leave it?'));
        return () => {
            removeEventListener('beforeunload', warn);
            stopAsking();
        };
    }, [isChanged]);
    if (problem && !value) return <ProblemBox problem={problem} retry={reload} />;
    if (!value) return <p class="faint">Reading…</p>;
    const isWritable = value.isWhole && mayAct(whoami.get());
    return (
        <div class="columns even">
            <Panel title="Text" aside={<button type="button" disabled={isLoading} onClick={readAgain}>Read again</button>}>
                {!value.isWhole && <ProblemBox problem={cutProblem(product, value.text)} />}
                <textarea class="editor" aria-label="Configuration" rows={22} spellcheck={false} autocomplete="off" readOnly={!isWritable}
                    value={after} onInput={(event) => setText(event.currentTarget.value)} />
            </Panel>
            <Panel title="Difference to what is there" aside={isWritable && (
                <span class="buttons">
                    <button type="button" disabled={!isChanged} onClick={() => setText(undefined)}>Undo all</button>
                    <button type="button" class="main" disabled={!isChanged || after.trim() === '' || open !== undefined} onClick={() => setSending(true)}>Send…</button>
                </span>
            )}>
                {open && (
                    <p class="box attention" role="status">
                        <Link to={taskAddress(open.id)}>A change of this configuration</Link> is on its way. What stands here is kept, and can be sent once that has ended.
                    </p>
                )}
                <DiffView before={before} after={withEnd(after)} />
            </Panel>
            {isSending && (
                <ActionDialog wide request={{ command: 'SETCONFIG', product, context: withEnd(after), ...(target === '' ? {} : { targetmsn: target }) }}
                    about={<p>Replace a configuration. The agent takes it when it is started again.</p>} mayForce
                    before={() => refuseIfChanged(product, target, value.text)}
                    onClose={() => setSending(false)} onAccepted={(task) => setSent({ task, text })}>
                    <DiffView before={before} after={withEnd(after)} />
                </ActionDialog>
            )}
        </div>
    );
}

export function ConfigurationPage() {
    const { search } = usePlace();
    const product = parameter(search, 'product');
    const target = parameter(search, 'target');
    const { value, problem, reload } = useResource(choices, []);
    useStore(whoami);
    const how = useStore(health);
    const isKnown = value?.some((one) => one.product === product && one.target === target) ?? false;
    const chosen = product === '' ? '' : addressOf(product, target);
    const choose = ({ currentTarget }: { currentTarget: HTMLSelectElement }) => {
        if (!go(currentTarget.value || '/configuration')) currentTarget.value = chosen;
    };
    return (
        <>
            <PageHead title="Configuration" about="See what is there, change it, and see what changes before anything is sent">
                <label class="inline">Agent <select value={chosen} onChange={choose}>
                    <option value="">choose…</option>
                    {!isKnown && product !== '' && <option value={addressOf(product, target)}>{printable(`${product} ${target}`)}</option>}
                    {value?.map((one) => <option key={one.name} value={addressOf(one.product, one.target)}>{printable(one.name)}</option>)}
                </select></label>
            </PageHead>
            {problem && <ProblemBox problem={problem} retry={reload} />}
            {product === '' && value?.length === 0 && <Empty title="No agent has a configuration yet"><p><Link to="/agents">Install one first.</Link></p></Empty>}
            {product === '' && (value?.length ?? 0) > 0 && <Empty title="Choose an agent"><p>Its configuration is read from the host, as <code>zavctl config get</code> does.</p></Empty>}
            {product.toLowerCase() === 'um' && <ImportPanel target={target} />}
            {product !== '' && how && product.toLowerCase() !== 'um' && <Editor key={`${product} ${target}`} product={product} target={target} />}
        </>
    );
}
