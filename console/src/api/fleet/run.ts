/// Has the operator's own zavctl do something. It signs what hosts get: the browser holds no key.
import { ask } from '../client';
import { type DepotPath, putFile } from '../depot';
import { Problem } from '../problem';

export type OptionValue = string | boolean;

export interface FleetRequest {
    verb: string;
    arguments: readonly string[];
    /// Arguments that stand behind "--" on the command line.
    trailing?: readonly string[];
    /// Without the dashes before their names. Empty and false ones are not sent.
    options: Readonly<Record<string, OptionValue | undefined>>;
    /// The names of the hosts that are meant, in the place of the option "on".
    hosts?: readonly string[] | undefined;
    /// What the verb reads from its standard input.
    input?: string;
}

interface RunAnswer {
    exit: number;
    command: string;
    output: unknown;
    messages: string;
}

export interface RunResult {
    output: unknown;
    /// What it had to say besides; not empty where something did not go well.
    messages: string;
    isWhole: boolean;
}

const member = (document: unknown, name: string): unknown =>
    document !== null && typeof document === 'object' ? (document as Record<string, unknown>)[name] : undefined;

const textIn = (document: unknown, name: string): string => {
    const value = member(document, name);
    return typeof value === 'string' ? value : '';
};

/// zavctl's messages without its name before each of them.
const plain = (messages: string): string => messages.replace(/^zavctl(-fleet)?: /gm, '').trim();

export const givenOptions = (options: FleetRequest['options']): Record<string, OptionValue> =>
    Object.fromEntries(Object.entries(options).filter((entry): entry is [string, OptionValue] => entry[1] !== undefined && entry[1] !== '' && entry[1] !== false));

function resultOf(answer: RunAnswer): RunResult {
    const messages = plain(String(answer.messages ?? ''));
    const refusal = textIn(answer.output, 'error');
    const isNothing = answer.output === null || answer.output === undefined;
    if (refusal !== '' || (answer.exit !== 0 && isNothing)) {
        const text = refusal || messages || `zavctl ended with the status ${answer.exit}`;
        throw new Problem(text, 200, textIn(answer.output, 'guard'), textIn(answer.output, 'hint'));
    }
    return { output: answer.output, messages, isWhole: answer.exit === 0 };
}

/// What the verb has answered. Throws a Problem, with its words, if it has done nothing.
export async function run(request: FleetRequest, signal?: AbortSignal): Promise<RunResult> {
    const { verb, input, hosts } = request;
    const body = {
        verb, arguments: [...request.arguments, ...(request.trailing ?? [])], options: givenOptions(request.options),
        ...(hosts === undefined ? {} : { hosts }), ...(input === undefined ? {} : { input }),
    };
    return resultOf(await ask<RunAnswer>('/console/run', { body, ...(signal ? { signal } : {}) }));
}

/// Has a file brought to the depots of a selector's hosts. Throws a Problem, as run() does.
export async function pushToMany(path: DepotPath, on: string, file: Blob, onProgress: (sent: number) => void, signal: AbortSignal): Promise<RunResult> {
    return resultOf(await putFile<RunAnswer>(`/console/depot?path=${path}&on=${encodeURIComponent(on)}`, file, onProgress, signal));
}

/// The identifier of the roll-out that a verb has begun; undefined if its answer has none.
export function rolloutIn(output: unknown): string | undefined {
    const rollout = member(output, 'rollout');
    const id = typeof rollout === 'string' ? rollout : textIn(rollout, 'id') || textIn(output, 'id');
    return id === '' ? undefined : id;
}

export interface Preview {
    hosts: { name: string; state: string }[];
    /// What each of them would get.
    kind: string;
    product: string;
    /// For how long the orders are good.
    seconds: number;
}

/// What a verb would do; nothing is sent to any host. Throws a Problem.
export async function preview(request: FleetRequest, signal: AbortSignal): Promise<Preview> {
    const { output } = await run({ ...request, options: { ...request.options, 'dry-run': true } }, signal);
    const hosts = member(output, 'hosts');
    if (!Array.isArray(hosts)) throw new Problem('the answer has no list of hosts', 200);
    const order = member(output, 'order');
    return {
        hosts: hosts.map((host) => ({ name: textIn(host, 'name') || textIn(host, 'host'), state: textIn(host, 'state') })),
        kind: textIn(order, 'kind'), product: textIn(member(order, 'body'), 'product'), seconds: Number(member(order, 'seconds') ?? 0),
    };
}
