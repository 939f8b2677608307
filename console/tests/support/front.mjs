// The console's server as the page sees it: the same headers, the same session, the same refusals.
// Behind it stands a host, a made-up one or a real one on a Unix socket, or a made-up fleet.
import { createHash, randomBytes } from 'node:crypto';
import { readFile } from 'node:fs/promises';
import http from 'node:http';
import path from 'node:path';

const headers = {
    'Content-Security-Policy':
        "default-src 'none'; script-src 'self'; style-src 'self'; img-src 'self'; connect-src 'self'; base-uri 'none'; form-action 'none'; frame-ancestors 'none'",
    'X-Content-Type-Options': 'nosniff',
    'Referrer-Policy': 'no-referrer',
    'Cross-Origin-Opener-Policy': 'same-origin',
    'Cross-Origin-Resource-Policy': 'same-origin',
    'Cache-Control': 'no-store',
};

const types = { '.html': 'text/html; charset=utf-8', '.js': 'text/javascript; charset=utf-8', '.css': 'text/css; charset=utf-8', '.svg': 'image/svg+xml' };

export function sendJson(response, status, document, more = {}) {
    response.writeHead(status, { 'Content-Type': 'application/json', ...more });
    response.end(`${JSON.stringify(document)}\n`);
}

export async function bodyOf(request) {
    const pieces = [];
    for await (const piece of request) pieces.push(piece);
    return Buffer.concat(pieces);
}

/// Hands a request to the host behind a Unix socket, and its answer back as it comes.
export function socketHost(socketPath) {
    return (request, response) => {
        const { host, cookie, origin, ...passed } = request.headers;
        const inner = http.request({ socketPath, path: request.url, method: request.method, headers: { ...passed, Host: 'localhost' } }, (answer) => {
            response.writeHead(answer.statusCode, answer.headers);
            response.flushHeaders();
            answer.pipe(response);
        });
        inner.on('error', () => (response.headersSent ? response.destroy() : sendJson(response, 502, { error: 'the host is away' })));
        response.on('close', () => inner.destroy());
        request.pipe(inner);
    };
}

/// An answer that is made, and of which another one comes.
const lostAnswer = (response) => ({ writeHead: () => undefined, end: () => sendJson(response, 502, { error: 'the answer was lost' }) });

/// Starts the server on a free port. `host(request, response, url)` answers below /v1/, `depot` takes
/// what is pushed, and `run` what the operator's zavctl of a fleet is to do. `session` is what the server says
/// of itself. `state.hold(request, url)` may keep a request waiting; with `isDeaf` the answers to what changes
/// something are lost, and with `refusal` they are that one. Returns the link to open, and how to end it.
export async function startFront({ page, host, depot, run, command = ['zavctl'], session }) {
    const token = randomBytes(16).toString('hex');
    const cookie = randomBytes(16).toString('hex');
    let isUsed = false;
    const state = { isAway: false, requests: [], hold: undefined, isDeaf: false, isOver: false, refusal: '' };

    const serveFile = async (response, name) => {
        const bytes = await readFile(path.join(page, name));
        const tag = `"${createHash('sha256').update(bytes).digest('hex').slice(0, 16)}"`;
        response.writeHead(200, { 'Content-Type': types[path.extname(name)] ?? 'application/octet-stream', 'Cache-Control': 'no-cache', ETag: tag });
        response.end(bytes);
    };

    const answer = async (request, response) => {
        for (const [name, value] of Object.entries(headers)) response.setHeader(name, value);
        const url = new URL(request.url, 'http://localhost');
        const isApi = url.pathname.startsWith('/v1/') || url.pathname.startsWith('/console/');
        if (url.pathname === '/open') {
            if (isUsed || url.searchParams.get('token') !== token) return sendJson(response, 403, { error: 'the link is used' });
            isUsed = true;
            response.writeHead(303, { Location: '/', 'Set-Cookie': `zav_console=${cookie}; HttpOnly; SameSite=Strict; Path=/` });
            return response.end();
        }
        if (!(request.headers.cookie ?? '').includes(`zav_console=${cookie}`)) return sendJson(response, 401, { error: 'no session' });
        const isSafe = request.method === 'GET' || request.method === 'HEAD';
        if (!isSafe && request.headers['x-zav-console'] !== '1') return sendJson(response, 403, { error: 'the header X-Zav-Console is missing' });
        if (isApi) state.requests.push(`${request.method} ${request.url}`);
        if (url.pathname === '/console/session' && !state.isOver) {
            return sendJson(response, 200, session ?? { mode: 'host', address: '/run/zavhost.sock', program: 'zavctl-console', version: '1.0.0', command });
        }
        if (isApi && state.isOver) return sendJson(response, 401, { error: 'no session' });
        if (isApi) await state.hold?.(request, url);
        if (url.pathname === '/console/depot' && request.method === 'PUT') return depot(request, response, url);
        if (isApi && state.isAway) return sendJson(response, 502, { error: 'the host is away' });
        if (isApi && !isSafe && state.refusal !== '') return sendJson(response, 403, { error: state.refusal });
        const behind = url.pathname === '/console/run' && run ? run : host;
        if (isApi && state.isDeaf && !isSafe) return behind(request, lostAnswer(response), url);
        if (isApi) return behind(request, response, url);
        const name = url.pathname.slice(1);
        return serveFile(response, types[path.extname(name)] ? name : 'index.html');
    };

    const server = http.createServer((request, response) => {
        Promise.resolve(answer(request, response)).catch((error) => {
            if (response.headersSent) response.destroy();
            else sendJson(response, 500, { error: String(error) });
        });
    });
    await new Promise((done) => server.listen(0, '127.0.0.1', done));
    const origin = `http://127.0.0.1:${server.address().port}`;
    return {
        origin,
        link: `${origin}/open?token=${token}`,
        state,
        /// Breaks every connection that is open.
        cut: () => server.closeAllConnections(),
        close: () => {
            server.closeAllConnections();
            return new Promise((done) => server.close(done));
        },
    };
}
