import type { ComponentChildren } from 'preact';
import { useEffect, useRef } from 'preact/hooks';

interface DialogProps {
    title: string;
    onClose: () => void;
    children: ComponentChildren;
    wide?: boolean;
    /// It cannot be closed while what it has asked for is not known to have been done or refused.
    isBusy?: boolean;
}

let count = 0;

/// A window over the page. The browser keeps the focus in it, closes it on Escape, and gives the
/// focus back.
export function Dialog({ title, onClose, children, wide = false, isBusy = false }: DialogProps) {
    const element = useRef<HTMLDialogElement>(null);
    const id = useRef(`dialog-${++count}`);
    useEffect(() => {
        const before = document.activeElement;
        element.current?.showModal();
        return () => {
            if (before instanceof HTMLElement && before.isConnected) before.focus();
        };
    }, []);
    // A browser lets a page refuse one Escape, and closes the window with the second one.
    const closed = () => (isBusy ? element.current?.showModal() : onClose());
    const cancelled = (event: Event) => {
        event.preventDefault();
        if (!isBusy) onClose();
    };
    return (
        <dialog ref={element} class={wide ? 'wide' : ''} aria-labelledby={id.current} onClose={closed} onCancel={cancelled}>
            <header>
                <h2 id={id.current}>{title}</h2>
                <button type="button" class="plain" aria-label="Close" disabled={isBusy} onClick={onClose}>✕</button>
            </header>
            {children}
        </dialog>
    );
}
