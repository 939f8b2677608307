/// A host's own list of tasks. The host is asked for it when somebody wants to see it.
import { useEffect, useRef, useState } from 'preact/hooks';
import { askTasks, tasksRequest } from '../../api/fleet/tasks';
import type { FleetHost } from '../../api/fleet/types';
import { type Problem, asProblem } from '../../api/problem';
import type { TaskSummary } from '../../api/types';
import { Link } from '../../route/link';
import { mayOrder, operator } from '../../state/fleet/centre';
import { commandPrefix, useOnlyLooks } from '../../state/session';
import { useStore } from '../../state/store';
import { fleetLine } from '../../words/fleet/lines';
import { hostTaskAddress } from '../../words/fleet/tasks';
import { printable } from '../../words/printable';
import { reasonOf, requestText } from '../../words/results';
import { CommandLine, Empty, Panel, ProblemBox, StateMark, Time } from '../basics';
import { Elsewhere } from './only_looks';

const mostTasks = 20;

function Line({ host, task }: { host: string; task: TaskSummary }) {
    const hasPage = mayOrder(useStore(operator), 'OUTPUT');
    const reason = reasonOf(task);
    const text = requestText(task);
    return (
        <li class="line">
            <StateMark state={task.state} />
            <span class="grow">{hasPage ? <Link to={hostTaskAddress(host, task.id)}>{text}</Link> : text}{reason !== '' && <span class="line-detail">{reason}</span>}<span class="line-detail">{printable(task.asker ?? '')}</span></span>
            <span class="when"><Time value={task.ended ?? task.started ?? task.accepted} brief /></span>
        </li>
    );
}

export function HostTasks({ host }: { host: FleetHost }) {
    const { name } = host;
    const onlyLooks = useOnlyLooks();
    const [tasks, setTasks] = useState<TaskSummary[]>();
    const [problem, setProblem] = useState<Problem>();
    const [isBusy, setBusy] = useState(false);
    const asking = useRef<AbortController | undefined>(undefined);
    useEffect(() => () => asking.current?.abort(), []);
    const look = async () => {
        const { signal } = (asking.current = new AbortController());
        setBusy(true);
        setProblem(undefined);
        try {
            setTasks(await askTasks(name, mostTasks, signal));
        } catch (error) {
            if (!signal.aborted) setProblem(asProblem(error));
        }
        setBusy(false);
    };
    return (
        <Panel title="Its tasks" aside={!onlyLooks && <button type="button" disabled={isBusy} onClick={() => void look()}>{isBusy ? 'Asking…' : tasks ? 'Ask again' : 'Ask the host'}</button>}>
            {!tasks && <p class="faint">{onlyLooks ? 'The host itself knows its tasks, and tells them to whoever holds an operator\'s key.' : 'The host itself knows its tasks, and is asked for them now.'}</p>}
            <Elsewhere />
            <CommandLine line={fleetLine(commandPrefix(), tasksRequest(name, mostTasks))} />
            {problem && <ProblemBox problem={problem} />}
            {tasks?.length === 0 && <Empty title="There are no such tasks" />}
            <ul class="lines">{tasks?.map((task) => <Line key={task.id} host={host.host} task={task} />)}</ul>
        </Panel>
    );
}
