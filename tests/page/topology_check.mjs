// The topology and its switch, followed to the end; the recommended packages beside it.
import { check, equal, finish, holds, looks, on, open, screenshot, signIn } from './browser.mjs';

const page = await open({ path: '#/topology' });
await signIn(page);
const mode = (name) => page.getByRole('radio', { name: new RegExp(`^${name}`) });
const dialog = page.getByRole('dialog');

await check('what it is now is marked, and what can be chosen is offered', async () => {
  holds(await mode('Router').isChecked(), 'router is chosen');
  await mode('Bridge').waitFor();
  equal(await page.getByRole('radio').count(), 2, 'modes');
});
await check('what a switch will do is said before it', async () => {
  await mode('Bridge').click();
  await page.getByText('gets a new address from the other router').waitFor();
});
await looks(page, 'topology');
await check('a switch that is refused says so, and the choice stays', async () => {
  await page.getByRole('button', { name: 'Switch to “Bridge” …' }).click();
  await dialog.getByText('You reach the router as').waitFor();
  await screenshot(page, 'topology-confirm');
  await page.route('**/*Topology/1/set', (route) => route.fulfill({ json: { success: false, error: { code: 4340 } } }));
  await dialog.getByRole('button', { name: 'Switch now' }).click();
  await dialog.getByText('A switch of the topology is under way.').waitFor();
  await page.unroute('**/*Topology/1/set');
});
await check('the switch begins, and tells where the router will be', async () => {
  await page.route('**/*Topology/2/get', async (route) => {
    await new Promise((resolve) => setTimeout(resolve, 700)); // so that there is time to look
    await route.continue().catch(() => undefined);
  });
  await dialog.getByRole('button', { name: 'Switch now' }).click();
  await page.getByRole('heading', { name: 'Where to find the router' }).waitFor();
  await page.getByRole('link', { name: /^http:\/\/203\.0\.113\.\d+/ }).waitFor();
  await screenshot(page, 'topology-switching');
  await page.unroute('**/*Topology/2/get');
});
await check('it is followed to its end: the router is a bridge', async () => {
  await page.getByText('Done. The router is in the mode “Bridge” now.').waitFor({ timeout: 60_000 });
  holds(on('router', 'ip', '-br', 'link').includes('br0'), 'br0 is there');
  await screenshot(page, 'topology-done');
  await page.getByRole('button', { name: 'Go on' }).click();
  await page.waitForFunction(() => document.querySelectorAll('.mode')[1]?.querySelector('.badge') !== null);
});
await check('the rules’ pages say that they have no effect now', async () => {
  await page.getByRole('link', { name: 'Port forwarding' }).click();
  await page.getByText('In the mode “bridge” the rules have no effect').waitFor();
  await page.getByRole('link', { name: 'Topology' }).click();
});
await check('silence on the way is told as expected, with the address of the home network', async () => {
  await mode('Router').click();
  await page.getByRole('button', { name: 'Switch to “Router” …' }).click();
  await page.route('**/*Topology/2/get', (route) => route.abort());
  await dialog.getByRole('button', { name: 'Switch now' }).click();
  await page.getByText('The router does not answer here. That is expected').waitFor();
  await page.getByText('its home network, as last seen').waitFor();
  await page.getByRole('link', { name: /192\.168\.1\.1/ }).waitFor();
  await looks(page, 'topology-silent');
  await page.unroute('**/*Topology/2/get');
  await page.getByText('Done. The router is in the mode “Router” now.').waitFor({ timeout: 60_000 });
  await page.getByRole('button', { name: 'Go on' }).click();
  await page.waitForFunction(() => document.querySelector('.mode .badge') !== null);
});
await check('a switch that the router put back is told', async () => {
  await mode('Bridge').click();
  await page.getByRole('button', { name: 'Switch to “Bridge” …' }).click();
  await page.route('**/*Topology/1/set', (route) =>
    route.fulfill({ json: { success: true, data: { redirect: true, secure: false, port: '8080', ip_list: ['203.0.113.9'] } } }));
  let asked = 0;
  await page.route('**/*Topology/2/get', (route) => route.fulfill({
    json: { success: true, data: { net_topology: 'router', switching: (asked += 1) < 2, support_net_topology: true, supported_mode: 'router,bridge', bridge_mode_forbidden: false } },
  }));
  await dialog.getByRole('button', { name: 'Switch now' }).click();
  await page.getByText('put back what there was. Check the cable').waitFor();
  await screenshot(page, 'topology-undone');
  await page.unroute('**/*Topology/1/set');
  await page.unroute('**/*Topology/2/get');
  await page.getByRole('button', { name: 'Back to the choice' }).click();
});

await check('packages are listed', async () => {
  await page.getByRole('link', { name: 'Packages' }).click();
  await page.getByRole('heading', { name: 'Media Server' }).waitFor();
});
await looks(page, 'packages');
await check('packages that cannot be fetched are explained, with the next step', async () => {
  await page.route('**/*PkgList/1/get', (route) => route.fulfill({ json: { success: false, error: { code: 4300 } } }));
  await page.reload();
  await page.getByText('The list comes from a server in the internet').waitFor();
  await screenshot(page, 'packages-failed');
  await page.unroute('**/*PkgList/1/get');
  await page.getByRole('button', { name: 'Try again' }).click();
  await page.getByRole('heading', { name: 'Media Server' }).waitFor();
});
await check('an empty list says so', async () => {
  await page.route('**/*PkgList/1/get', (route) => route.fulfill({ json: { success: true, data: { packages: [] } } }));
  await page.reload();
  await page.getByText('Nothing is recommended at the moment.').waitFor();
});
await finish();
