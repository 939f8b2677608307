/// What a host has told of what is installed on it. It may have written anything: only what has the
/// form of an inventory is taken.
import type { FleetHost } from '../../api/fleet/types';

export interface InstalledProduct {
    product: string;
    version: string;
    release: string;
    platform: string;
    description: string;
}

export interface InstalledInstance {
    product: string;
    instance: string;
    target: string;
    state: string;
    user: string;
}

export interface HostInventory {
    host: string;
    name: string;
    /// Undefined: it has never told what is installed.
    age?: number;
    products: readonly InstalledProduct[];
    instances: readonly InstalledInstance[];
    warnings: readonly string[];
}

/// No host has so many.
const mostEntries = 1000;

type Entry = Readonly<Record<string, unknown>>;

const isEntry = (value: unknown): value is Entry => value !== null && typeof value === 'object' && !Array.isArray(value);

const entriesOf = (inventory: Entry, name: string): Entry[] => {
    const list = inventory[name];
    return Array.isArray(list) ? list.slice(0, mostEntries).filter(isEntry) : [];
};

const textOf = (entry: Entry, name: string): string => {
    const value = entry[name];
    return typeof value === 'string' || typeof value === 'number' ? String(value) : '';
};

function warningsOf(inventory: Entry): string[] {
    const list = inventory['warnings'];
    const warnings = (Array.isArray(list) ? list : []).filter((one): one is string => typeof one === 'string');
    const leftOut = Number(inventory['leftOut'] ?? 0);
    return leftOut > 0 ? [...warnings, `the inventory is too long to be told; ${leftOut} entries are left out`] : warnings;
}

export function inventoryOf(host: FleetHost): HostInventory {
    const own = { host: host.host, name: host.name };
    const inventory: unknown = host.facts?.inventory;
    if (!isEntry(inventory)) return { ...own, products: [], instances: [], warnings: [] };
    return {
        ...own,
        age: Number(inventory['age'] ?? 0) || 0,
        products: entriesOf(inventory, 'products').map((row) => ({
            product: textOf(row, 'PRODUCT'), version: textOf(row, 'VERSION'), release: textOf(row, 'RELEASE'),
            platform: textOf(row, 'PLATFORM'), description: textOf(row, 'PRODDESC'),
        })),
        instances: entriesOf(inventory, 'instances').map((row) => ({
            product: textOf(row, 'product'), instance: textOf(row, 'instance'), target: textOf(row, 'target'),
            state: textOf(row, 'state'), user: textOf(row, 'user'),
        })),
        warnings: warningsOf(inventory),
    };
}

/// How many hosts have a version of a product, the most frequent version first.
export interface VersionSpread {
    product: string;
    description: string;
    hosts: number;
    versions: readonly (readonly [string, number])[];
    running: number;
    /// Instances that should run and do not.
    missing: number;
}

class Counts {
    private readonly counts = new Map<string, number>();
    add(key: string): void {
        this.counts.set(key, (this.counts.get(key) ?? 0) + 1);
    }
    sorted(): (readonly [string, number])[] {
        return [...this.counts].sort((a, b) => b[1] - a[1] || b[0].localeCompare(a[0]));
    }
}

interface Tally {
    description: string;
    hosts: number;
    versions: Counts;
    running: number;
    missing: number;
}

/// By the product's code.
export function spreadOf(inventories: readonly HostInventory[]): VersionSpread[] {
    const tallies = new Map<string, Tally>();
    const tallyOf = (product: string): Tally => {
        const tally = tallies.get(product) ?? { description: '', hosts: 0, versions: new Counts(), running: 0, missing: 0 };
        tallies.set(product, tally);
        return tally;
    };
    for (const { products, instances } of inventories) {
        const seen = new Set<string>();
        for (const { product, version, description } of products) {
            const tally = tallyOf(product);
            if (!seen.has(product)) ++tally.hosts;
            if (!seen.has(`${product}\n${version}`)) tally.versions.add(version);
            seen.add(product).add(`${product}\n${version}`);
            tally.description ||= description;
        }
        for (const { product, state } of instances) {
            if (state === 'running') ++tallyOf(product).running;
            if (state === 'missing') ++tallyOf(product).missing;
        }
    }
    return [...tallies].map(([product, { versions, ...rest }]) => ({ product, ...rest, versions: versions.sorted() }))
        .sort((a, b) => a.product.localeCompare(b.product));
}

/// A named instance of a product, by the name of its managed system, and the hosts that have it.
export interface InstanceTarget {
    target: string;
    instance: string;
    hosts: readonly string[];
    running: number;
    /// On so many hosts it should run and does not.
    missing: number;
}

/// The named instances of a product; the default one goes without a name. By instance, then by target.
export function targetsOf(inventories: readonly HostInventory[], product: string): InstanceTarget[] {
    const found = new Map<string, InstanceTarget & { hosts: string[] }>();
    for (const { name, instances } of inventories) {
        for (const one of instances) {
            if (one.product !== product || one.instance === '' || one.target === '') continue;
            const key = `${one.instance}\n${one.target}`;
            const row = found.get(key) ?? { target: one.target, instance: one.instance, hosts: [], running: 0, missing: 0 };
            found.set(key, row);
            row.hosts.push(name);
            if (one.state === 'running') ++row.running;
            if (one.state === 'missing') ++row.missing;
        }
    }
    const order = (a: string, b: string): number => (a < b ? -1 : a > b ? 1 : 0);
    return [...found.values()].sort((a, b) => order(a.instance, b.instance) || order(a.target, b.target));
}
