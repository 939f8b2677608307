/// Texts of a host as they are shown: nothing in them is obeyed. Markup is no danger, since the page
/// only ever makes text nodes of them. What is left are characters that nobody sees or that turn the
/// direction of what stands beside them.

import { masked } from './masked';

const hidden = /[\u0000-\u0008\u000b-\u001f\u007f-\u009f\u200b-\u200f\u2028-\u202e\u2060-\u2069\ufeff]/g;
const lineEnds = /[\t\n]/g;

function escaped(character: string): string {
    const code = character.charCodeAt(0);
    return code < 0x100
        ? `\\x${code.toString(16).toUpperCase().padStart(2, '0')}`
        : `\\u${code.toString(16).toUpperCase().padStart(4, '0')}`;
}

/// Whether there is anything in it that nobody would see, or that a terminal would obey.
export const holdsHidden = (text: string): boolean => text.search(hidden) >= 0;

/// One line of text.
export function printable(text: string): string {
    return text.replace(hidden, escaped).replace(lineEnds, escaped);
}

/// Several lines of text; tabs and line feeds stay.
export function printableLines(text: string): string {
    return text.replace(/\r\n/g, '\n').replace(hidden, escaped);
}

/// One line of text without secrets.
export const redacted = (text: string): string => printable(masked(text));

/// Several lines of text without secrets.
export const redactedLines = (text: string): string => printableLines(masked(text));
