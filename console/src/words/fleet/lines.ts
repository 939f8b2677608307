/// The zavctl line that does on many hosts what a button does.
import { type FleetRequest, givenOptions } from '../../api/fleet/run';
import { shellLine, withInput } from '../shell';

function optionWords(options: FleetRequest['options']): string[] {
    return Object.entries(givenOptions(options)).flatMap(([name, value]) => {
        if (value === true) return [`--${name}`];
        const text = String(value);
        return text.startsWith('-') ? [`--${name}=${text}`] : [`--${name}`, text];
    });
}

/// A single dash means the standard input, and is no option.
const wouldBeOption = (word: string): boolean => word.startsWith('-') && word !== '-';

/// Where a line takes the names of hosts from: they come by its standard input, unless that is taken.
const namesFrom = (request: FleetRequest): FleetRequest['options'] =>
    request.hosts === undefined ? {} : { on: request.input === undefined ? '@/dev/stdin' : '@FILE' };

export function fleetLine(prefix: readonly string[], request: FleetRequest): string {
    const { arguments: words, trailing = [] } = request;
    const areMistaken = words.some(wouldBeOption);
    const before = areMistaken ? [] : words;
    const behind = [...(areMistaken ? words : []), ...trailing];
    const line = shellLine([...prefix, ...request.verb.split(' '), ...before, ...optionWords({ ...request.options, ...namesFrom(request) }), ...(behind.length > 0 ? ['--', ...behind] : [])]);
    if (request.input !== undefined) return withInput(line, request.input);
    return request.hosts === undefined ? line : `printf '%s\\n' ${shellLine(request.hosts)} | ${line}`;
}

/// "start ux", as zavctl's messages begin.
export const fleetTitle = (request: FleetRequest): string =>
    [request.verb, ...request.arguments.filter((word) => word !== '-').slice(0, 1)].join(' ');
