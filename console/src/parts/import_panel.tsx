/// The universal agent's configuration: the import of a metafile of the depot.
import { useState } from 'preact/hooks';
import { mayAct, whoami } from '../state/host';
import { useStore } from '../state/store';
import { ActionDialog } from './action_dialog';
import { Panel } from './basics';

export function ImportPanel({ target }: { target: string }) {
    const who = useStore(whoami);
    const [metafile, setMetafile] = useState('');
    const [scripts, setScripts] = useState('');
    const [port, setPort] = useState('');
    const [isRestart, setRestart] = useState(false);
    const [isSending, setSending] = useState(false);
    const context = [port === '' ? '' : `PORT=${port}`, isRestart ? 'RESTART=Y' : ''].filter((part) => part !== '').join(',');
    const isPort = port === '' || (/^\d{1,5}$/.test(port) && Number(port) > 0 && Number(port) < 65536);
    return (
        <Panel title="Import into the universal agent">
            <p class="faint">The host changes nothing of the universal agent by a text; it imports a metafile and its scripts from the depot.</p>
            <div class="fields">
                <label class="field">Metafile in the depot <input value={metafile} spellcheck={false} placeholder="disks.mdl" onInput={(event) => setMetafile(event.currentTarget.value.trim())} /></label>
                <label class="field">Scripts in the depot, separated by commas <input value={scripts} spellcheck={false} placeholder="disks.sh" onInput={(event) => setScripts(event.currentTarget.value.trim())} /></label>
                <label class="field">Port of the agent's console <input value={port} inputMode="numeric" onInput={(event) => setPort(event.currentTarget.value.trim())} /></label>
            </div>
            <label class="check"><input type="checkbox" checked={isRestart} onChange={(event) => setRestart(event.currentTarget.checked)} /> Add the metafile's data provider to those that are started, which restarts the agent when it is not among them yet</label>
            <p><button type="button" class="main" disabled={metafile === '' || !isPort || !mayAct(who)} onClick={() => setSending(true)}>Import…</button></p>
            {isSending && (
                <ActionDialog mayForce onClose={() => setSending(false)} about={<p>Import a metafile and its scripts from the depot into the universal agent.</p>}
                    request={{ command: 'SETCONFIG', product: 'um', uaconfig: metafile, uascript: scripts, context, targetmsn: target }} />
            )}
        </Panel>
    );
}
