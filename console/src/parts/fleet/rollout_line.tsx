import type { Rollout } from '../../api/fleet/types';
import { Link } from '../../route/link';
import { progressText, reasonText, rolloutAddress, rolloutTone, workText } from '../../words/fleet/rollouts';
import { printable } from '../../words/printable';
import { StateMark, Time } from '../basics';
import { RolloutBar } from './rollout_bar';

/// A roll-out in a short list.
export function RolloutLine({ rollout }: { rollout: Rollout }) {
    const reason = reasonText(rollout);
    return (
        <li class="line">
            <StateMark state={rolloutTone(rollout)} text={rollout.state} />
            <span class="grow">
                <Link to={rolloutAddress(rollout.id)}>{workText(rollout)} on {printable(rollout.selector)}</Link>
                <span class="line-detail">{progressText(rollout)}{reason !== '' && `; ${reason}`}</span>
                {rollout.state === 'running' && <RolloutBar rollout={rollout} />}
            </span>
            <span class="when"><Time value={rollout.since} brief /></span>
        </li>
    );
}
