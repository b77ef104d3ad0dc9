// The ways to the internet and static routes, and what the kernel has of them.
import { check, equal, finish, holds, looks, on, open, screenshot, signIn } from './browser.mjs';

on('router', 'sh', '-c', 'ip link set eth1 up && ip addr add 198.51.100.7/24 dev eth1 && ip route add default via 198.51.100.1 dev eth1 metric 900');
const page = await open({ path: '#/internet' });
await signIn(page);
const dialog = page.getByRole('dialog');
const ways = page.getByRole('region', { name: 'Ways to the internet' });
const order = () => ways.getByRole('listitem').locator('strong').allTextContents();
const routes = page.getByRole('region', { name: 'Static routes' });
const row = (network) => routes.getByRole('row').filter({ has: page.getByRole('rowheader', { name: network, exact: true }) });
const kernel = (family) => on('router', 'ip', family, 'route', 'show');
const orderIs = (wanted) => page.waitForFunction(
  (names) => JSON.stringify([...document.querySelectorAll('.gateway strong')].map((each) => each.textContent)) === names,
  JSON.stringify(wanted),
);

await check('the ways are listed, with the one that carries the traffic', async () => {
  await orderIs(['eth0', 'eth1']);
  await ways.getByRole('listitem').filter({ hasText: 'eth0' }).getByText('carries the traffic').waitFor();
});
await looks(page, 'internet');
await check('the buttons move a way, and nothing is stored before one says so', async () => {
  await ways.getByRole('button', { name: 'Move eth1 up' }).click();
  await orderIs(['eth1', 'eth0']);
  await page.getByText('The order is not saved yet.').waitFor();
  await screenshot(page, 'internet-order');
  await page.getByRole('button', { name: 'Discard' }).click();
  await orderIs(['eth0', 'eth1']);
});
await check('Alt with an arrow moves a way', async () => {
  await ways.getByRole('button', { name: 'Move eth0 down' }).focus();
  await page.keyboard.press('Alt+ArrowDown');
  await orderIs(['eth1', 'eth0']);
  await page.keyboard.press('Alt+ArrowUp');
  await orderIs(['eth0', 'eth1']);
});
await check('a way is dragged to its place', async () => {
  const from = await ways.locator('.drag-handle').nth(1).boundingBox();
  const to = await ways.getByRole('listitem').first().boundingBox();
  await page.mouse.move(from.x + 10, from.y + 15);
  await page.mouse.down();
  await page.mouse.move(to.x + 20, to.y + 5, { steps: 6 });
  await page.mouse.up();
  await orderIs(['eth1', 'eth0']);
});
await check('an order that the router refuses stays as it was made', async () => {
  await page.route('**/*Gateway.List/1/set', (route) => route.fulfill({ json: { success: false, error: { code: 4300 } } }));
  await page.getByRole('button', { name: 'Save order' }).click();
  await page.getByText('The router could not do this.').waitFor();
  equal(await order(), ['eth1', 'eth0']);
  await page.unroute('**/*Gateway.List/1/set');
});
await check('the saved order is the kernel’s: the other way carries the traffic', async () => {
  await page.getByRole('button', { name: 'Save order' }).click();
  await ways.getByRole('listitem').filter({ hasText: 'eth1' }).getByText('carries the traffic').waitFor();
  holds(/default via 198\.51\.100\.1/.test(on('router', 'sh', '-c', 'ip route show default | sort -t c -k 5 | head -n 1')), kernel('-4'));
});

await check('a route’s verdict comes while it is typed', async () => {
  await routes.getByRole('button', { name: 'Add route' }).click();
  await dialog.getByText('Fill in the network').waitFor();
  await dialog.getByLabel('Destination network').fill('10.20.0.7');
  await dialog.getByLabel('Netmask or prefix length').fill('16');
  await dialog.getByText('This is a device’s address, not a network’s.').first().waitFor();
  await dialog.getByRole('button', { name: 'Use 10.20.0.0' }).click();
  await dialog.getByLabel('Gateway', { exact: true }).fill('10.99.0.1');
  await dialog.getByLabel('Interface').selectOption('lbr0');
  await dialog.getByText('would refuse this route. The gateway is not in the network of this interface.').waitFor();
  await screenshot(page, 'internet-route-refused');
  await dialog.getByLabel('Gateway', { exact: true }).fill('192.168.1.110');
  await dialog.getByText('The router takes this route.').waitFor();
});
await check('it is stored and installed', async () => {
  await dialog.getByRole('button', { name: 'Save' }).click();
  await dialog.waitFor({ state: 'detached' });
  await row('10.20.0.0/16').getByText('installed', { exact: true }).waitFor();
  holds(/10\.20\.0\.0\/16 via 192\.168\.1\.110/.test(kernel('-4')), kernel('-4'));
});
await check('a second route to the same network is explained', async () => {
  await routes.getByRole('button', { name: 'Add route' }).click();
  await dialog.getByLabel('Destination network').fill('10.20.0.0');
  await dialog.getByLabel('Netmask or prefix length').fill('255.255.0.0');
  await dialog.getByText('Another route leads to the same network already.').first().waitFor();
  await dialog.getByRole('button', { name: 'Cancel' }).click();
});
await check('a stored route may be changed without being taken for its own double', async () => {
  await routes.getByRole('button', { name: 'Edit the route to 10.20.0.0/16' }).click();
  await dialog.getByText('The router takes this route.').waitFor();
  await dialog.getByLabel('Gateway', { exact: true }).fill('192.168.1.111');
  await dialog.getByText('The router takes this route.').waitFor();
  await dialog.getByRole('button', { name: 'Save' }).click();
  await dialog.waitFor({ state: 'detached' });
  await row('10.20.0.0/16').getByText('192.168.1.111').waitFor();
});
await check('a route that is not in the kernel says why', async () => {
  on('router', 'ip', 'link', 'set', 'eth1', 'up');
  await routes.getByRole('button', { name: 'Add route' }).click();
  await dialog.getByLabel('Destination network').fill('10.30.0.0');
  await dialog.getByLabel('Netmask or prefix length').fill('24');
  await dialog.getByLabel('Gateway', { exact: true }).fill('198.51.100.1');
  await dialog.getByLabel('Interface').selectOption('eth1');
  await dialog.getByText('The router takes this route.').waitFor();
  await dialog.getByRole('button', { name: 'Save' }).click();
  await row('10.30.0.0/24').getByText('installed', { exact: true }).waitFor();
  on('router', 'ip', 'link', 'set', 'eth1', 'down');
  await page.reload();
  await row('10.30.0.0/24').getByText('not installed').waitFor();
  await row('10.30.0.0/24').getByText('The interface is down.').waitFor();
});
await looks(page, 'internet-routes');
await check('a route is switched off and removed', async () => {
  await row('10.20.0.0/16').getByRole('switch').click();
  await row('10.20.0.0/16').getByText('switched off').waitFor();
  holds(!kernel('-4').includes('10.20.0.0/16'), kernel('-4'));
  await routes.getByRole('button', { name: 'Remove the route to 10.20.0.0/16' }).click();
  await dialog.getByRole('button', { name: 'Remove' }).click();
  await row('10.20.0.0/16').waitFor({ state: 'detached' });
});
await check('IPv6 has its own list, which survives a reload', async () => {
  await page.getByRole('button', { name: 'IPv6' }).click();
  await page.getByText('There are no static routes for IPv6.').waitFor();
  await routes.getByRole('button', { name: 'Add route' }).click();
  await dialog.getByLabel('Destination network').fill('2001:db8:77::');
  await dialog.getByLabel('Prefix length').fill('48');
  await dialog.getByLabel('Interface').selectOption('lbr0');
  await dialog.getByText('The router takes this route.').waitFor();
  await dialog.getByRole('button', { name: 'Save' }).click();
  await row('2001:db8:77::/48').getByText('installed', { exact: true }).waitFor();
  holds(kernel('-6').includes('2001:db8:77::/48'), kernel('-6'));
  await page.reload();
  await row('2001:db8:77::/48').waitFor();
});
await check('the tables are listed by name', async () => {
  await page.getByText('Routing tables').click();
  await page.getByRole('cell', { name: 'main-table' }).waitFor();
});
await finish();
