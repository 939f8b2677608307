/// One roll-out: how far it is, where it failed and why, and what can be done about it.
import { useMemo, useState } from 'preact/hooks';
import type { FleetRequest } from '../../api/fleet/run';
import type { Rollout, RolloutPart } from '../../api/fleet/types';
import { Empty, PageHead, Panel, ProblemBox, StateMark, Time } from '../../parts/basics';
import { ChangeDialog } from '../../parts/fleet/change_dialog';
import { PartGrid } from '../../parts/fleet/part_grid';
import { RolloutBar } from '../../parts/fleet/rollout_bar';
import { WindowList } from '../../parts/window_list';
import { Link } from '../../route/link';
import { go, parameter, usePlace, withParameters } from '../../route/route';
import { mayChangeRollouts, operator } from '../../state/fleet/centre';
import { countedStates, useRollout } from '../../state/fleet/parts';
import { useStore } from '../../state/store';
import { hostAddress } from '../../words/fleet/hosts';
import { countsText, overCount, partMark, partName, partText, planText, progressText, reasonText, rolloutTone, workText } from '../../words/fleet/rollouts';
import { printable, redacted } from '../../words/printable';
import { counted } from '../../words/size';

interface Change {
    verb: string;
    button: string;
    about: string;
    done: string;
    isGrave: boolean;
    isOffered: (rollout: Rollout) => boolean;
}

/// In the words of zavctl's help.
const changes: readonly Change[] = [
    { verb: 'pause', button: 'Pause', about: 'Let no more hosts get their orders for now.', done: 'paused', isGrave: false, isOffered: ({ state }) => state === 'running' },
    { verb: 'resume', button: 'Resume', about: 'Let a roll-out go on that is paused; what has expired is signed anew.', done: 'goes on', isGrave: false, isOffered: ({ state }) => state === 'paused' },
    { verb: 'abort', button: 'Abort', about: 'End a roll-out, and cancel what hosts have not done yet.', done: 'aborted', isGrave: true, isOffered: ({ state }) => state === 'running' || state === 'paused' },
    {
        verb: 'retry-failed', button: 'Retry failed', about: 'Try again on the hosts where it failed.', done: 'tries again', isGrave: false,
        isOffered: ({ state, failures, counts }) => state !== 'aborted' && (failures > 0 || (counts.over['unknown'] ?? 0) > 0),
    },
];

function Changing({ rollout, change, onClose }: { rollout: Rollout; change: Change; onClose: () => void }) {
    const [force, setForce] = useState(false);
    const request: FleetRequest = { verb: `rollout ${change.verb}`, arguments: [rollout.id], options: { force } };
    return (
        <ChangeDialog request={request} title={`rollout ${change.verb}`} about={<p>{change.about}</p>} button={`${change.button} the roll-out`} done={change.done} isGrave={change.isGrave} onClose={onClose}>
            <p>{workText(rollout)} on <code>{printable(rollout.selector)}</code>: {progressText(rollout)}.</p>
            {change.verb === 'retry-failed' && (
                <label class="check">
                    <input type="checkbox" checked={force} onChange={(event) => setForce(event.currentTarget.checked)} />
                    Try again also where nobody knows whether it ran: it may run twice
                </label>
            )}
        </ChangeDialog>
    );
}

const columns = [
    { name: 'State', class: 'c-wide-state' },
    { name: 'Host', class: 'c-main' },
    { name: 'Wave', class: 'c-id' },
    { name: 'Tries', class: 'c-took' },
];

const cellsOf = (part: RolloutPart) => [
    <span class={`state ${partMark(part)}`}>{printable(partText(part))}</span>,
    <><Link to={hostAddress(part)}>{printable(partName(part))}</Link>{part.reason !== '' && <span class="aside" title={redacted(part.reason)}>{redacted(part.reason)}</span>}</>,
    part.wave,
    part.tries,
];

/// The forms of the marks are explained by the words beside them.
function Legend({ parts, all }: { parts: readonly RolloutPart[]; all: number }) {
    const states = useMemo(() => countedStates(parts), [parts]);
    return (
        <p class="legend" role="status">
            {states.map(([state, count]) => <span key={state} class={`state ${partMark({ state, away: false, unconfirmed: false })}`}>{count} {printable(state)}</span>)}
            {parts.length < all && <span class="faint">{all - parts.length} that you may not see, or that are on their way</span>}
        </p>
    );
}

function PartList({ parts }: { parts: readonly RolloutPart[] }) {
    const here = usePlace();
    const wanted = parameter(here.search, 'state');
    const states = useMemo(() => countedStates(parts), [parts]);
    const shown = useMemo(() => (wanted === '' ? parts : parts.filter((part) => part.state === wanted)), [parts, wanted]);
    const set = (state: string) => go(withParameters(here, { state }), 'replace');
    return (
        <Panel title="Hosts" aside={(
            <label class="inline">State <select value={wanted} onChange={(event) => set(event.currentTarget.value)}>
                <option value="">any</option>
                {states.map(([state, count]) => <option key={state} value={state}>{printable(state)} ({count})</option>)}
                {wanted !== '' && !states.some(([state]) => state === wanted) && <option value={wanted}>{printable(wanted)}</option>}
            </select></label>
        )}>
            <WindowList label="Hosts of the roll-out" columns={columns} rows={shown} keyOf={(part) => part.place} cells={cellsOf} />
        </Panel>
    );
}

function Waves({ rollout }: { rollout: Rollout }) {
    return (
        <ol class="waves">
            {rollout.waves.map((wave, i) => {
                const hosts = wave.waiting + wave.released + overCount(wave);
                const isNow = i + 1 === rollout.wave && rollout.state === 'running';
                return <li key={i} aria-current={isNow ? 'step' : undefined}><strong>Wave {i + 1}</strong> {countsText(wave, hosts)}</li>;
            })}
        </ol>
    );
}

function Failures({ failures, count }: { failures: readonly RolloutPart[]; count: number }) {
    return (
        <Panel title={`Failures: ${count}`}>
            {failures.length === 0 && <Empty title="It has failed nowhere" />}
            <ul class="lines failures">
                {failures.map((part) => (
                    <li key={part.place} class="line">
                        <span class={`state ${partMark(part)}`}>{printable(part.state)}</span>
                        <span class="grow"><Link to={hostAddress(part)}>{printable(partName(part))}</Link><span class="line-detail">{redacted(part.reason) || 'the host has given no reason'}</span></span>
                    </li>
                ))}
            </ul>
        </Panel>
    );
}

export function RolloutPage({ id }: { id: string }) {
    const { rollout, parts, failures, problem, reload } = useRollout(id);
    const who = useStore(operator);
    const [change, setChange] = useState<Change>();
    if (!rollout) {
        return <><PageHead title="Roll-out" about={printable(id)} />{problem ? <ProblemBox problem={problem} retry={reload} /> : <p class="faint">…</p>}</>;
    }
    const reason = reasonText(rollout);
    return (
        <>
            <PageHead title={`${workText(rollout)} on ${printable(rollout.selector)}`} about={<>{printable(rollout.id)} <StateMark state={rolloutTone(rollout)} text={rollout.state} /></>}>
                {mayChangeRollouts(who) && changes.filter((one) => one.isOffered(rollout)).map((one) => (
                    <button type="button" key={one.verb} class={one.isGrave ? 'grave' : ''} onClick={() => setChange(one)}>{one.button}…</button>
                ))}
            </PageHead>
            {problem && <ProblemBox problem={problem} retry={reload} />}
            {reason !== '' && <p class="box attention">{printable(rollout.state)}: {reason}</p>}
            <dl class="facts">
                <div><dt>Made by</dt><dd>{printable(rollout.operator)}</dd></div>
                <div><dt>Made</dt><dd><Time value={rollout.created} /></dd></div>
                <div><dt>{printable(rollout.state)} since</dt><dd><Time value={rollout.since} /></dd></div>
                <div class="wide-fact"><dt>Plan</dt><dd>{planText(rollout.plan)}{rollout.plan.maxFailures.endsWith('%') && `; here ${counted(rollout.mostFailures, 'failure')}`}</dd></div>
            </dl>
            <Panel title={progressText(rollout)}>
                <RolloutBar rollout={rollout} />
                <Waves rollout={rollout} />
                <Legend parts={parts} all={rollout.hosts} />
                <PartGrid parts={parts} onPick={(part) => go(hostAddress(part))} />
            </Panel>
            {(failures.length > 0 || rollout.failures > 0) && <Failures failures={failures} count={rollout.failures} />}
            <PartList parts={parts} />
            {change && <Changing rollout={rollout} change={change} onClose={() => setChange(undefined)} />}
        </>
    );
}
