/// Asks whether a verb shall change something that is there.
import type { ComponentChildren } from 'preact';
import { useState } from 'preact/hooks';
import type { FleetRequest } from '../../api/fleet/run';
import { type Problem, asProblem } from '../../api/problem';
import { change } from '../../state/fleet/actions';
import { commandPrefix, useOnlyLooks } from '../../state/session';
import { fleetLine } from '../../words/fleet/lines';
import { CommandLine, ProblemBox } from '../basics';
import { Dialog } from '../dialog';
import { Elsewhere } from './only_looks';

interface ChangeDialogProps {
    request: FleetRequest;
    title: string;
    about: ComponentChildren;
    /// What the button says, and what is said once it is done.
    button: string;
    done: string;
    isGrave?: boolean;
    missing?: string;
    children?: ComponentChildren;
    onClose: () => void;
    onDone?: (output: unknown) => void;
}

export function ChangeDialog({ request, title, about, button, done, isGrave = false, missing = '', children, onClose, onDone }: ChangeDialogProps) {
    const onlyLooks = useOnlyLooks();
    const [isBusy, setBusy] = useState(false);
    const [problem, setProblem] = useState<Problem>();
    const send = async (event: Event) => {
        event.preventDefault();
        if (onlyLooks) return;
        setBusy(true);
        setProblem(undefined);
        try {
            const output = await change(request, done);
            onDone?.(output);
            onClose();
        } catch (error) {
            setProblem(asProblem(error));
            setBusy(false);
        }
    };
    return (
        <Dialog title={title} onClose={onClose} isBusy={isBusy}>
            <form onSubmit={(event) => void send(event)}>
                <div class="about">{about}</div>
                {children}
                {missing === '' && <CommandLine line={fleetLine(commandPrefix(), request)} />}
                {problem && <ProblemBox problem={problem} />}
                <Elsewhere />
                <footer>
                    {missing !== '' && <p class="faint">{missing}</p>}
                    <button type="button" disabled={isBusy} onClick={onClose}>Back</button>
                    {!onlyLooks && <button type="submit" class={isGrave ? 'grave' : 'main'} disabled={isBusy || missing !== ''}>{isBusy ? 'Asking…' : button}</button>}
                </footer>
            </form>
        </Dialog>
    );
}
