/// Hosts of a fleet in the words of zavctl.
import type { FleetHost } from '../../api/fleet/types';
import { redacted } from '../printable';
import { spanText } from '../time';

/// A clock that differs by less does no harm.
const noteworthySkew = 60;

export const isSkewed = (host: FleetHost): boolean => Math.abs(host.skew ?? 0) >= noteworthySkew;

/// Two machines claim to be this host, or another machine does.
export const isStopped = (host: FleetHost): boolean => (host.stopped ?? '') !== '';
export const isRefused = (host: FleetHost): boolean => (host.unpublished ?? '') !== '';
export const isBlocked = (host: FleetHost): boolean => (host.blocked ?? '') !== '';
export const isAway = (host: FleetHost): boolean => host.state === 'away';

/// What is wrong with it; empty if nothing is.
export function troubleOf(host: FleetHost): string {
    const reasons = [['stopped', host.stopped], ['blocked', host.blocked], ['unpublished', host.unpublished]] as const;
    const texts = reasons.filter(([, reason]) => reason).map(([name, reason]) => `${name}: ${redacted(String(reason))}`);
    const skew = host.skew ?? 0;
    if (isSkewed(host)) texts.push(`its clock is ${spanText(Math.abs(skew))} ${skew > 0 ? 'ahead' : 'behind'}`);
    return texts.join('; ');
}

/// "env=test, site=a".
export const labelsText = (labels: Readonly<Record<string, string>> | undefined): string =>
    Object.entries(labels ?? {}).map(([name, value]) => `${name}=${value}`).join(', ');

export const openOrders = (host: FleetHost): number => Math.max((host.last ?? 0) - (host.taken ?? 0), 0);

export const hostAddress = (host: { host: string }): string => `/hosts/${encodeURIComponent(host.host)}`;

/// How a host's state is marked.
export const hostTones: Readonly<Record<string, string>> = { here: 'ok', away: 'warning', stopped: 'error', unknown: 'quiet' };
