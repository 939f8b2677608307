import { useEffect, useRef, useState } from 'preact/hooks';
import type { Problem } from '../api/problem';
import { followOutput } from '../live/output';
import { type Piece, appended } from '../words/output';
import { printable, redacted, redactedLines } from '../words/printable';
import { counted } from '../words/size';
import { ProblemBox } from './basics';

/// More than this is not kept in the page; its beginning goes first.
const mostCharacters = 256 * 1024;

export type OutputState = 'live' | 'broken off' | 'over' | 'refused';

interface Props {
    /// Of the stream; see followOutput().
    address: string;
    onState?: (state: OutputState) => void;
}

/// What a running task's commands write, as they write it.
export function OutputView({ address, onState }: Props) {
    const [pieces, setPieces] = useState<readonly Piece[]>([]);
    const [lost, setLost] = useState(0);
    const [hasGap, setGap] = useState(false);
    const [isOver, setOver] = useState(false);
    const [broken, setBroken] = useState<Problem>();
    const [problem, setProblem] = useState<Problem>();
    const [turn, setTurn] = useState(0);
    const told = useRef(onState);
    told.current = onState;
    const view = useRef<HTMLPreElement>(null);
    const isAtEnd = useRef(true);
    useEffect(() => {
        setPieces([]);
        setLost(0);
        setGap(false);
        setOver(false);
        setBroken(undefined);
        setProblem(undefined);
        told.current?.('live');
        return followOutput(address, {
            onPiece: (piece) => setPieces((old) => appended(old, piece, mostCharacters)),
            onLost: (bytes) => setLost((old) => old + bytes),
            onGap: () => setGap(true),
            onEnd: () => { setOver(true); told.current?.('over'); },
            onBreak: (now) => { setBroken(now); told.current?.(now ? 'broken off' : 'live'); },
            onRefusal: (refusal) => { setProblem(refusal); told.current?.('refused'); },
        });
    }, [address, turn]);
    useEffect(() => {
        const element = view.current;
        if (element && isAtEnd.current) element.scrollTop = element.scrollHeight;
    }, [pieces]);
    const note = (element: HTMLElement) => {
        isAtEnd.current = element.scrollTop + element.clientHeight >= element.scrollHeight - 8;
    };
    if (problem) return <ProblemBox problem={problem} retry={() => setTurn((count) => count + 1)} />;
    return (
        <>
            {broken && <p class="box attention" role="status">{redacted(broken.message)}. It is asked for again. {printable(broken.hint)}</p>}
            {hasGap && <p class="box attention">A part of the output was lost on its way.</p>}
            {lost > 0 && <p class="box attention">{counted(lost, 'byte')} of the output were lost: they came too fast.</p>}
            <pre class="output" ref={view} tabIndex={0} role="region" aria-label="Output" onScroll={(event) => note(event.currentTarget)}>
                {pieces.length === 0 ? <span class="faint">{isOver ? 'Nothing was written, or it is not kept any more.' : broken ? '' : 'Nothing has been written yet.'}</span>
                    : pieces.map((piece, i) => <span key={i} class={piece.stream}>{redactedLines(piece.text)}</span>)}
            </pre>
        </>
    );
}
