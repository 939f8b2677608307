/// The zavctl line that does what a button does.
import type { TaskRequest } from '../api/tasks';
import { shellLine, withInput } from './shell';

type Prefix = readonly string[];

/// Words of which one would be taken for an option need the dashes before them.
const values = (texts: readonly string[]): string[] => (texts.some((text) => text.startsWith('-')) ? ['--', ...texts] : [...texts]);
const value = (text: string): string[] => values([text]);

const option = (name: string, text: string | undefined): string[] => {
    if (!text) return [];
    return text.startsWith('-') ? [`${name}=${text}`] : [name, text];
};
const flag = (name: string, isSet: boolean | undefined): string[] => (isSet ? [name] : []);

/// start, stop and restart. With OPTIONAL "INSTANCE" the target is the instance's own name.
function stateLine(verb: string, request: TaskRequest): string[] {
    const name = request.optional === 'INSTANCE' ? '--instance' : '--target';
    return [verb, ...option(name, request.targetmsn), ...flag('--force', request.force), ...value(request.product)];
}

function installLine(request: TaskRequest): string[] {
    const isRestart = request.optional === 'REQUIRES_RESTART';
    const how = isRestart ? ['--restart'] : option('--optional', request.optional);
    return ['install', ...how, request.product, request.version ?? '', '--', request.context ?? ''];
}

/// Of the universal agent, whose configuration is the import of a metafile.
function importLine(request: TaskRequest): string[] {
    const settings = new Map((request.context ?? '').split(',').map((part) => part.split('=') as [string, string]));
    return [
        'ua-config', ...option('--metafile', request.uaconfig), ...option('--scripts', request.uascript),
        ...option('--port', settings.get('PORT')), ...flag('--restart', settings.get('RESTART') === 'Y'),
        ...option('--target', request.targetmsn), ...flag('--force', request.force),
    ];
}

/// The line for a task; undefined if zavctl has no verb for it.
export function taskLine(prefix: Prefix, request: TaskRequest): string | undefined {
    const whole = (words: readonly string[]): string => shellLine([...prefix, ...words]);
    switch (request.command) {
        case 'START':
        case 'STOP':
        case 'RESTART':
            return whole(stateLine(request.command.toLowerCase(), request));
        case 'INSTALL':
            return whole(installLine(request));
        case 'UNINSTALL':
            return whole(['uninstall', ...flag('--force', request.force), ...value(request.product)]);
        case 'REMOVEINSTANCE':
            return whole(['remove-instance', ...option('--context', request.context), request.product, ...value(request.targetmsn ?? '')]);
        case 'SETCONFIG': {
            if (request.uaconfig) return whole(importLine(request));
            const words = ['config', 'set', ...option('--target', request.targetmsn), ...flag('--force', request.force), request.product, '-'];
            return withInput(whole(words), request.context ?? '');
        }
        default:
            return undefined;
    }
}

export const cancelLine = (prefix: Prefix, id: string): string => shellLine([...prefix, 'task', 'cancel', id]);
export const removeLine = (prefix: Prefix, path: string, recursive: boolean): string =>
    shellLine([...prefix, 'depot', 'rm', ...flag('-r', recursive), ...value(path)]);
export const sumLine = (prefix: Prefix, paths: readonly string[]): string =>
    shellLine([...prefix, 'depot', 'sum', ...values(paths)]);
export const pushLine = (prefix: Prefix, file: string, destination: string): string =>
    shellLine([...prefix, 'push', ...(file === destination ? value(file) : values([file, destination]))]);

/// "start ux", as zavctl's messages begin.
export function titleOf(request: { command: string; product: string; targetmsn?: string | undefined }): string {
    const verbs: Readonly<Record<string, string>> = { REMOVEINSTANCE: 'remove-instance', SETCONFIG: 'config set', GETCONFIG: 'config get' };
    const verb = verbs[request.command] ?? request.command.toLowerCase();
    return [verb, request.product, request.targetmsn].filter((part) => part).join(' ');
}
