// The server goes away while the page is open.
import { check, equal, finish, holds, on, open, screenshot, signIn } from './browser.mjs';

const page = await open();
await signIn(page);
const LAPTOP = 'd4:3d:7e:11:22:33';
const rows = page.locator('.devices-body [role=row]');
await rows.filter({ hasText: LAPTOP }).waitFor();

await check('a device that cannot be renamed keeps what was typed, and says why', async () => {
  await page.route('**/*ConnectionList/1/set', (route) => route.fulfill({ json: { success: false, error: { code: 4300 } } }));
  await rows.filter({ hasText: LAPTOP }).getByRole('button').click();
  await page.locator('.editor input').fill('typed with care');
  await page.getByRole('button', { name: 'Save' }).click();
  await page.getByText('The router could not do this.').waitFor();
  equal(await page.locator('.editor input').inputValue(), 'typed with care');
  await page.unroute('**/*ConnectionList/1/set');
});
await check('a listing that fails leaves the list, and can be tried again', async () => {
  await page.waitForFunction(() => document.querySelector('progress') === null, undefined, { timeout: 90_000 });
  let fails = true;
  await page.route('**/*ConnectionList/1/get', async (route) => {
    const live = JSON.parse(route.request().postData() ?? '{}').scannertype === undefined;
    if (!live) await route.continue();
    else if (fails) await route.fulfill({ json: { success: false, error: { code: 4300 } } });
    else await route.fulfill({ json: { success: true, data: { stations: [], finish: true } } });
  });
  const before = await rows.count();
  holds(before > 4, `rows: ${before}`);
  await page.getByRole('button', { name: 'Refresh' }).click();
  await page.getByText('did not come through').waitFor();
  equal(await rows.count(), before, 'rows');
  fails = false;
  await page.getByRole('button', { name: 'Try again' }).click();
  await page.getByText('did not come through').waitFor({ state: 'detached' });
  await page.unroute('**/*ConnectionList/1/get');
});
await check('a page that finds no router keeps looking, and goes on by itself', async () => {
  const second = await page.context().newPage();
  await second.route('**/webapi/session', (route) => route.abort());
  await second.goto(page.url());
  await second.getByRole('alert').getByText('The router does not answer.').waitFor();
  await second.unroute('**/webapi/session');
  await second.getByRole('heading', { name: 'Devices', level: 1 }).waitFor();
  await second.close();
});
await check('a server that is killed is told of, the list stays, and what is typed too', async () => {
  const killed = on('router', 'sh', '-c', 'kill -KILL $(pidof vornwebd)');
  equal(killed, '');
  await page.getByRole('button', { name: 'Save' }).click();
  await page.getByText('The router does not answer.').first().waitFor();
  await screenshot(page, 'server-gone');
  equal(await page.locator('.editor input').inputValue(), 'typed with care');
  await page.getByRole('button', { name: 'Refresh' }).click();
  await page.getByRole('button', { name: 'Try again' }).first().waitFor();
  holds((await rows.count()) > 0, 'the list is there');
});
await finish();
