/// Why a request was not done, in the host's own words.
export class Problem extends Error {
    constructor(
        text: string,
        /// The status of the answer; 0: there was none.
        readonly status: number,
        /// The guard that refused; empty: none did.
        readonly guard = '',
        /// The way out; may be empty.
        readonly hint = '',
    ) {
        super(text);
    }

    /// Whether nothing is known of what became of the request.
    get isLost(): boolean {
        return this.status === 0 || this.status === 502 || this.status === 504;
    }
}

function member(document: unknown, name: string): string {
    const value = document !== null && typeof document === 'object' ? (document as Record<string, unknown>)[name] : undefined;
    return typeof value === 'string' ? value : '';
}

/// The problem that an answer of this status and body tells of.
export function problemOf(status: number, body: string): Problem {
    let document: unknown = null;
    try {
        document = JSON.parse(body);
    } catch {
        // Whoever answered was not the host. Its status has to do.
    }
    if (status === 401) {
        return new Problem('this session is over', status, '', 'Open a new link: zavctl console prints it, and with --at-centre one to the console of a centre.');
    }
    const text = member(document, 'error') || `the answer has the status ${status}`;
    return new Problem(text, status, member(document, 'guard'), member(document, 'hint'));
}

export function asProblem(error: unknown): Problem {
    if (error instanceof Problem) return error;
    return new Problem('the console cannot be reached', 0, '', 'What serves it must be running: zavctl console on this machine, or the centre.');
}
