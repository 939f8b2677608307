/// How a roll-out is to go: which hosts, in which waves, and when it stops by itself.
import { printable } from '../../words/printable';

export interface Plan {
    on: string;
    waves: string;
    'max-failures': string;
    pause: string;
    wait: string;
    parallel: string;
    expires: string;
}

export const emptyPlan: Plan = { on: '', waves: '', 'max-failures': '', pause: '', wait: '', parallel: '', expires: '' };

interface Field {
    name: keyof Plan;
    label: string;
    example: string;
}

const fields: readonly Field[] = [
    { name: 'waves', label: 'Waves: how many hosts together', example: '1,10%,100%' },
    { name: 'max-failures', label: 'More failures than that pause it', example: '2%' },
    { name: 'pause', label: 'Time between two waves', example: '60s' },
    { name: 'wait', label: 'A wave may take so long', example: '10m' },
    { name: 'parallel', label: 'Hosts of a wave at the same time', example: '50' },
    { name: 'expires', label: 'An order is good for', example: '24h' },
];

interface PlanFieldsProps {
    plan: Plan;
    /// Those that are named; otherwise a selector is asked for.
    hosts: readonly string[] | undefined;
    onChange: (plan: Plan) => void;
}

export function PlanFields({ plan, hosts, onChange }: PlanFieldsProps) {
    const field = (name: keyof Plan) => ({
        name, value: plan[name], spellcheck: false, autocomplete: 'off' as const,
        onInput: (event: { currentTarget: HTMLInputElement }) => onChange({ ...plan, [name]: event.currentTarget.value }),
    });
    return (
        <>
            {hosts && <p class="field">{hosts.length === 1 ? 'Only on the host ' : 'On '}<strong>{hosts.length === 1 ? printable(hosts[0] ?? '') : `${hosts.length} hosts`}</strong></p>}
            {!hosts && <label class="field">
                Hosts: terms joined by commas, all of which must hold, as <code>env=test</code>, <code>site in (a,b)</code>, <code>!old</code>, <code>web-*</code>; <code>*</code> means all
                <input class="mono" {...field('on')} />
            </label>}
            <details>
                <summary>Waves and limits</summary>
                <div class="fields">
                    {fields.map(({ name, label, example }) => <label class="field" key={name}>{label}<input class="mono" placeholder={example} {...field(name)} /></label>)}
                </div>
            </details>
        </>
    );
}
