/// Which component shows which path.
import type { ComponentType } from 'preact';
import { isFleet, session } from '../state/session';
import { useStore } from '../state/store';
import { FleetAgentsPage } from './fleet/agents';
import { FleetConfigurationPage } from './fleet/configuration';
import { FleetHostPage } from './fleet/host';
import { HostsPage } from './fleet/hosts';
import { FleetOverviewPage } from './fleet/overview';
import { RolloutPage } from './fleet/rollout';
import { RolloutsPage } from './fleet/rollouts';
import { FleetTaskPage } from './fleet/task';
import { AgentsPage } from './host/agents';
import { ConfigurationPage } from './host/configuration';
import { DepotPage } from './host/depot';
import { DoctorPage } from './host/doctor';
import { EventsPage } from './host/events';
import { OverviewPage } from './host/overview';
import { TaskPage } from './host/task';
import { TasksPage } from './host/tasks';
import { LostPage } from './lost';

interface Views {
    pages: Readonly<Record<string, ComponentType>>;
    /// What stands below a page's path, by that path: one thing of which the page lists many.
    things: Readonly<Record<string, ComponentType<{ id: string }>>>;
    /// What such a thing has several of in its turn: by the page's path and the name of what they are.
    parts: Readonly<Record<string, ComponentType<{ id: string; part: string }>>>;
}

const ofHost: Views = {
    pages: {
        '/': OverviewPage,
        '/agents': AgentsPage,
        '/tasks': TasksPage,
        '/configuration': ConfigurationPage,
        '/depot': DepotPage,
        '/events': EventsPage,
        '/doctor': DoctorPage,
    },
    things: { '/tasks': TaskPage },
    parts: {},
};

const ofFleet: Views = {
    pages: {
        '/': FleetOverviewPage,
        '/hosts': HostsPage,
        '/agents': FleetAgentsPage,
        '/rollouts': RolloutsPage,
        '/configuration': FleetConfigurationPage,
    },
    things: { '/hosts': FleetHostPage, '/rollouts': RolloutPage },
    parts: { '/hosts/tasks': FleetTaskPage },
};

function decoded(text: string): string {
    try {
        return decodeURIComponent(text);
    } catch {
        return text;
    }
}

const rowOf = <T,>(table: Readonly<Record<string, T>>, path: string): T | undefined => (Object.hasOwn(table, path) ? table[path] : undefined);

export function View({ path }: { path: string }) {
    const known = useStore(session);
    if (!known) return <p class="faint">…</p>;
    const { pages, things, parts } = isFleet(known) ? ofFleet : ofHost;
    const [, above = '', id, kind = '', part] = /^(\/[^/]+)\/([^/]+)(?:(\/[^/]+)\/([^/]+))?$/.exec(path) ?? [];
    const Part = part === undefined ? undefined : rowOf(parts, above + kind);
    if (Part && id !== undefined && part !== undefined) return <Part key={path} id={decoded(id)} part={decoded(part)} />;
    const Thing = part === undefined && id !== undefined ? rowOf(things, above) : undefined;
    if (Thing && id !== undefined) return <Thing key={id} id={decoded(id)} />;
    const Page = rowOf(pages, path);
    return Page ? <Page /> : <LostPage />;
}
