// A fleet made of JavaScript: a centre with its hosts and roll-outs, and the operator's zavctl that the
// console's server runs. Names and reasons try to be scripts if they are to.
import { script } from './fake_host.mjs';
import { bodyOf, sendJson } from './front.mjs';

const ring = 20_000;
const fleet = 'shop';
export const address = 'https://centre.example:8443';

const at = (milliseconds) => new Date(milliseconds).toISOString();
const four = (number) => String(number).padStart(5, '0');

const certificates = {
    admin: { commands: ['*'], products: ['*'] },
    operator: { commands: ['START', 'STOP', 'TASKS', 'GETCONFIG'], products: ['ux'] },
    viewer: { commands: [], products: [] },
};

/// The terms that the tests use, as a centre takes them. Throws for others.
function fitsTerm(term, host) {
    const pattern = (text) => new RegExp(`^${text.replace(/[.+?^${}()|[\]\\]/g, '\\$&').replaceAll('*', '.*')}$`);
    const [, name, value] = /^([\w.-]+)=([\w.*-]+)$/.exec(term) ?? [];
    if (name) return pattern(value).test(host.labels[name] ?? '');
    if (/^![\w.-]+$/.test(term)) return !(term.slice(1) in host.labels);
    if (/^[\w.*-]+$/.test(term)) return term.includes('*') ? pattern(term).test(host.name) : term in host.labels;
    throw new Error(`the selector's term "${term}" has no label's name`);
}

const selected = (hosts, selector) => hosts.filter((host) => selector.split(',').every((term) => fitsTerm(term.trim(), host)));

/// `role` is the operator's; with `onlyLooks` the page is the centre's own. `now` in milliseconds is when the hosts were heard last.
export function makeFakeCentre({ hosts: count = 12, isHostile = false, role = 'admin', onlyLooks = false, now = Date.now() } = {}) {
    const evil = (text) => (isHostile ? `${text}${script}` : text);
    const hosts = [];
    const rollouts = [];
    const parts = new Map();
    const events = [];
    const streams = new Set();
    const runs = [];
    const outputs = new Map();
    let outputRefusal;
    let heardOf = 0;
    let turn = 0;

    const inventoryOf = (i) => ({
        taken: at(now - 600_000), age: 600,
        products: [
            { PRODUCT: 'ax', VERSION: '070100000', RELEASE: '100', PLATFORM: 'lx8266', PRODDESC: evil('Shared component') },
            { PRODUCT: evil('ux'), VERSION: evil(i % 10 === 3 ? '070200000' : '070100000'), RELEASE: '100', PLATFORM: evil('lx8266'), PRODDESC: evil('Monitoring agent for load and memory') },
        ],
        instances: [
            { product: evil('ux'), instance: '', target: evil(`h${i}:UX`), state: i % 50 === 4 ? 'missing' : 'running', user: evil('tovrin'), pid: 100 },
            { product: 'ux', instance: 'db1', target: `db1:h${i}:UX`, state: 'stopped', user: null, pid: null },
        ],
        warnings: isHostile ? [evil('a program of the home failed')] : [],
    });

    for (let i = 0; i < count; ++i) {
        const isAway = i % 40 === 7;
        hosts.push({
            host: `UHOST${four(i)}`, name: evil(`web-${four(i)}`), labels: { env: i % 4 === 0 ? 'test' : 'live', site: evil(i % 2 ? 'a' : 'b') },
            centreLabels: { env: i % 4 === 0 ? 'test' : 'live' }, state: isAway ? 'away' : i === 2 ? 'stopped' : 'here', signing: 'SIGNER', last: 4, taken: i % 5 === 0 ? 3 : 4,
            stopped: i === 2 ? evil('two machines claim to be this host') : '', unpublished: i === 3 ? evil('the bus has refused its orders') : '',
            blocked: i === 5 ? evil('the disk is full') : '', journal: evil('a0a99408e7707b3d'), heard: at(now - (isAway ? 7_200_000 : 4_000)), skew: i === 6 ? 182.5 : 0.02,
            facts: { told: at(now), heard: at(now), name: `web-${four(i)}`, labels: { env: 'test' }, link: evil('1.0.0'), version: '1.0.0', journal: 'a0', blocked: '', inventory: inventoryOf(i) },
        });
    }

    const withoutFacts = ({ facts, ...host }) => host;

    const tell = (type, data) => {
        const event = { number: ++heardOf, type, data };
        events.push(event);
        if (events.length > ring) events.shift();
        for (const stream of streams) stream(event);
    };

    const countsOf = (list) => {
        const counts = { waiting: 0, released: 0, over: {} };
        for (const { state } of list) {
            if (state in counts) ++counts[state];
            else counts.over[state] = (counts.over[state] ?? 0) + 1;
        }
        return counts;
    };

    const recount = (rollout) => {
        const list = parts.get(rollout.id);
        rollout.counts = countsOf(list);
        rollout.waves = [1, 2].map((wave) => countsOf(list.filter((part) => part.wave === wave)));
        rollout.failures = list.filter((part) => part.failure).length;
        return rollout;
    };

    const addRollout = (kind, product, on, meant, state = 'running') => {
        const id = `rollout${four(rollouts.length + 1)}`;
        const made = at(now + rollouts.length * 1000);
        const rollout = {
            id, operator: evil('anna'), kind, product: evil(product), selector: evil(on), created: made, state, cause: '', reason: '', since: made,
            plan: { waves: '1,100%', maxFailures: '2%', pause: 60 }, hosts: meant.length, mostFailures: Math.floor(meant.length / 50), wave: 1, waves: [], counts: {}, failures: 0, away: 0, unconfirmed: 0, expired: 0,
        };
        parts.set(id, meant.map((host, place) => ({
            place, host: host.host, name: host.name, wave: place === 0 ? 1 : 2, order: `${id}-${place}`, number: place + 1, tries: 1,
            state: 'waiting', reason: '', failure: false, away: false, unconfirmed: false,
        })));
        rollouts.unshift(recount(rollout));
        return rollout;
    };

    /// A host's part ends or goes on, and the feed tells it.
    const settle = (rollout, place, state, reason = '') => {
        const part = parts.get(rollout.id)[place];
        Object.assign(part, { state, reason, failure: !['waiting', 'released', 'done', 'cancelled', 'expired'].includes(state) });
        tell('order', { order: part.order, host: part.host, name: part.name, rollout: rollout.id, kind: rollout.kind, product: rollout.product, state });
        return rollout;
    };

    const change = (rollout, changes = {}) => {
        Object.assign(recount(rollout), changes);
        tell('rollout', rollout);
        return rollout;
    };

    if (count > 0) {
        const past = addRollout('RESTART', 'ux', 'env=live', hosts.slice(0, Math.min(count, 2000)), 'finished');
        parts.get(past.id).forEach((part, place) => {
            part.state = place % 20 === 3 ? 'failed' : place % 20 === 9 ? 'unknown' : 'done';
            part.failure = part.state === 'failed';
            part.reason = part.failure ? evil('TovrinAgent: ux did not start, process 4711 has ended') : '';
        });
        recount(past);
        const now2 = addRollout('INSTALL', 'ux', 'env=test', hosts.filter((host) => host.labels.env === 'test'));
        parts.get(now2.id).forEach((part, place) => {
            part.state = place % 3 === 0 ? 'done' : place % 3 === 1 ? 'released' : 'waiting';
        });
        recount(now2);
    }

    const configurations = (meant) => {
        const usual = evil('INTERVAL=5\n# A larger file is rotated.\nMAX_KB=1024\n');
        const here = meant.filter((host) => host.state === 'here');
        const others = here.filter((_, i) => i % 5 === 4);
        const groups = [{ hosts: here.filter((_, i) => i % 5 !== 4).map((host) => host.name), configuration: usual }];
        if (others.length > 0) groups.push({ hosts: others.map((host) => host.name), configuration: usual.replace('INTERVAL=5', 'INTERVAL=60') });
        return { groups, failed: meant.filter((host) => host.state !== 'here').map((host) => ({ host: host.name, error: evil('it is away') })) };
    };

    const tasksOf = (host) => [{
        id: 'a0-7', transid: 'nightly', command: 'START', product: evil('ux'), state: 'failed', accepted: at(now - 60_000), started: at(now - 59_000), ended: at(now - 58_000),
        asker: evil('root'), reply: null, reason: evil(`ux runs on ${host.name} already`),
    }];

    const kinds = { start: 'START', stop: 'STOP', restart: 'RESTART', install: 'INSTALL', uninstall: 'UNINSTALL', 'remove-instance': 'REMOVEINSTANCE', 'config set': 'SETCONFIG' };

    const refusal = (error, hint = '') => ({ exit: 1, output: { error, ...(hint ? { hint } : {}) }, messages: `zavctl: ${error}\n` });

    /// By their names, or by a selector.
    const meantBy = ({ options = {}, hosts: names }) => (names ? hosts.filter((host) => names.includes(host.name)) : selected(hosts, options.on ?? ''));

    const begin = (request) => {
        const { verb, arguments: [product], options } = request;
        const kind = kinds[verb];
        const meant = meantBy(request);
        if (meant.length === 0) return refusal('there are no such hosts');
        if (product === 'zz') return refusal(evil('your certificate does not allow START for the product zz'), 'zavctl whoami with --fleet shows what it allows.');
        if (options['dry-run']) {
            const chosen = meant.map(({ host, name, state }) => ({ host, name, state }));
            return { exit: 0, output: { hosts: chosen, order: { kind, body: { product: evil(product) }, selector: options.on ?? '*', seconds: 86_400 }, plan: {} }, messages: '' };
        }
        const rollout = addRollout(kind, product, options.on ?? '*', meant);
        tell('rollout', rollout);
        return { exit: 0, output: { rollout: rollout.id }, messages: isHostile ? `zavctl: note: ${evil('some hosts are away')}\n` : '' };
    };

    const changeRollout = (verb, [id], options) => {
        const rollout = rollouts.find((one) => one.id === id);
        if (verb === 'abort') return { exit: 0, output: change(rollout, { state: 'aborted', reason: evil('aborted by anna') }), messages: '' };
        if (verb === 'retry-failed') {
            const failed = parts.get(id).filter((part) => part.failure || (options.force && part.state === 'unknown'));
            for (const part of failed) Object.assign(part, { state: 'waiting', failure: false, tries: part.tries + 1 });
            return { exit: 0, output: change(rollout, { state: 'running' }), messages: '' };
        }
        return { exit: 0, output: change(rollout, verb === 'pause' ? { state: 'paused', cause: 'operator', reason: evil('paused by anna') } : { state: 'running', reason: '' }), messages: '' };
    };

    const label = ([name, ...changes]) => {
        const host = hosts.find((one) => one.name === name);
        for (const one of changes) {
            const [key, value] = one.split('=');
            if (value === undefined && !one.endsWith('-')) return refusal(`"${one}" is neither NAME=VALUE nor NAME-`);
            if (value === undefined) delete host.labels[one.slice(0, -1)];
            else host.labels[key] = host.centreLabels[key] = value;
        }
        tell('host', { host: host.host, name: host.name, state: host.state, since: host.heard, blocked: host.blocked });
        return { exit: 0, output: { hosts: [withoutFacts(host)] }, messages: '' };
    };

    /// What the operator's zavctl would answer.
    const zavctl = (request) => {
        const { verb, options = {} } = request;
        try {
            if (verb in kinds) return begin(request);
            if (verb.startsWith('rollout ')) return changeRollout(verb.slice(8), request.arguments, options);
            if (verb === 'hosts label') return label(request.arguments);
            const meant = meantBy(request);
            if (verb === 'config get') return { exit: 0, output: configurations(meant), messages: '' };
            if (verb === 'tasks') return { exit: 0, output: { hosts: meant.map((host) => ({ host: host.name, tasks: tasksOf(host) })) }, messages: '' };
        } catch (error) {
            return refusal(error.message);
        }
        return undefined;
    };

    async function run(request, response) {
        const given = JSON.parse(await bodyOf(request));
        runs.push(given);
        if (role === 'viewer') return sendJson(response, 403, { error: evil('a viewer changes nothing') });
        const answer = zavctl(given);
        if (!answer) return sendJson(response, 400, { error: `the console runs no "${given.verb}"` });
        return sendJson(response, 200, { ...answer, command: `zavctl --fleet ${address} ${given.verb}` });
    }

    /// A file for the depots of a selector's hosts.
    async function push(request, response, url) {
        const bytes = (await bodyOf(request)).length;
        const { searchParams: given } = url;
        const rollout = addRollout('PUSH', '', given.get('on'), selected(hosts, given.get('on')));
        runs.push({ path: given.get('path'), on: given.get('on'), bytes });
        return sendJson(response, 200, { exit: 0, output: { rollout: rollout.id }, messages: '', command: 'zavctl push' });
    }

    const eventStream = (request, response) => {
        const last = request.headers['last-event-id'] ?? '';
        const from = last === '' ? heardOf : Number(last.slice(last.lastIndexOf('-') + 1));
        response.writeHead(200, { 'Content-Type': 'text/event-stream', 'Last-Event-ID': `centre-${from}` });
        response.flushHeaders();
        const send = ({ number, type, data }) => response.write(`id: centre-${number}\nevent: ${type}\ndata: ${JSON.stringify(data)}\n\n`);
        const kept = events.filter((event) => event.number > from);
        const missing = heardOf - from - kept.length;
        if (missing > 0) send({ number: from + missing, type: 'gap', data: { missing } });
        kept.forEach(send);
        streams.add(send);
        response.on('close', () => streams.delete(send));
    };

    const page = (list, parameters, most) => {
        const after = parameters.get('after') ?? '';
        const limit = Math.min(Number(parameters.get('limit') ?? 100), most);
        const from = after === '' ? 0 : list.findIndex((host) => host.host === after) + 1;
        const next = from + limit < list.length ? { next: list[from + limit - 1].host } : {};
        return { hosts: list.slice(from, from + limit), ...next };
    };

    const hostAnswer = (response, [, id, what]) => {
        const host = hosts.find((one) => one.host === id || one.name === id);
        if (!host) return sendJson(response, 404, { error: `there is no host "${id}"` });
        if (what !== 'orders') return sendJson(response, 200, host);
        const orders = [4, 3].map((number) => ({
            order: `order-${number}`, host: host.host, number, published: true, state: number === 4 && host.taken < 4 ? 'open' : number === 3 ? 'failed' : 'done',
            kind: 'START', product: evil('ux'), operator: evil('anna'), issued: at(now - 60_000 * number), expires: at(now), ...(number === 3 ? { reason: evil('ux runs already') } : {}),
        }));
        return sendJson(response, 200, { orders });
    };

    const rolloutAnswer = (response, [, id, what], parameters) => {
        const rollout = rollouts.find((one) => one.id === id);
        if (!rollout) return sendJson(response, 404, { error: `there is no roll-out "${id}"` });
        const list = parts.get(id);
        const from = Number(parameters.get('from') ?? 0);
        if (what === 'hosts') return sendJson(response, 200, { hosts: list.slice(from, from + Math.min(Number(parameters.get('limit') ?? 100), 1000)) });
        if (what === 'failures') return sendJson(response, 200, { hosts: list.filter((part) => part.failure).slice(0, Number(parameters.get('limit') ?? 100)) });
        return sendJson(response, 200, rollout);
    };

    /// What a task writes on its host, by the key of that and the task's identifier.
    const outputOf = (key, id) => {
        const name = `${key} ${id}`;
        if (!outputs.has(name)) outputs.set(name, { events: [], readers: new Set() });
        return outputs.get(name);
    };

    /// An event of that output, as the operator's zavctl passes it on.
    const tellOutput = (key, id, type, data) => {
        const output = outputOf(key, id);
        output.events.push({ type, data });
        for (const reader of output.readers) reader(output.events.length);
    };

    const outputStream = (request, response, parameters) => {
        const host = hosts.find((one) => one.host === parameters.get('host'));
        if (outputRefusal) return sendJson(response, ...outputRefusal);
        if (!outputs.has(`${host?.host} ${parameters.get('task')}`)) return sendJson(response, 400, { error: evil(`${host?.name}: there is no task "${parameters.get('task')}"`) });
        const output = outputOf(host.host, parameters.get('task'));
        const last = request.headers['last-event-id'] ?? '0';
        response.writeHead(200, { 'Content-Type': 'text/event-stream', 'Last-Event-ID': last });
        response.flushHeaders();
        const send = (number) => {
            const { type, data } = output.events[number - 1];
            response.write(`${type === 'message' ? `id: ${number}\n` : `event: ${type}\n`}data: ${JSON.stringify(data)}\n\n`);
            if (type === 'end' || type === 'break') response.end();
        };
        for (let number = Number(last) + 1; number <= output.events.length; ++number) {
            if (output.events[number - 1].type !== 'break') send(number);
        }
        output.readers.add(send);
        response.on('close', () => output.readers.delete(send));
        return undefined;
    };

    async function host(request, response, url) {
        const path = decodeURIComponent(url.pathname);
        const { searchParams: parameters } = url;
        if (request.method !== 'GET') return sendJson(response, 405, { error: 'only GET and HEAD are handed on' });
        if (path === '/v1/events') return eventStream(request, response);
        if (path === '/console/output') return outputStream(request, response, parameters);
        if (path === '/v1/whoami') return sendJson(response, 200, { operator: evil('anna'), key: 'OKEY', role, ...certificates[role], selector: '*', fleet: evil(fleet) });
        if (path === '/v1/rollouts') return sendJson(response, 200, { rollouts: rollouts.slice(0, Number(parameters.get('limit') ?? 20)) });
        if (path === '/v1/hosts' || path === '/v1/inventory') {
            const hasFacts = path === '/v1/inventory';
            try {
                const list = selected(hosts, parameters.get('selector') ?? '*');
                const { hosts: some, ...rest } = page(list, parameters, hasFacts ? 100 : 1000);
                return sendJson(response, 200, { hosts: hasFacts ? some : some.map(withoutFacts), ...rest });
            } catch (error) {
                return sendJson(response, 400, { error: error.message });
            }
        }
        const ofHost = /^\/v1\/hosts\/([^/]+)(?:\/(\w+))?$/.exec(path);
        if (ofHost) return hostAnswer(response, ofHost);
        const ofRollout = /^\/v1\/rollouts\/([^/]+)(?:\/(\w+))?$/.exec(path);
        if (ofRollout) return rolloutAnswer(response, ofRollout, parameters);
        return sendJson(response, 404, { error: `there is nothing at ${path}` });
    }

    /// A host comes, goes, or has something new to tell.
    const tellHost = (i, changes = {}) => {
        const one = Object.assign(hosts[i], changes);
        tell('host', { host: one.host, name: one.name, state: one.state, since: at(Date.now()), blocked: one.blocked });
    };

    return {
        host, run, push, hosts, rollouts, parts, runs, settle, change, tell, tellHost, tellOutput,
        /// What is answered in the place of every output from now on: its status and its document.
        refuseOutput: (...answer) => (outputRefusal = answer.length > 0 ? answer : undefined),
        session: { mode: 'fleet', push: !onlyLooks, ...(onlyLooks ? { onlyLooks } : {}), address, fleet: evil(fleet), operator: evil('anna'), role, command: `zavctl --fleet ${address}`, program: 'zavctl-fleet', version: '1.0.0' },
        /// So many hosts come into a state, one event each; the next ones the next time.
        burst: (number, state) => {
            for (let i = 0; i < number; ++i) tellHost(turn++ % hosts.length, { state });
        },
        /// Events that nobody gets who is not there now.
        forget: () => events.splice(0, events.length),
    };
}
