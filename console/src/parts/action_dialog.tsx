/// Asks for a task after having shown what is asked for: the words, the zavctl line, what it means.
import type { ComponentChildren } from 'preact';
import { useEffect, useRef, useState } from 'preact/hooks';
import { type Problem, asProblem } from '../api/problem';
import { RequestNames, type TaskRequest } from '../api/tasks';
import type { Task } from '../api/types';
import { act } from '../state/actions';
import { commandPrefix } from '../state/session';
import { notify } from '../state/notices';
import { taskLine, titleOf } from '../words/lines';
import { masked } from '../words/masked';
import { CommandLine, ProblemBox } from './basics';
import { Dialog } from './dialog';

interface ActionDialogProps {
    request: TaskRequest;
    /// What it does, in zavctl's words.
    about: ComponentChildren;
    /// Whether what it does is hard to undo.
    isGrave?: boolean;
    /// Fields of the request that are filled in here.
    children?: ComponentChildren;
    /// Why it cannot be sent yet; empty: it can.
    missing?: string;
    /// Whether the product need not be in the inventory, if somebody insists.
    mayForce?: boolean;
    /// Done right before it is sent; throws a Problem if it must not be.
    before?: () => Promise<void>;
    wide?: boolean;
    onClose: () => void;
    onAccepted?: (task: Task) => void;
}

export function ActionDialog(props: ActionDialogProps) {
    const [force, setForce] = useState(false);
    const [isBusy, setBusy] = useState(false);
    const [problem, setProblem] = useState<Problem>();
    const [names] = useState(() => new RequestNames());
    const isThere = useRef(true);
    useEffect(() => () => {
        isThere.current = false;
    }, []);
    const request = props.mayForce && force ? { ...props.request, force } : props.request;
    const title = titleOf(request);
    const line = taskLine(commandPrefix(), request);
    const send = async (event: Event) => {
        event.preventDefault();
        setBusy(true);
        setProblem(undefined);
        try {
            await props.before?.();
            const task = await act(request, names.nameOf(request));
            props.onClose();
            props.onAccepted?.(task);
        } catch (error) {
            const found = asProblem(error);
            if (!found.isLost) names.forget(request);
            // The page may have been left meanwhile, and its window with it.
            if (!isThere.current) notify({ tone: 'bad', text: `${title}: ${found.isLost ? 'nobody knows whether it was accepted' : 'not accepted'}`, detail: masked(found.message), hint: found.hint });
            setProblem(found);
            setBusy(false);
        }
    };
    const isForceOffered = props.mayForce === true && (force || problem?.guard === 'product');
    return (
        <Dialog title={title} onClose={props.onClose} wide={props.wide === true} isBusy={isBusy}>
            <form onSubmit={(event) => void send(event)}>
                <div class="about">{props.about}</div>
                {props.children}
                {line !== undefined && !props.missing && <CommandLine line={line} />}
                {problem && <ProblemBox problem={problem} />}
                {isForceOffered && (
                    <label class="check">
                        <input type="checkbox" checked={force} onChange={(event) => setForce(event.currentTarget.checked)} />
                        Send it although the inventory does not list the product
                    </label>
                )}
                <footer>
                    {props.missing && <p class="faint">{props.missing}</p>}
                    <button type="button" disabled={isBusy} onClick={props.onClose}>Back</button>
                    <button type="submit" class={props.isGrave ? 'grave' : 'main'} disabled={isBusy || !!props.missing}>
                        {isBusy ? 'Asking…' : `Send ${title}`}
                    </button>
                </footer>
            </form>
        </Dialog>
    );
}
