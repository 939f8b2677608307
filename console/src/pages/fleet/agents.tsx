/// Products and their versions on the hosts of the fleet, and what can be done with them on many.
import { useCallback, useMemo, useState } from 'preact/hooks';
import { Empty, PageHead, Panel, ProblemBox, StateMark } from '../../parts/basics';
import { type FleetAction, actionOn, productActions } from '../../parts/fleet/actions';
import { FleetInstallDialog } from '../../parts/fleet/fleet_install_dialog';
import { FleetPushDialog } from '../../parts/fleet/fleet_push_dialog';
import { InstanceTargets } from '../../parts/fleet/instance_targets';
import { RolloutDialog } from '../../parts/fleet/rollout_dialog';
import { SelectorField } from '../../parts/fleet/selector_field';
import { Spread } from '../../parts/fleet/spread';
import { WindowList } from '../../parts/window_list';
import { Link } from '../../route/link';
import { go, parameter, usePlace, withParameters } from '../../route/route';
import { mayOrder, operator } from '../../state/fleet/centre';
import { type InventoryList, useInventories } from '../../state/fleet/inventory';
import { session, useOnlyLooks } from '../../state/session';
import { useStore } from '../../state/store';
import { hostAddress } from '../../words/fleet/hosts';
import { type HostInventory, spreadOf } from '../../words/fleet/inventory';
import { printable } from '../../words/printable';
import { counted } from '../../words/size';
import { spanText } from '../../words/time';

const columns = [
    { name: 'Host', class: 'c-main' },
    { name: 'Version', class: 'c-time' },
    { name: 'Instances', class: 'c-state' },
    { name: 'Told', class: 'c-took' },
];

/// More hosts are not named in one request; a selector means them.
const mostNamed = 10_000;

const instanceText = (host: HostInventory, product: string) => {
    const own = host.instances.filter((one) => one.product === product);
    const missing = own.filter((one) => one.state === 'missing').length;
    const running = own.filter((one) => one.state === 'running').length;
    return <StateMark state={missing > 0 ? 'missing' : running > 0 ? 'ok' : 'quiet'} text={missing > 0 ? `${missing} should run` : `${running} run`} />;
};

/// The hosts that have it; an empty version means any.
interface HostsWithProps {
    list: InventoryList;
    product: string;
    version: string;
    /// Something is to be done on all of them.
    ask: (action: FleetAction, hosts: readonly string[]) => void;
}

function HostsWith({ list, product, version, ask }: HostsWithProps) {
    const who = useStore(operator);
    const rows = useMemo(
        () => list.hosts.filter((host) => host.products.some((one) => one.product === product && (version === '' || one.version === version))),
        [list.hosts, product, version]);
    const cells = useMemo(() => (host: HostInventory) => [
        <Link to={hostAddress(host)}>{printable(host.name)}</Link>,
        printable(host.products.filter((one) => one.product === product).map((one) => one.version).join(', ')),
        instanceText(host, product),
        host.age === undefined ? '' : `${spanText(host.age)} ago`,
    ], [product]);
    const title = `Hosts with ${printable(product)}${version === '' ? '' : ` ${printable(version)}`}`;
    return (
        <Panel title={`${title}: ${rows.length}${list.isComplete ? '' : ' so far'}`} aside={list.isComplete && rows.length > 0 && rows.length <= mostNamed && (
            <span class="buttons">
                {productActions.filter((row) => mayOrder(who, row.kind)).map((row) => (
                    <button type="button" key={row.verb} class="small" aria-label={`${row.name} ${printable(product)} on these hosts`} onClick={() => ask(actionOn(row, product), rows.map((host) => host.name))}>{row.name}</button>
                ))}
            </span>
        )}>
            {rows.length === 0 && list.isComplete ? <Empty title="No host has it" />
                : <WindowList label={title} columns={columns} rows={rows} keyOf={(host) => host.host} cells={cells} />}
        </Panel>
    );
}

export function FleetAgentsPage() {
    const here = usePlace();
    const on = parameter(here.search, 'on');
    const product = parameter(here.search, 'product');
    const version = parameter(here.search, 'version');
    const who = useStore(operator);
    const list = useInventories(on);
    const spread = useMemo(() => spreadOf(list.hosts), [list.hosts]);
    const [asked, setAsked] = useState<{ action: FleetAction; hosts?: readonly string[] }>();
    const [isInstalling, setInstalling] = useState(false);
    const [isPushing, setPushing] = useState(false);
    const onlyLooks = useOnlyLooks();
    const takesFiles = useStore(session)?.push === true || onlyLooks;
    const mayPush = takesFiles && mayOrder(who, 'PUSH');
    const silent = useMemo(() => list.hosts.filter((host) => host.age === undefined).length, [list.hosts]);
    const allowed = productActions.filter((row) => mayOrder(who, row.kind));
    const mayConfigure = mayOrder(who, 'SETCONFIG') || mayOrder(who, 'GETCONFIG');
    const askOn = useCallback((action: FleetAction, hosts: readonly string[]) => setAsked({ action, hosts }), []);
    const change = (changes: Record<string, string>) => go(withParameters(here, changes));
    const isViewer = who !== undefined && allowed.length === 0 && !mayOrder(who, 'INSTALL');
    return (
        <>
            <PageHead title="Agents" about={`${counted(spread.length, 'product')} on ${counted(list.hosts.length, 'host')}${list.isComplete || list.problem ? '' : ' so far…'}`}>
                {list.isComplete && <button type="button" onClick={list.reload}>Read again</button>}
                {mayPush && <button type="button" onClick={() => setPushing(true)}>Push…</button>}
                {mayOrder(who, 'INSTALL') && <button type="button" class="main" onClick={() => setInstalling(true)}>Install…</button>}
            </PageHead>
            <form class="filters" aria-label="Filters" onSubmit={(event) => event.preventDefault()}>
                <SelectorField value={on} onChange={(value) => change({ on: value })} />
                {here.search !== '' && <button type="button" class="plain" onClick={() => go(here.path)}>Show all</button>}
            </form>
            {isViewer && <p class="box attention">You may look, and change nothing: your certificate allows no order.</p>}
            {list.problem && <ProblemBox problem={list.problem} retry={list.reload} />}
            {silent > 0 && list.isComplete && <p class="box">{counted(silent, 'host')} never told what is installed.</p>}
            {list.isComplete && spread.length === 0 && (
                <Empty title="No products are installed">
                    <p>Bring one into the depots of the hosts with <code>zavctl push</code> and <code>--on</code>, then install it.</p>
                    {mayOrder(who, 'INSTALL') && <p><button type="button" class="main" onClick={() => setInstalling(true)}>Install…</button></p>}
                </Empty>
            )}
            {spread.length > 0 && (
                <Panel title="Products by version">
                    <Spread spread={spread} on={on} {...(allowed.length > 0 || mayConfigure ? { buttons: ({ product: code }) => (
                        <>
                            {allowed.map((row) => <button type="button" key={row.verb} class="small" aria-label={`${row.name} ${printable(code)}`} onClick={() => setAsked({ action: actionOn(row, code) })}>{row.name}</button>)}
                            {mayConfigure && <Link class="button small" to={`/configuration?product=${encodeURIComponent(code)}&on=${encodeURIComponent(on || '*')}`} aria-label={`Configure ${printable(code)}`}>Configure</Link>}
                        </>
                    ) } : {})} />
                </Panel>
            )}
            {product !== '' && <HostsWith list={list} product={product} version={version} ask={askOn} />}
            {product !== '' && <InstanceTargets list={list} product={product} ask={askOn} />}
            {asked && (
                <RolloutDialog request={asked.action.request} about={<p>{asked.action.about}</p>} on={on} hosts={asked.hosts}
                    isGrave={asked.action.isGrave} mayForce={asked.action.mayForce} onClose={() => setAsked(undefined)} />
            )}
            {isPushing && <FleetPushDialog on={on} onClose={() => setPushing(false)} />}
            {isInstalling && <FleetInstallDialog on={on} products={spread.map((row) => row.product)} onClose={() => setInstalling(false)} />}
        </>
    );
}
