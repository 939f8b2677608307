/// A task of one host of a fleet.
import { fleetLine } from './lines';

/// `host` is the host's key, `id` the host's identifier of the task or that of the order.
export const hostTaskAddress = (host: string, id: string): string => `/hosts/${encodeURIComponent(host)}/tasks/${encodeURIComponent(id)}`;

export const outputLine = (prefix: readonly string[], name: string, id: string): string =>
    fleetLine(prefix, { verb: 'task output -f', arguments: [id], options: { on: name } });
