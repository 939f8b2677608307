// Every page of a fleet in light and dark, on a desk and on a phone, as those of a host are looked at.
import path from 'node:path';
import { after, before, test } from 'node:test';
import { press, untilText } from '../support/browser.mjs';
import { looksRight } from '../support/looks.mjs';
import { raise, shots } from '../support/stage.mjs';

let stage;
before(async () => (stage = await raise()));
after(() => stage.strike());

/// Name, address, what is there once the page is.
const pages = [
    ['overview', '/', '070200000'],
    ['hosts', '/hosts', 'two machines claim'],
    ['host', '/hosts/UHOST00004', 'should run, does not'],
    ['task', '/hosts/UHOST00004/tasks/a0-7', 'ux started, process 4711'],
    ['agents', '/agents?product=ux&version=070200000', 'web-00003'],
    ['rollouts', '/rollouts', 'INSTALL ux'],
    ['rollout', '/rollouts/rollout00001', 'did not start'],
    ['configuration', '/configuration?product=ux&on=*', '1 line removed'],
    ['lost', '/depot', 'nothing at this address'],
];

for (const scheme of ['light', 'dark']) {
    for (const [width, height] of [[1280, 860], [360, 740]]) {
        test(`every page of a fleet is fit to be used, ${scheme}, ${width} pixels wide`, async () => {
            const view = await stage.open({ centre: { hosts: 240 }, scheme, width, height });
            view.fake.tellOutput('UHOST00004', 'a0-7', 'message', { stream: 'stdout', text: 'checking the machine\n' });
            view.fake.tellOutput('UHOST00004', 'a0-7', 'message', { stream: 'stderr', text: 'TovrinAgent: ux started, process 4711\n' });
            for (const [name, address, text] of pages) {
                await view.go(address);
                await untilText(view.tab, text, 'main').catch((error) => {
                    throw new Error(`${name}: "${text}" does not come (${error.message})`);
                });
                await untilText(view.tab, 'live', '.top');
                await looksRight(view, name);
                await view.tab.screenshot({ path: path.join(shots, `fleet-${name}-${scheme}-${width}.png`) });
            }
            await view.end();
        });
    }
}

test('windows of a fleet are fit to be used as well', async () => {
    for (const scheme of ['light', 'dark']) {
        const view = await stage.open({ centre: { hosts: 60 }, scheme });
        await view.go('/agents?on=env%3Dtest');
        await press(view.tab, 'Stop ux');
        await press(view.tab, 'Preview the hosts');
        await untilText(view.tab, 'Send stop ux to 15 hosts', 'dialog');
        await (await view.tab.waitForSelector('summary')).click();
        await looksRight(view, 'stop');
        await view.tab.screenshot({ path: path.join(shots, `fleet-dialog-${scheme}-1280.png`) });
        await press(view.tab, 'Back');
        await press(view.tab, 'Install…');
        await looksRight(view, 'install');
        await press(view.tab, 'Back');
        await press(view.tab, 'Push…');
        await looksRight(view, 'push');
        await view.go('/rollouts/rollout00001');
        await press(view.tab, 'Retry failed…');
        await untilText(view.tab, 'it may run twice', 'dialog');
        await looksRight(view, 'retry-failed');
        await view.end();
    }
});

test('named instances are fit to be used as well', async () => {
    for (const [scheme, width, height] of [['light', 1280, 1100], ['dark', 360, 740]]) {
        const view = await stage.open({ centre: { hosts: 60 }, scheme, width, height });
        await view.go('/agents?product=ux&on=web-0000*');
        await untilText(view.tab, 'Instances of ux: 10', 'main');
        await view.tab.waitForSelector('aria/Start db1:h0:UX');
        await (await view.tab.$('.instance-targets')).scrollIntoView();
        await looksRight(view, 'instances');
        await view.tab.screenshot({ path: path.join(shots, `fleet-instances-${scheme}-${width}.png`) });
        await view.end();
    }
});

test('what stands in the place of a button is fit to be used as well', async () => {
    for (const scheme of ['light', 'dark']) {
        const view = await stage.open({ centre: { hosts: 60, onlyLooks: true }, scheme });
        await view.go('/agents?on=env%3Dtest');
        await press(view.tab, 'Stop ux');
        await untilText(view.tab, 'This page only looks.', 'dialog');
        await looksRight(view, 'line');
        await view.tab.screenshot({ path: path.join(shots, `fleet-line-${scheme}-1280.png`) });
        await view.go('/configuration?product=ux&on=env%3Dtest');
        await untilText(view.tab, 'config set ux', 'main');
        await looksRight(view, 'lines of a configuration');
        await view.end();
    }
});

test('a fleet that has nothing yet is told what to do first', async () => {
    const view = await stage.open({ centre: { hosts: 0 } });
    for (const [address, text] of [['/', 'No host has joined yet'], ['/hosts', 'No host has joined yet'], ['/agents', 'No products are installed'],
        ['/rollouts', 'There is no roll-out yet'], ['/configuration', 'Name a product and the hosts']]) {
        await view.go(address);
        await untilText(view.tab, text, 'main');
        await looksRight(view, `empty ${address}`);
    }
    await view.end();
});
