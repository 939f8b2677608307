/// A roll-out's hosts as a field of marks, one for each, which change their colour and their form. It is
/// painted, because a document of ten thousand elements would be slow; the list beside it says the same
/// to whoever cannot see it.
import { useEffect, useRef } from 'preact/hooks';
import type { RolloutPart } from '../../api/fleet/types';
import { type PartMark, partMark, partName, partText } from '../../words/fleet/rollouts';
import { printable } from '../../words/printable';
import { counted } from '../../words/size';

/// More marks would make a picture that no browser holds.
const mostMarks = 20_000;
const many = 2_500;

const sizeFor = (count: number): number => (count > many ? 9 : 14);

interface Painting {
    columns: number;
    size: number;
}

function colors(): Record<PartMark, string> {
    const style = getComputedStyle(document.documentElement);
    const of = (name: string): string => style.getPropertyValue(name).trim();
    return { good: of('--good-mark'), bad: of('--bad-mark'), attention: of('--attention-mark'), busy: of('--accent'), quiet: of('--quiet') };
}

/// The same forms as those before the words of states.
function paintMark(to: CanvasRenderingContext2D, mark: PartMark, x: number, y: number, width: number): void {
    const half = width / 2;
    to.beginPath();
    switch (mark) {
        case 'bad':
            to.rect(x, y, width, width);
            return to.fill();
        case 'attention':
            to.moveTo(x + half, y);
            to.lineTo(x + width, y + width);
            to.lineTo(x, y + width);
            return to.fill();
        case 'busy':
            to.arc(x + half, y + half, half, Math.PI / 2, Math.PI * 1.5);
            to.fill();
            break;
        case 'good':
            to.arc(x + half, y + half, half, 0, Math.PI * 2);
            return to.fill();
        case 'quiet':
            break;
    }
    to.beginPath();
    to.arc(x + half, y + half, half - 0.75, 0, Math.PI * 2);
    to.stroke();
}

function paint(canvas: HTMLCanvasElement, parts: readonly RolloutPart[]): Painting {
    const size = sizeFor(parts.length);
    const columns = Math.max(Math.floor(canvas.clientWidth / size), 1);
    const rows = Math.ceil(Math.min(parts.length, mostMarks) / columns);
    const scale = Math.min(devicePixelRatio || 1, 2);
    canvas.style.height = `${rows * size}px`;
    canvas.width = columns * size * scale;
    canvas.height = rows * size * scale;
    const to = canvas.getContext('2d');
    if (!to) return { columns, size };
    canvas.style.width = `${columns * size}px`;
    to.scale(scale, scale);
    to.lineWidth = 1.5;
    const known = colors();
    parts.slice(0, mostMarks).forEach((part, i) => {
        const mark = partMark(part);
        to.fillStyle = to.strokeStyle = known[mark];
        paintMark(to, mark, (i % columns) * size + 1, Math.floor(i / columns) * size + 1, size - 3);
    });
    canvas.style.width = '100%';
    return { columns, size };
}

interface PartGridProps {
    parts: readonly RolloutPart[];
    onPick: (part: RolloutPart) => void;
}

export function PartGrid({ parts, onPick }: PartGridProps) {
    const canvas = useRef<HTMLCanvasElement>(null);
    const painting = useRef<Painting>({ columns: 1, size: 14 });
    const latest = useRef(parts);
    latest.current = parts;
    const repaint = () => {
        if (canvas.current) painting.current = paint(canvas.current, latest.current);
    };
    useEffect(() => {
        const frame = requestAnimationFrame(repaint);
        return () => cancelAnimationFrame(frame);
    }, [parts]);
    useEffect(() => {
        const theme = matchMedia('(prefers-color-scheme: dark)');
        theme.addEventListener('change', repaint);
        addEventListener('resize', repaint);
        return () => {
            theme.removeEventListener('change', repaint);
            removeEventListener('resize', repaint);
        };
    }, []);
    const partAt = (event: MouseEvent): RolloutPart | undefined => {
        const { columns, size } = painting.current;
        const column = Math.floor(event.offsetX / size);
        return column < columns ? latest.current[Math.floor(event.offsetY / size) * columns + column] : undefined;
    };
    const point = (event: MouseEvent & { currentTarget: HTMLCanvasElement }) => {
        const part = partAt(event);
        event.currentTarget.title = part ? `${printable(partName(part))}: ${printable(partText(part))}` : '';
    };
    const pick = (event: MouseEvent) => {
        const part = partAt(event);
        if (part) onPick(part);
    };
    const left = parts.length - mostMarks;
    return (
        <>
            <canvas ref={canvas} class="part-grid" role="img" aria-label={`${counted(parts.length, 'host')}, which the list below names`} onMouseMove={point} onClick={pick} />
            {left > 0 && <p class="faint">and {left} more, which the list names</p>}
        </>
    );
}
