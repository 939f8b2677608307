/// The hosts of the fleet, or of a selector.
import { useMemo } from 'preact/hooks';
import type { FleetHost } from '../../api/fleet/types';
import { Empty, PageHead, ProblemBox, Search, StateMark, Time } from '../../parts/basics';
import { SelectorField } from '../../parts/fleet/selector_field';
import { WindowList } from '../../parts/window_list';
import { Link } from '../../route/link';
import { go, parameter, usePlace, withParameters } from '../../route/route';
import { sinceOf, useHosts } from '../../state/fleet/hosts';
import { hostAddress, hostTones, isBlocked, isRefused, isSkewed, labelsText, openOrders, troubleOf } from '../../words/fleet/hosts';
import { printable } from '../../words/printable';
import { counted } from '../../words/size';

const columns = [
    { name: 'State', class: 'c-state' },
    { name: 'Host', class: 'c-main' },
    { name: 'Away since', class: 'c-time' },
    { name: 'Open orders', class: 'c-took' },
];

/// What the list can be narrowed down to.
const kinds: Readonly<Record<string, (host: FleetHost) => boolean>> = {
    here: (host) => host.state === 'here',
    away: (host) => host.state === 'away',
    stopped: (host) => host.state === 'stopped',
    unknown: (host) => host.state === 'unknown',
    trouble: (host) => troubleOf(host) !== '',
    blocked: isBlocked,
    refused: isRefused,
    skewed: isSkewed,
};
const kindNames: readonly (readonly [string, string])[] = [
    ['', 'any'], ['here', 'here'], ['away', 'away'], ['stopped', 'stopped'], ['unknown', 'never heard'],
    ['trouble', 'with trouble'], ['blocked', 'blocked'], ['refused', 'refused'], ['skewed', 'clock is off'],
];

/// Made once for each host as it stands: it is looked at with each letter of a search.
const searched = new WeakMap<FleetHost, string>();

function searchedText(host: FleetHost): string {
    const known = searched.get(host);
    if (known !== undefined) return known;
    const text = `${host.name} ${host.host} ${host.state} ${labelsText(host.labels)} ${troubleOf(host)}`.toLowerCase();
    searched.set(host, text);
    return text;
}

const cellsOf = (host: FleetHost) => {
    const trouble = troubleOf(host);
    const labels = printable(labelsText(host.labels));
    const open = openOrders(host);
    return [
        <StateMark state={hostTones[host.state] ?? 'quiet'} text={host.state} />,
        <>
            <Link to={hostAddress(host)}>{printable(host.name)}</Link>
            {trouble !== '' && <span class="aside trouble" title={trouble}><StateMark state="warning" text={trouble} /></span>}
            {labels !== '' && <span class="aside">{labels}</span>}
        </>,
        host.state === 'here' ? '' : host.heard ? <Time value={sinceOf(host)} /> : 'never heard',
        open === 0 ? '' : open,
    ];
};

export function HostsPage() {
    const here = usePlace();
    const on = parameter(here.search, 'on');
    const text = parameter(here.search, 'text').toLowerCase();
    const kind = parameter(here.search, 'is');
    const list = useHosts(on);
    const shown = useMemo(() => {
        const isKind = Object.hasOwn(kinds, kind) ? kinds[kind] : undefined;
        return list.hosts.filter((host) => (!isKind || isKind(host)) && (text === '' || searchedText(host).includes(text)));
    }, [list.hosts, text, kind]);
    const change = (changes: Record<string, string>) => go(withParameters(here, changes), 'replace');
    return (
        <>
            <PageHead title="Hosts" about={`${counted(shown.length, 'host')}${shown.length === list.hosts.length ? '' : ` of ${list.hosts.length}`}${list.isComplete || list.problem ? '' : ' so far…'}`}>
                <Search value={parameter(here.search, 'text')} label="Search hosts" onChange={(value) => change({ text: value })} />
            </PageHead>
            <form class="filters" aria-label="Filters" onSubmit={(event) => event.preventDefault()}>
                <SelectorField value={on} onChange={(value) => change({ on: value })} />
                <label>State <select value={kind} onChange={(event) => change({ is: event.currentTarget.value })}>
                    {kindNames.map(([value, name]) => <option key={value} value={value}>{name}</option>)}
                </select></label>
                {here.search !== '' && <button type="button" class="plain" onClick={() => go(here.path, 'replace')}>Show all</button>}
            </form>
            {list.problem && <ProblemBox problem={list.problem} retry={list.reload} />}
            {shown.length === 0 && list.isComplete && (here.search !== ''
                ? <Empty title="No host is like that"><p><button type="button" onClick={() => go(here.path, 'replace')}>Show all hosts</button></p></Empty>
                : <Empty title="No host has joined yet"><p>Where the centre runs, <code>zavfleetd enrol NAME</code> prints a line that <code>zavlink enrol</code> takes on the host.</p></Empty>)}
            {shown.length > 0 && <WindowList label="Hosts" columns={columns} rows={shown} keyOf={(host) => host.host} cells={cellsOf} />}
        </>
    );
}
