/// What the page says about actions, in the corner, until it is read.
import { Store } from './store';

export interface Notice {
    key: number;
    tone: 'info' | 'good' | 'bad' | 'attention';
    text: string;
    detail?: string | undefined;
    hint?: string | undefined;
    /// A task to look at.
    task?: string | undefined;
    /// Of a fleet: a roll-out to look at.
    rollout?: string | undefined;
}

export const notices = new Store<readonly Notice[]>([]);

const mostNotices = 5;
/// What went well leaves by itself; a failure stays until somebody has put it away.
const goodFor = 12_000;

let keys = 0;

/// Says something. With the key of an earlier notice it takes that one's place.
export function notify(notice: Omit<Notice, 'key'>, key: number = ++keys): number {
    notices.update((all) => [...all.filter((other) => other.key !== key), { ...notice, key }].slice(-mostNotices));
    if (notice.tone === 'good') setTimeout(() => dismiss(key), goodFor);
    return key;
}

export function dismiss(key: number): void {
    notices.update((all) => all.filter((notice) => notice.key !== key));
}
