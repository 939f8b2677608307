import type { ComponentChildren } from 'preact';
import { useEffect, useRef } from 'preact/hooks';

interface DialogProps {
    title: string;
    onClose: () => void;
    children: ComponentChildren;
    wide?: boolean;
}

let count = 0;

/// A window over the page. The browser keeps the focus in it, closes it on Escape, and gives the
/// focus back.
export function Dialog({ title, onClose, children, wide = false }: DialogProps) {
    const element = useRef<HTMLDialogElement>(null);
    const id = useRef(`dialog-${++count}`);
    useEffect(() => {
        const before = document.activeElement;
        element.current?.showModal();
        return () => {
            if (before instanceof HTMLElement && before.isConnected) before.focus();
        };
    }, []);
    return (
        <dialog ref={element} class={wide ? 'wide' : ''} aria-labelledby={id.current} onClose={onClose}
            onCancel={(event) => { event.preventDefault(); onClose(); }}>
            <header>
                <h2 id={id.current}>{title}</h2>
                <button type="button" class="plain" aria-label="Close" onClick={onClose}>✕</button>
            </header>
            {children}
        </dialog>
    );
}
