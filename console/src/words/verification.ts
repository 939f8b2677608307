/// Whether a success is one: what zavctl looks at when a task has ended well.
import type { Inventory } from '../api/host';
import type { TaskRequest } from '../api/tasks';
import type { Instance } from '../api/types';
import { printable } from './printable';

/// Both missing: the success is one.
export interface Finding {
    doubt?: string;
    note?: string;
}

const isNumeric = (version: string): boolean => /^[0-9.]*$/.test(version);

/// The version as the inventory writes it: two digits before the point, nine in all, so that "6.3"
/// and "06.30" are "063000000".
function listedForm(version: string): string {
    const point = version.indexOf('.');
    const first = point < 0 ? version.length : point;
    return ('0'.repeat(Math.max(2 - first, 0)) + version).replaceAll('.', '').padEnd(9, '0');
}

export function isSameVersion(asked: string, listed: string): boolean {
    if (!isNumeric(asked)) return true;
    return asked === listed || (asked !== '' && listedForm(asked) === listed);
}

const unknownInventory: Finding = { note: 'not verified: the inventory could not be taken' };

export function doubtAboutInstall(request: TaskRequest, inventory: Inventory): Finding {
    if (inventory.warnings.length > 0) return unknownInventory;
    const asked = request.version ?? '';
    const listed = inventory.products.filter((row) => row.product === request.product).map((row) => row.version);
    if (!listed.some((version) => isSameVersion(asked, version))) {
        const others = listed.length === 0 ? '' : `, which lists ${printable(listed.join(', '))}`;
        return { doubt: `the host reported success, but ${request.product} ${asked} is not in the inventory${others}` };
    }
    return isNumeric(asked) ? {} : { note: `not verified: no inventory lists a version such as ${asked}` };
}

export function doubtAboutUninstall(request: TaskRequest, inventory: Inventory): Finding {
    if (inventory.warnings.length > 0) return unknownInventory;
    const isThere = inventory.products.some((row) => row.product === request.product);
    return isThere ? { doubt: `the host reported success, but ${request.product} is still in the inventory` } : {};
}

function isMeant(request: TaskRequest, instance: Instance): boolean {
    const target = request.targetmsn ?? '';
    if (instance.product !== request.product) return false;
    if (target === '') return instance.instance === '';
    if (request.optional === 'INSTANCE') return instance.instance === target;
    return instance.target.toLowerCase() === target.toLowerCase();
}

export function doubtAboutState(request: TaskRequest, instances: readonly Instance[] | null): Finding {
    if (instances === null) return { note: `not verified: the home has no way to ask whether ${request.product} runs` };
    const instance = instances.find((one) => isMeant(request, one));
    if (!instance) {
        if (request.command === 'STOP') return {}; // a stopped instance may be gone
        const called = request.targetmsn ? ` called ${request.targetmsn}` : '';
        return { note: `not verified: the home lists no instance of ${request.product}${called}` };
    }
    const runs = instance.state === 'running';
    if (runs !== (request.command === 'STOP')) return {};
    return { doubt: `the host reported success, but ${printable(instance.target)}${runs ? ' still runs' : ' does not run'}` };
}
