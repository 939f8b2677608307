/// The output of a task's commands while it runs.
import type { OutputPiece, TaskState } from '../api/types';
import { Problem } from '../api/problem';
import { EventStream } from './stream';

export interface OutputWatch {
    onPiece(piece: OutputPiece): void;
    /// So many bytes came too fast.
    onLost(bytes: number): void;
    /// A part was lost on its way, and nobody knows how much.
    onGap(): void;
    onEnd(state: TaskState | undefined): void;
    /// It cannot be had now, and is asked for again; undefined: it is there again.
    onBreak(problem: Problem | undefined): void;
    onRefusal(problem: Problem): void;
}

/// Where the one host that the console is for shows it.
export const ownOutput = (task: string): string => `/v1/tasks/${encodeURIComponent(task)}/output?follow=1`;

/// Where the operator's zavctl shows that of a host of the fleet. `host` is a name or a key.
export const hostOutput = (host: string, task: string): string => `/console/output?host=${encodeURIComponent(host)}&task=${encodeURIComponent(task)}`;

/// Returns how to stop following.
export function followOutput(address: string, watch: OutputWatch): () => void {
    const stream = new EventStream(address, {
        onEvent: (event) => {
            const data = JSON.parse(event.data) as { state?: TaskState; lost?: number; error?: string; hint?: string };
            if (event.type === 'end') {
                stream.close();
                watch.onEnd(data.state);
            } else if (event.type === 'overflow') watch.onLost(data.lost ?? 0);
            else if (event.type === 'gap') watch.onGap();
            else if (event.type === 'break') watch.onBreak(new Problem(String(data.error ?? ''), 502, '', String(data.hint ?? '')));
            else if (event.type === 'message') watch.onPiece(data as OutputPiece);
        },
        onOpen: () => watch.onBreak(undefined),
        // That nobody answers is what the whole page says.
        onBreak: (problem) => problem.status !== 0 && watch.onBreak(problem),
        onRefusal: watch.onRefusal,
    });
    return () => stream.close();
}
