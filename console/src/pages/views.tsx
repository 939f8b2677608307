/// Which component shows which path.
import type { ComponentType } from 'preact';
import { AgentsPage } from './agents';
import { ConfigurationPage } from './configuration';
import { DepotPage } from './depot';
import { DoctorPage } from './doctor';
import { EventsPage } from './events';
import { LostPage } from './lost';
import { OverviewPage } from './overview';
import { TaskPage } from './task';
import { TasksPage } from './tasks';

const views: Readonly<Record<string, ComponentType>> = {
    '/': OverviewPage,
    '/agents': AgentsPage,
    '/tasks': TasksPage,
    '/configuration': ConfigurationPage,
    '/depot': DepotPage,
    '/events': EventsPage,
    '/doctor': DoctorPage,
};

function decoded(text: string): string {
    try {
        return decodeURIComponent(text);
    } catch {
        return text;
    }
}

export function View({ path }: { path: string }) {
    const task = /^\/tasks\/([^/]+)$/.exec(path)?.[1];
    if (task !== undefined) return <TaskPage key={task} id={decoded(task)} />;
    const Page = Object.hasOwn(views, path) ? views[path] : undefined;
    return Page ? <Page /> : <LostPage />;
}
