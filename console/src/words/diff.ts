/// The difference between two texts, line by line.

export interface DiffLine {
    kind: 'same' | 'removed' | 'added';
    text: string;
    /// Its number in the old and in the new text, from 1.
    before?: number;
    after?: number;
}

/// More changed lines than this are shown as one block that goes and one that comes: the exact way
/// would keep the browser busy, and nobody reads it.
const mostChanges = 600;

/// The lines of a text. A last line feed ends its line and begins no further one.
export function linesOf(text: string): string[] {
    if (text === '') return [];
    return text.replace(/\n$/, '').split('\n');
}

type Pair = readonly [number, number];

/// Pairs of equal lines in their order, as many as there can be (Myers); undefined if the texts have
/// more than `mostChanges` differences.
function matches(a: readonly string[], b: readonly string[]): Pair[] | undefined {
    const most = Math.min(a.length + b.length, mostChanges);
    let reach = new Map<number, number>([[1, 0]]);
    const history: Map<number, number>[] = [];
    for (let depth = 0; depth <= most; ++depth) {
        history.push(new Map(reach));
        const next = new Map(reach);
        for (let k = -depth; k <= depth; k += 2) {
            const down = k === -depth || (k !== depth && (reach.get(k - 1) ?? -1) < (reach.get(k + 1) ?? -1));
            let x = down ? (reach.get(k + 1) ?? 0) : (reach.get(k - 1) ?? 0) + 1;
            while (x < a.length && x - k < b.length && a[x] === b[x - k]) ++x;
            next.set(k, x);
            if (x >= a.length && x - k >= b.length) return wayBack(history, a.length, b.length);
        }
        reach = next;
    }
    return undefined;
}

function wayBack(history: readonly Map<number, number>[], rows: number, columns: number): Pair[] {
    const pairs: Pair[] = [];
    let x = rows;
    let y = columns;
    for (let depth = history.length - 1; depth >= 0 && (x > 0 || y > 0); --depth) {
        const reach = history[depth] as Map<number, number>;
        const k = x - y;
        const down = k === -depth || (k !== depth && (reach.get(k - 1) ?? -1) < (reach.get(k + 1) ?? -1));
        const fromK = down ? k + 1 : k - 1;
        const fromX = depth === 0 ? 0 : (reach.get(fromK) ?? 0);
        const fromY = depth === 0 ? 0 : fromX - fromK;
        while (x > Math.max(fromX, 0) && y > Math.max(fromY, 0)) pairs.push([--x, --y]);
        x = fromX;
        y = fromY;
    }
    return pairs.reverse();
}

/// Each line of both texts once, in an order in which the one becomes the other.
export function diffLines(before: string, after: string): DiffLine[] {
    const a = linesOf(before);
    const b = linesOf(after);
    let head = 0;
    while (head < a.length && head < b.length && a[head] === b[head]) ++head;
    let tail = 0;
    while (tail < a.length - head && tail < b.length - head && a[a.length - 1 - tail] === b[b.length - 1 - tail]) ++tail;
    const inner = matches(a.slice(head, a.length - tail), b.slice(head, b.length - tail)) ?? [];
    const pairs: Pair[] = [];
    for (let i = 0; i < head; ++i) pairs.push([i, i]);
    for (const [x, y] of inner) pairs.push([x + head, y + head]);
    for (let i = tail; i > 0; --i) pairs.push([a.length - i, b.length - i]);
    return linesBetween(a, b, pairs);
}

function linesBetween(a: readonly string[], b: readonly string[], pairs: readonly Pair[]): DiffLine[] {
    const lines: DiffLine[] = [];
    let x = 0;
    let y = 0;
    for (const [nextX, nextY] of [...pairs, [a.length, b.length] as Pair]) {
        for (; x < nextX; ++x) lines.push({ kind: 'removed', text: a[x] as string, before: x + 1 });
        for (; y < nextY; ++y) lines.push({ kind: 'added', text: b[y] as string, after: y + 1 });
        if (x < a.length && y < b.length) lines.push({ kind: 'same', text: a[x] as string, before: ++x, after: ++y });
    }
    return lines;
}

export function isChange(lines: readonly DiffLine[]): boolean {
    return lines.some((line) => line.kind !== 'same');
}

/// The changed lines with some unchanged ones around them; a number stands for as many lines left out.
export function folded(lines: readonly DiffLine[], around = 3): (DiffLine | number)[] {
    const isNear = lines.map(() => false);
    lines.forEach((line, i) => {
        if (line.kind === 'same') return;
        for (let j = Math.max(i - around, 0); j <= Math.min(i + around, lines.length - 1); ++j) isNear[j] = true;
    });
    const result: (DiffLine | number)[] = [];
    lines.forEach((line, i) => {
        const last = result[result.length - 1];
        if (isNear[i]) result.push(line);
        else if (typeof last === 'number') result[result.length - 1] = last + 1;
        else result.push(1);
    });
    return result;
}
