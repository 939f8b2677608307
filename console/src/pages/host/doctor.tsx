/// What the host finds when it checks its home and its machine.
import { askChecks } from '../../api/host';
import type { Check } from '../../api/types';
import { PageHead, Panel, ProblemBox, StateMark } from '../../parts/basics';
import { useResource } from '../../state/resource';
import { printable } from '../../words/printable';
import { counted } from '../../words/size';

const severity: Readonly<Record<string, number>> = { error: 0, warning: 1, ok: 2 };

function summaryOf(checks: readonly Check[]): string {
    const count = (result: string): number => checks.filter((check) => check.result === result).length;
    return `${counted(count('error'), 'error')}, ${counted(count('warning'), 'warning')}, ${count('ok')} in order`;
}

export function DoctorPage() {
    const { value, problem, isLoading, reload } = useResource(askChecks, []);
    const checks = [...(value ?? [])].sort((a, b) => (severity[a.result] ?? 0) - (severity[b.result] ?? 0));
    return (
        <>
            <PageHead title="Doctor" about={value ? summaryOf(value) : 'Checks the home and the machine'}>
                <button type="button" disabled={isLoading} onClick={reload}>{isLoading ? 'Checking…' : 'Check again'}</button>
            </PageHead>
            {problem && <ProblemBox problem={problem} retry={reload} />}
            {value && (
                <Panel title="Checks">
                    <ul class="lines">
                        {checks.map((check, i) => (
                            <li key={i} class="line">
                                <StateMark state={check.result} />
                                <span class="grow"><strong>{printable(check.check)}</strong> {printable(check.text)}
                                    {check.remedy !== '' && <span class="line-detail">{printable(check.remedy)}</span>}</span>
                            </li>
                        ))}
                    </ul>
                </Panel>
            )}
        </>
    );
}
