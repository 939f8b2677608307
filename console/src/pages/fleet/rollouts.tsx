/// The roll-outs, newest first.
import type { Rollout } from '../../api/fleet/types';
import { Empty, PageHead, ProblemBox, StateMark, Time } from '../../parts/basics';
import { RolloutBar } from '../../parts/fleet/rollout_bar';
import { WindowList } from '../../parts/window_list';
import { Link } from '../../route/link';
import { loadRollouts, rollouts } from '../../state/fleet/rollouts';
import { useStore } from '../../state/store';
import { progressText, rolloutAddress, rolloutTone, workText } from '../../words/fleet/rollouts';
import { printable } from '../../words/printable';
import { counted } from '../../words/size';

const columns = [
    { name: 'State', class: 'c-state' },
    { name: 'Does', class: 'c-main' },
    { name: 'Over', class: 'c-bar' },
    { name: 'Made', class: 'c-time' },
    { name: 'By', class: 'c-by' },
];

const cellsOf = (rollout: Rollout) => [
    <StateMark state={rolloutTone(rollout)} text={rollout.state} />,
    <><Link to={rolloutAddress(rollout.id)}>{workText(rollout)} on {printable(rollout.selector)}</Link><span class="aside" title={progressText(rollout)}>{progressText(rollout)}</span></>,
    <RolloutBar rollout={rollout} />,
    <Time value={rollout.created} />,
    printable(rollout.operator),
];

export function RolloutsPage() {
    const { value, problem } = useStore(rollouts);
    return (
        <>
            <PageHead title="Roll-outs" about={value ? counted(value.length, 'roll-out') : '…'} />
            {problem && <ProblemBox problem={problem} retry={() => void loadRollouts()} />}
            {value?.length === 0 && <Empty title="There is no roll-out yet"><p>Start an agent on many hosts on <Link to="/agents">Agents</Link>, or run <code>zavctl start ux</code> with <code>--on</code>.</p></Empty>}
            {value && value.length > 0 && <WindowList label="Roll-outs" columns={columns} rows={value} keyOf={(rollout) => rollout.id} cells={cellsOf} />}
        </>
    );
}
