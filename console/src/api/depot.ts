/// The depot. Paths are what the host calls them: bytes, percent-encoded, so that names that are no
/// text keep theirs.
import { ask, ownHeader } from './client';
import { asProblem, problemOf } from './problem';
import type { Arrival, DepotCheck, DepotEntry, DepotListing, DepotSum } from './types';

/// A path below the depot, percent-encoded but for its slashes.
export type DepotPath = string;

export const encodedPath = (path: string): DepotPath => path.split('/').map(encodeURIComponent).join('/');

/// The path as people read it; bytes that are no text become replacement characters.
export function shownPath(path: DepotPath): string {
    const bytes: number[] = [];
    for (const [whole] of path.matchAll(/%[0-9A-Fa-f]{2}|[^%]|%/gu)) {
        if (whole.length === 3 && whole[0] === '%') bytes.push(parseInt(whole.slice(1), 16));
        else bytes.push(...new TextEncoder().encode(whole));
    }
    return new TextDecoder().decode(new Uint8Array(bytes));
}

export const childOf = (directory: DepotPath, entry: DepotEntry): DepotPath =>
    (directory === '' ? '' : `${directory}/`) + (entry.escaped ?? encodeURIComponent(entry.name));

/// As the value of a parameter: a slash needs no encoding there.
const target = (path: string, parameters: readonly string[]): string =>
    parameters.length === 0 ? path : `${path}?${parameters.join('&')}`;

export const askListing = (path: DepotPath, signal?: AbortSignal): Promise<DepotListing> =>
    ask(target('/v1/depot', path === '' ? [] : [`path=${path}`]), signal ? { signal } : {});

export async function askSums(paths: readonly DepotPath[]): Promise<DepotSum[]> {
    return (await ask<{ files: DepotSum[] }>(target('/v1/depot/sum', paths.map((path) => `path=${path}`)))).files;
}

/// Whether the host would take files of so many bytes together. There are as many as one request can carry.
export const askCheck = (paths: readonly DepotPath[], bytes: number): Promise<DepotCheck> =>
    ask(target('/v1/depot/check', [...paths.map((path) => `path=${path}`), `bytes=${bytes}`]));

export const removeFromDepot = (path: DepotPath, recursive: boolean): Promise<unknown> =>
    ask(target('/v1/depot', [`path=${path}`, ...(recursive ? ['recursive=1'] : [])]), { method: 'DELETE' });

/// Sends a file. `onProgress` hears how many bytes have gone; XMLHttpRequest is what can tell.
/// Throws a Problem.
/// The answer is the JSON document of whoever takes it.
export function putFile<T>(address: string, file: Blob, onProgress: (sent: number) => void, signal: AbortSignal): Promise<T> {
    return new Promise((resolve, reject) => {
        const request = new XMLHttpRequest();
        request.open('PUT', address);
        for (const [name, value] of Object.entries(ownHeader)) request.setRequestHeader(name, value);
        request.setRequestHeader('Content-Type', 'application/octet-stream');
        request.upload.onprogress = (event) => onProgress(event.loaded);
        // An empty file has no progress to report.
        request.upload.onload = () => onProgress(file.size);
        request.onerror = () => reject(asProblem(undefined));
        request.onabort = () => reject(new DOMException('given up', 'AbortError'));
        request.onload = () => {
            if (request.status !== 200) reject(problemOf(request.status, request.responseText));
            else resolve(JSON.parse(request.responseText) as T);
        };
        signal.addEventListener('abort', () => request.abort(), { once: true });
        request.send(file);
    });
}

export const pushFile = (path: DepotPath, file: Blob, onProgress: (sent: number) => void, signal: AbortSignal): Promise<Arrival> =>
    putFile(`/console/depot?path=${path}`, file, onProgress, signal);
