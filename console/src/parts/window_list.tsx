/// A long list of which only what can be seen is in the document. It scrolls with the page.
import type { ComponentChildren } from 'preact';
import { useEffect, useLayoutEffect, useMemo, useRef, useState } from 'preact/hooks';

export interface Column {
    name: string;
    /// A class that gives the cells their width and place.
    class: string;
}

interface WindowListProps<T> {
    label: string;
    columns: readonly Column[];
    rows: readonly T[];
    keyOf: (row: T) => string | number;
    /// The contents of the row's cells, one for each column.
    cells: (row: T) => readonly ComponentChildren[];
    /// Called when the end comes into sight.
    onEnd?: (() => void) | undefined;
}

/// Rows above and below the window that are there already when the page is scrolled.
const spare = 12;

interface Span {
    first: number;
    last: number;
}

interface RowProps<T> {
    row: T;
    index: number;
    top: number;
    columns: readonly Column[];
    cells: (row: T) => readonly ComponentChildren[];
}

/// What a row shows is made once: scrolling moves rows into the window and out of it, and leaves the
/// others as they are.
function ListRow<T>({ row, index, top, columns, cells }: RowProps<T>) {
    return useMemo(() => (
        <div class="list-row" role="row" aria-rowindex={index} style={{ transform: `translateY(${top}px)` }}>
            {cells(row).map((cell, j) => <span key={j} role="cell" class={columns[j]?.class}>{cell}</span>)}
        </div>
    ), [row, index, top, columns, cells]);
}

export function WindowList<T>({ label, columns, rows, keyOf, cells, onEnd }: WindowListProps<T>) {
    const body = useRef<HTMLDivElement>(null);
    const [span, setSpan] = useState<Span>({ first: 0, last: 60 });
    const [height, setHeight] = useState(0);
    const measured = useRef(36);
    const measure = () => {
        // The style sheet says how high a row is: on a phone it has two lines.
        measured.current = parseFloat(getComputedStyle(document.documentElement).getPropertyValue('--row')) || 36;
        look();
    };
    const look = () => {
        const element = body.current;
        if (!element) return;
        const rowHeight = measured.current;
        const top = element.getBoundingClientRect().top;
        const first = Math.max(Math.floor(-top / rowHeight) - spare, 0);
        const last = Math.ceil((innerHeight - top) / rowHeight) + spare;
        setHeight(rowHeight);
        setSpan((old) => (old.first === first && old.last === last ? old : { first, last }));
    };
    useLayoutEffect(measure, [rows.length]);
    useEffect(() => {
        addEventListener('scroll', look, { passive: true });
        addEventListener('resize', measure);
        return () => {
            removeEventListener('scroll', look);
            removeEventListener('resize', measure);
        };
    }, []);
    const isAtEnd = span.last >= rows.length;
    useEffect(() => {
        if (isAtEnd) onEnd?.();
    }, [isAtEnd, rows.length, onEnd]);
    const first = Math.min(span.first, Math.max(rows.length - 1, 0));
    const shown = rows.slice(first, span.last);
    return (
        <div class="list" role="table" aria-label={label} aria-rowcount={rows.length + 1}>
            <div class="list-head" role="row" aria-rowindex={1}>
                {columns.map((column) => <span key={column.name} role="columnheader" class={column.class}>{column.name}</span>)}
            </div>
            <div class="list-body" role="rowgroup" ref={body} style={{ height: `${rows.length * height}px` }}>
                {shown.map((row, i) => (
                    <ListRow key={keyOf(row)} row={row} index={first + i + 2} top={(first + i) * height} columns={columns} cells={cells} />
                ))}
            </div>
        </div>
    );
}
