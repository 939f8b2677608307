/// Asks for the same once more. What is not kept of a task is asked for anew.
import { useState } from 'preact/hooks';
import type { TaskRequest } from '../api/tasks';
import type { Task } from '../api/types';
import { isCut, isInPart, whatIsMissing } from '../words/kept';
import { ActionDialog } from './action_dialog';

const repeatable: ReadonlySet<string> = new Set(['START', 'STOP', 'RESTART', 'INSTALL', 'UNINSTALL', 'REMOVEINSTANCE', 'SETCONFIG']);

export const isRepeatable = (task: Task): boolean => repeatable.has(task.command);

/// The members of a request with the names that the page has for them.
const names = {
    product: 'product', version: 'version', targetmsn: 'target', optional: 'option', context: 'context', uaconfig: 'metafile', uascript: 'scripts',
} as const;
type Member = keyof typeof names;
const members = Object.keys(names) as Member[];

interface Asked {
    member: Member;
    kept: string;
    label: string;
}

/// Only an import has a metafile; its context holds settings and is kept.
const isConfiguration = (task: Task): boolean => task.command === 'SETCONFIG' && !task.uaconfig;

function askedOf(task: Task): Asked[] {
    const asked = members.filter((member) => isInPart(task[member] ?? '') && !(member === 'context' && isConfiguration(task)))
        .map((member) => {
            const kept = task[member] ?? '';
            const why = isCut(kept) ? 'is cut: the host has not kept its end' : 'holds secrets, which are not kept with the task';
            return { member, kept, label: `The ${names[member]} ${why}` };
        });
    if (!isConfiguration(task)) return asked;
    return [...asked, { member: 'context', kept: '', label: 'The whole configuration; its text is not kept with the task' }];
}

export function AgainDialog({ task, onClose, onAccepted }: { task: Task; onClose: () => void; onAccepted: (task: Task) => void }) {
    const asked = askedOf(task);
    const [given, setGiven] = useState<Partial<Record<Member, string>>>({});
    const valueOf = ({ member, kept }: Asked): string => given[member] ?? kept;
    const kept = Object.fromEntries(members.filter((member) => task[member]).map((member) => [member, task[member]]));
    const anew = Object.fromEntries(asked.map((one) => [one.member, valueOf(one)]));
    const request: TaskRequest = { command: task.command, product: task.product, ...kept, ...anew, ...(task.force ? { force: true } : {}) };
    const missing = asked.map((one) => one.member === 'context' && isConfiguration(task) && valueOf(one).trim() === ''
        ? 'Give the text of the configuration.' : whatIsMissing(names[one.member], one.kept, valueOf(one))).find((text) => text !== '') ?? '';
    return (
        <ActionDialog request={request} missing={missing} mayForce onClose={onClose} onAccepted={onAccepted}
            isGrave={task.command === 'UNINSTALL' || task.command === 'REMOVEINSTANCE'}
            about={<p>The same is asked for once more, as a task of its own.</p>}>
            {asked.map((one) => (
                <label class="field" key={one.member}>
                    {one.label}
                    <textarea rows={10} spellcheck={false} value={valueOf(one)}
                        onInput={(event) => { const { value } = event.currentTarget; setGiven((old) => ({ ...old, [one.member]: value })); }} />
                </label>
            ))}
        </ActionDialog>
    );
}
