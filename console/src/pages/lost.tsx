import { Empty, PageHead } from '../parts/basics';
import { Link } from '../route/link';

export function LostPage() {
    return <><PageHead title="No such page" /><Empty title="There is nothing at this address"><p><Link to="/">Overview</Link></p></Empty></>;
}
