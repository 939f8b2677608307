import { useEffect, useRef } from 'preact/hooks';
import uPlot from 'uplot';
import type { Buckets } from '../words/buckets';
import { counted } from '../words/size';

const chartHeight = 132;

const sum = (values: readonly number[]): number => values.reduce((total, value) => total + value, 0);

const added = (a: readonly number[], b: readonly number[]): number[] => a.map((value, i) => value + (b[i] ?? 0));

function color(name: string): string {
    return getComputedStyle(document.documentElement).getPropertyValue(name).trim();
}

/// Bars that stand on each other: the whole first, what is above it painted over it.
function optionsFor(width: number): uPlot.Options {
    const bars = uPlot.paths.bars as NonNullable<typeof uPlot.paths.bars>;
    const series = (name: string, label: string): uPlot.Series => ({
        label, fill: color(name), stroke: color(name), width: 0, points: { show: false }, paths: bars({ size: [0.72, 18], align: 1 }),
    });
    const axis = { stroke: color('--faint'), grid: { stroke: color('--line'), width: 1 }, ticks: { show: false }, font: '12px system-ui, sans-serif' };
    return {
        width, height: chartHeight, legend: { show: false }, cursor: { show: false }, padding: [8, 16, 0, 0],
        scales: { y: { range: (_plot, _low, high) => [0, Math.max(Math.ceil(high * 1.1), 4)] } },
        axes: [
            { ...axis, grid: { show: false }, space: 70, size: 26, values: [[60, '{HH}:{mm}', null, null, null, null, null, null, 0]] },
            { ...axis, size: 34, incrs: [1, 2, 5, 10, 20, 50, 100, 200, 500, 1000, 2000, 5000] },
        ],
        series: [{}, series('--quiet', 'other'), series('--good-mark', 'done'), series('--bad-mark', 'failed')],
    };
}

const dataOf = (buckets: Buckets): uPlot.AlignedData => {
    const done = added(buckets.done, buckets.bad);
    return [buckets.starts, added(done, buckets.other), done, buckets.bad];
};

/// How many tasks were accepted, by time and by how they stand. The caption says it in words.
export function TasksChart({ buckets }: { buckets: Buckets }) {
    const place = useRef<HTMLDivElement>(null);
    const plot = useRef<uPlot | undefined>(undefined);
    const latest = useRef(buckets);
    latest.current = buckets;
    useEffect(() => {
        const element = place.current;
        if (!element) return undefined;
        const draw = () => {
            plot.current?.destroy();
            plot.current = new uPlot(optionsFor(element.clientWidth), dataOf(latest.current), element);
        };
        draw();
        const theme = matchMedia('(prefers-color-scheme: dark)');
        theme.addEventListener('change', draw);
        const size = new ResizeObserver(() => plot.current?.setSize({ width: element.clientWidth, height: chartHeight }));
        size.observe(element);
        return () => {
            theme.removeEventListener('change', draw);
            size.disconnect();
            plot.current?.destroy();
        };
    }, []);
    useEffect(() => plot.current?.setData(dataOf(buckets)), [buckets]);
    const bad = sum(buckets.bad);
    const all = bad + sum(buckets.done) + sum(buckets.other);
    return (
        <figure class="chart">
            <div ref={place} aria-hidden="true" />
            <figcaption>
                {counted(all, 'task')} in the last hour: <span class="state good">{sum(buckets.done)} done</span>
                <span class={`state ${bad > 0 ? 'bad' : 'quiet'}`}>{bad} not well</span>
                <span class="state quiet">{sum(buckets.other)} other</span>
            </figcaption>
        </figure>
    );
}
