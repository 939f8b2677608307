/// Installs a product from a folder of the depot.
import { useState } from 'preact/hooks';
import { askListing, encodedPath } from '../api/depot';
import type { TaskRequest } from '../api/tasks';
import { Link } from '../route/link';
import { useResource } from '../state/resource';
import { ActionDialog } from './action_dialog';

const usualCommand = "/bin/sh |DEPLOYDIR|/install.sh -h |TOVRINHOME|";

async function directoriesOf(path: string, signal: AbortSignal): Promise<string[]> {
    const listing = await askListing(encodedPath(path), signal);
    return listing.entries.filter((entry) => entry.type === 'directory' && !entry.escaped).map((entry) => entry.name);
}

export function InstallDialog({ onClose }: { onClose: () => void }) {
    const [product, setProduct] = useState('');
    const [version, setVersion] = useState('');
    const [command, setCommand] = useState(usualCommand);
    const [optional, setOptional] = useState('');
    const [isRestart, setRestart] = useState(false);
    const products = useResource((signal) => directoriesOf('', signal), []);
    const versions = useResource(
        async (signal) => (products.value?.includes(product) ? directoriesOf(product, signal) : []), [products.value, product]);
    const request: TaskRequest = {
        command: 'INSTALL', product: product.trim(), version: version.trim(), context: command.trim(),
        ...(isRestart ? { optional: 'REQUIRES_RESTART' } : optional.trim() === '' ? {} : { optional: optional.trim() }),
    };
    const isComplete = request.product !== '' && request.version !== '' && request.context !== '';
    return (
        <ActionDialog request={request} onClose={onClose} missing={isComplete ? '' : 'Name the product, its version and the command.'} wide
            about={<p>Install a product from the depot, where it is <code>PRODUCT/VERSION</code>. Not there yet? <Link to="/depot">Push it first.</Link></p>}>
            <div class="fields">
                <label class="field">Product code
                    <input list="depot-products" value={product} spellcheck={false} autocomplete="off" onInput={(event) => setProduct(event.currentTarget.value)} />
                </label>
                <label class="field">Version, as in the depot
                    <input list="depot-versions" value={version} spellcheck={false} autocomplete="off" onInput={(event) => setVersion(event.currentTarget.value)} />
                </label>
            </div>
            <datalist id="depot-products">{products.value?.map((name) => <option key={name} value={name} />)}</datalist>
            <datalist id="depot-versions">{versions.value?.map((name) => <option key={name} value={name} />)}</datalist>
            <label class="field">The install command; |DEPLOYDIR|, |DEPOTDIR| and |TOVRINHOME| stand for the host's directories
                <input class="mono" value={command} spellcheck={false} autocomplete="off" onInput={(event) => setCommand(event.currentTarget.value)} />
            </label>
            <label class="check"><input type="checkbox" checked={isRestart} onChange={(event) => setRestart(event.currentTarget.checked)} /> The install restarts the host's agent process</label>
            {!isRestart && (
                <label class="field">Qualifier, usually empty; any text asks for the translator's -setCMS step
                    <input value={optional} spellcheck={false} onInput={(event) => setOptional(event.currentTarget.value)} />
                </label>
            )}
        </ActionDialog>
    );
}
