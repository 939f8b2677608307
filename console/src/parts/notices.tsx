import { Link } from '../route/link';
import { dismiss, notices } from '../state/notices';
import { useStore } from '../state/store';
import { printable } from '../words/printable';
import { rolloutAddress } from '../words/fleet/rollouts';
import { taskAddress } from './task_line';

/// What became of actions. Screen readers say it when it comes.
export function Notices() {
    const all = useStore(notices);
    return (
        <div class="notices" role="status" aria-label="What became of actions">
            {all.map((notice) => (
                <div key={notice.key} class={`notice ${notice.tone}`}>
                    <p><span class={`state ${notice.tone === 'info' ? 'busy' : notice.tone}`}>{printable(notice.text)}</span></p>
                    {notice.detail && <p>{printable(notice.detail)}</p>}
                    {notice.hint && <p class="faint">{printable(notice.hint)}</p>}
                    {notice.task && <p><Link to={taskAddress(notice.task)}>Show the task</Link></p>}
                    {notice.rollout && <p><Link to={rolloutAddress(notice.rollout)}>Show the roll-out</Link></p>}
                    <button type="button" class="plain" aria-label={`Put away: ${printable(notice.text)}`} onClick={() => dismiss(notice.key)}>✕</button>
                </div>
            ))}
        </div>
    );
}
