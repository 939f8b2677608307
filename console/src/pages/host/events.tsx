/// Outcomes as they come.
import { useEffect, useMemo, useState } from 'preact/hooks';
import { feedStatus } from '../../live/connection';
import { type FeedItem, feedItems } from '../../live/feed';
import { Empty, PageHead, Search, StateMark, Time } from '../../parts/basics';
import { taskAddress } from '../../parts/task_line';
import { WindowList } from '../../parts/window_list';
import { Link } from '../../route/link';
import { go, parameter, usePlace, withParameters } from '../../route/route';
import { useStore } from '../../state/store';
import { textOf } from '../../api/types';
import { printable } from '../../words/printable';
import { describeRow, reasonOf, requestText, returnCodeOf } from '../../words/results';
import { counted } from '../../words/size';

const columns = [
    { name: 'State', class: 'c-state' },
    { name: 'Event', class: 'c-main' },
    { name: 'Time', class: 'c-time' },
    { name: 'Identifier', class: 'c-id' },
];

function cellsOf({ content, heard, id }: FeedItem) {
    const place = <span class="faint">{printable(id.slice(id.lastIndexOf('-') + 1))}</span>;
    if (content.kind === 'gap') {
        const count = content.missing === null ? 'events' : counted(content.missing, 'event');
        return [<StateMark state="warning" text="gap" />, `${count} before this are not kept any more`, <Time value={heard} />, place];
    }
    if (content.kind === 'task') {
        const { task } = content;
        const reason = reasonOf(task);
        return [<StateMark state={task.state} />,
            <><Link to={taskAddress(task.id)}>{requestText(task)}</Link>{reason !== '' && <span class="aside" title={reason}>{reason}</span>}</>,
            <Time value={task.ended} />, place];
    }
    const { row } = content;
    const isGood = returnCodeOf(row) === 0;
    const what = [textOf(row, 'COMMAND'), textOf(row, 'TARGETMSN')].filter((part) => part !== '').join(' ');
    const detail = isGood && textOf(row, 'RETMSGID') === '' ? textOf(row, 'TRANSID') : describeRow(row);
    return [<span class={`state ${isGood ? 'quiet' : 'bad'}`}>outcome</span>,
        <>{printable(what)} <span class="aside" title={printable(detail)}>{printable(detail)}</span></>, <span class="faint">–</span>, place];
}

const searched = (item: FeedItem): string => JSON.stringify(item.content).toLowerCase();

/// The list stands still while it is read further down; what comes meanwhile is counted.
function useSteady(items: readonly FeedItem[]): { shown: readonly FeedItem[]; waiting: number; release: () => void } {
    const [held, setHeld] = useState<readonly FeedItem[]>();
    useEffect(() => {
        const look = () => setHeld((old) => (scrollY < 120 ? undefined : (old ?? feedItems.get())));
        addEventListener('scroll', look, { passive: true });
        return () => removeEventListener('scroll', look);
    }, []);
    const newest = held?.[0]?.key ?? 0;
    const waiting = held ? items.filter((item) => item.key > newest).length : 0;
    return { shown: held ?? items, waiting, release: () => { setHeld(undefined); scrollTo(0, 0); } };
}

export function EventsPage() {
    const here = usePlace();
    const items = useStore(feedItems);
    const status = useStore(feedStatus);
    const { shown, waiting, release } = useSteady(items);
    const text = parameter(here.search, 'text');
    const kind = parameter(here.search, 'kind');
    const found = useMemo(() => shown.filter((item) => (kind === '' || item.content.kind === kind) && (text === '' || searched(item).includes(text.toLowerCase()))), [shown, text, kind]);
    return (
        <>
            <PageHead title="Events" about={`${counted(found.length, 'event')}, the newest first`}>
                <Search value={text} label="Search events" onChange={(value) => go(withParameters(here, { text: value }), 'replace')} />
            </PageHead>
            <form class="filters" aria-label="Filters" onSubmit={(event) => event.preventDefault()}>
                <label>Kind <select value={kind} onChange={(event) => go(withParameters(here, { kind: event.currentTarget.value }), 'replace')}>
                    <option value="">all</option><option value="task">ends of tasks</option><option value="row">outcomes</option>
                </select></label>
            </form>
            {waiting > 0 && <p class="floating"><button type="button" class="main" onClick={release}>{counted(waiting, 'new event')}: show</button></p>}
            {found.length > 0 && <WindowList label="Events" columns={columns} rows={found} keyOf={(item) => item.key} cells={cellsOf} />}
            {found.length === 0 && status.kind === 'live' && (items.length > 0
                ? <Empty title="No event is like that" />
                : <Empty title="Nothing has happened yet"><p>Outcomes of tasks come up here as they happen. <Link to="/agents">Start an agent</Link> to see one.</p></Empty>)}
        </>
    );
}
