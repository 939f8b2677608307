/// A folder on its way into the depot, in words.
import { counted } from './size';

/// How far its files are.
export interface FolderCounts {
    files: number;
    arrived: number;
    verified: number;
    refused: number;
    /// They are already there, and are replaced.
    replaced: number;
    /// Their line ends are converted.
    converted: number;
}

/// "7 of 12 arrived, 7 verified, 1 not there".
export function arrivedText({ files, arrived, verified, refused }: FolderCounts): string {
    const parts = [`${arrived} of ${counted(files, 'file')} arrived`];
    if (arrived > 0) parts.push(verified === arrived ? 'all of them verified' : `${verified} verified`);
    if (refused > 0) parts.push(`${refused} not there`);
    return parts.join(', ');
}

/// What the host has said before anything was sent, a sentence each.
export function folderNotes({ replaced, converted }: FolderCounts): string[] {
    return [
        ...(replaced > 0 ? [`${counted(replaced, 'file')} of these names ${replaced === 1 ? 'is' : 'are'} there: gone once the new one is on its way.`] : []),
        ...(converted > 0 ? [`Line ends of ${counted(converted, 'file')} are converted: carriage returns and Ctrl-Z are dropped.`] : []),
    ];
}
