/// The output of a task's commands while it runs.
import type { OutputPiece, TaskState } from '../api/types';
import type { Problem } from '../api/problem';
import { EventStream } from './stream';

export interface OutputWatch {
    onPiece(piece: OutputPiece): void;
    /// So many bytes came too fast.
    onLost(bytes: number): void;
    onEnd(state: TaskState | undefined): void;
    onRefusal(problem: Problem): void;
}

/// Returns how to stop following.
export function followOutput(task: string, watch: OutputWatch): () => void {
    const stream = new EventStream(`/v1/tasks/${encodeURIComponent(task)}/output?follow=1`, {
        onEvent: (event) => {
            const data = JSON.parse(event.data) as { state?: TaskState; lost?: number };
            if (event.type === 'end') {
                stream.close();
                watch.onEnd(data.state);
            } else if (event.type === 'overflow') watch.onLost(data.lost ?? 0);
            else if (event.type === 'message') watch.onPiece(data as OutputPiece);
        },
        onRefusal: watch.onRefusal,
    });
    return () => stream.close();
}
