/// Server-sent events as they come out of a stream of bytes.

export interface ServerEvent {
    /// "message" for events without a name.
    type: string;
    data: string;
    /// The position behind this event; empty as long as none was named.
    id: string;
}

/// Takes text in pieces of any size. An event is told when the blank line behind it has come.
export class EventParser {
    private rest = '';
    private type = '';
    private data: string[] = [];

    /// `id` is the position at which the stream begins.
    constructor(
        private readonly onEvent: (event: ServerEvent) => void,
        private id = '',
    ) {}

    feed(piece: string): void {
        let text = this.rest + piece;
        // A line feed may follow in the next piece, and belong to this line's end.
        const isOpen = text.endsWith('\r');
        if (isOpen) text = text.slice(0, -1);
        const lines = text.split(/\r\n|\r|\n/);
        this.rest = (lines.pop() ?? '') + (isOpen ? '\r' : '');
        for (const line of lines) this.take(line);
    }

    private take(line: string): void {
        if (line === '') return this.end();
        const colon = line.indexOf(':');
        if (colon === 0) return;
        const field = colon < 0 ? line : line.slice(0, colon);
        const value = colon < 0 ? '' : line.slice(colon + 1).replace(/^ /, '');
        if (field === 'data') this.data.push(value);
        else if (field === 'event') this.type = value;
        else if (field === 'id' && !value.includes('\0')) this.id = value;
    }

    private end(): void {
        if (this.data.length > 0) this.onEvent({ type: this.type || 'message', data: this.data.join('\n'), id: this.id });
        this.type = '';
        this.data = [];
    }
}
