/// A task's way on a time line: accepted, handed over, running, over; and its commands.
import type { Command, Task } from '../api/types';
import { isOver } from '../api/tasks';
import { useStore } from '../state/store';
import { printable, redacted, redactedLines } from '../words/printable';
import { endText, endedBadly } from '../words/results';
import { elapsedText, parsedTime } from '../words/time';
import { StateMark, Time, now } from './basics';

interface Step {
    name: string;
    time?: string | null | undefined;
    isReached: boolean;
    note?: string;
}

function stepsOf(task: Task): Step[] {
    const isStarted = task.started !== null;
    const wasHandedOver = task.reply !== null || task.run !== undefined || isStarted;
    return [
        { name: 'Accepted', time: task.accepted, isReached: true, note: `by ${printable(task.asker)}` },
        { name: 'Handed over', isReached: wasHandedOver, note: task.run === undefined ? '' : `run ${task.run} of the host` },
        { name: 'Running', time: task.started, isReached: isStarted },
        { name: isOver(task.state) ? 'Over' : 'Not over', time: task.ended, isReached: isOver(task.state) },
    ];
}

export function Way({ task }: { task: Task }) {
    return (
        <ol class="way">
            {stepsOf(task).map((step) => (
                <li key={step.name} class={step.isReached ? 'reached' : ''}>
                    <strong>{step.name}</strong>
                    {step.name === 'Over' && <StateMark state={task.state} />}
                    <span>{step.time ? <Time value={step.time} /> : step.isReached ? '' : <span class="faint">not yet</span>}</span>
                    {step.isReached && step.note && <span class="faint">{step.note}</span>}
                </li>
            ))}
        </ol>
    );
}

const milliseconds = (text: string | null | undefined): number | undefined => parsedTime(text)?.getTime();

function Bar({ command, from, to, current }: { command: Command; from: number; to: number; current: number }) {
    const began = milliseconds(command.started) ?? from;
    const ended = milliseconds(command.ended) ?? current;
    const whole = Math.max(to - from, 1);
    const left = Math.min(Math.max((began - from) / whole, 0), 1) * 100;
    const width = Math.max(Math.min((ended - began) / whole, 1) * 100, 0.6);
    const tone = command.ended === null ? 'busy' : endedBadly(command) ? 'bad' : 'good';
    return <span class={`bar ${tone}`} style={{ left: `${Math.min(left, 99.4)}%`, width: `${Math.min(width, 100 - left)}%` }} />;
}

/// Each command with its place in the task's time, its end and its last words.
export function Commands({ task }: { task: Task }) {
    const current = useStore(now).getTime();
    const commands = task.details.commands;
    const from = Math.min(...commands.map((command) => milliseconds(command.started) ?? Infinity), milliseconds(task.started) ?? Infinity);
    const to = Math.max(...commands.map((command) => milliseconds(command.ended) ?? current), milliseconds(task.ended) ?? 0);
    return (
        <ul class="commands">
            {commands.map((command, i) => (
                <li key={i}>
                    <code class="command">{redacted(command.command)}</code>
                    <div class="bars" aria-hidden="true"><Bar command={command} from={from} to={to} current={current} /></div>
                    <p class="command-end">
                        <span class={`state ${command.ended === null ? 'busy' : endedBadly(command) ? 'bad' : 'good'}`}>{endText(command)}</span>
                        <span><Time value={command.started} /></span>
                        {command.ended && <span class="faint">took {elapsedText((milliseconds(command.ended) ?? 0) - (milliseconds(command.started) ?? 0))}</span>}
                        {command.pid !== undefined && <span class="faint">process {command.pid}</span>}
                    </p>
                    {command.stdout && <Words name="standard output" text={command.stdout} />}
                    {command.stderr && <Words name="standard error" text={command.stderr} />}
                </li>
            ))}
        </ul>
    );
}

function Words({ name, text }: { name: string; text: string }) {
    return (
        <>
            <h3>{name}</h3>
            <pre class="output short" tabIndex={0} role="region" aria-label={name}>{redactedLines(text)}</pre>
        </>
    );
}
