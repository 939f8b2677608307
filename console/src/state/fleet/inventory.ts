/// What is installed on the hosts of a fleet, as they have told. Ten thousand inventories come in a
/// hundred pages, so they are loaded once somebody looks, and shown as they come.
import { useEffect, useState } from 'preact/hooks';
import { inventoryPages } from '../../api/fleet/centre';
import type { FleetHost } from '../../api/fleet/types';
import { type Problem, asProblem } from '../../api/problem';
import { type HostInventory, inventoryOf } from '../../words/fleet/inventory';
import { Store, replaced, useStore } from '../store';

export interface InventoryList {
    hosts: readonly HostInventory[];
    isComplete: boolean;
    problem?: Problem;
}

/// Pages that come faster are shown together.
const showEvery = 250;

export class Inventories {
    readonly list = new Store<InventoryList>({ hosts: [], isComplete: false });
    private loading = new AbortController();

    constructor(private readonly selector: string) {
        void this.load();
    }

    close(): void {
        this.loading.abort();
    }

    /// What is known is shown until all of it has come anew.
    readonly load = async (): Promise<void> => {
        this.loading.abort();
        const { signal } = (this.loading = new AbortController());
        const isFirst = !this.list.get().isComplete;
        const hosts: HostInventory[] = [];
        let shown = 0;
        try {
            for await (const page of inventoryPages(this.selector, signal)) {
                if (signal.aborted) return;
                hosts.push(...page.map(inventoryOf));
                if (!isFirst || performance.now() - shown < showEvery) continue;
                this.list.set({ hosts: [...hosts], isComplete: false });
                shown = performance.now();
            }
            if (!signal.aborted) this.list.set({ hosts, isComplete: true });
        } catch (error) {
            if (!signal.aborted) this.list.update((list) => ({ ...list, problem: asProblem(error) }));
        }
    };

    /// What one host has told anew.
    note(host: FleetHost): void {
        const place = this.list.get().hosts.findIndex((one) => one.host === host.host);
        if (place >= 0) this.list.update((list) => ({ ...list, hosts: replaced(list.hosts, place, inventoryOf(host)) }));
    }
}

let all: Inventories | undefined;

export const noteInventory = (host: FleetHost): void => all?.note(host);

const none = new Store<InventoryList>({ hosts: [], isComplete: false });

/// The inventories of a selector's hosts; an empty one means all, which are kept while the page is open.
/// Without a selector nothing is asked for yet.
export function useInventories(selector: string | undefined): InventoryList & { reload: () => void } {
    const [own, setOwn] = useState<{ selector: string; inventories: Inventories }>();
    useEffect(() => {
        if (selector === undefined) return undefined;
        const inventories = selector === '' ? (all ??= new Inventories('')) : new Inventories(selector);
        setOwn({ selector, inventories });
        return () => {
            if (inventories !== all) inventories.close();
        };
    }, [selector]);
    const shown = own && own.selector === selector ? own.inventories : undefined;
    const list = useStore(shown?.list ?? none);
    return { ...list, reload: () => void shown?.load() };
}
