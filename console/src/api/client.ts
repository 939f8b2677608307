/// Requests to the host, by way of the console's server.
import { Problem, asProblem, problemOf } from './problem';

/// The server takes nothing that changes anything without it: pages of other origins cannot send it.
export const ownHeader = { 'X-Zav-Console': '1' } as const;

export interface Request {
    method?: 'GET' | 'POST' | 'DELETE';
    body?: unknown;
    signal?: AbortSignal;
}

/// The JSON document of the answer. Throws a Problem, or an AbortError if the signal says so.
export async function ask<T>(path: string, request: Request = {}): Promise<T> {
    const { method = request.body === undefined ? 'GET' : 'POST' } = request;
    let answer: Response;
    let text: string;
    try {
        answer = await fetch(path, {
            method,
            headers: {
                ...(method === 'GET' ? {} : ownHeader),
                ...(request.body === undefined ? {} : { 'Content-Type': 'application/json' }),
            },
            ...(request.body === undefined ? {} : { body: JSON.stringify(request.body) }),
            ...(request.signal ? { signal: request.signal } : {}),
        });
        text = await answer.text();
    } catch (error) {
        if (request.signal?.aborted) throw error;
        throw asProblem(error);
    }
    if (!answer.ok) throw problemOf(answer.status, text);
    try {
        return JSON.parse(text) as T;
    } catch {
        throw new Problem('the answer is no JSON document', answer.status);
    }
}

/// A path with parameters; those that are empty or undefined are left out.
export function withQuery(path: string, parameters: Readonly<Record<string, string | number | undefined>>): string {
    const query = new URLSearchParams();
    for (const [name, value] of Object.entries(parameters)) {
        if (value !== undefined && value !== '') query.set(name, String(value));
    }
    const text = query.toString();
    return text === '' ? path : `${path}?${text}`;
}
