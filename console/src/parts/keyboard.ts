/// Keys that lead somewhere. They can be switched off: single letters get in the way of speech input.
import { pagesNow } from '../pages/table';
import { go } from '../route/route';
import { Store } from '../state/store';

const settingName = 'keys';

export const areKeysOn = new Store(localStorage.getItem(settingName) !== 'off');

areKeysOn.subscribe(() => localStorage.setItem(settingName, areKeysOn.get() ? 'on' : 'off'));

/// After `g` the next key must come within this time.
const patience = 1_500;

const isTyping = (target: EventTarget | null): boolean =>
    target instanceof HTMLElement && (target.isContentEditable || /^(INPUT|TEXTAREA|SELECT)$/.test(target.tagName));

function search(): void {
    const field = (): HTMLInputElement | null => document.querySelector<HTMLInputElement>('[data-search]');
    const searched = pagesNow().find((page) => page.isSearched);
    if (!field() && searched) go(searched.path);
    // The page that has it is there with the next frame.
    requestAnimationFrame(() => setTimeout(() => field()?.focus()));
}

/// Returns how to stop listening.
export function listenToKeys(showHelp: () => void): () => void {
    let goneAt = 0;
    const onKey = (event: KeyboardEvent) => {
        if (!areKeysOn.get() || event.ctrlKey || event.metaKey || event.altKey || isTyping(event.target)) return;
        if (document.querySelector('dialog[open]')) return;
        const isSecond = event.timeStamp - goneAt < patience;
        const page = isSecond ? pagesNow().find((one) => one.key === event.key) : undefined;
        goneAt = event.key === 'g' && !isSecond ? event.timeStamp : -patience;
        if (page) go(page.path);
        else if (isSecond) return;
        else if (event.key === '/') search();
        else if (event.key === '?') showHelp();
        else return;
        event.preventDefault();
    };
    goneAt = -patience;
    addEventListener('keydown', onKey);
    return () => removeEventListener('keydown', onKey);
}
