// Port forwarding and the DMZ host: rules made, changed and refused, and what the router then has.
import { readFileSync, writeFileSync } from 'node:fs';
import { tmpdir } from 'node:os';
import { join } from 'node:path';

import { check, equal, finish, holds, looks, on, open, screenshot, signIn } from './browser.mjs';

const page = await open({ path: '#/portforward' });
await signIn(page);
const dialog = page.getByRole('dialog');
const row = (name) => page.getByRole('row').filter({ has: page.getByRole('rowheader', { name, exact: true }) });
const installed = () => on('router', 'sh', '-c', 'nft list table ip vorn_dnat 2>/dev/null || true');
const save = () => dialog.getByRole('button', { name: 'Save', exact: true }).click();
const closed = () => dialog.waitFor({ state: 'detached' });
const PORTFORWARD_SET = '**/*PortForward/1/set';

async function add({ name, ports, protocol = 'tcp', ip, inner = '' }) {
  await page.getByRole('button', { name: 'Add rule' }).click();
  await dialog.getByLabel('Name').fill(name);
  await dialog.getByLabel('Port outside').fill(ports);
  await dialog.getByLabel('Protocol').selectOption(protocol);
  await dialog.getByLabel('Device', { exact: true }).selectOption('other');
  await dialog.getByLabel('Address of the device').fill(ip);
  await dialog.getByLabel('Port on the device').fill(inner);
}

await check('without rules the page says that nothing is reached', () =>
  page.getByText('There are no rules').waitFor());
await check('the router’s networks are shown', () => page.getByRole('row', { name: /lbr0.*192\.168\.1\.1/ }).waitFor());

await check('a rule is made with a device from the list', async () => {
  await page.getByRole('button', { name: 'Add rule' }).click();
  await dialog.getByLabel('Name').fill('Web of the laptop');
  await dialog.getByLabel('Port outside').fill('8081');
  const laptop = dialog.getByLabel('Device', { exact: true }).locator('option', { hasText: '192.168.1.110' });
  await laptop.waitFor({ state: 'attached' });
  await dialog.getByLabel('Device', { exact: true }).selectOption(await laptop.getAttribute('value'));
  await dialog.getByLabel('Port on the device').fill('80');
  await screenshot(page, 'forwards-rule');
  await save();
  await closed();
  await row('Web of the laptop').getByText('active', { exact: true }).waitFor();
});
await check('the router forwards it: the provider reads the laptop’s page', () => {
  const text = on('isp', 'sh', '-c', 'wan=$(sed -n "s/^[0-9]* [0-9a-f:]* \\(203[0-9.]*\\) .*/\\1/p" /var/lib/misc/*.leases | head -n 1); curl -s --noproxy "*" --max-time 5 "http://$wan:8081/" || true');
  holds(/laptop/.test(text), `"${text}"`);
});
await check('ports that are none are explained while they are typed', async () => {
  await add({ name: 'x', ports: '70000', ip: '192.168.1.111' });
  await dialog.getByText('This is no port from 1 to 65535').waitFor();
});
await check('a port of the router’s own page is refused', async () => {
  await dialog.getByLabel('Port outside').fill(new URL(page.url()).port);
  await dialog.getByText('is the one of this page').waitFor();
});
await check('a conflict names the other rule and its ports, and the rule is not stored', async () => {
  await dialog.getByLabel('Port outside').fill('8000-8100');
  await dialog.getByText('The rule “Web of the laptop” (number 1) has 8081 already.').waitFor();
  await save();
  equal(await dialog.count(), 1, 'dialogs');
  await screenshot(page, 'forwards-conflict');
});
await check('an address that is in no network of the router is refused', async () => {
  await dialog.getByLabel('Port outside').fill('9000-9010');
  await dialog.getByLabel('Address of the device').fill('10.1.2.3');
  await dialog.getByText('This address is in no network of this router.').waitFor();
});
await check('what the router refuses keeps what was typed, and says so', async () => {
  await dialog.getByLabel('Address of the device').fill('192.168.1.111');
  await page.route(PORTFORWARD_SET, (route) => route.fulfill({ json: { success: false, error: { code: 4300 } } }));
  await save();
  await dialog.getByText('The router could not do this.').waitFor();
  equal(await dialog.getByLabel('Port outside').inputValue(), '9000-9010');
  await page.unroute(PORTFORWARD_SET);
  await dialog.getByLabel('Name').fill('Games');
  await dialog.getByLabel('Protocol').selectOption('both');
  await save();
  await closed();
  await row('Games').getByText('active', { exact: true }).waitFor();
  holds(installed().includes('9000-9010'), installed());
});
await check('a rule that is switched off is closed at once', async () => {
  await row('Games').getByRole('switch').click();
  await row('Games').getByText('off', { exact: true }).waitFor();
  holds(!installed().includes('9000-9010'), installed());
});

await check('rules that cannot be read are told of, and can be tried again', async () => {
  await page.route('**/*PortForward/1/get', (route) => route.abort());
  await page.reload();
  const rules = page.getByRole('region', { name: 'Rules' });
  await rules.getByText('The router does not answer.').waitFor();
  await page.unroute('**/*PortForward/1/get');
  await rules.getByRole('button', { name: 'Try again' }).click();
  await row('Games').waitFor();
});
await check('while the devices load, the rules are there and one can be typed', async () => {
  let release = () => undefined;
  const later = new Promise((resolve) => (release = resolve));
  await page.route('**/*ConnectionList/1/get', async (route) => {
    await later;
    await route.continue();
  });
  await page.reload();
  await row('Games').waitFor();
  await page.getByRole('button', { name: 'Add rule' }).click();
  await dialog.getByLabel('Port outside').fill('1234');
  release();
  await dialog.getByLabel('Device', { exact: true }).locator('option', { hasText: '192.168.1.110' }).waitFor({ state: 'attached' });
  equal(await dialog.getByLabel('Port outside').inputValue(), '1234');
  await page.unroute('**/*ConnectionList/1/get');
  await page.keyboard.press('Escape');
  await closed();
});

let file = '';
await check('the rules are saved as a file', async () => {
  const [download] = await Promise.all([
    page.waitForEvent('download'),
    page.getByRole('button', { name: 'Save as file' }).click(),
  ]);
  equal(download.suggestedFilename(), 'port-forwarding.json');
  file = readFileSync(await download.path(), 'utf8');
  equal(JSON.parse(file).rules.map((each) => each.service), ['Web of the laptop', 'Games']);
});

const path = join(tmpdir(), `forwards-${process.pid}.json`);
async function choose(text) {
  writeFileSync(path, text);
  const [chooser] = await Promise.all([
    page.waitForEvent('filechooser'),
    page.getByRole('button', { name: 'Load from file' }).click(),
  ]);
  await chooser.setFiles(path);
  await dialog.waitFor();
}
await check('a file that is none is refused in words, and nothing changes', async () => {
  await choose('{"rules": [');
  await dialog.getByText('It is not a JSON file.').waitFor();
  await dialog.getByRole('button', { name: 'Close' }).last().click();
  await choose(file.replace('8081', '0'));
  await dialog.getByText('Rule 1, “sourcePort”').waitFor();
  await screenshot(page, 'forwards-bad-file');
  await dialog.getByRole('button', { name: 'Close' }).last().click();
  equal(await page.getByRole('rowheader').filter({ hasText: 'Web of the laptop' }).count(), 1);
});
await check('a file that repeats the rules warns, and shows the conflict at each rule', async () => {
  await choose(file);
  await dialog.getByText('Together, 1 of the rules would be left out').waitFor();
  await dialog.getByRole('button', { name: 'Keep, and add those of the file' }).click();
  await closed();
  await page.getByText('left out', { exact: true }).waitFor();
  await page.getByText('(number 1) has 8081 already').waitFor();
});
await looks(page, 'forwards');
await check('a file replaces all rules', async () => {
  await choose(file);
  await dialog.getByRole('button', { name: 'Replace all' }).click();
  await closed();
  await page.getByText('left out', { exact: true }).waitFor({ state: 'detached' });
  equal(await row('Games').count(), 1, 'rules of the name');
});
await check('a rule is removed after a question', async () => {
  await page.getByRole('button', { name: 'Remove “Games”' }).click();
  await dialog.getByRole('button', { name: 'Remove' }).click();
  await closed();
  await row('Games').waitFor({ state: 'detached' });
});

const dmz = page.getByRole('region', { name: 'DMZ host' });
await check('a DMZ host outside of the networks is explained', async () => {
  await dmz.getByRole('switch').click();
  await dmz.getByLabel('Device', { exact: true }).selectOption('other');
  await dmz.getByLabel('Address of the device').fill('192.168.1.255');
  await dmz.getByText('not of one').waitFor();
});
await check('a DMZ host is set and taken back', async () => {
  await dmz.getByLabel('Address of the device').fill('192.168.1.110');
  await dmz.getByRole('button', { name: 'Save' }).click();
  await dmz.getByText('Everything else goes to').waitFor();
  holds(installed().includes('192.168.1.110'), installed());
  await screenshot(page, 'forwards-dmz');
  await dmz.getByRole('switch').click();
  await dmz.getByRole('button', { name: 'Save' }).click();
  await dmz.getByText('Everything else goes to').waitFor({ state: 'detached' });
});
await finish();
