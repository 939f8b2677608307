/// One task of one host of a fleet: what the host says of it, and what its commands write.
import { useState } from 'preact/hooks';
import { askHost } from '../../api/fleet/centre';
import { askTasks } from '../../api/fleet/tasks';
import type { FleetHost } from '../../api/fleet/types';
import type { TaskSummary } from '../../api/types';
import { hostOutput } from '../../live/output';
import { CommandLine, PageHead, Panel, ProblemBox, StateMark, Time } from '../../parts/basics';
import { Elsewhere } from '../../parts/fleet/only_looks';
import { type OutputState, OutputView } from '../../parts/output_view';
import { Link } from '../../route/link';
import { mayOrder, operator } from '../../state/fleet/centre';
import { useResource } from '../../state/resource';
import { commandPrefix, useOnlyLooks } from '../../state/session';
import { useStore } from '../../state/store';
import { hostAddress } from '../../words/fleet/hosts';
import { outputLine } from '../../words/fleet/tasks';
import { printable } from '../../words/printable';
import { reasonOf, requestText } from '../../words/results';

/// A host is asked for its latest tasks: what is looked at now is one of them.
const mostTasks = 100;

/// It runs in the host's name for it, or for the one who ordered it.
const isMeant = (task: TaskSummary, id: string): boolean => task.id === id || task.transid === id;

/// What the host says of the task, asked for now and whenever `turn` changes.
function Said({ host, id, turn }: { host: FleetHost; id: string; turn: number }) {
    const { value, problem, reload } = useResource((signal) => askTasks(host.name, mostTasks, signal), [host.name, id, turn]);
    const task = value?.find((one) => isMeant(one, id));
    const reason = task ? reasonOf(task) : '';
    const times: readonly (readonly [string, string | null | undefined])[] = [['Accepted', task?.accepted], ['Began', task?.started], ['Ended', task?.ended]];
    return (
        <Panel title="What the host says of it" aside={<button type="button" class="small" onClick={reload}>Ask again</button>}>
            {problem && <ProblemBox problem={problem} />}
            {!value && !problem && <p class="faint">Asking the host…</p>}
            {value && !task && <p class="faint">It is not among the {mostTasks} latest tasks of the host. An order that has yet to reach the host is none.</p>}
            {task && (
                <>
                    <p>{requestText(task)} <StateMark state={task.state} /></p>
                    {reason !== '' && <p class={`box ${task.state === 'done' ? 'attention' : 'bad'}`}>{reason}</p>}
                    <dl class="facts">
                        {times.map(([name, time]) => time && <div key={name}><dt>{name}</dt><dd><Time value={time} /></dd></div>)}
                        {task.asker && <div class="wide-fact"><dt>Asked by</dt><dd>{printable(task.asker)}</dd></div>}
                    </dl>
                </>
            )}
        </Panel>
    );
}

/// What somebody sees to whom the host does not show its output from here.
function NoOutput({ onlyLooks }: { onlyLooks: boolean }) {
    if (!onlyLooks) return <p class="box attention">Your certificate does not allow OUTPUT.</p>;
    return <p class="faint">The host shows its output to whoever holds an operator's key, and there is none here.</p>;
}

function Output({ host, id, onEnd }: { host: FleetHost; id: string; onEnd: () => void }) {
    const onlyLooks = useOnlyLooks();
    const who = useStore(operator);
    const [state, setState] = useState<OutputState>('live');
    const isShown = !onlyLooks && mayOrder(who, 'OUTPUT');
    const note = (now: OutputState) => {
        setState(now);
        if (now === 'over') onEnd();
    };
    const mark = isShown && state !== 'refused' && <span class={`state ${state === 'live' ? 'busy' : 'quiet'}`}>{state}</span>;
    return (
        <Panel title="Output" aside={mark}>
            {isShown && <OutputView address={hostOutput(host.host, id)} onState={note} />}
            {!isShown && (who || onlyLooks) && <NoOutput onlyLooks={onlyLooks} />}
            <Elsewhere />
            <CommandLine line={outputLine(commandPrefix(), host.name, id)} />
        </Panel>
    );
}

export function FleetTaskPage({ id: hostId, part: id }: { id: string; part: string }) {
    const { value: host, problem, reload } = useResource((signal) => askHost(hostId, signal), [hostId]);
    const onlyLooks = useOnlyLooks();
    const who = useStore(operator);
    const [ends, setEnds] = useState(0);
    return (
        <>
            <PageHead title={`Task ${printable(id)}`} about={host && <>on <Link to={hostAddress(host)}>{printable(host.name)}</Link></>} />
            {problem && <ProblemBox problem={problem} retry={reload} />}
            {!host && !problem && <p class="faint">…</p>}
            {host && <Output host={host} id={id} onEnd={() => setEnds((count) => count + 1)} />}
            {host && !onlyLooks && mayOrder(who, 'TASKS') && <Said host={host} id={id} turn={ends} />}
        </>
    );
}
