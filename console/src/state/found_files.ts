/// Folders that somebody drops or chooses, and the files in them.
import { Problem } from '../api/problem';

export interface FoundFile {
    file: File;
    /// The names on the way to it from within the folder; the last one is its own.
    names: readonly string[];
}

export interface FoundFolder {
    name: string;
    files: readonly FoundFile[];
    /// What is not among them, a sentence each.
    skipped: readonly string[];
}

/// One is sent after the other, and each has a line on the page. More is work for zavctl.
export const mostFiles = 1000;
/// Of entries that are looked at: folders may hold folders only.
const mostEntries = 4 * mostFiles;
/// A link may lead around in a circle.
const mostDepth = 16;

const tooMany = (name: string): Problem =>
    new Problem(`${name} holds more than this page takes: ${mostFiles} files, ${mostDepth} folders deep`, 0, '', '"zavctl push FOLDER" has no such limit.');

/// What stands in its way belongs into the note of it.
const whyOf = (error: unknown): string => (error instanceof Error && error.message !== '' ? error.message : 'it cannot be read');

/// The next entries of a folder; none at its end.
const nextEntries = (reader: FileSystemDirectoryReader): Promise<FileSystemEntry[]> => new Promise((done, failed) => reader.readEntries(done, failed));
const fileOf = (entry: FileSystemFileEntry): Promise<File> => new Promise((done, failed) => entry.file(done, failed));

/// Walks through one folder.
class Walk {
    readonly files: FoundFile[] = [];
    readonly skipped: string[] = [];
    private seen = 0;

    constructor(private readonly name: string) {}

    async through(folder: FileSystemDirectoryEntry, names: readonly string[]): Promise<void> {
        if (names.length >= mostDepth) throw tooMany(this.name);
        const noted = this.skipped.length;
        const entries = await this.entriesOf(folder, names);
        if (entries.length === 0 && this.skipped.length === noted) this.skipped.push(`${[this.name, ...names].join('/')} is empty`);
        for (const entry of entries) await this.take(entry, [...names, entry.name]);
    }

    /// What cannot be read is noted, and there is nothing in it then.
    private async entriesOf(folder: FileSystemDirectoryEntry, names: readonly string[]): Promise<FileSystemEntry[]> {
        const all: FileSystemEntry[] = [];
        const reader = folder.createReader();
        try {
            // A browser gives a hundred at a time.
            for (let some = await nextEntries(reader); some.length > 0; some = await nextEntries(reader)) {
                all.push(...some);
                if ((this.seen += some.length) > mostEntries) throw tooMany(this.name);
            }
        } catch (error) {
            if (error instanceof Problem) throw error;
            this.skipped.push(`${[this.name, ...names].join('/')}: ${whyOf(error)}`);
        }
        return all.sort((a, b) => (a.name < b.name ? -1 : 1));
    }

    private async take(entry: FileSystemEntry, names: readonly string[]): Promise<void> {
        if (entry.isDirectory) return this.through(entry as FileSystemDirectoryEntry, names);
        if (this.files.length >= mostFiles) throw tooMany(this.name);
        try {
            this.files.push({ file: await fileOf(entry as FileSystemFileEntry), names });
        } catch (error) {
            this.skipped.push(`${[this.name, ...names].join('/')}: ${whyOf(error)}`);
        }
    }
}

/// All files of a folder, in the order of their names. Throws a Problem if there are too many.
export async function filesIn(folder: FileSystemDirectoryEntry): Promise<FoundFolder> {
    const walk = new Walk(folder.name);
    await walk.through(folder, []);
    return { name: folder.name, files: walk.files, skipped: walk.skipped };
}

/// What is dropped: files, and folders by themselves. It has to be asked at once, in the event.
export function droppedIn(transfer: DataTransfer | null): { files: File[]; folders: FileSystemDirectoryEntry[] } {
    const files: File[] = [];
    const folders: FileSystemDirectoryEntry[] = [];
    for (const item of [...(transfer?.items ?? [])]) {
        if (item.kind !== 'file') continue;
        const entry = item.webkitGetAsEntry();
        const file = entry?.isDirectory ? null : item.getAsFile();
        if (entry?.isDirectory) folders.push(entry as FileSystemDirectoryEntry);
        else if (file) files.push(file);
    }
    return { files, folders };
}

/// The folder whose files a browser has found for somebody who chose it. Throws a Problem if there
/// are too many.
export function chosenFolder(files: readonly File[]): FoundFolder {
    const found = files.map((file) => ({ file, names: file.webkitRelativePath.split('/').slice(1) })).filter(({ names }) => names.length > 0);
    const name = files[0]?.webkitRelativePath.split('/')[0] ?? '';
    if (found.length > mostFiles || found.some(({ names }) => names.length > mostDepth)) throw tooMany(name);
    return { name, files: found.sort((a, b) => (a.names.join('/') < b.names.join('/') ? -1 : 1)), skipped: [] };
}
