/// Names for the documents of the host's interface, whose types are generated from its description.
import type { components } from '../generated/host';

type Schemas = components['schemas'];

export type Health = Schemas['Health'];
export type Ready = Schemas['Ready'];
export type Whoami = Schemas['Whoami'];
export type Check = Schemas['Checks'][number];
export type Instance = Schemas['Instances']['instances'][number];
export type Task = Schemas['Task'];
export type TaskSummary = Schemas['TaskSummary'];
export type TaskState = Schemas['TaskState'];
export type TaskList = Schemas['TaskList'];
export type Command = Schemas['Task']['details']['commands'][number];
export type Row = Schemas['Row'];
export type QueryAnswer = Schemas['QueryAnswer'];
export type DepotListing = Schemas['DepotListing'];
export type DepotEntry = Schemas['DepotEntry'];
export type DepotSum = Schemas['DepotSums']['files'][number];
export type DepotCheck = Schemas['DepotCheck'];
export type OutputPiece = Schemas['OutputPiece'];

/// What the console's own server says of this session.
export interface Session {
    mode: string;
    address: string;
    program: string;
    version: string;
    /// What stands before a verb in a line to copy.
    command: string[] | string;
    /// Of a fleet: its name, and whose session the centre has opened.
    fleet?: string;
    operator?: string;
    role?: string;
    /// Whether files for the depots of its hosts are taken.
    push?: boolean;
    /// The server does nothing that changes anything, whoever asks: it is done elsewhere, with zavctl.
    onlyLooks?: boolean;
}

/// A file that has arrived in the depot.
export interface Arrival {
    path: string;
    bytes: number;
    sha256: string;
    verified: boolean;
    notes: string[];
}

/// A column of a row as text; empty if there is none.
export function textOf(row: Readonly<Record<string, unknown>> | null | undefined, column: string): string {
    const value = row?.[column];
    return value === undefined || value === null ? '' : String(value);
}
