import { useEffect, useRef, useState } from 'preact/hooks';
import type { Problem } from '../api/problem';
import { followOutput } from '../live/output';
import { type Piece, appended } from '../words/output';
import { redactedLines } from '../words/printable';
import { counted } from '../words/size';
import { ProblemBox } from './basics';

/// More than this is not kept in the page; its beginning goes first.
const mostCharacters = 256 * 1024;

/// What a running task's commands write, as they write it.
export function OutputView({ task }: { task: string }) {
    const [pieces, setPieces] = useState<readonly Piece[]>([]);
    const [lost, setLost] = useState(0);
    const [problem, setProblem] = useState<Problem>();
    const view = useRef<HTMLPreElement>(null);
    const isAtEnd = useRef(true);
    useEffect(() => {
        setPieces([]);
        setLost(0);
        return followOutput(task, {
            onPiece: (piece) => setPieces((old) => appended(old, piece, mostCharacters)),
            onLost: (bytes) => setLost((old) => old + bytes),
            onEnd: () => undefined,
            onRefusal: setProblem,
        });
    }, [task]);
    useEffect(() => {
        const element = view.current;
        if (element && isAtEnd.current) element.scrollTop = element.scrollHeight;
    }, [pieces]);
    const note = (element: HTMLElement) => {
        isAtEnd.current = element.scrollTop + element.clientHeight >= element.scrollHeight - 8;
    };
    if (problem) return <ProblemBox problem={problem} />;
    return (
        <>
            {lost > 0 && <p class="box attention">{counted(lost, 'byte')} of the output were lost: they came too fast.</p>}
            <pre class="output" ref={view} tabIndex={0} role="region" aria-label="Output" onScroll={(event) => note(event.currentTarget)}>
                {pieces.length === 0 ? <span class="faint">Nothing has been written yet.</span>
                    : pieces.map((piece, i) => <span key={i} class={piece.stream}>{redactedLines(piece.text)}</span>)}
            </pre>
        </>
    );
}
