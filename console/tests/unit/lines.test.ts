import assert from 'node:assert/strict';
import { test } from 'node:test';
import { cancelLine, pushLine, removeLine, sumLine, taskLine, titleOf } from '../../src/words/lines';

const line = (request: object): string | undefined => taskLine(['zavctl'], { command: '', product: 'ux', ...request });

test('start, stop and restart name their instance', () => {
    assert.equal(line({ command: 'START' }), 'zavctl start ux');
    assert.equal(line({ command: 'STOP', targetmsn: 'db1:host:UX' }), 'zavctl stop --target db1:host:UX ux');
    assert.equal(line({ command: 'START', targetmsn: 'db1', optional: 'INSTANCE', force: true }), 'zavctl start --instance db1 --force ux');
});

test('a value that begins with a dash is no option', () => {
    assert.equal(line({ command: 'STOP', targetmsn: '-x' }), 'zavctl stop --target=-x ux');
    assert.equal(removeLine(['zavctl'], '-r', false), 'zavctl depot rm -- -r');
    assert.equal(pushLine(['zavctl'], '-a', 'ux/-a'), 'zavctl push -- -a ux/-a');
    assert.equal(pushLine(['zavctl'], 'a', '-ux/a'), 'zavctl push -- a -ux/a');
    assert.equal(sumLine(['zavctl'], ['a', '-r']), 'zavctl depot sum -- a -r');
    assert.equal(sumLine(['zavctl'], ['a', 'b']), 'zavctl depot sum a b');
});

test('the command of an install is one word behind the dashes', () => {
    assert.equal(line({ command: 'INSTALL', version: '7.1', context: '/bin/sh |DEPLOYDIR|/install.sh', optional: 'REQUIRES_RESTART' }),
        "zavctl install --restart ux 7.1 -- '/bin/sh |DEPLOYDIR|/install.sh'");
});

test('uninstall, remove-instance and an import have their verbs', () => {
    assert.equal(line({ command: 'UNINSTALL' }), 'zavctl uninstall ux');
    assert.equal(line({ command: 'REMOVEINSTANCE', targetmsn: 'db1:h:UX' }), 'zavctl remove-instance ux db1:h:UX');
    assert.equal(line({ command: 'SETCONFIG', product: 'um', uaconfig: 'disks.mdl', uascript: 'a.sh,b.sh', context: 'PORT=7700,RESTART=Y' }),
        'zavctl ua-config --metafile disks.mdl --scripts a.sh,b.sh --port 7700 --restart');
});

test('a configuration goes to standard input, not onto the command line', () => {
    assert.equal(line({ command: 'SETCONFIG', context: "A='1'\n" }), "zavctl config set ux - <<'END'\nA='1'\nEND");
});

test('what zavctl has no verb for has no line', () => {
    assert.equal(line({ command: 'REBOOT' }), undefined);
});

test('the words before a verb are quoted, too', () => {
    assert.equal(cancelLine(['zavctl', '--socket', '/tmp/a b'], 'x-1'), "zavctl --socket '/tmp/a b' task cancel x-1");
    assert.equal(pushLine(['zavctl'], 'a.tar', 'a.tar'), 'zavctl push a.tar');
});

test('titles are those of zavctl', () => {
    assert.equal(titleOf({ command: 'START', product: 'ux' }), 'start ux');
    assert.equal(titleOf({ command: 'SETCONFIG', product: 'ux', targetmsn: 'a:b:UX' }), 'config set ux a:b:UX');
});
