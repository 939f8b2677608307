/// Products by version: how many hosts have which. Each number leads to these hosts.
import type { ComponentChildren } from 'preact';
import { Link } from '../../route/link';
import { withParameters } from '../../route/route';
import type { VersionSpread } from '../../words/fleet/inventory';
import { printable } from '../../words/printable';
import { StateMark } from '../basics';

/// Rarer versions of a product are counted together.
const mostVersions = 8;

interface SpreadProps {
    spread: readonly VersionSpread[];
    /// The selector of which the numbers are.
    on?: string;
    /// What stands at the end of a product's row.
    buttons?: (product: VersionSpread) => ComponentChildren;
}

const addressOf = (on: string, product: string, version: string): string =>
    withParameters({ path: '/agents', search: '' }, { on, product, version });

/// The most frequent versions of all products, the newest first.
function columnsOf(spread: readonly VersionSpread[]): string[] {
    const counts = new Map<string, number>();
    for (const { versions } of spread) for (const [version, hosts] of versions) counts.set(version, (counts.get(version) ?? 0) + hosts);
    return [...counts].sort((a, b) => b[1] - a[1]).slice(0, mostVersions).map(([version]) => version).sort((a, b) => b.localeCompare(a));
}

export function Spread({ spread, on = '', buttons }: SpreadProps) {
    const columns = columnsOf(spread);
    const shown = new Set(columns);
    const others = (row: VersionSpread): number => row.versions.reduce((sum, [version, hosts]) => (shown.has(version) ? sum : sum + hosts), 0);
    const hasOthers = spread.some((row) => others(row) > 0);
    const cell = (row: VersionSpread, version: string) => {
        const hosts = row.versions.find(([one]) => one === version)?.[1];
        return hosts === undefined ? <span class="faint">–</span>
            : <Link to={addressOf(on, row.product, version)} aria-label={`${hosts} hosts with ${printable(row.product)} ${printable(version)}`}>{hosts}</Link>;
    };
    if (spread.length === 0) return null;
    return (
        <div class="matrix" tabIndex={0} role="region" aria-label="Products by version">
            <table>
                <thead>
                    <tr>
                        <th scope="col">Product</th>
                        {columns.map((version) => <th scope="col" key={version}>{printable(version)}</th>)}
                        {hasOthers && <th scope="col">other</th>}
                        <th scope="col">Instances</th>
                        {buttons && <th scope="col">Actions</th>}
                    </tr>
                </thead>
                <tbody>
                    {spread.map((row) => (
                        <tr key={row.product}>
                            <th scope="row"><Link to={addressOf(on, row.product, '')}><code>{printable(row.product)}</code></Link> <span class="faint">{printable(row.description)}</span></th>
                            {columns.map((version) => <td key={version}>{cell(row, version)}</td>)}
                            {hasOthers && <td>{others(row) || <span class="faint">–</span>}</td>}
                            <td class="instances-cell">
                                <StateMark state={row.running > 0 ? 'ok' : 'quiet'} text={`${row.running} run`} />
                                {row.missing > 0 && <> <StateMark state="missing" text={`${row.missing} should run`} /></>}
                            </td>
                            {buttons && <td><span class="buttons">{buttons(row)}</span></td>}
                        </tr>
                    ))}
                </tbody>
            </table>
        </div>
    );
}
