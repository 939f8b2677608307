/// The state of the fleet on one page; what needs somebody's attention comes first.
import { useEffect, useMemo } from 'preact/hooks';
import type { FleetHost, Rollout } from '../../api/fleet/types';
import { Empty, PageHead, Panel, ProblemBox, StateMark, Time } from '../../parts/basics';
import { RolloutLine } from '../../parts/fleet/rollout_line';
import { Spread } from '../../parts/fleet/spread';
import { Link } from '../../route/link';
import { type HostList, allHosts, sinceOf, useAllHosts } from '../../state/fleet/hosts';
import { useInventories } from '../../state/fleet/inventory';
import { loadRollouts, rollouts } from '../../state/fleet/rollouts';
import { useStore } from '../../state/store';
import { hostAddress, hostTones, isAway, isBlocked, isRefused, isSkewed, isStopped, troubleOf } from '../../words/fleet/hosts';
import { spreadOf } from '../../words/fleet/inventory';
import { printable } from '../../words/printable';
import { counted } from '../../words/size';

const mostNamed = 3;
const mostRollouts = 6;

interface Concern {
    state: string;
    title: string;
    isMeant: (host: FleetHost) => boolean;
    /// What the page of hosts filters by.
    filter: string;
}

/// The most urgent first.
const concerns: readonly Concern[] = [
    { state: 'error', title: 'stopped', isMeant: isStopped, filter: 'is=stopped' },
    { state: 'error', title: 'refused', isMeant: isRefused, filter: 'is=refused' },
    { state: 'error', title: 'blocked', isMeant: isBlocked, filter: 'is=blocked' },
    { state: 'warning', title: 'away', isMeant: isAway, filter: 'is=away' },
    { state: 'warning', title: 'clock is off', isMeant: isSkewed, filter: 'is=skewed' },
];

/// What has failed for longer is not news.
const newsFor = 24 * 3_600_000;

const needsSomebody = (rollout: Rollout): boolean =>
    rollout.state === 'paused' || (rollout.failures > 0 && rollout.state !== 'aborted' && Date.now() - Date.parse(rollout.since) < newsFor);

function ConcernLine({ concern, hosts }: { concern: Concern; hosts: readonly FleetHost[] }) {
    return (
        <li class="line">
            <StateMark state={concern.state} text={concern.title} />
            <span class="grow">
                <Link to={`/hosts?${concern.filter}`}>{counted(hosts.length, 'host')}</Link>
                {hosts.slice(0, mostNamed).map((host) => (
                    <span class="line-detail" key={host.host}>
                        <Link to={hostAddress(host)}>{printable(host.name)}</Link>
                        {concern.filter === 'is=away' ? <>, since <Time value={sinceOf(host)} brief /></> : `: ${troubleOf(host)}`}
                    </span>
                ))}
                {hosts.length > mostNamed && <span class="line-detail">and {hosts.length - mostNamed} more</span>}
            </span>
        </li>
    );
}

function Attention({ list, all }: { list: HostList; all: readonly Rollout[] | undefined }) {
    const groups = useMemo(() => concerns.map((concern) => ({ concern, hosts: list.hosts.filter(concern.isMeant) })).filter(({ hosts }) => hosts.length > 0), [list.hosts]);
    const concerning = (all ?? []).filter(needsSomebody);
    if (!list.isComplete && groups.length + concerning.length === 0) return <p class="faint">…</p>;
    if (groups.length + concerning.length === 0) {
        return <Empty title="Nothing needs attention"><p>Roll-outs that fail, and hosts that are away, blocked or refused, come up here.</p></Empty>;
    }
    return (
        <ul class="lines">
            {concerning.slice(0, mostRollouts).map((rollout) => <RolloutLine key={rollout.id} rollout={rollout} />)}
            {groups.map(({ concern, hosts }) => <ConcernLine key={concern.title} concern={concern} hosts={hosts} />)}
        </ul>
    );
}

function Facts({ list }: { list: HostList }) {
    const counts = useMemo(() => {
        const byState = new Map<string, number>();
        for (const { state } of list.hosts) byState.set(state, (byState.get(state) ?? 0) + 1);
        return [...byState].sort((a, b) => b[1] - a[1]);
    }, [list.hosts]);
    return (
        <dl class="facts">
            <div><dt>Hosts</dt><dd><Link to="/hosts">{list.hosts.length}</Link>{!list.isComplete && ' so far'}</dd></div>
            {counts.map(([state, count]) => (
                <div key={state}><dt><StateMark state={hostTones[state] ?? 'quiet'} text={state} /></dt><dd><Link to={`/hosts?is=${encodeURIComponent(state)}`}>{count}</Link></dd></div>
            ))}
        </dl>
    );
}

function Versions({ isReady }: { isReady: boolean }) {
    const inventories = useInventories(isReady ? '' : undefined);
    const spread = useMemo(() => spreadOf(inventories.hosts), [inventories.hosts]);
    return (
        <Panel title="Versions" aside={<Link to="/agents">Agents</Link>}>
            {inventories.problem && <ProblemBox problem={inventories.problem} retry={inventories.reload} />}
            {inventories.isComplete && spread.length === 0
                ? <Empty title="No host has told of a product yet"><p>A host tells what is installed within the hour while it and its link are there.</p></Empty>
                : <Spread spread={spread} />}
            {!inventories.isComplete && <p class="faint">{counted(inventories.hosts.length, 'host')} so far…</p>}
        </Panel>
    );
}

/// Measured from the moment when the last host has come until all of them are on the screen.
function useFirstView(isComplete: boolean): void {
    useEffect(() => {
        if (!isComplete || performance.getEntriesByName('fleet-first-view').length > 0) return;
        requestAnimationFrame(() => {
            if (performance.getEntriesByName('fleet-hosts-known').length > 0) performance.measure('fleet-first-view', 'fleet-hosts-known');
        });
    }, [isComplete]);
}

export function FleetOverviewPage() {
    const list = useAllHosts();
    const { value, problem } = useStore(rollouts);
    useFirstView(list.isComplete);
    const running = (value ?? []).filter((rollout) => rollout.state === 'running');
    const latest = running.length > 0 ? running : (value ?? []).slice(0, mostRollouts);
    return (
        <>
            <PageHead title="Overview" about="How the fleet is, and what needs somebody" />
            {list.problem && <ProblemBox problem={list.problem} retry={() => void allHosts().load()} />}
            {problem && <ProblemBox problem={problem} retry={() => void loadRollouts()} />}
            {list.isComplete && list.hosts.length === 0
                ? <Empty title="No host has joined yet"><p>Where the centre runs, <code>zavfleetd enrol NAME</code> prints a line that <code>zavlink enrol</code> takes on the host.</p></Empty>
                : <Facts list={list} />}
            <div class="columns">
                <Panel title="Needs attention" name="attention"><Attention list={list} all={value} /></Panel>
                <div>
                    <Panel title={running.length > 0 ? 'Roll-outs at work' : 'Latest roll-outs'} aside={<Link to="/rollouts">All roll-outs</Link>}>
                        {value?.length === 0 && <Empty title="There is no roll-out yet"><p>Start an agent on many hosts on <Link to="/agents">Agents</Link>.</p></Empty>}
                        <ul class="lines">{latest.slice(0, mostRollouts).map((rollout) => <RolloutLine key={rollout.id} rollout={rollout} />)}</ul>
                    </Panel>
                    <Versions isReady={list.isComplete} />
                </div>
            </div>
        </>
    );
}
