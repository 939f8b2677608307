/// A document of the host that a component shows.
import { useCallback, useEffect, useRef, useState } from 'preact/hooks';
import { type Problem, asProblem } from '../api/problem';

export interface Resource<T> {
    /// The last one that came for these inputs, also while a newer one is on its way or could not be had.
    value?: T;
    problem?: Problem;
    isLoading: boolean;
    reload: () => void;
}

/// Asks when it is first shown, when one of `inputs` changes, and on `reload`. An answer that is no
/// longer wanted is dropped, and what other inputs had brought goes at once: it would stand below the
/// wrong heading.
export function useResource<T>(load: (signal: AbortSignal) => Promise<T>, inputs: readonly unknown[]): Resource<T> {
    const [state, setState] = useState<Omit<Resource<T>, 'reload'>>({ isLoading: true });
    /// The `reload` that has brought the state: there is one for each set of inputs.
    const source = useRef<unknown>(undefined);
    const current = useRef<AbortController | undefined>(undefined);
    const reload: () => void = useCallback(() => {
        current.current?.abort();
        const controller = new AbortController();
        current.current = controller;
        const isOther = source.current !== reload;
        source.current = reload;
        setState((old) => ({ ...(isOther ? {} : old), isLoading: true }));
        load(controller.signal).then(
            (value) => {
                if (!controller.signal.aborted) setState({ value, isLoading: false });
            },
            (error: unknown) => {
                if (controller.signal.aborted) return;
                setState((old) => ({ ...old, problem: asProblem(error), isLoading: false }));
            },
        );
    }, inputs);
    useEffect(() => {
        reload();
        return () => current.current?.abort();
    }, [reload]);
    return source.current === reload ? { ...state, reload } : { isLoading: true, reload };
}
