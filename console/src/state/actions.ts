/// What buttons do: ask for a task, say what becomes of it, and look whether a success is one.
import { askInstances, askInventory } from '../api/host';
import { asProblem } from '../api/problem';
import { type TaskRequest, askForTask, askTask, isOver } from '../api/tasks';
import type { Task } from '../api/types';
import { feedEpoch, feedItems, onFeed } from '../live/feed';
import { noteWork } from '../live/work';
import { titleOf } from '../words/lines';
import { reasonOf } from '../words/results';
import { elapsedText, parsedTime } from '../words/time';
import { type Finding, doubtAboutInstall, doubtAboutState, doubtAboutUninstall } from '../words/verification';
import { health } from './host';
import { notify } from './notices';

/// The task once it is over, as the feed tells it, or the host itself where the feed has lost events.
export function whenOver(task: Task): Promise<Task> {
    if (isOver(task.state)) return Promise.resolve(task);
    for (const item of feedItems.get()) {
        if (item.content.kind === 'task' && item.content.task.id === task.id) return Promise.resolve(item.content.task);
    }
    return new Promise((resolve) => {
        const take = (current: Task) => {
            if (current.id !== task.id || !isOver(current.state)) return;
            stopFeed();
            stopEpoch();
            resolve(current);
        };
        const stopFeed = onFeed((items) => {
            for (const { content } of items) if (content.kind === 'task') take(content.task);
        });
        const stopEpoch = feedEpoch.subscribe(() => void askTask(task.id).then(take, () => undefined));
    });
}

async function verify(request: TaskRequest): Promise<Finding> {
    if (health.get()?.guarded !== true) return {};
    try {
        switch (request.command) {
            case 'START':
            case 'STOP':
            case 'RESTART':
                return doubtAboutState(request, await askInstances());
            case 'INSTALL':
                return doubtAboutInstall(request, await askInventory());
            case 'UNINSTALL':
                return doubtAboutUninstall(request, await askInventory());
            default:
                return {};
        }
    } catch (error) {
        return { note: `not verified: ${asProblem(error).message}` };
    }
}

async function tellEnd(title: string, request: TaskRequest, accepted: Task, key: number): Promise<void> {
    const task = await whenOver(accepted);
    const began = parsedTime(task.accepted);
    const ended = parsedTime(task.ended);
    const took = began && ended ? ` after ${elapsedText(ended.getTime() - began.getTime())}` : '';
    if (task.state !== 'done') {
        notify({ tone: 'bad', text: `${title}: ${task.state}${took}`, detail: reasonOf(task), hint: task.hint, task: task.id }, key);
        return;
    }
    const finding = await verify(request);
    const tone = finding.doubt ? 'bad' : finding.note ? 'attention' : 'good';
    const detail = finding.doubt ?? (finding.note ? `note: ${finding.note}` : reasonOf(task));
    notify({ tone, text: `${title}: done${took}`, detail, task: task.id }, key);
}

/// Asks for the task and says what becomes of it, now and when it is over. Returns it once the host
/// has it. `transid` names the request. Throws a Problem.
export async function act(request: TaskRequest, transid: string): Promise<Task> {
    const title = titleOf(request);
    const task = await askForTask(request, transid);
    const key = notify({ tone: 'info', text: `${title}: accepted`, task: task.id });
    noteWork(task);
    void tellEnd(title, request, task, key);
    return task;
}
