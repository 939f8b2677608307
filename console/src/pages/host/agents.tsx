/// Products and their instances, and what can be done with them.
import { useEffect, useMemo, useState } from 'preact/hooks';
import { type Product, askInstances, askInventory } from '../../api/host';
import type { Instance } from '../../api/types';
import type { TaskRequest } from '../../api/tasks';
import { feedEpoch, onFeed } from '../../live/feed';
import { ActionDialog } from '../../parts/action_dialog';
import { Empty, PageHead, ProblemBox, Search, StateMark } from '../../parts/basics';
import { InstallDialog } from '../../parts/install_dialog';
import { Link } from '../../route/link';
import { go, parameter, usePlace, withParameters } from '../../route/route';
import { mayAct, whoami } from '../../state/host';
import { useResource } from '../../state/resource';
import { useStore } from '../../state/store';
import { printable } from '../../words/printable';
import { counted } from '../../words/size';

/// What is asked before it is sent, in the words of zavctl's help.
interface Asking {
    request: TaskRequest;
    about: string;
    isGrave: boolean;
}

type Ask = (asking: Asking) => void;

const abouts: Readonly<Record<string, string>> = {
    START: 'Start an agent.',
    STOP: 'Stop an agent.',
    RESTART: 'Stop an agent and start it again.',
    UNINSTALL: 'Remove a product, with all of its instances.',
    REMOVEINSTANCE: 'Remove one instance of a product, with its configuration.',
};

const graveCommands: ReadonlySet<string> = new Set(['UNINSTALL', 'REMOVEINSTANCE']);

/// The default instance needs no target.
function askingFor(command: string, product: string, instance?: Instance): Asking {
    const isNamed = instance !== undefined && instance.instance !== '';
    const request = { command, product, ...(isNamed ? { targetmsn: instance.target } : {}) };
    return { request, about: abouts[command] ?? '', isGrave: graveCommands.has(command) };
}

interface Group {
    code: string;
    products: Product[];
    instances: Instance[];
}

/// Instances of products that the inventory does not list are shown all the same.
export function groupsOf(products: readonly Product[], instances: readonly Instance[]): Group[] {
    const groups = new Map<string, Group>();
    const groupOf = (code: string): Group => {
        const group = groups.get(code) ?? { code, products: [], instances: [] };
        groups.set(code, group);
        return group;
    };
    for (const product of products) groupOf(product.product).products.push(product);
    for (const instance of instances) groupOf(instance.product).instances.push(instance);
    const troubles = (group: Group): number => (group.instances.some((instance) => instance.state === 'missing') ? 0 : 1);
    return [...groups.values()].sort((a, b) => troubles(a) - troubles(b) || a.code.localeCompare(b.code));
}

const textOfGroup = (group: Group): string =>
    [group.code, ...group.products.flatMap((product) => [product.version, product.description, product.platform]),
        ...group.instances.flatMap((instance) => [instance.target, instance.state, instance.user ?? ''])].join(' ').toLowerCase();

function InstanceRow({ instance, ask, isMine }: { instance: Instance; ask: Ask; isMine: boolean }) {
    const { product, target } = instance;
    const runs = instance.state === 'running';
    const button = (command: string, name: string) => (
        <button type="button" aria-label={`${name} ${printable(target)}`} onClick={() => ask(askingFor(command, product, instance))}>{name}</button>
    );
    const named = instance.instance === '' ? '' : `&target=${encodeURIComponent(target)}`;
    return (
        <li class="instance">
            <StateMark state={runs ? 'ok' : instance.state} text={instance.state === 'missing' ? 'should run, does not' : instance.state} />
            <span class="grow">
                <code>{printable(target)}</code>
                <span class="faint">{instance.user && ` ${printable(instance.user)}`}{instance.pid !== null && `, process ${instance.pid}`}</span>
            </span>
            <span class="buttons">
                {isMine && !runs && button('START', 'Start')}
                {isMine && instance.state !== 'stopped' && button('STOP', 'Stop')}
                {isMine && runs && button('RESTART', 'Restart')}
                {isMine && <Link class="button" to={`/configuration?product=${encodeURIComponent(product)}${named}`} aria-label={`Configure ${printable(target)}`}>Configure</Link>}
                {isMine && instance.instance !== '' && button('REMOVEINSTANCE', 'Remove…')}
            </span>
        </li>
    );
}

function GroupCard({ group, ask, isMine, areInstancesKnown }: { group: Group; ask: Ask; isMine: boolean; areInstancesKnown: boolean }) {
    const first = group.products[0];
    const button = (command: string, name: string) => (
        <button type="button" aria-label={`${name} ${printable(group.code)}`} onClick={() => ask(askingFor(command, group.code))}>{name}</button>
    );
    return (
        <section class="panel agent">
            <header>
                <h2><code>{printable(group.code)}</code> {first ? printable(first.description) : <span class="faint">not in the inventory</span>}</h2>
                <span class="buttons">
                    {isMine && !areInstancesKnown && <>{button('START', 'Start')}{button('STOP', 'Stop')}{button('RESTART', 'Restart')}</>}
                    {isMine && first && button('UNINSTALL', 'Uninstall…')}
                </span>
            </header>
            <p class="versions">
                {group.products.map((product) => (
                    <span key={`${product.version} ${product.platform}`}>
                        version <strong>{printable(product.version)}</strong><span class="faint">, release {printable(product.release)}, {printable(product.platform)}</span>
                    </span>
                ))}
            </p>
            {group.instances.length > 0
                ? <ul class="instances">{group.instances.map((instance) => <InstanceRow key={instance.target} instance={instance} ask={ask} isMine={isMine} />)}</ul>
                : areInstancesKnown && <p class="faint">It has no instances: nothing of it runs by itself.</p>}
        </section>
    );
}

export function AgentsPage() {
    const here = usePlace();
    const who = useStore(whoami);
    const epoch = useStore(feedEpoch);
    const inventory = useResource(askInventory, []);
    const instances = useResource(askInstances, []);
    const [asking, setAsking] = useState<Asking>();
    const [isInstalling, setInstalling] = useState(false);
    useEffect(() => {
        if (epoch > 0) { inventory.reload(); instances.reload(); }
        return onFeed((items) => {
            const ended = items.flatMap((item) => (item.content.kind === 'task' ? [item.content.task.command] : []));
            if (ended.some((command) => command !== 'GETCONFIG')) instances.reload();
            if (ended.some((command) => /INSTALL/.test(command))) inventory.reload();
        });
    }, [epoch]);
    const text = parameter(here.search, 'text');
    const groups = useMemo(() => groupsOf(inventory.value?.products ?? [], instances.value ?? []), [inventory.value, instances.value]);
    const shown = groups.filter((group) => textOfGroup(group).includes(text.toLowerCase()));
    const running = (instances.value ?? []).filter((instance) => instance.state === 'running').length;
    const isMine = mayAct(who);
    const problem = inventory.problem ?? instances.problem;
    return (
        <>
            <PageHead title="Agents" about={inventory.value ? `${counted(groups.length, 'product')}, ${counted(running, 'instance')} running` : '…'}>
                <Search value={text} label="Search agents" onChange={(value) => go(withParameters(here, { text: value }), 'replace')} />
                {isMine && <button type="button" class="main" onClick={() => setInstalling(true)}>Install…</button>}
            </PageHead>
            {who && !isMine && <p class="box attention">You may look, and change nothing: {printable(who.reason)}.</p>}
            {problem && <ProblemBox problem={problem} retry={() => { inventory.reload(); instances.reload(); }} />}
            {inventory.value?.warnings.map((warning) => <p key={warning} class="box attention">What is installed could not be found out in full: {printable(warning)}</p>)}
            {inventory.value && groups.length === 0 && inventory.value.warnings.length === 0 && (
                <Empty title="No products are installed">
                    <p>First <Link to="/depot">put a product's folder into the depot</Link>, then install it from there.</p>
                    {isMine && <p><button type="button" class="main" onClick={() => setInstalling(true)}>Install…</button></p>}
                </Empty>
            )}
            {groups.length > 0 && shown.length === 0 && <Empty title="No agent is like that"><p><button type="button" onClick={() => go(here.path, 'replace')}>Show all agents</button></p></Empty>}
            {inventory.value && shown.map((group) => (
                <GroupCard key={group.code} group={group} ask={setAsking} isMine={isMine} areInstancesKnown={instances.value !== null} />
            ))}
            {asking && <ActionDialog request={asking.request} about={<p>{asking.about}</p>} isGrave={asking.isGrave} mayForce={!/INSTANCE/.test(asking.request.command)} onClose={() => setAsking(undefined)} />}
            {isInstalling && <InstallDialog onClose={() => setInstalling(false)} />}
        </>
    );
}
