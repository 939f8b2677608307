/// Everything about one task.
import { useEffect, useState } from 'preact/hooks';
import { asProblem, type Problem } from '../../api/problem';
import { askTask, cancelTask, isOver } from '../../api/tasks';
import type { Task } from '../../api/types';
import { feedEpoch, onFeed } from '../../live/feed';
import { ownOutput } from '../../live/output';
import { lookAtWork, work } from '../../live/work';
import { AgainDialog, isRepeatable } from '../../parts/again_dialog';
import { CommandLine, PageHead, Panel, ProblemBox, StateMark } from '../../parts/basics';
import { Dialog } from '../../parts/dialog';
import { OutputView } from '../../parts/output_view';
import { taskAddress } from '../../parts/task_line';
import { Commands, Way } from '../../parts/way';
import { go } from '../../route/route';
import { mayAct, whoami } from '../../state/host';
import { notify } from '../../state/notices';
import { useResource } from '../../state/resource';
import { commandPrefix } from '../../state/session';
import { useStore } from '../../state/store';
import { cancelLine, titleOf } from '../../words/lines';
import { printable, redacted } from '../../words/printable';
import { reasonOf, requestText } from '../../words/results';

function CancelDialog({ task, onClose }: { task: Task; onClose: () => void }) {
    const [problem, setProblem] = useState<Problem>();
    const [isBusy, setBusy] = useState(false);
    const send = async (event: Event) => {
        event.preventDefault();
        setBusy(true);
        try {
            const answer = await cancelTask(task.id);
            const isCancelled = answer.state === 'cancelled';
            notify({ tone: isCancelled ? 'good' : 'attention', text: `${titleOf(task)}: ${isCancelled ? 'cancelled' : answer.state}`, task: task.id });
            lookAtWork();
            onClose();
        } catch (error) {
            setProblem(asProblem(error));
            setBusy(false);
        }
    };
    return (
        <Dialog title={`task cancel ${task.id}`} onClose={onClose} isBusy={isBusy}>
            <form onSubmit={(event) => void send(event)}>
                <p>{task.state === 'queued' ? 'It waits, and will never run.' : 'What its commands have started is ended: first asked to, then killed after 10 seconds. What made a session of its own, as agents do, is left alone.'}</p>
                <CommandLine line={cancelLine(commandPrefix(), task.id)} />
                {problem && <ProblemBox problem={problem} />}
                <footer>
                    <button type="button" disabled={isBusy} onClick={onClose}>Back</button>
                    <button type="submit" class="grave" disabled={isBusy}>{isBusy ? 'Ending it…' : 'Cancel the task'}</button>
                </footer>
            </form>
        </Dialog>
    );
}

/// What was asked for besides what the title says.
function Asked({ task }: { task: Task }) {
    const members: readonly (readonly [string, string | undefined])[] = [
        ['Transaction', task.transid], ['Target', task.targetmsn], ['Option', task.optional], ['Context', task.context],
        ['Metafile', task.uaconfig], ['Scripts', task.uascript], ['Machine start', task.boot],
        ['Cut off', task.interruptions ? `${task.interruptions} times by an unclean end of the host` : ''],
    ];
    return (
        <dl class="facts">
            {members.map(([name, value]) => value && <div key={name} class="wide-fact"><dt>{name}</dt><dd><code>{redacted(value)}</code></dd></div>)}
        </dl>
    );
}

function useTask(id: string) {
    const { value, problem, isLoading, reload } = useResource((signal) => askTask(id, signal), [id]);
    const epoch = useStore(feedEpoch);
    // A beginning is told by what runs and waits, an end by the feed.
    const known = useStore(work)?.find((task) => task.id === id);
    useEffect(() => onFeed((items) => {
        const isNews = items.some(({ content }) => content.kind === 'gap' || (content.kind === 'task' && content.task.id === id) ||
            (content.kind === 'row' && value !== undefined && (content.row as Record<string, unknown>)['TRANSID'] === value.transid));
        if (isNews) reload();
    }), [id, reload, value?.transid]);
    useEffect(() => {
        if (value && !isOver(value.state)) reload();
    }, [known?.state, known?.cancelling, epoch]);
    return { task: value?.id === id ? value : undefined, problem, isLoading, reload };
}

export function TaskPage({ id }: { id: string }) {
    const { task, problem, reload } = useTask(id);
    const who = useStore(whoami);
    const [asking, setAsking] = useState<'cancel' | 'again'>();
    const isMine = mayAct(who);
    if (!task) {
        return <><PageHead title="Task" about={printable(id)} />{problem ? <ProblemBox problem={problem} retry={reload} /> : <p class="faint">…</p>}</>;
    }
    const reason = reasonOf(task);
    const isFollowed = task.state === 'running';
    return (
        <>
            <PageHead title={requestText(task)} about={<>{printable(task.id)} <StateMark state={task.state} text={task.cancelling && !isOver(task.state) ? 'cancelling' : task.state} /></>}>
                {isMine && !isOver(task.state) && <button type="button" class="grave" disabled={task.cancelling === true} onClick={() => setAsking('cancel')}>Cancel…</button>}
                {isMine && isRepeatable(task) && <button type="button" onClick={() => setAsking('again')}>Do again…</button>}
            </PageHead>
            {problem && <ProblemBox problem={problem} retry={reload} />}
            {reason !== '' && (
                <div class={`box ${task.state === 'done' ? 'attention' : 'bad'}`}>
                    <p>{reason}</p>
                    {task.guard && <p class="faint">Refused by the guard <code>{printable(task.guard)}</code></p>}
                    {task.hint && <p>{printable(task.hint)}</p>}
                </div>
            )}
            <Panel title="Its way"><Way task={task} /></Panel>
            {isFollowed && <Panel title="Output" aside={<span class="state busy">live</span>}><OutputView address={ownOutput(task.id)} /></Panel>}
            <Panel title="Commands">
                {task.details.commands.length > 0 ? <Commands task={task} />
                    : <p class="faint">{isOver(task.state) ? 'It ran no command, or what its commands did is not kept any more.' : 'It has run no command yet.'}</p>}
            </Panel>
            <Panel title="What was asked for"><Asked task={task} /></Panel>
            {asking === 'cancel' && <CancelDialog task={task} onClose={() => setAsking(undefined)} />}
            {asking === 'again' && <AgainDialog task={task} onClose={() => setAsking(undefined)} onAccepted={(again) => go(taskAddress(again.id))} />}
        </>
    );
}

