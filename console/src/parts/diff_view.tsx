import { diffLines, folded, isChange } from '../words/diff';
import { printable } from '../words/printable';
import { counted } from '../words/size';

const marks = { same: ' ', removed: '−', added: '+' };
const names = { same: '', removed: 'removed: ', added: 'added: ' };

/// The difference between what is there and what is to be there.
export function DiffView({ before, after }: { before: string; after: string }) {
    const lines = diffLines(before, after);
    if (!isChange(lines)) return <p class="faint">No difference to what is there.</p>;
    const count = (kind: string): number => lines.filter((line) => line.kind === kind).length;
    return (
        <div class="diff" role="region" aria-label="Difference" tabIndex={0}>
            <p class="faint">{counted(count('removed'), 'line')} removed, {counted(count('added'), 'line')} added</p>
            <ul>
                {folded(lines).map((line, i) => typeof line === 'number'
                    ? <li key={i} class="skipped">{counted(line, 'unchanged line')}</li>
                    : <li key={i} class={line.kind}>
                        <span class="mark" aria-hidden="true">{marks[line.kind]}</span>
                        <span class="line-number" aria-hidden="true">{line.after ?? line.before}</span>
                        <span class="hidden">{names[line.kind]}</span>{printable(line.text) || ' '}
                    </li>)}
            </ul>
        </div>
    );
}
