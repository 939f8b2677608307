/// What the host says of itself and of what is installed on it.
import { ask } from './client';
import { Problem } from './problem';
import type { Check, Health, Instance, QueryAnswer, Ready, Session, Whoami } from './types';

export const askSession = (): Promise<Session> => ask('/console/session');
export const askHealth = (signal?: AbortSignal): Promise<Health> => ask('/v1/health', signal ? { signal } : {});
export const askWhoami = (): Promise<Whoami> => ask('/v1/whoami');
export const askChecks = (signal?: AbortSignal): Promise<Check[]> => ask('/v1/doctor', signal ? { signal } : {});

/// Not being ready is an answer, too.
export async function askReady(signal?: AbortSignal): Promise<Ready> {
    const answer = await fetch('/v1/ready', signal ? { signal } : {});
    const document = (await answer.json()) as Partial<Ready> & { error?: string };
    if (Array.isArray(document.reasons)) return { ready: document.ready === true, reasons: document.reasons };
    throw new Problem(document.error ?? `the answer has the status ${answer.status}`, answer.status);
}

/// A product that the inventory lists. All texts are the host's.
export interface Product {
    product: string;
    version: string;
    release: string;
    platform: string;
    description: string;
}

export interface Inventory {
    products: Product[];
    /// Why products may be missing.
    warnings: string[];
}

export async function askInventory(signal?: AbortSignal): Promise<Inventory> {
    const answer = await ask<QueryAnswer>('/v1/query', { body: { table: 'KINAGT' }, ...(signal ? { signal } : {}) });
    const text = (value: unknown): string => (value === undefined ? '' : String(value));
    return {
        products: answer.rows.map((row) => ({
            product: text(row['PRODUCT']),
            version: text(row['VERSION']),
            release: text(row['RELEASE']),
            platform: text(row['PLATFORM']),
            description: text(row['PRODDESC']),
        })),
        warnings: (answer.warnings ?? []).map((warning) => warning.text),
    };
}

/// Null: the home has no way to tell which instances run.
export async function askInstances(signal?: AbortSignal): Promise<Instance[] | null> {
    try {
        return (await ask<{ instances: Instance[] }>('/v1/instances', signal ? { signal } : {})).instances;
    } catch (error) {
        if (error instanceof Problem && error.status === 404) return null;
        throw error;
    }
}
