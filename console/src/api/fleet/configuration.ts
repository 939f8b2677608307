/// An agent's configuration on many hosts. The hosts themselves are asked, and only zavctl can read
/// their answers.
import { Problem } from '../problem';
import { type FleetRequest, run } from './run';

export interface SameOnes {
    hosts: readonly string[];
    text: string;
}

export interface Configurations {
    /// Hosts with the same text stand together, the largest group first.
    groups: readonly SameOnes[];
    /// Of the others, why theirs is not known.
    failed: readonly { host: string; error: string }[];
}

type Entry = Readonly<Record<string, unknown>>;

const listIn = (document: unknown, name: string): Entry[] => {
    const list = document !== null && typeof document === 'object' ? (document as Entry)[name] : undefined;
    return Array.isArray(list) ? list.filter((one): one is Entry => one !== null && typeof one === 'object') : [];
};

const textsOf = (value: unknown): string[] => (Array.isArray(value) ? value.filter((one): one is string => typeof one === 'string') : []);

/// Whose configuration is meant: of the hosts of a selector, or of one host that is named.
export interface ConfigurationChoice {
    product: string;
    /// Empty: the default instance.
    target: string;
    on: string;
    host: string;
}

/// The hosts as a request has them.
export const hostsOf = ({ on, host }: ConfigurationChoice): { on: string; hosts: readonly string[] | undefined } =>
    (host === '' ? { on, hosts: undefined } : { on: '', hosts: [host] });

export function configGet(choice: ConfigurationChoice): FleetRequest {
    const { on, hosts } = hostsOf(choice);
    return { verb: 'config get', arguments: [choice.product], options: { on, target: choice.target, diff: true }, hosts };
}

/// Throws a Problem.
export async function askConfigurations(request: FleetRequest, signal: AbortSignal): Promise<Configurations> {
    const { output } = await run(request, signal);
    if (output === null || typeof output !== 'object' || !('groups' in output)) throw new Problem('the answer has no configurations', 200);
    return {
        groups: listIn(output, 'groups').map((group) => ({ hosts: textsOf(group['hosts']), text: String(group['configuration'] ?? '') })),
        failed: listIn(output, 'failed').map((one) => ({ host: String(one['host'] ?? ''), error: String(one['error'] ?? '') })),
    };
}
