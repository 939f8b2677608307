/// The end of a long output, in pieces of the two streams that it comes from.

export interface Piece {
    stream: string;
    text: string;
    /// Its beginning is gone in the middle of a line, of which the rest has yet to come.
    isInLine?: boolean;
}

/// What is left of a text whose first `gone` characters go. The line that is cut goes as a whole: a
/// secret is known by the name before it, which may be what is gone.
function shortened(piece: Piece, gone: number): Piece {
    if (piece.text[gone - 1] === '\n') return { stream: piece.stream, text: piece.text.slice(gone) };
    const end = piece.text.indexOf('\n', gone);
    if (end < 0) return { stream: piece.stream, text: '', isInLine: true };
    return { stream: piece.stream, text: piece.text.slice(end + 1) };
}

function joined(last: Piece, text: string): Piece {
    if (!last.isInLine) return { ...last, text: last.text + text };
    const end = text.indexOf('\n');
    return end < 0 ? last : { stream: last.stream, text: text.slice(end + 1) };
}

/// The pieces with one more, of which at most `most` characters are kept; the beginning goes first.
export function appended(pieces: readonly Piece[], piece: Piece, most: number): Piece[] {
    const last = pieces.at(-1);
    const all = last?.stream === piece.stream ? [...pieces.slice(0, -1), joined(last, piece.text)] : [...pieces, { ...piece }];
    let extra = all.reduce((total, one) => total + one.text.length, 0) - most;
    for (let first = all[0]; extra > 0 && first; first = all[0]) {
        const isWhole = extra >= first.text.length && all.length > 1;
        if (isWhole) all.shift();
        else all[0] = shortened(first, Math.min(extra, first.text.length));
        extra = isWhole ? extra - first.text.length : 0;
    }
    return all;
}
