// A host made of JavaScript: answers in the form of docs/openapi.json, with tasks that really wait,
// run and end, streams that can be resumed, and names that try to be scripts.
import { createHash } from 'node:crypto';
import { bodyOf, sendJson } from './front.mjs';

/// If any of these ran, the page would report it: see browser.mjs.
export const script = `<img src=x onerror="reportFault('a script of the host ran')"><script>reportFault('a script of the host ran')</script>`;

const journal = 'a0a99408e7707b3d';
const node = 'db7.example:ZAV';

const rowOf = (task) => ({
    ORIGINNODE: node, TRANSID: task.transid, COMMAND: task.command, RETVAL: task.state === 'done' ? 0 : 8,
    RETMSGID: task.state === 'done' ? '' : 'ZAV1024E', RETMSGPARM: task.state === 'done' ? '' : '4', TARGETMSN: task.targetmsn ?? '',
});

const summary = ({ reply, events, details, run, boot, ...rest }) => rest;

/// `now` in milliseconds is the moment at which the host's history ends. `isHostile` puts scripts into
/// every text that a host can fill.
export function makeFakeHost({ tasks: count = 40, isHostile = false, access = 'act', now = Date.now(), isEmpty = false } = {}) {
    const evil = (text) => (isHostile ? `${text}${script}` : text);
    const tasks = [];
    const events = [];
    const streams = new Set();
    const outputs = new Map();
    const instances = isEmpty ? [] : [
        { product: 'ux', instance: '', target: evil('db7:UX'), state: 'running', user: evil('tovrin'), pid: 4711 },
        { product: 'ux', instance: 'db1', target: 'db1:db7:UX', state: 'missing', user: 'tovrin', pid: null },
        { product: 'um', instance: '', target: 'db7:UA', state: 'stopped', user: null, pid: null },
    ];
    const products = isEmpty ? [] : [
        { PRODUCT: 'ax', VERSION: '070100000', PRODDESC: evil('Shared component'), RELEASE: '100', PLATFORM: 'lx8266' },
        { PRODUCT: 'ux', VERSION: evil('070100000'), PRODDESC: 'Monitoring agent for load and memory and disk', RELEASE: evil('100'), PLATFORM: evil('lx8266') },
        { PRODUCT: 'um', VERSION: '070100000', PRODDESC: 'Universal agent for scripts and files', RELEASE: '100', PLATFORM: 'lx8266' },
    ];
    const file = (text) => ({ type: 'file', content: Buffer.from(text), modified: new Date(now - 7_200_000).toISOString() });
    const depot = new Map(isEmpty ? [] : [
        ['ux/7.1/install.sh', file('#!/bin/sh\n')], ['ux/7.2/package.tar', file('x'.repeat(81_920))], ['um/7.1/install.sh', file('#!/bin/sh\nexit 0\n')],
        [evil('notes.txt'), file('read me\n')], ['disks.mdl', file('//APPL disks\n')], ['package.tar', file('y'.repeat(3_400_000))],
    ]);
    const configurations = new Map([['ux', evil('INSTANCE=\n# Seconds between two lines of figures.\nINTERVAL=5\n# A larger file is rotated.\nMAX_KB=1024\nSTART_SECONDS=1\nSTOP_SECONDS=5\n')]]);
    let isAddingPast = true;

    const at = (milliseconds) => new Date(milliseconds).toISOString();

    const tell = (type, data) => {
        const event = { id: `${journal}-${events.length + 1}`, type, data };
        events.push(event);
        if (!isAddingPast) for (const stream of streams) stream(event);
    };

    const end = (task, state, more = {}) => {
        Object.assign(task, { state, ...more });
        task.ended ??= at(Date.now());
        if (task.state === 'done' || task.state === 'failed') {
            const row = rowOf(task);
            task.events = [row];
            tell('message', row);
        }
        tell('task', task);
    };

    const create = (given) => {
        const task = {
            id: `${journal}-${tasks.length + 1}`, transid: '', command: 'START', product: 'ux', state: 'queued', accepted: at(Date.now()),
            started: null, ended: null, asker: evil('root'), reply: null, events: [], details: { commands: [] }, ...given,
        };
        tasks.push(task);
        return task;
    };

    const commandOf = (task, exit) => ({
        command: evil(`/opt/tovrin/bin/TovrinAgent -h /opt/tovrin ${task.command.toLowerCase()} ${task.product}`), pid: 4000 + tasks.length,
        started: task.started, ended: task.ended, ...(exit === undefined ? {} : { exit }), stdout: evil('checking the machine\n'),
        stderr: evil(exit === 0 ? `TovrinAgent: ${task.product} started, process 4711\n` : 'TovrinAgent: ux runs already\n'),
    });

    const addPast = (index) => {
        const commands = ['START', 'GETCONFIG', 'STOP', 'RESTART', 'SETCONFIG', 'INSTALL'];
        const command = commands[index % commands.length];
        const began = now - (count - index) * (index > count - 60 ? 57_000 : 600_000);
        const state = index % 17 === 5 ? 'failed' : index % 29 === 7 ? 'interrupted' : index % 31 === 3 ? 'refused' : 'done';
        const task = create({
            command, accepted: at(began), started: at(began + 20), ended: at(began + 1_400 + (index % 7) * 300), transid: evil(`nightly-${index}`),
            targetmsn: evil(index % 4 === 1 ? 'db1:db7:UX' : ''), product: evil(index % 5 === 2 ? 'um' : 'ux'), run: 3, boot: '828ffaec-a14e', ...(command === 'INSTALL' ? { version: evil('7.1'), context: evil('/bin/sh |DEPLOYDIR|/install.sh') } : {}),
        });
        task.details.commands = [commandOf(task, state === 'done' ? 0 : 4)];
        const more = state === 'interrupted' ? { reason: evil('the host ended in the middle of it; the inventory lists ux 7.1') }
            : state === 'refused' ? { guard: evil('product'), reason: evil('ux is not installed here'), hint: evil('installed: ax, um') } : {};
        end(task, state, more);
    };
    for (let i = 0; i < (isEmpty ? 0 : count); ++i) addPast(i);
    isAddingPast = false;

    const say = (task, stream, text) => {
        const output = outputs.get(task.id);
        output.pieces.push({ stream, text });
        for (const reader of output.readers) reader(output.pieces.length - 1);
    };

    const settle = (task) => {
        const instance = instances.find((one) => one.product === task.product && (task.targetmsn ? one.target === task.targetmsn : one.instance === ''));
        const runs = task.command !== 'STOP';
        if (instance && /^(START|STOP|RESTART)$/.test(task.command)) {
            Object.assign(instance, { state: runs ? 'running' : 'stopped', pid: runs ? 4242 : null, user: runs ? 'tovrin' : null });
        }
        if (task.command === 'UNINSTALL') products.splice(0, products.length, ...products.filter((row) => row.PRODUCT !== task.product));
        if (task.command === 'REMOVEINSTANCE') instances.splice(0, instances.length, ...instances.filter((one) => one.target !== task.targetmsn));
        if (task.command === 'INSTALL') products.push({ PRODUCT: task.product, VERSION: task.version, PRODDESC: 'New', RELEASE: '100', PLATFORM: 'lx8266' });
    };

    let isBusy = false;
    let pace = 350;
    const work = () => {
        const task = tasks.find((one) => one.state === 'queued');
        if (isBusy || !task) return;
        isBusy = true;
        Object.assign(task, { state: 'running', started: at(Date.now()), run: 3, reply: { ...rowOf({ ...task, state: 'done' }) } });
        outputs.set(task.id, { pieces: [], readers: new Set() });
        task.details.commands = [{ ...commandOf(task, undefined), ended: null, stdout: '', stderr: '' }];
        const lines = setInterval(() => say(task, 'stdout', evil(`line ${outputs.get(task.id).pieces.length + 1}\n`)), Math.min(pace / 4, 400));
        task.finish = (state) => {
            clearInterval(lines);
            clearTimeout(timer);
            delete task.finish;
            isBusy = false;
            task.ended = at(Date.now());
            Object.assign(task.details.commands[0], { ended: task.ended, exit: state === 'done' ? 0 : 4 });
            if (state === 'done') settle(task);
            if (task.command === 'SETCONFIG' && state === 'done' && task.text) configurations.set(task.product, task.text);
            end(task, state);
            for (const reader of outputs.get(task.id).readers) reader(-1);
            work();
        };
        const timer = setTimeout(() => task.finish(task.product === 'bad' ? 'failed' : 'done'), pace);
    };

    const openStream = (response, position) => {
        response.writeHead(200, { 'Content-Type': 'text/event-stream', 'Last-Event-ID': position });
        response.flushHeaders();
    };
    const sendEvent = (response, { id, type, data }) =>
        response.write(`id: ${id}\n${type === 'message' ? '' : `event: ${type}\n`}data: ${JSON.stringify(data)}\n\n`);

    const eventStream = (request, response) => {
        const last = request.headers['last-event-id'] ?? '';
        let next = last === '' ? events.length : Number(last.slice(last.lastIndexOf('-') + 1));
        openStream(response, `${journal}-${next}`);
        for (; next < events.length; ++next) sendEvent(response, events[next]);
        const listener = (event) => sendEvent(response, event);
        streams.add(listener);
        response.on('close', () => streams.delete(listener));
    };

    const outputStream = (task, request, response) => {
        const output = outputs.get(task.id) ?? { pieces: [], readers: new Set() };
        const last = Number(request.headers['last-event-id'] ?? 0);
        openStream(response, String(last));
        const tellPiece = (i) => (i < 0 ? finish() : sendEvent(response, { id: String(i + 1), type: 'message', data: output.pieces[i] }));
        const finish = () => {
            response.write(`event: end\ndata: ${JSON.stringify({ state: task.state })}\n\n`);
            response.end();
        };
        for (let i = last; i < output.pieces.length; ++i) tellPiece(i);
        if (task.state !== 'running') return finish();
        output.readers.add(tellPiece);
        response.on('close', () => output.readers.delete(tellPiece));
    };

    const accept = (given) => {
        const { once, force, ...members } = given;
        const known = tasks.find((task) => task.transid === given.transid);
        if (known) return [202, known];
        if (given.product === 'zz' && !force) {
            return [409, { error: evil('zz is not installed here'), guard: evil('product'), hint: evil('installed: ax, um, ux') }];
        }
        const { context, ...kept } = members;
        const task = create(given.command === 'SETCONFIG' && !given.uaconfig ? kept : members);
        Object.defineProperty(task, 'text', { value: context, enumerable: false });
        setTimeout(work, 60);
        return [202, task];
    };

    const query = ({ table, where = [] }) => {
        const of = (column) => where.find((one) => one.column === column)?.value ?? '';
        if (table === 'KINAGT') return { rows: products };
        const product = of('PRODUCT');
        const text = configurations.get(product);
        const task = create({ command: 'GETCONFIG', product, transid: of('TRANSID'), state: 'done', started: at(Date.now()) });
        end(task, text === undefined ? 'failed' : 'done');
        const row = { ...rowOf(task), CONTEXT: (text ?? '').slice(0, 100) };
        return text === undefined ? { rows: [{ ...row, RETVAL: 4, RETMSGID: 'ZAV1007E' }] } : { rows: [row], full: [{ row: 0, column: 'CONTEXT', text, complete: true }] };
    };

    const list = (parameters) => {
        const limit = Number(parameters.get('limit') ?? 100);
        const after = Number(parameters.get('after') ?? Infinity);
        const since = parameters.get('since') ?? '';
        const found = [];
        for (let i = Math.min(tasks.length, after - 1); i > 0 && found.length <= limit; --i) {
            const task = tasks[i - 1];
            const fits = ['state', 'product', 'command'].every((name) => !parameters.get(name) || task[name] === parameters.get(name));
            if (fits && task.accepted >= since) found.push([i, summary(task)]);
        }
        const shown = found.slice(0, limit);
        return { tasks: shown.map(([, task]) => task), next: found.length > limit ? shown.at(-1)[0] : null };
    };

    const listing = (directory) => {
        const entries = new Map();
        const prefix = directory === '' ? '' : `${directory}/`;
        for (const [name, { content, modified }] of depot) {
            if (!name.startsWith(prefix)) continue;
            const [head, ...rest] = name.slice(prefix.length).split('/');
            entries.set(head, rest.length > 0 && !head.includes('<') ? { name: head, type: 'directory', bytes: 0, modified }
                : { name: name.slice(prefix.length), type: 'file', bytes: content.length, modified });
        }
        if (directory !== '' && entries.size === 0) return undefined;
        return { path: directory, type: 'directory', entries: [...entries.values()].sort((a, b) => (a.name < b.name ? -1 : 1)), complete: true };
    };

    const sumOf = (content) => createHash('sha256').update(content).digest('hex');

    const checks = [
        { check: 'home', result: 'ok', text: evil('/opt/tovrin'), remedy: '' },
        { check: evil('java'), result: 'warning', text: evil('bundles hold .jar files, and there is no Java'), remedy: evil('install a Java runtime, or set JAVA_HOME') },
        { check: 'space', result: 'ok', text: '41 GiB and 2,600,000 files free', remedy: '' },
        { check: 'clock', result: 'ok', text: 'not behind the files of the home', remedy: '' },
    ];

    const routes = {
        'GET /v1/health': () => ({ version: evil('1.0.0'), width: 64, home: evil('/opt/tovrin'), origin_node: evil(node), uptime_seconds: 273_600, subscriptions: 1, guarded: true, journal }),
        'GET /v1/ready': () => ({ ready: true, reasons: [] }),
        'GET /v1/whoami': () => ({ user: evil('ada'), uid: 1000, gid: 1000, pid: 99, access, reason: evil(access === 'act' ? "the host's own user" : 'the group watchers') }),
        'GET /v1/instances': () => ({ instances }),
        'GET /v1/doctor': () => checks,
    };

    const forbidden = (request, response) => {
        if (access === 'act' || request.method === 'GET') return false;
        if (new URL(request.url, 'http://localhost').pathname === '/v1/query') return false;
        sendJson(response, 403, { error: 'ada may only look' });
        return true;
    };

    async function host(request, response, url) {
        const route = routes[`${request.method} ${url.pathname}`];
        const parameters = url.searchParams;
        if (forbidden(request, response)) return undefined;
        if (route) return sendJson(response, 200, route());
        if (url.pathname === '/v1/events') return eventStream(request, response);
        if (url.pathname === '/v1/query') return sendJson(response, 200, query(JSON.parse(await bodyOf(request))));
        if (url.pathname === '/v1/tasks' && request.method === 'POST') return sendJson(response, ...accept(JSON.parse(await bodyOf(request))));
        if (url.pathname === '/v1/tasks') return sendJson(response, 200, list(parameters));
        const [, id, what] = /^\/v1\/tasks\/([^/]+)(?:\/(\w+))?$/.exec(url.pathname) ?? [];
        if (id) {
            const task = tasks.find((one) => one.id === decodeURIComponent(id));
            if (!task) return sendJson(response, 404, { error: `there is no task "${decodeURIComponent(id)}"` });
            if (what === 'output') return outputStream(task, request, response);
            if (what === 'cancel') {
                if (task.state === 'queued') end(task, 'cancelled');
                else if (task.finish) task.finish('cancelled');
                else return sendJson(response, 409, { error: `too late, it is ${task.state}` });
            }
            return sendJson(response, 200, task);
        }
        if (url.pathname === '/v1/depot' && request.method === 'DELETE') {
            const path = parameters.get('path');
            for (const name of [...depot.keys()]) if (name === path || (parameters.get('recursive') === '1' && name.startsWith(`${path}/`))) depot.delete(name);
            return sendJson(response, 200, { removed: path });
        }
        if (url.pathname === '/v1/depot') {
            const found = listing(parameters.get('path') ?? '');
            return found ? sendJson(response, 200, found) : sendJson(response, 404, { error: `the depot holds no ${parameters.get('path')}` });
        }
        if (url.pathname === '/v1/depot/sum') {
            const rows = parameters.getAll('path').map((path) => (depot.has(path) ? { path, bytes: depot.get(path).content.length, sha256: sumOf(depot.get(path).content) } : { path, error: `the depot holds no ${path}` }));
            return sendJson(response, 200, { files: rows });
        }
        if (url.pathname === '/v1/depot/check') {
            const rows = parameters.getAll('path').map((path) => {
                const taken = !path.endsWith('install.sh.tar');
                return { path, taken, converted: path.includes('install.sh'), replaces: depot.has(path), ...(taken ? {} : { error: evil('the archive would lose bytes'), guard: 'depot-content', hint: evil('call it package.tar') }) };
            });
            return sendJson(response, 200, { guarded: true, taken: rows.every((row) => row.taken), free_bytes: 1e12, replaced_bytes: 0, files: rows });
        }
        return sendJson(response, 404, { error: `there is nothing at ${url.pathname}` });
    }

    async function push(request, response, url) {
        const content = await bodyOf(request);
        const path = url.searchParams.get('path');
        if (access !== 'act') return sendJson(response, 403, { error: 'ada may only look' });
        depot.set(path, { type: 'file', content, modified: at(Date.now()) });
        return sendJson(response, 200, { path, bytes: content.length, sha256: sumOf(content), verified: true, notes: [] });
    }

    return {
        host, push, tasks, instances, depot, configurations,
        accept: (given) => accept({ transid: `made-${tasks.length}`, ...given })[1],
        /// Events that come by themselves, as many at once.
        burst: (number) => {
            for (let i = 0; i < number; ++i) {
                const task = create({ transid: `burst-${tasks.length}`, state: 'done', started: at(Date.now()) });
                end(task, 'done');
            }
        },
        slow: (milliseconds) => (pace = milliseconds),
    };
}
