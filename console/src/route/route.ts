/// Where the page is. The address holds all that a page shows by choice, so that it can be shared.
import { Store, useStore } from '../state/store';

export interface Place {
    path: string;
    /// With its question mark, as it stands in the address.
    search: string;
}

const read = (): Place => ({ path: location.pathname, search: location.search });

export const place = new Store<Place>(read());

let mayLeave: (() => boolean) | undefined;

/// Has `ask` decide from now on whether what is shown may be left for another place within the console.
/// Returns how to stop that.
export function askBeforeLeaving(ask: () => boolean): () => void {
    mayLeave = ask;
    return () => {
        if (mayLeave === ask) mayLeave = undefined;
    };
}

addEventListener('popstate', () => {
    const from = place.get();
    const to = read();
    // A link within the page comes here as well.
    if (to.path === from.path && to.search === from.search) return;
    // The browser is there already, so staying is a step of its own.
    if (mayLeave && !mayLeave()) history.pushState(null, '', from.path + from.search);
    else place.set(to);
});

/// Goes to another page, or to another view of this one without an entry of its own in the history.
/// False: what is shown was not to be left.
export function go(address: string, how: 'push' | 'replace' = 'push'): boolean {
    if (address === location.pathname + location.search) return true;
    if (mayLeave && !mayLeave()) return false;
    if (how === 'push') history.pushState(null, '', address);
    else history.replaceState(null, '', address);
    const isOtherPage = location.pathname !== place.get().path;
    place.set(read());
    if (isOtherPage) scrollTo(0, 0);
    return true;
}

/// A parameter as it stands in the address, still percent-encoded.
export function rawParameter(search: string, name: string): string {
    for (const part of search.replace(/^\?/, '').split('&')) {
        if (part.startsWith(`${name}=`)) return part.slice(name.length + 1);
    }
    return '';
}

export function parameter(search: string, name: string): string {
    return new URLSearchParams(search).get(name) ?? '';
}

/// The address of this page with some parameters changed; empty ones go.
export function withParameters(from: Place, changes: Readonly<Record<string, string>>): string {
    const query = new URLSearchParams(from.search);
    for (const [name, value] of Object.entries(changes)) {
        if (value === '') query.delete(name);
        else query.set(name, value);
    }
    const text = query.toString();
    return from.path + (text === '' ? '' : `?${text}`);
}

export const usePlace = (): Place => useStore(place);
