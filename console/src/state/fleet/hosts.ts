/// The hosts of a fleet, or of a selector: loaded page by page, and kept up to date by the feed.
import { useEffect, useState } from 'preact/hooks';
import { askHost, hostPages } from '../../api/fleet/centre';
import type { FleetHost, HostNews } from '../../api/fleet/types';
import { type Problem, asProblem } from '../../api/problem';
import { firstContact } from '../../live/connection';
import { type FleetNews, fleetEpoch, onFleetNews } from '../../live/fleet_feed';
import { Store, replaced, useStore } from '../store';
import { noteInventory } from './inventory';

export interface HostList {
    /// By name.
    hosts: readonly FleetHost[];
    /// False: more are on their way.
    isComplete: boolean;
    problem?: Problem;
}

/// Labels, reasons and clocks are not told by the feed, only that they have changed. What has come
/// within this time is asked for together.
const askChangedAfter = 3_000;
/// More changed hosts than these are not asked for one by one.
const mostSingleQuestions = 20;

/// Told by the feed only: when it came into its state.
type SeenHost = FleetHost & { since?: string };

export const sinceOf = (host: FleetHost): string | undefined => (host as SeenHost).since ?? host.heard;

/// What hosts have told about themselves is a lot, and is kept elsewhere.
function withoutFacts({ facts: _facts, ...host }: FleetHost): FleetHost {
    return host;
}

export function changedHost(host: FleetHost, news: HostNews): FleetHost {
    const { name, state, since, blocked } = news;
    return { ...host, name, state, since, blocked, ...(state === 'here' ? { heard: since } : {}) } as SeenHost;
}

/// Whether more has changed than is told: labels, facts, or why a host is stopped.
const isAskedFor = (known: FleetHost | undefined, news: HostNews): boolean =>
    !known || known.state === news.state || news.state === 'stopped';

const byName = (a: FleetHost, b: FleetHost): number => (a.name < b.name ? -1 : a.name > b.name ? 1 : 0);

export class LiveHosts {
    readonly list = new Store<HostList>({ hosts: [], isComplete: false });
    private places = new Map<string, number>();
    private loading = new AbortController();
    /// What was told while the list was on its way, which may be older.
    private missed: Map<string, HostNews> | undefined;
    private readonly changed = new Set<string>();
    private asking: ReturnType<typeof setTimeout> | undefined;
    private readonly stops: (() => void)[];

    constructor(private readonly selector: string) {
        this.stops = [onFleetNews((news) => this.take(news)), fleetEpoch.subscribe(() => void this.load())];
        void this.load();
    }

    close(): void {
        this.loading.abort();
        clearTimeout(this.asking);
        for (const stop of this.stops) stop();
    }

    /// What is known is shown until all of it has come anew.
    readonly load = async (): Promise<void> => {
        this.loading.abort();
        const { signal } = (this.loading = new AbortController());
        const isFirst = !this.list.get().isComplete;
        const hosts: FleetHost[] = [];
        await firstContact();
        if (signal.aborted) return;
        this.missed = new Map();
        try {
            for await (const page of hostPages(this.selector, signal)) {
                if (signal.aborted) return;
                hosts.push(...page.map(withoutFacts));
                if (isFirst) this.show([...hosts], false);
            }
            if (!signal.aborted) this.finish(hosts);
        } catch (error) {
            if (!signal.aborted) this.list.update((list) => ({ ...list, problem: asProblem(error) }));
        }
    };

    private show(hosts: FleetHost[], isComplete: boolean): void {
        hosts.sort(byName);
        this.places = new Map(hosts.map((host, place) => [host.host, place]));
        this.list.set({ hosts, isComplete });
    }

    private finish(hosts: FleetHost[]): void {
        const missed = this.missed;
        this.missed = undefined;
        const isKnown = performance.getEntriesByName('fleet-hosts-known').length > 0;
        if (this.selector === '' && !isKnown) performance.mark('fleet-hosts-known');
        this.show(hosts, true);
        if (missed) this.apply(missed);
    }

    private take(news: FleetNews): void {
        for (const one of news.hosts.values()) this.missed?.set(one.host, one);
        if (this.list.get().isComplete) this.apply(news.hosts);
    }

    private apply(news: ReadonlyMap<string, HostNews>): void {
        if (news.size === 0) return;
        const next = [...this.list.get().hosts];
        let hasRetired = false;
        for (const one of news.values()) {
            const place = this.places.get(one.host);
            const known = place === undefined ? undefined : next[place];
            if (known && place !== undefined) next[place] = changedHost(known, one);
            if (one.state === 'retired') hasRetired = true;
            else if (isAskedFor(known, one)) this.changed.add(one.host);
        }
        if (hasRetired) this.show(next.filter((host) => String(host.state) !== 'retired'), true);
        else this.list.update((list) => ({ ...list, hosts: next }));
        if (this.changed.size > 0) this.asking ??= setTimeout(() => void this.askChanged(), askChangedAfter);
    }

    /// A selector may mean a host no more once its labels have changed, so its list is made anew.
    private async askChanged(): Promise<void> {
        const keys = [...this.changed];
        this.changed.clear();
        this.asking = undefined;
        const isNew = keys.some((key) => !this.places.has(key));
        if (this.selector !== '' || isNew || keys.length > mostSingleQuestions) return this.load();
        const { signal } = this.loading;
        for (const key of keys) {
            const host = await askHost(key, signal).catch(() => undefined);
            if (signal.aborted || !host) continue;
            noteInventory(host);
            const place = this.places.get(key);
            if (place !== undefined) this.list.update((list) => ({ ...list, hosts: replaced(list.hosts, place, withoutFacts(host)) }));
        }
    }
}

let all: LiveHosts | undefined;

/// All hosts. They are loaded once, and kept while the page is open.
export const allHosts = (): LiveHosts => (all ??= new LiveHosts(''));

export const useAllHosts = (): HostList => useStore(allHosts().list);

const none = new Store<HostList>({ hosts: [], isComplete: false });

/// The hosts of a selector, as long as somebody looks; an empty one means all.
export function useHosts(selector: string): HostList & { reload: () => void } {
    const [own, setOwn] = useState<{ selector: string; hosts: LiveHosts }>();
    useEffect(() => {
        if (selector === '') return undefined;
        const hosts = new LiveHosts(selector);
        setOwn({ selector, hosts });
        return () => hosts.close();
    }, [selector]);
    const shown = selector === '' ? allHosts() : own?.selector === selector ? own.hosts : undefined;
    const list = useStore(shown?.list ?? none);
    return { ...list, reload: () => void shown?.load() };
}
