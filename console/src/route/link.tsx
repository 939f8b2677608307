import type { ComponentChildren } from 'preact';
import { go } from './route';

interface LinkProps {
    to: string;
    class?: string;
    'aria-label'?: string;
    'aria-current'?: 'page' | undefined;
    children: ComponentChildren;
}

/// A link within the console. With a modifier key the browser does with it what it does with any.
export function Link({ to, children, ...rest }: LinkProps) {
    const follow = (event: MouseEvent) => {
        if (event.button !== 0 || event.metaKey || event.ctrlKey || event.shiftKey || event.altKey) return;
        event.preventDefault();
        go(to);
    };
    return (
        <a {...rest} href={to} onClick={follow}>
            {children}
        </a>
    );
}
