/// An agent's configuration, as `zavctl config get` reads it.
import { describeRow, returnCodeOf } from '../words/results';
import { ask } from './client';
import { Problem } from './problem';
import { makeTransid } from './tasks';
import type { QueryAnswer } from './types';

/// As many bytes a row can hold. A text of that length may have been cut.
const contextBytes = 3072;

export interface Configuration {
    text: string;
    /// False: there is more than the host gives as text.
    isWhole: boolean;
}

/// `guarded`: whether the host's guards are on. Throws a Problem.
export async function askConfiguration(product: string, target: string, guarded: boolean): Promise<Configuration> {
    const equal = (column: string, value: string) => ({ column, op: '=', value });
    const where = [equal('COMMAND', 'GETCONFIG'), equal('PRODUCT', product), equal('TRANSID', makeTransid())];
    if (target !== '') where.push(equal('TARGETMSN', target));
    const answer = await ask<QueryAnswer>('/v1/query', { body: { table: 'KAGREQT', where } });
    const row = answer.rows[0];
    if (!row) throw new Problem('the host gave no answer row', 200);
    if (returnCodeOf(row) !== 0) throw new Problem(`config get ${product}: failed; ${describeRow(row)}`, 200);
    const full = answer.full?.find((entry) => entry.row === 0 && entry.column === 'CONTEXT');
    if (full) return { text: full.text, isWhole: full.complete };
    const text = String(row['CONTEXT'] ?? '');
    return { text, isWhole: !guarded || new TextEncoder().encode(text).length < contextBytes };
}
