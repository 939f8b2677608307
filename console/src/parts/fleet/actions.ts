/// What can be done with agents on many hosts, in the words of zavctl's help.
import type { FleetRequest } from '../../api/fleet/run';

export interface FleetAction {
    request: FleetRequest;
    about: string;
    isGrave: boolean;
    mayForce: boolean;
}

interface Row {
    verb: string;
    /// What a certificate calls it.
    kind: string;
    /// What the button says.
    name: string;
    about: string;
    isGrave: boolean;
}

export const productActions: readonly Row[] = [
    { verb: 'start', kind: 'START', name: 'Start', about: 'Start an agent.', isGrave: false },
    { verb: 'stop', kind: 'STOP', name: 'Stop', about: 'Stop an agent.', isGrave: false },
    { verb: 'restart', kind: 'RESTART', name: 'Restart', about: 'Stop an agent and start it again.', isGrave: false },
    { verb: 'uninstall', kind: 'UNINSTALL', name: 'Uninstall…', about: 'Remove a product, with all of its instances.', isGrave: true },
];

/// `target` names an instance; empty: the default one.
export function actionOn(row: Row, product: string, target = ''): FleetAction {
    return { request: { verb: row.verb, arguments: [product], options: { target } }, about: row.about, isGrave: row.isGrave, mayForce: target === '' };
}

export const removeInstance = (product: string, target: string): FleetAction => ({
    request: { verb: 'remove-instance', arguments: [product, target], options: {} },
    about: 'Remove one instance of a product, with its configuration.', isGrave: true, mayForce: false,
});
