/// A value that several parts of the page look at.
import { useEffect, useState } from 'preact/hooks';

export class Store<T> {
    private readonly listeners = new Set<() => void>();

    constructor(private value: T) {}

    get(): T {
        return this.value;
    }

    set(value: T): void {
        if (Object.is(value, this.value)) return;
        this.value = value;
        for (const listener of [...this.listeners]) listener();
    }

    update(change: (value: T) => T): void {
        this.set(change(this.value));
    }

    subscribe(listener: () => void): () => void {
        this.listeners.add(listener);
        return () => this.listeners.delete(listener);
    }
}

/// The store's value; the component is drawn again when it changes.
export function useStore<T>(store: Store<T>): T {
    const [, draw] = useState({});
    const value = store.get();
    useEffect(() => {
        if (!Object.is(store.get(), value)) draw({});
        return store.subscribe(() => draw({}));
    }, [store]);
    return value;
}

/// The list with another entry in one place.
export function replaced<T>(list: readonly T[], place: number, entry: T): T[] {
    const copy = [...list];
    copy[place] = entry;
    return copy;
}
