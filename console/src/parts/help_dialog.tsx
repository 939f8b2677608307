import { usePages } from '../pages/table';
import { useStore } from '../state/store';
import { Dialog } from './dialog';
import { areKeysOn } from './keyboard';

export function HelpDialog({ onClose }: { onClose: () => void }) {
    const isOn = useStore(areKeysOn);
    const keys: readonly (readonly [string, string])[] = [
        ['/', 'Search on this page'],
        ...usePages().map((page) => [`g ${page.key}`, page.name] as const),
        ['Esc', 'Close a window'],
        ['?', 'This help'],
    ];
    return (
        <Dialog title="Keyboard" onClose={onClose}>
            <dl class="keys">{keys.map(([key, what]) => <div key={key}><dt>{key.split(' ').map((one) => <kbd key={one}>{one}</kbd>)}</dt><dd>{what}</dd></div>)}</dl>
            <label class="check"><input type="checkbox" checked={isOn} onChange={(event) => areKeysOn.set(event.currentTarget.checked)} /> Keys of one letter are on</label>
            <p class="faint">Whatever this page does, <code>zavctl</code> does too: each action shows the line for it. <code>zavctl --help</code> lists all.</p>
        </Dialog>
    );
}
