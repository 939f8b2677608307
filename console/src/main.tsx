/// Puts the console into the document.
import { render } from 'preact';
import { useEffect, useRef } from 'preact/hooks';
import './style/app.css';
import { Frame } from './parts/frame';
import { PageHead, ProblemBox } from './parts/basics';
import { View } from './pages/views';
import { usePlace } from './route/route';
import { startFleet } from './state/fleet/centre';
import { startHost } from './state/host';
import { isFleet, learnSession, session, sessionProblem } from './state/session';
import { useStore } from './state/store';

function Console() {
    const { path } = usePlace();
    const problem = useStore(sessionProblem);
    const known = useStore(session);
    const first = useRef(true);
    useEffect(() => {
        // Whoever cannot see the page change is told by where the focus is.
        const isPlaced = document.activeElement?.matches('[data-search]') ?? false;
        if (!first.current && !isPlaced) document.querySelector<HTMLElement>('h1')?.focus({ preventScroll: true });
        first.current = false;
    }, [path]);
    // What is being written on a page stays there when the session ends.
    return (
        <Frame>
            {problem && !known && <PageHead title="Console" />}
            {problem && <ProblemBox problem={problem} />}
            {(known || !problem) && <View path={path} />}
        </Frame>
    );
}

/// Until the console's server has said what it is for there is nothing to listen to.
async function start(): Promise<void> {
    const pauses = [500, 1_000, 2_000, 4_000, 8_000];
    for (let tries = 0; !session.get(); ++tries) {
        await learnSession();
        const isOver = sessionProblem.get()?.status === 401;
        if (isOver || tries === pauses.length) break;
        if (!session.get()) await new Promise((done) => setTimeout(done, pauses[tries]));
    }
    const known = session.get();
    if (known) (isFleet(known) ? startFleet : startHost)();
}

void start();

const root = document.getElementById('app');
if (root) {
    root.textContent = '';
    render(<Console />, root);
}
