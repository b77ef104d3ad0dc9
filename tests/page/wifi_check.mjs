// The Wi-Fi filter. The home has no radio; the adapter's configuration is all that the filter needs.
import { check, equal, finish, holds, looks, on, open, screenshot, signIn } from './browser.mjs';

const page = await open({ path: '#/wifi' });
await signIn(page);
const list = page.getByRole('region', { name: 'The list', exact: true });
const candidates = page.getByRole('region', { name: 'Put devices on the list' });
const save = () => page.getByRole('button', { name: 'Save', exact: true }).click();
const stored = () => JSON.parse(on('router', 'cat', '/etc/vorn/wireless/wlan0.json'));

await check('without an adapter the page says so, and can be tried again', async () => {
  await page.getByText('It may have no wireless adapter').waitFor();
  await screenshot(page, 'wifi-none');
  on('router', 'sh', '-c', 'mkdir -p /etc/hostapd && printf "interface=wlan0\\ndriver=none\\nssid=home\\nctrl_interface=/run/hostapd\\n" >/etc/hostapd/wlan0.conf');
  await page.getByRole('button', { name: 'Try again' }).click();
  await page.getByRole('radio', { name: /Everyone The list/ }).waitFor();
});
await check('devices are put on the list by a click', async () => {
  const laptop = candidates.getByRole('button').filter({ hasText: 'd4:3d:7e:11:22:33' });
  await laptop.click();
  await list.getByText('d4:3d:7e:11:22:33', { exact: true }).waitFor();
  await laptop.waitFor({ state: 'detached' });
});
await check('an address that is none, or on the list, is explained and stays', async () => {
  const field = candidates.getByLabel('By its address');
  await field.fill('ff:ff:ff:ff:ff:ff');
  await field.press('Enter');
  await candidates.getByText('This is no MAC address of a device.').waitFor();
  equal(await field.inputValue(), 'ff:ff:ff:ff:ff:ff');
  await field.fill('D4-3D-7E-11-22-33');
  await field.press('Enter');
  await candidates.getByText('This address is on the list already.').waitFor();
  await field.fill('02-00-00-00-01-00');
  await field.press('Enter');
  await list.getByText('02:00:00:00:01:00', { exact: true }).waitFor();
});
await check('whoever would lock everybody out is warned', async () => {
  await page.getByRole('radio', { name: /^Only devices/ }).click();
  for (const each of await list.getByRole('switch').all()) await each.click();
  await page.getByText('no device gets in by radio').waitFor();
  await list.getByRole('switch').first().click();
  await page.getByText('no device gets in by radio').waitFor({ state: 'detached' });
});
await check('what the router refuses stays as it was made', async () => {
  await page.route('**/*MacFilter/1/set', (route) => route.fulfill({ json: { success: false, error: { code: 4300 } } }));
  await save();
  await page.getByText('The router could not do this.').waitFor();
  equal(await list.getByRole('listitem').count(), 2, 'entries');
  await page.unroute('**/*MacFilter/1/set');
});
await check('policy and list are stored, what is off with them', async () => {
  await list.getByLabel(/Description: 02:00/).fill('television <b>');
  await save();
  await page.locator('.save-bar').waitFor({ state: 'detached' });
  const { mac_filter_policy, mac_filter_list } = stored();
  equal(mac_filter_policy, 'allow');
  equal(mac_filter_list.map((each) => [each.mac, each.mac_filter_enabled]), [
    ['d4:3d:7e:11:22:33', true],
    ['02:00:00:00:01:00', false],
  ]);
  equal(on('router', 'sh', '-c', 'grep -v "^#" /etc/vorn/wireless/wlan0.accept').trim(), 'd4:3d:7e:11:22:33');
});
await check('it comes back as it was stored', async () => {
  await page.reload();
  await list.getByText('d4:3d:7e:11:22:33', { exact: true }).waitFor();
  holds(await page.getByRole('radio', { name: /^Only devices/ }).isChecked(), 'the policy is chosen');
  equal(await list.getByLabel(/Description: 02:00/).inputValue(), 'television <b>');
});
await looks(page, 'wifi');
await check('an entry is taken off, and the change can be discarded', async () => {
  await list.getByRole('button', { name: /^Take television/ }).click();
  equal(await list.getByRole('listitem').count(), 1, 'entries');
  await page.getByRole('button', { name: 'Discard' }).click();
  equal(await list.getByRole('listitem').count(), 2, 'entries');
});
await finish();
