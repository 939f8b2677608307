/// Puts the console into the document.
import { render } from 'preact';
import { useEffect, useRef } from 'preact/hooks';
import './style/app.css';
import { startFeed } from './live/feed';
import { startWork } from './live/work';
import { Frame } from './parts/frame';
import { PageHead, ProblemBox } from './parts/basics';
import { View } from './pages/views';
import { usePlace } from './route/route';
import { sessionProblem, startHost } from './state/host';
import { useStore } from './state/store';

function Console() {
    const { path } = usePlace();
    const problem = useStore(sessionProblem);
    const first = useRef(true);
    useEffect(() => {
        // Whoever cannot see the page change is told by where the focus is.
        const isPlaced = document.activeElement?.matches('[data-search]') ?? false;
        if (!first.current && !isPlaced) document.querySelector<HTMLElement>('h1')?.focus({ preventScroll: true });
        first.current = false;
    }, [path]);
    return <Frame>{problem ? <><PageHead title="Console" /><ProblemBox problem={problem} /></> : <View path={path} />}</Frame>;
}

startHost();
startFeed();
startWork();

const root = document.getElementById('app');
if (root) {
    root.textContent = '';
    render(<Console />, root);
}
