/// The pages in the order in which they are offered. A new page is a file, its row here, and its row
/// in views.tsx.
export interface PageEntry {
    path: string;
    name: string;
    /// The key that leads there after `g`.
    key: string;
}

export const pages: readonly PageEntry[] = [
    { path: '/', name: 'Overview', key: 'o' },
    { path: '/agents', name: 'Agents', key: 'a' },
    { path: '/tasks', name: 'Tasks', key: 't' },
    { path: '/configuration', name: 'Configuration', key: 'c' },
    { path: '/depot', name: 'Depot', key: 'd' },
    { path: '/events', name: 'Events', key: 'e' },
    { path: '/doctor', name: 'Doctor', key: 'h' },
];
