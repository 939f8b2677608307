/// The state of the host on one page; what needs somebody's attention comes first.
import { useEffect, useMemo } from 'preact/hooks';
import { askInstances, askReady } from '../../api/host';
import { askTasks } from '../../api/tasks';
import type { Instance, Ready, TaskSummary } from '../../api/types';
import { feedEpoch, onFeed } from '../../live/feed';
import { work } from '../../live/work';
import { Empty, PageHead, Panel, ProblemBox, StateMark, now } from '../../parts/basics';
import { TaskLine } from '../../parts/task_line';
import { TasksChart } from '../../parts/tasks_chart';
import { Link } from '../../route/link';
import { health } from '../../state/host';
import { useResource } from '../../state/resource';
import { useStore } from '../../state/store';
import { bucketsOf, isBad } from '../../words/buckets';
import { printable } from '../../words/printable';
import { counted } from '../../words/size';
import { spanText } from '../../words/time';

const bucketSeconds = 120;
const hourMilliseconds = 3_600_000;
const mostTasks = 1000;
const mostShown = 8;

async function lastHour(signal: AbortSignal): Promise<TaskSummary[]> {
    const since = new Date(Date.now() - hourMilliseconds).toISOString();
    const tasks: TaskSummary[] = [];
    let after: number | undefined;
    do {
        const list = await askTasks({ since }, mostTasks, after, signal);
        tasks.push(...list.tasks);
        after = list.next ?? undefined;
    } while (after !== undefined && tasks.length < 10 * mostTasks);
    return tasks;
}

function Attention({ ready, instances, tasks }: { ready: Ready | undefined; instances: Instance[] | null | undefined; tasks: readonly TaskSummary[] }) {
    const missing = (instances ?? []).filter((instance) => instance.state === 'missing');
    const bad = tasks.filter((task) => isBad(task.state));
    const reasons = ready?.reasons ?? [];
    if (missing.length + bad.length + reasons.length === 0) {
        return <Empty title="Nothing needs attention"><p>Whatever fails, is interrupted or should run and does not comes up here.</p></Empty>;
    }
    return (
        <ul class="lines">
            {reasons.map((reason) => (
                <li key={reason.part} class="line"><StateMark state="error" text="not ready" /><span class="grow">{printable(reason.text)}</span></li>
            ))}
            {missing.map((instance) => (
                <li key={instance.target} class="line">
                    <StateMark state="missing" text="should run" />
                    <span class="grow">
                        <Link to={`/agents?text=${encodeURIComponent(instance.target)}`}>{printable(instance.target)}</Link>
                        <span class="line-detail">It was started and not stopped on request, and it does not run.</span>
                    </span>
                </li>
            ))}
            {bad.slice(0, mostShown).map((task) => <TaskLine key={task.id} task={task} />)}
            {bad.length > mostShown && <li class="line"><Link to="/tasks?since=1h">and {bad.length - mostShown} more of the last hour</Link></li>}
        </ul>
    );
}

function Facts({ ready, instances }: { ready: Ready | undefined; instances: Instance[] | null | undefined }) {
    const how = useStore(health);
    const running = (instances ?? []).filter((instance) => instance.state === 'running').length;
    if (!how) return null;
    return (
        <dl class="facts">
            <div><dt>Host</dt><dd>{ready ? <StateMark state={ready.ready ? 'ok' : 'error'} text={ready.ready ? 'ready' : 'not ready'} /> : '…'}</dd></div>
            <div><dt>Guards</dt><dd><StateMark state={how.guarded ? 'ok' : 'warning'} text={how.guarded ? 'on' : 'off'} /></dd></div>
            <div><dt>Agents that run</dt><dd>{instances === null ? 'not known' : instances ? running : '…'}</dd></div>
            <div><dt>Up for</dt><dd>{spanText(how.uptime_seconds)}</dd></div>
            <div><dt>Version</dt><dd>{printable(how.version)}, {how.width} bits</dd></div>
            <div class="wide-fact"><dt>Home</dt><dd><code>{printable(how.home)}</code></dd></div>
        </dl>
    );
}

function Queue() {
    const tasks = useStore(work);
    if (!tasks) return <p class="faint">…</p>;
    if (tasks.length === 0) {
        return <Empty title="Nothing runs, and nothing waits"><p>Start an agent on <Link to="/agents">Agents</Link>, or run <code>zavctl start ux</code>.</p></Empty>;
    }
    return (
        <>
            <ul class="lines">{tasks.slice(0, mostShown).map((task) => <TaskLine key={task.id} task={task} />)}</ul>
            {tasks.length > mostShown && <p><Link to="/tasks?state=queued">and {tasks.length - mostShown} more that wait</Link></p>}
        </>
    );
}

export function OverviewPage() {
    const ready = useResource(askReady, []);
    const instances = useResource(askInstances, []);
    const tasks = useResource(lastHour, []);
    const epoch = useStore(feedEpoch);
    const current = useStore(now);
    useEffect(() => {
        let timer: ReturnType<typeof setTimeout> | undefined;
        const reload = () => { ready.reload(); instances.reload(); tasks.reload(); };
        if (epoch > 0) reload();
        const stop = onFeed((items) => {
            if (!items.some((item) => item.content.kind === 'task')) return;
            timer ??= setTimeout(() => { timer = undefined; reload(); }, 1_000);
        });
        return () => { stop(); clearTimeout(timer); };
    }, [epoch]);
    const minute = Math.floor(current.getTime() / 60_000);
    const buckets = useMemo(() => bucketsOf(tasks.value ?? [], current.getTime() / 1000, hourMilliseconds / 1000 / bucketSeconds, bucketSeconds), [tasks.value, minute]);
    const problem = tasks.problem ?? instances.problem ?? ready.problem;
    const bad = (tasks.value ?? []).filter((task) => isBad(task.state)).length;
    return (
        <>
            <PageHead title="Overview" about={bad > 0 ? `${counted(bad, 'task')} of the last hour did not end well` : 'How this host is, and what needs somebody'} />
            {problem && <ProblemBox problem={problem} retry={() => { tasks.reload(); instances.reload(); ready.reload(); }} />}
            <Facts ready={ready.value} instances={instances.value} />
            <div class="columns">
                <Panel title="Needs attention" name="attention">
                    {tasks.value ? <Attention ready={ready.value} instances={instances.value} tasks={tasks.value} /> : <p class="faint">…</p>}
                </Panel>
                <div>
                    <Panel title="Tasks of the last hour" aside={<Link to="/tasks">All tasks</Link>}><TasksChart buckets={buckets} /></Panel>
                    <Panel title="Runs and waits"><Queue /></Panel>
                </div>
            </div>
        </>
    );
}
