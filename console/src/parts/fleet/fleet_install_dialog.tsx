/// Installs a product on many hosts, from their depots.
import { useState } from 'preact/hooks';
import { RolloutDialog } from './rollout_dialog';

const usualCommand = '/bin/sh |DEPLOYDIR|/install.sh -h |TOVRINHOME|';

export function FleetInstallDialog({ on, products, onClose }: { on: string; products: readonly string[]; onClose: () => void }) {
    const [product, setProduct] = useState('');
    const [version, setVersion] = useState('');
    const [command, setCommand] = useState(usualCommand);
    const [isRestart, setRestart] = useState(false);
    const isComplete = product.trim() !== '' && version.trim() !== '' && command.trim() !== '';
    return (
        <RolloutDialog on={on} onClose={onClose} missing={isComplete ? '' : 'Name the product, its version and the command.'}
            request={{ verb: 'install', arguments: [product.trim(), version.trim()], trailing: [command.trim()], options: { restart: isRestart } }}
            about={<p>Install a product from the depots of the hosts, where it is <code>PRODUCT/VERSION</code>. <code>zavctl push</code> with <code>--on</code> brings it there first.</p>}>
            <div class="fields">
                <label class="field">Product code
                    <input name="product" list="fleet-products" value={product} spellcheck={false} autocomplete="off" onInput={(event) => setProduct(event.currentTarget.value)} />
                </label>
                <label class="field">Version, as in the depot
                    <input name="version" value={version} spellcheck={false} autocomplete="off" onInput={(event) => setVersion(event.currentTarget.value)} />
                </label>
            </div>
            <datalist id="fleet-products">{products.map((name) => <option key={name} value={name} />)}</datalist>
            <label class="field">The install command; |DEPLOYDIR|, |DEPOTDIR| and |TOVRINHOME| stand for the host's directories
                <input name="command" class="mono" value={command} spellcheck={false} autocomplete="off" onInput={(event) => setCommand(event.currentTarget.value)} />
            </label>
            <label class="check"><input type="checkbox" checked={isRestart} onChange={(event) => setRestart(event.currentTarget.checked)} /> The install restarts the host's agent process</label>
        </RolloutDialog>
    );
}
