/// Reads an agent's configuration, and replaces it after having shown what changes.
import { useEffect, useState } from 'preact/hooks';
import { askConfiguration } from '../api/configuration';
import { askInstances, askInventory } from '../api/host';
import { Problem } from '../api/problem';
import { ActionDialog } from '../parts/action_dialog';
import { Empty, PageHead, Panel, ProblemBox } from '../parts/basics';
import { DiffView } from '../parts/diff_view';
import { ImportPanel } from '../parts/import_panel';
import { Link } from '../route/link';
import { go, parameter, usePlace } from '../route/route';
import { health, mayAct, whoami } from '../state/host';
import { useResource } from '../state/resource';
import { useStore } from '../state/store';
import { printable } from '../words/printable';

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

function Editor({ product, target }: { product: string; target: string }) {
    const guarded = health.get()?.guarded === true;
    const { value, problem, isLoading, reload } = useResource(() => askConfiguration(product, target, guarded), [product, target]);
    const [text, setText] = useState<string>();
    const [isSending, setSending] = useState(false);
    useEffect(() => setText(undefined), [value]);
    const before = value ? withEnd(value.text) : '';
    const after = text ?? before;
    const isChanged = withEnd(after) !== before;
    useEffect(() => {
        if (!isChanged) return undefined;
        const warn = (event: BeforeUnloadEvent) => event.preventDefault();
        addEventListener('beforeunload', warn);
        return () => removeEventListener('beforeunload', warn);
    }, [isChanged]);
    if (problem && !value) return <ProblemBox problem={problem} retry={reload} />;
    if (!value) return <p class="faint">Reading…</p>;
    const isWritable = value.isWhole && mayAct(whoami.get());
    return (
        <div class="columns even">
            <Panel title="Text" aside={<button type="button" disabled={isLoading} onClick={reload}>Read again</button>}>
                {!value.isWhole && <ProblemBox problem={cutProblem(product, value.text)} />}
                <textarea class="editor" aria-label="Configuration" rows={22} spellcheck={false} autocomplete="off" readOnly={!isWritable}
                    value={after} onInput={(event) => setText(event.currentTarget.value)} />
            </Panel>
            <Panel title="Difference to what is there" aside={isWritable && (
                <span class="buttons">
                    <button type="button" disabled={!isChanged} onClick={() => setText(undefined)}>Undo all</button>
                    <button type="button" class="main" disabled={!isChanged || after.trim() === ''} onClick={() => setSending(true)}>Send…</button>
                </span>
            )}>
                <DiffView before={before} after={withEnd(after)} />
            </Panel>
            {isSending && (
                <ActionDialog wide request={{ command: 'SETCONFIG', product, context: withEnd(after), ...(target === '' ? {} : { targetmsn: target }) }}
                    about={<p>Replace a configuration. The agent takes it when it is started again.</p>} mayForce
                    before={() => refuseIfChanged(product, target, value.text)}
                    onClose={() => setSending(false)} onAccepted={() => setTimeout(reload, 1_000)}>
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
    const choose = (event: { currentTarget: HTMLSelectElement }) => go(event.currentTarget.value || '/configuration');
    return (
        <>
            <PageHead title="Configuration" about="See what is there, change it, and see what changes before anything is sent">
                <label class="inline">Agent <select value={product === '' ? '' : addressOf(product, target)} onChange={choose}>
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
