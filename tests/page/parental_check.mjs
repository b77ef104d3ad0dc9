// Parental control: a week painted with mouse and keys, copied, stored, and enforced.
import { check, equal, finish, holds, lease, looks, on, open, screenshot, signIn } from './browser.mjs';

const page = await open({ path: '#/parental' });
await signIn(page);
const grid = page.getByRole('grid');
const cut = () => grid.locator('[aria-selected=true]').count();
const slot = (day, hour) => grid.locator(`[data-slot="${day * 24 + hour}"]`);
const save = () => page.getByRole('button', { name: 'Save', exact: true }).click();
const stored = () => on('router', 'sh', '-c', 'cat /etc/parental/timectrl.ui.conf 2>/dev/null || true');
const saved = () => page.locator('.save-bar').waitFor({ state: 'detached' });

async function drag(from, to) {
  const [a, b] = [await from.boundingBox(), await to.boundingBox()];
  await page.mouse.move(a.x + a.width / 2, a.y + a.height / 2);
  await page.mouse.down();
  await page.mouse.move(b.x + b.width / 2, b.y + b.height / 2, { steps: 12 });
  await page.mouse.up();
}

await check('without hours the page says how to begin', () => page.getByText('No device has hours yet.').waitFor());
await check('a device is chosen from those that are known', async () => {
  const option = page.getByLabel('Add a device').locator('option').nth(1);
  await option.waitFor({ state: 'attached' });
  const laptop = page.getByLabel('Add a device').locator('option[value="d4:3d:7e:11:22:33"]');
  await page.getByLabel('Add a device').selectOption(await laptop.getAttribute('value'));
  await page.getByRole('button', { name: 'Add', exact: true }).click();
  await grid.waitFor();
  equal(await cut(), 0, 'cut hours');
});
await check('the mouse paints a rectangle, and takes it away again', async () => {
  await drag(slot(1, 20), slot(5, 23));
  equal(await cut(), 20, 'cut hours');
  await drag(slot(5, 20), slot(5, 23));
  equal(await cut(), 16, 'cut hours');
});
await check('an hour is named by its day, its time and its state', () =>
  grid.getByRole('gridcell', { name: /^Monday, 20:00 to 21:00(, now)?: cut off$/ }).waitFor());
await check('keys move one by one, Space turns, Shift with an arrow paints on', async () => {
  await slot(0, 0).focus();
  equal(await grid.locator('[tabindex="0"]').count(), 1, 'places for Tab');
  await page.keyboard.press('ArrowRight');
  await page.keyboard.press('ArrowDown');
  await page.keyboard.press('Space');
  equal(await slot(1, 1).getAttribute('aria-selected'), 'true');
  await page.keyboard.press('Shift+ArrowRight');
  await page.keyboard.press('Shift+ArrowDown');
  equal(await cut(), 20, 'cut hours');
  equal(await slot(2, 2).getAttribute('aria-selected'), 'true');
  await page.keyboard.press('Shift+ArrowUp');
  equal(await cut(), 18, 'cut hours');
  await page.keyboard.press('Control+a');
  equal(await cut(), 0, 'cut hours after Ctrl+A on one that was cut');
  await page.keyboard.press('Control+a');
  equal(await cut(), 168, 'cut hours after Ctrl+A on a free one');
});
await check('all is freed, and a day is copied to the others', async () => {
  await page.getByRole('button', { name: 'Free all' }).click();
  equal(await cut(), 0, 'cut hours');
  await drag(slot(3, 21), slot(3, 23));
  await page.getByLabel('Copy the day').selectOption('3');
  await page.getByLabel('to', { exact: true }).selectOption('weekdays');
  await page.getByRole('button', { name: 'Copy', exact: true }).click();
  equal(await cut(), 15, 'cut hours');
  await page.getByText('In words', { exact: true }).last().click();
  await page.getByText('Friday: 21:00–24:00').waitFor();
  await page.getByText('Sunday: free').waitFor();
});
await check('what the router refuses stays painted', async () => {
  await page.route('**/*ParentalControl/1/set', (route) => route.fulfill({ json: { success: false, error: { code: 4300 } } }));
  await save();
  await page.getByText('The router could not do this.').waitFor();
  equal(await cut(), 15, 'cut hours');
  await page.unroute('**/*ParentalControl/1/set');
});
await check('the week is stored, Sunday first, and comes back', async () => {
  await save();
  await saved();
  const evening = `${'0'.repeat(21)}111`;
  const week = '0'.repeat(24) + evening.repeat(5) + '0'.repeat(24);
  holds(stored().includes(`tc_sched=${week}`), stored());
  await page.reload();
  await grid.waitFor();
  equal(await cut(), 15, 'cut hours');
});
await check('the present hour is marked, and what is cut now is said until when', async () => {
  equal(await grid.locator('.slot.now').count(), 1, 'marked hours');
  await page.getByRole('button', { name: 'Free all' }).click();
  const now = grid.locator('.slot.now');
  const index = Number(await now.getAttribute('data-slot'));
  await now.click();
  const next = (index + 1) % 24;
  await page.locator('.now-state').getByText(/^Cut off now, until .*\d\d:00\.$/).waitFor();
  const said = await page.locator('.now-state').innerText();
  holds(said.includes(`${String(next).padStart(2, '0')}:00`), said);
  await save();
  await saved();
});
await check('the device is cut off: the kernel’s table has it', () => {
  const table = on('router', 'nft', 'list', 'ruleset');
  holds(table.includes('vorn_timecontrol') && table.includes('d4:3d:7e:11:22:33'), table);
});
await looks(page, 'parental');
await check('on a telephone a finger paints hours', async () => {
  await page.setViewportSize({ width: 360, height: 900 });
  await page.getByRole('button', { name: 'Free all' }).click();
  await grid.scrollIntoViewIfNeeded();
  await drag(slot(2, 8), slot(4, 10));
  equal(await cut(), 9, 'cut hours');
  await slot(2, 8).focus();
  await page.keyboard.press('ArrowRight'); // where days are columns, right is the next day
  equal(await page.evaluate(() => document.activeElement?.getAttribute('data-slot')), String(3 * 24 + 8));
  await page.setViewportSize({ width: 1400, height: 900 });
  await page.getByRole('button', { name: 'Discard' }).click();
});
await check('hours are removed after a question', async () => {
  await page.getByRole('button', { name: /^Remove / }).click();
  await page.getByRole('dialog').getByRole('button', { name: 'Remove' }).click();
  await page.getByText('No device has hours yet.').waitFor();
  equal(stored().includes('tc_sched'), false, 'rules are stored');
});
await check('names from the network are only ever text', async () => {
  const name = '<img/src=x/onerror=window.pwned=1>';
  lease([{ mac: '00:00:5e:00:53:01', ip: '192.168.1.77', name }]);
  const option = page.getByLabel('Add a device').locator('option', { hasText: name });
  for (let tries = 0; tries < 40 && (await option.count()) === 0; tries += 1) {
    await page.reload();
    await page.getByText('No device has hours yet.').waitFor();
    await option.waitFor({ state: 'attached', timeout: 500 }).catch(() => undefined);
  }
  await page.getByLabel('Add a device').selectOption(await option.getAttribute('value'));
  await page.getByRole('button', { name: 'Add', exact: true }).click();
  await page.getByRole('heading', { name: `Week of ${name}` }).waitFor();
  await page.getByRole('button', { name: 'Discard' }).click();
  equal(await page.evaluate(() => window.pwned), undefined);
});
await check('in German the week begins on Monday', async () => {
  await page.locator('.side').getByLabel('Language').selectOption('de');
  const option = page.getByLabel('Gerät hinzufügen').locator('option').nth(1);
  await page.getByLabel('Gerät hinzufügen').selectOption(await option.getAttribute('value'));
  await page.getByRole('button', { name: 'Hinzufügen', exact: true }).click();
  equal(await grid.getByRole('rowheader').first().innerText(), 'Mo\nMontag');
  await screenshot(page, 'parental-german');
});
await finish();
