/// What the host keeps of a request, and what of it can be sent once more.

/// Longer values are kept in part (host/outcomes/shown_request.cpp).
const mostKept = 4096;
/// A cut may leave a part of a character, which does not come through as text.
const longestCharacter = 4;
/// What stands in the place of a secret that is not kept.
const mask = '***';

const bytesOf = (text: string): number => new TextEncoder().encode(text).length;

/// Whether the end of a value may be missing. One that has exactly that length may be whole; nobody knows.
export const isCut = (kept: string): boolean => bytesOf(kept) > mostKept - longestCharacter;

export const isMasked = (kept: string): boolean => kept.includes(mask);

/// Whether a value must be given anew before the same can be asked for.
export const isInPart = (kept: string): boolean => isCut(kept) || isMasked(kept);

/// Why `given` does not do in the place of what was kept in part; empty: it does.
export function whatIsMissing(name: string, kept: string, given: string): string {
    if (given.trim() === '') return `Give the ${name}.`;
    if (isMasked(given)) return `Replace ${mask} in the ${name} by what stood there.`;
    if (isCut(kept) && given === kept) return `The ${name} is cut: give the whole of it.`;
    return '';
}
