/// Asks for the same once more. What is not kept of a task is asked for anew.
import { useState } from 'preact/hooks';
import type { TaskRequest } from '../api/tasks';
import type { Task } from '../api/types';
import { ActionDialog } from './action_dialog';

const repeatable: ReadonlySet<string> = new Set(['START', 'STOP', 'RESTART', 'INSTALL', 'UNINSTALL', 'REMOVEINSTANCE', 'SETCONFIG']);

export const isRepeatable = (task: Task): boolean => repeatable.has(task.command);

/// What stands in the place of a secret that is not kept.
const mask = '***';
/// Longer values are kept in part.
const mostKept = 4096;

function requestOf(task: Task): TaskRequest {
    const { command, product, version, targetmsn, optional, context, uaconfig, uascript } = task;
    const given = Object.entries({ version, targetmsn, optional, context, uaconfig, uascript }).filter(([, value]) => value);
    return { command, product, ...Object.fromEntries(given), ...(task.force ? { force: true } : {}) };
}

export function AgainDialog({ task, onClose, onAccepted }: { task: Task; onClose: () => void; onAccepted: (task: Task) => void }) {
    const request = requestOf(task);
    // Only an import has a metafile; its context holds settings and is kept.
    const isConfiguration = task.command === 'SETCONFIG' && !task.uaconfig;
    const isInPart = (task.context ?? '').includes(mask) || (task.context ?? '').length >= mostKept;
    const isAsked = isConfiguration || isInPart;
    const [context, setContext] = useState(isConfiguration ? '' : (task.context ?? ''));
    const isIncomplete = isAsked && (context.trim() === '' || context.includes(mask));
    const missing = !isIncomplete ? '' : isConfiguration ? 'Give the text of the configuration.' : `Replace ${mask} by what stood there.`;
    return (
        <ActionDialog request={isAsked ? { ...request, context } : request} missing={missing} mayForce onClose={onClose} onAccepted={onAccepted}
            isGrave={task.command === 'UNINSTALL' || task.command === 'REMOVEINSTANCE'}
            about={<p>The same is asked for once more, as a task of its own.</p>}>
            {isAsked && (
                <label class="field">
                    {isConfiguration ? 'The whole configuration; its text is not kept with the task' : 'The context; secrets in it are not kept with the task'}
                    <textarea rows={10} spellcheck={false} value={context} onInput={(event) => setContext(event.currentTarget.value)} />
                </label>
            )}
        </ActionDialog>
    );
}
