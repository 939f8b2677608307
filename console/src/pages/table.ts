/// The pages in the order in which they are offered, of a host and of a fleet. A new page is a file, its
/// row here, and its row in views.tsx.
import { isFleet, session } from '../state/session';
import { useStore } from '../state/store';

export interface PageEntry {
    path: string;
    name: string;
    /// The key that leads there after `g`.
    key: string;
    /// Where the key `/` leads from a page that has nothing to search.
    isSearched?: boolean;
}

const hostPages: readonly PageEntry[] = [
    { path: '/', name: 'Overview', key: 'o' },
    { path: '/agents', name: 'Agents', key: 'a' },
    { path: '/tasks', name: 'Tasks', key: 't', isSearched: true },
    { path: '/configuration', name: 'Configuration', key: 'c' },
    { path: '/depot', name: 'Depot', key: 'd' },
    { path: '/events', name: 'Events', key: 'e' },
    { path: '/doctor', name: 'Doctor', key: 'h' },
];

const fleetPages: readonly PageEntry[] = [
    { path: '/', name: 'Overview', key: 'o' },
    { path: '/hosts', name: 'Hosts', key: 'h', isSearched: true },
    { path: '/agents', name: 'Agents', key: 'a' },
    { path: '/rollouts', name: 'Roll-outs', key: 'r' },
    { path: '/configuration', name: 'Configuration', key: 'c' },
];

/// None before it is known what the console is for.
export function pagesNow(): readonly PageEntry[] {
    const known = session.get();
    if (!known) return [];
    return isFleet(known) ? fleetPages : hostPages;
}

/// As pagesNow(); the component is drawn again when that changes.
export function usePages(): readonly PageEntry[] {
    useStore(session);
    return pagesNow();
}
