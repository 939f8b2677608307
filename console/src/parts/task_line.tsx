import type { TaskSummary } from '../api/types';
import { Link } from '../route/link';
import { requestText, reasonOf } from '../words/results';
import { StateMark, Time } from './basics';

export const taskAddress = (id: string): string => `/tasks/${encodeURIComponent(id)}`;

/// A task in a short list: what was asked for, how it stands, why, and when.
export function TaskLine({ task }: { task: TaskSummary }) {
    const reason = reasonOf(task);
    return (
        <li class="line">
            <StateMark state={task.state} text={task.cancelling && task.state === 'running' ? 'cancelling' : task.state} />
            <span class="grow">
                <Link to={taskAddress(task.id)}>{requestText(task)}</Link>
                {reason !== '' && <span class="line-detail">{reason}</span>}
            </span>
            <span class="when"><Time value={task.ended ?? task.started ?? task.accepted} brief /></span>
        </li>
    );
}
