import type { Preview } from '../../api/fleet/run';
import { hostTones } from '../../words/fleet/hosts';
import { printable } from '../../words/printable';
import { counted } from '../../words/size';
import { spanText } from '../../words/time';
import { StateMark } from '../basics';

const mostShown = 200;

/// Hosts that would get an order, and what they would get.
export function HostsPreview({ preview }: { preview: Preview }) {
    const { hosts, kind, product, seconds } = preview;
    const away = hosts.filter((host) => host.state !== 'here').length;
    return (
        <section class="preview" aria-label="Hosts that are meant">
            <p>
                <strong>{counted(hosts.length, 'host')}</strong> would get <code>{printable(`${kind} ${product}`.trim())}</code>
                {seconds > 0 && `, good for ${spanText(seconds)}`}.{' '}
                {away > 0 && <StateMark state="warning" text={`${away} of them ${away === 1 ? 'is' : 'are'} not here now`} />}
            </p>
            <div class="names" tabIndex={0} role="region" aria-label="Their names">
                <ul>
                    {hosts.slice(0, mostShown).map((host) => <li key={host.name}><StateMark state={hostTones[host.state] ?? 'quiet'} text={host.state} /> {printable(host.name)}</li>)}
                    {hosts.length > mostShown && <li class="faint">and {hosts.length - mostShown} more</li>}
                </ul>
            </div>
        </section>
    );
}
