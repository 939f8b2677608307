/// Everything that the centre knows about one host, and what the host itself says when it is asked.
import { useEffect, useRef, useState } from 'preact/hooks';
import { askHost, askOrders } from '../../api/fleet/centre';
import type { FleetHost, FleetOrder } from '../../api/fleet/types';
import { fleetEpoch, onFleetNews } from '../../live/fleet_feed';
import { Empty, PageHead, Panel, ProblemBox, StateMark, Time } from '../../parts/basics';
import { type FleetAction, actionOn, productActions, removeInstance } from '../../parts/fleet/actions';
import { HostTasks } from '../../parts/fleet/host_tasks';
import { LabelsDialog } from '../../parts/fleet/labels_dialog';
import { RolloutDialog } from '../../parts/fleet/rollout_dialog';
import { Link } from '../../route/link';
import { isAdmin, mayOrder, operator } from '../../state/fleet/centre';
import { useResource } from '../../state/resource';
import { useStore } from '../../state/store';
import { hostTones, labelsText, troubleOf } from '../../words/fleet/hosts';
import { type HostInventory, type InstalledInstance, inventoryOf } from '../../words/fleet/inventory';
import { hostTaskAddress } from '../../words/fleet/tasks';
import { printable, redacted } from '../../words/printable';
import { spanText } from '../../words/time';

type Ask = (action: FleetAction) => void;

/// What happens together is one question.
const askAfterNews = 500;

function useHost(id: string) {
    const host = useResource((signal) => askHost(id, signal), [id]);
    const orders = useResource((signal) => askOrders(id, signal), [id]);
    const epoch = useStore(fleetEpoch);
    const key = host.value?.host;
    const asking = useRef<ReturnType<typeof setTimeout> | undefined>(undefined);
    useEffect(() => {
        const reload = () => { asking.current = undefined; host.reload(); orders.reload(); };
        if (epoch > 0) reload();
        const stop = onFleetNews((news) => {
            const isMeant = key !== undefined && (news.hosts.has(key) || [...news.orders.values()].some((order) => order.host === key));
            if (isMeant) asking.current ??= setTimeout(reload, askAfterNews);
        });
        return () => { stop(); clearTimeout(asking.current); asking.current = undefined; };
    }, [key, epoch]);
    return { host, orders };
}

function Facts({ host }: { host: FleetHost }) {
    const facts: readonly (readonly [string, string])[] = [
        ['Key', host.host], ['Labels', labelsText(host.labels) || 'none'], ['Orders', `${host.taken ?? 0} of ${host.last ?? 0} taken`],
        ['Host', host.facts?.version ?? ''], ['Link', host.facts?.link ?? ''], ['Journal', host.journal ?? ''], ['Signing key', host.signing ?? ''],
    ];
    return (
        <dl class="facts">
            {host.state !== 'here' && <div><dt>Heard</dt><dd>{host.heard ? <Time value={host.heard} /> : 'never'}</dd></div>}
            {facts.map(([name, value]) => value !== '' && <div key={name} class={value.length > 20 ? 'wide-fact' : ''}><dt>{name}</dt><dd><code>{printable(value)}</code></dd></div>)}
        </dl>
    );
}

function InstanceRow({ instance, ask }: { instance: InstalledInstance; ask: Ask }) {
    const who = useStore(operator);
    const runs = instance.state === 'running';
    const target = instance.instance === '' ? '' : instance.target;
    const fitting = productActions.filter((row) => !row.isGrave && mayOrder(who, row.kind) && (row.verb === 'start' ? !runs : row.verb === 'restart' ? runs : instance.state !== 'stopped'));
    return (
        <li class="instance">
            <StateMark state={runs ? 'ok' : instance.state} text={instance.state === 'missing' ? 'should run, does not' : instance.state} />
            <span class="grow"><code>{printable(instance.target)}</code> <span class="faint">{printable(instance.user)}</span></span>
            <span class="buttons">
                {fitting.map((row) => (
                    <button type="button" key={row.verb} aria-label={`${row.name} ${printable(instance.target)}`} onClick={() => ask(actionOn(row, instance.product, target))}>{row.name}</button>
                ))}
                {target !== '' && mayOrder(who, 'REMOVEINSTANCE') && (
                    <button type="button" aria-label={`Remove… ${printable(target)}`} onClick={() => ask(removeInstance(instance.product, target))}>Remove…</button>
                )}
            </span>
        </li>
    );
}

function ProductBlock({ code, inventory, ask }: { code: string; inventory: HostInventory; ask: Ask }) {
    const who = useStore(operator);
    const uninstall = productActions.find((row) => row.verb === 'uninstall');
    const versions = inventory.products.filter((row) => row.product === code);
    const instances = inventory.instances.filter((row) => row.product === code);
    return (
        <div class="product">
            <p class="product-head">
                <span class="grow"><code>{printable(code)}</code>{' '}
                    {versions.map((row) => (
                        <span key={`${row.version} ${row.platform}`}>version <strong>{printable(row.version)}</strong> <span class="faint">{printable(`${row.platform} ${row.description}`)}</span> </span>
                    ))}
                </span>
                {uninstall && mayOrder(who, uninstall.kind) && versions.length > 0 && (
                    <button type="button" aria-label={`${uninstall.name} ${printable(code)}`} onClick={() => ask(actionOn(uninstall, code))}>{uninstall.name}</button>
                )}
            </p>
            {instances.length > 0 && <ul class="instances">{instances.map((row) => <InstanceRow key={row.target} instance={row} ask={ask} />)}</ul>}
        </div>
    );
}

function Agents({ host, ask }: { host: FleetHost; ask: Ask }) {
    const inventory = inventoryOf(host);
    const { age, products, instances, warnings } = inventory;
    const codes = [...new Set([...products, ...instances].map((row) => row.product))];
    return (
        <Panel title="Agents" aside={age !== undefined && <span class="faint">told {spanText(age)} ago</span>}>
            {warnings.map((warning) => <p key={warning} class="box attention">What is installed could not be found out in full: {printable(warning)}</p>)}
            {age === undefined && <Empty title="It has never told what is installed"><p>A host tells it within the hour while it and its link are there.</p></Empty>}
            {age !== undefined && codes.length === 0 && <Empty title="No products are installed" />}
            {codes.map((code) => <ProductBlock key={code} code={code} inventory={inventory} ask={ask} />)}
        </Panel>
    );
}

function OrderLine({ order }: { order: FleetOrder }) {
    const product = typeof order.product === 'string' ? order.product : '';
    const text = printable(`${order.kind ?? 'order'} ${product}`.trim());
    const hasPage = order.order !== undefined && mayOrder(useStore(operator), 'OUTPUT');
    return (
        <li class="line">
            <StateMark state={order.state === 'open' ? 'running' : order.state} text={order.state} />
            <span class="grow">
                {hasPage ? <Link to={hostTaskAddress(order.host, order.order)}>{text}</Link> : text} <span class="faint">number {order.number}{order.operator && `, by ${printable(order.operator)}`}</span>
                {order.reason && <span class="line-detail">{redacted(order.reason)}</span>}
            </span>
            <span class="when"><Time value={order.issued} brief /></span>
        </li>
    );
}

export function FleetHostPage({ id }: { id: string }) {
    const { host, orders } = useHost(id);
    const who = useStore(operator);
    const [action, setAction] = useState<FleetAction>();
    const [isLabelling, setLabelling] = useState(false);
    const known = host.value;
    if (!known) {
        return <><PageHead title="Host" about={printable(id)} />{host.problem ? <ProblemBox problem={host.problem} retry={host.reload} /> : <p class="faint">…</p>}</>;
    }
    const trouble = troubleOf(known);
    return (
        <>
            <PageHead title={printable(known.name)} about={<StateMark state={hostTones[known.state] ?? 'quiet'} text={known.state} />}>
                <Link class="button" to={`/configuration?host=${encodeURIComponent(known.name)}`} aria-label={`Configuration of ${printable(known.name)}`}>Configuration</Link>
                {isAdmin(who) && <button type="button" onClick={() => setLabelling(true)}>Labels…</button>}
            </PageHead>
            {host.problem && <ProblemBox problem={host.problem} retry={host.reload} />}
            {trouble !== '' && <p class="box bad">{trouble}</p>}
            <Facts host={known} />
            <div class="columns">
                <Agents host={known} ask={setAction} />
                <div>
                    <Panel title="Latest orders">
                        {orders.problem && <ProblemBox problem={orders.problem} retry={orders.reload} />}
                        {orders.value?.length === 0 && <Empty title="It has got no order yet" />}
                        <ul class="lines">{orders.value?.map((order) => <OrderLine key={order.number} order={order} />)}</ul>
                    </Panel>
                    {mayOrder(who, 'TASKS') && <HostTasks host={known} />}
                </div>
            </div>
            {action && (
                <RolloutDialog request={action.request} about={<p>{action.about}</p>} hosts={[known.name]} isGrave={action.isGrave} mayForce={action.mayForce} onClose={() => setAction(undefined)} />
            )}
            {isLabelling && <LabelsDialog host={known} onClose={() => setLabelling(false)} onDone={host.reload} />}
        </>
    );
}
