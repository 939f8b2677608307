/// What surrounds every page: the name of the host, the way to the pages, whether the connection
/// holds, notices, and the keyboard.
import type { ComponentChildren } from 'preact';
import { useEffect, useState } from 'preact/hooks';
import { type FeedStatus, feedStatus, retryFeed } from '../live/connection';
import { retryWork, work, workProblem } from '../live/work';
import { usePages } from '../pages/table';
import { Link } from '../route/link';
import { usePlace } from '../route/route';
import { rollouts } from '../state/fleet/rollouts';
import { health, whoami } from '../state/host';
import { isFleet, session } from '../state/session';
import { useStore } from '../state/store';
import { printable } from '../words/printable';
import { Time } from './basics';
import { HelpDialog } from './help_dialog';
import { listenToKeys } from './keyboard';
import { Notices } from './notices';

function Connection() {
    const status = useStore(feedStatus);
    const words = { connecting: 'connecting', live: 'live', paused: 'paused', broken: 'no connection' };
    const tone = status.kind === 'live' ? 'good' : status.kind === 'broken' ? 'bad' : 'quiet';
    return <span class={`state ${tone}`} role="status">{words[status.kind]}</span>;
}

/// What stands behind the reason in the banner.
function outlookOf(status: FeedStatus & { kind: 'broken' }): string {
    const hint = status.problem.hint === '' ? '' : ` ${printable(status.problem.hint)}`;
    if (status.isGivenUp) return `${hint} It is not tried again by itself.`;
    return hint === '' ? ' It is tried again, and what was missed is caught up with.' : hint;
}

function BrokenBanner() {
    const status = useStore(feedStatus);
    const problem = useStore(workProblem);
    if (status.kind !== 'broken' && !problem) return null;
    const retry = () => {
        retryFeed();
        retryWork();
    };
    return (
        <div class="banner" role="alert">
            <p>
                {status.kind === 'broken' && (
                    <>The connection is broken since <Time value={status.since} />: {printable(status.problem.message)}. What you see may be old.{outlookOf(status)}</>
                )}
                {status.kind !== 'broken' && problem && `${printable(problem.message)}. `}
                {problem && ' What waits and what runs is no longer asked for.'}
            </p>
            <button type="button" onClick={retry}>Try now</button>
        </div>
    );
}

function Navigation() {
    const { path } = usePlace();
    const inHand: Readonly<Record<string, number>> = {
        '/tasks': useStore(work)?.length ?? 0,
        '/rollouts': (useStore(rollouts).value ?? []).filter((rollout) => rollout.state === 'running').length,
    };
    return (
        <nav aria-label="Pages">
            <ul>
                {usePages().map((page) => {
                    const count = inHand[page.path] ?? 0;
                    const isHere = page.path === '/' ? path === '/' : path === page.path || path.startsWith(`${page.path}/`);
                    return (
                        <li key={page.path}>
                            <Link to={page.path} aria-current={isHere ? 'page' : undefined}>
                                {page.name}
                                {count > 0 && <span class="count" aria-label={`${count} in hand`}>{count}</span>}
                            </Link>
                        </li>
                    );
                })}
            </ul>
        </nav>
    );
}

/// What is looked at, and who looks.
function useNames(): { title: string; visitor: string } {
    const known = useStore(session);
    const how = useStore(health);
    const who = useStore(whoami);
    if (isFleet(known)) {
        const role = known?.role === 'viewer' ? 'may only look' : known?.onlyLooks ? `${known.role ?? ''}, here only to look` : known?.role;
        return { title: known?.fleet || 'Fleet', visitor: [known?.operator, role].filter((text) => text).join(', ') };
    }
    return { title: how?.origin_node ?? 'Console', visitor: who ? `${who.user}${who.access === 'read' ? ', may only look' : ''}` : '' };
}

export function Frame({ children }: { children: ComponentChildren }) {
    const [isHelpOpen, setHelpOpen] = useState(false);
    const { title, visitor } = useNames();
    const here = useStore(session);
    useEffect(() => listenToKeys(() => setHelpOpen(true)), []);
    return (
        <>
            <a class="skip" href="#main">Skip to the page</a>
            <header class="top">
                <Link to="/" class="brand"><img src="/icon.svg" alt="" width={22} height={22} /><span>{printable(title)}</span></Link>
                <Connection />
                <span class="who faint">{printable(visitor)}</span>
                <button type="button" class="plain" aria-label="Keyboard and help" onClick={() => setHelpOpen(true)}>?</button>
            </header>
            <div class="frame">
                <Navigation />
                <main id="main" tabIndex={-1}>
                    <BrokenBanner />
                    {children}
                    <footer class="foot faint">{here && `${here.program} ${here.version}`}</footer>
                </main>
            </div>
            <Notices />
            {isHelpOpen && <HelpDialog onClose={() => setHelpOpen(false)} />}
        </>
    );
}
