/// The named instances of a product on the hosts of a fleet, and what can be done with each.
import { useMemo } from 'preact/hooks';
import { mayOrder, operator } from '../../state/fleet/centre';
import { useStore } from '../../state/store';
import type { InventoryList } from '../../state/fleet/inventory';
import { type InstanceTarget, targetsOf } from '../../words/fleet/inventory';
import { printable } from '../../words/printable';
import { counted } from '../../words/size';
import { Panel, StateMark } from '../basics';
import { WindowList } from '../window_list';
import { type FleetAction, actionOn, productActions } from './actions';

const columns = [
    { name: 'Instance', class: 'c-by' },
    { name: 'Managed system', class: 'c-main' },
    { name: 'State', class: 'c-state' },
    { name: 'Actions', class: 'c-wide-actions' },
];

interface InstanceTargetsProps {
    list: InventoryList;
    product: string;
    /// Something is to be done where there is such an instance.
    ask: (action: FleetAction, hosts: readonly string[]) => void;
}

function stateOf({ hosts, running, missing }: InstanceTarget) {
    const of = hosts.length === 1 ? '' : ` of ${hosts.length}`;
    if (missing > 0) return <StateMark state="missing" text={`${missing}${of} should run`} />;
    return <StateMark state={running > 0 ? 'ok' : 'quiet'} text={hosts.length === 1 ? (running > 0 ? 'runs' : 'stopped') : `${running}${of} run`} />;
}

export function InstanceTargets({ list, product, ask }: InstanceTargetsProps) {
    const who = useStore(operator);
    const rows = useMemo(() => targetsOf(list.hosts, product), [list.hosts, product]);
    const cells = useMemo(() => (row: InstanceTarget) => [
        printable(row.instance),
        <><code>{printable(row.target)}</code> <span class="faint">{row.hosts.length === 1 ? printable(row.hosts[0] ?? '') : counted(row.hosts.length, 'host')}</span></>,
        stateOf(row),
        <span class="buttons">
            {productActions.filter((action) => !action.isGrave && mayOrder(who, action.kind)).map((action) => (
                <button type="button" key={action.verb} class="small" aria-label={`${action.name} ${printable(row.target)}`} onClick={() => ask(actionOn(action, product, row.target), row.hosts)}>{action.name}</button>
            ))}
        </span>,
    ], [product, who, ask]);
    if (rows.length === 0) return null;
    const title = `Instances of ${printable(product)}`;
    return (
        <Panel title={`${title}: ${rows.length}${list.isComplete ? '' : ' so far'}`} name="instance-targets">
            <WindowList label={title} columns={columns} rows={rows} keyOf={(row) => `${row.instance}\n${row.target}`} cells={cells} />
        </Panel>
    );
}
