/// All tasks, newest first, with filters in the address.
import { useMemo } from 'preact/hooks';
import type { TaskSummary } from '../../api/types';
import { isMadeUp } from '../../api/tasks';
import { Empty, PageHead, ProblemBox, Search, StateMark, Time } from '../../parts/basics';
import { taskAddress } from '../../parts/task_line';
import { WindowList } from '../../parts/window_list';
import { Link } from '../../route/link';
import { go, parameter, usePlace, withParameters } from '../../route/route';
import { useTaskList } from '../../state/task_list';
import { printable } from '../../words/printable';
import { reasonOf, requestText } from '../../words/results';
import { counted } from '../../words/size';
import { elapsedText, parsedTime, timeSince } from '../../words/time';

const states = ['queued', 'running', 'done', 'failed', 'refused', 'cancelled', 'expired', 'interrupted'];
const commands = ['START', 'STOP', 'RESTART', 'INSTALL', 'UNINSTALL', 'REMOVEINSTANCE', 'SETCONFIG', 'GETCONFIG', 'COMPLETE_INSTALL'];
const spans: readonly (readonly [string, string])[] = [['', 'any time'], ['15min', '15 minutes'], ['1h', 'hour'], ['1d', 'day'], ['7d', '7 days']];

const columns = [
    { name: 'State', class: 'c-state' },
    { name: 'Command', class: 'c-main' },
    { name: 'Asked', class: 'c-time' },
    { name: 'Took', class: 'c-took' },
    { name: 'By', class: 'c-by' },
];

function tookText(task: TaskSummary): string {
    const began = parsedTime(task.started);
    const ended = parsedTime(task.ended);
    return began && ended ? elapsedText(ended.getTime() - began.getTime()) : '';
}

const cellsOf = (task: TaskSummary) => {
    const reason = reasonOf(task) || (isMadeUp(task.transid) ? '' : task.transid);
    return [
        <StateMark state={task.state} text={task.cancelling && task.state === 'running' ? 'cancelling' : task.state} />,
        <><Link to={taskAddress(task.id)}>{requestText(task)}</Link>{reason !== '' && <span class="aside" title={printable(reason)}>{printable(reason)}</span>}</>,
        <Time value={task.accepted} />,
        tookText(task),
        printable(task.asker),
    ];
};

const searched = (task: TaskSummary): string =>
    `${task.id} ${task.transid} ${task.state} ${task.command} ${task.product} ${task.version ?? ''} ${task.targetmsn ?? ''} ${task.asker} ${task.reason ?? ''}`.toLowerCase();

export function TasksPage() {
    const here = usePlace();
    const of = (name: string) => parameter(here.search, name);
    const set = (name: string) => (event: { currentTarget: HTMLSelectElement | HTMLInputElement }) =>
        go(withParameters(here, { [name]: event.currentTarget.value.trim() }), 'replace');
    const span = of('since');
    // The moment is kept while the word stays, so that the list is not loaded all the time.
    const since = useMemo(() => timeSince(span, new Date())?.toISOString() ?? '', [span]);
    const filter = { state: of('state'), product: of('product'), command: of('command'), since };
    const list = useTaskList(filter);
    const text = of('text').toLowerCase();
    const shown = useMemo(() => (text === '' ? list.tasks : list.tasks.filter((task) => searched(task).includes(text))), [list.tasks, text]);
    const isFiltered = here.search !== '';
    return (
        <>
            <PageHead title="Tasks" about={`${counted(shown.length, 'task')}${list.isComplete ? '' : ' so far; more come as you scroll'}`}>
                <Search value={of('text')} label="Search tasks" onChange={(value) => go(withParameters(here, { text: value }), 'replace')} />
            </PageHead>
            <form class="filters" aria-label="Filters" onSubmit={(event) => event.preventDefault()}>
                <label>State <select value={filter.state} onChange={set('state')}>
                    <option value="">any</option>{states.map((state) => <option key={state} value={state}>{state}</option>)}
                </select></label>
                <label>Command <select value={filter.command} onChange={set('command')}>
                    <option value="">any</option>{commands.map((command) => <option key={command} value={command}>{command}</option>)}
                </select></label>
                <label>Product <input size={6} value={filter.product} spellcheck={false} onChange={set('product')} /></label>
                <label>Within the last <select value={span} onChange={set('since')}>
                    {spans.map(([value, name]) => <option key={value} value={value}>{name}</option>)}
                    {!spans.some(([value]) => value === span) && <option value={span}>{span}</option>}
                </select></label>
                {isFiltered && <button type="button" class="plain" onClick={() => go(here.path, 'replace')}>Show all</button>}
            </form>
            {list.problem && <ProblemBox problem={list.problem} retry={list.reload} />}
            {shown.length === 0 && !list.isLoading && !list.problem && (isFiltered
                ? <Empty title="No task is like that"><p><button type="button" onClick={() => go(here.path, 'replace')}>Show all tasks</button></p></Empty>
                : <Empty title="This host has not been asked for anything yet"><p>Start an agent on <Link to="/agents">Agents</Link>, or run <code>zavctl start ux</code>.</p></Empty>)}
            {shown.length > 0 && <WindowList label="Tasks" columns={columns} rows={shown} keyOf={(task) => task.id} cells={cellsOf} onEnd={list.more} />}
        </>
    );
}
