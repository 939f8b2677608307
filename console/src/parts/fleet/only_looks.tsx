/// What a page says that shows how something is done, and does nothing itself.
import { useOnlyLooks } from '../../state/session';

/// The note where there would be a button otherwise.
export function Elsewhere() {
    return useOnlyLooks() ? <p class="faint">This page only looks. Copy the line, and run it where you have logged in with zavctl.</p> : null;
}
