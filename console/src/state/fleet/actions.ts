/// What buttons of a fleet's pages do, and what they say of it.
import { type FleetRequest, type RunResult, rolloutIn, run } from '../../api/fleet/run';
import { asProblem, Problem } from '../../api/problem';
import type { Rollout } from '../../api/fleet/types';
import { fleetTitle } from '../../words/fleet/lines';
import { notify } from '../notices';
import { noteRollout } from './rollouts';

/// Nobody knows whether a roll-out has begun whose answer was lost, and a second one would not be the
/// same one.
function lost(problem: Problem, hint: string): Problem {
    return problem.isLost ? new Problem(problem.message, problem.status, problem.guard, `${problem.hint} ${hint}`.trim()) : problem;
}

const isRollout = (output: unknown): output is Rollout =>
    output !== null && typeof output === 'object' && 'counts' in output && 'plan' in output && 'id' in output;

/// Begins a roll-out. Returns its identifier. Throws a Problem.
export const beginRollout = (request: FleetRequest, hosts: string): Promise<string> => noteBeginning(run(request), fleetTitle(request), hosts);

/// Says what becomes of a roll-out that has been asked for. Returns its identifier. Throws a Problem.
export async function noteBeginning(asked: Promise<RunResult>, title: string, hosts: string): Promise<string> {
    try {
        const { output, messages } = await asked;
        const id = rolloutIn(output);
        if (id === undefined) throw new Problem('the answer names no roll-out', 200, '', 'Look at Roll-outs before you send it again.');
        notify({ tone: messages === '' ? 'good' : 'attention', text: `${title}: begun on ${hosts}`, detail: messages, rollout: id });
        return id;
    } catch (error) {
        throw lost(asProblem(error), 'It may have begun all the same: look at Roll-outs before you send it again.');
    }
}

/// Has a verb change something that is there, and says so. Throws a Problem.
export async function change(request: FleetRequest, done: string): Promise<unknown> {
    try {
        const { output, messages, isWhole } = await run(request);
        if (isRollout(output)) noteRollout(output);
        notify({ tone: isWhole && messages === '' ? 'good' : 'attention', text: `${fleetTitle(request)}: ${done}`, detail: messages });
        return output;
    } catch (error) {
        throw lost(asProblem(error), 'It may have been done all the same: look before you send it again.');
    }
}
