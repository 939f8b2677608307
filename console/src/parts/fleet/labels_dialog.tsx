/// Changes the labels that the centre knows a host by. Those of the host's own configuration stay.
import { useState } from 'preact/hooks';
import type { FleetHost } from '../../api/fleet/types';
import { labelsText } from '../../words/fleet/hosts';
import { printable } from '../../words/printable';
import { ChangeDialog } from './change_dialog';

export function LabelsDialog({ host, onClose, onDone }: { host: FleetHost; onClose: () => void; onDone: () => void }) {
    const [changes, setChanges] = useState('');
    const words = changes.split(/\s+/).filter((word) => word !== '');
    return (
        <ChangeDialog request={{ verb: 'hosts label', arguments: [host.name, ...words], options: {} }} title={`hosts label ${host.name}`}
            about={<p>Change the labels that the centre knows a host by. It gives <code>{printable(labelsText(host.centreLabels)) || 'none'}</code> now.</p>}
            button="Change the labels" done="changed" missing={words.length === 0 ? 'NAME=VALUE gives it a label, NAME- takes one away.' : ''} onClose={onClose} onDone={onDone}>
            <label class="field">Changes, with blanks between them
                <input class="mono" name="labels" value={changes} spellcheck={false} autocomplete="off" placeholder="env=test old-" onInput={(event) => setChanges(event.currentTarget.value)} />
            </label>
        </ChangeDialog>
    );
}
