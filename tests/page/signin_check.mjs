// Signing in, the first password, the session's end, tokens, languages.
import { check, equal, finish, firstPassword, holds, looks, NARROW, open, password, screenshot, signIn, WIDE } from './browser.mjs';

const page = await open();

await looks(page, 'signin');
await check('a wrong password is said to be wrong, and the user name stays', async () => {
  await page.getByLabel('Password', { exact: true }).fill('wrong');
  await page.getByRole('button', { name: 'Sign in' }).click();
  await page.getByRole('alert').getByText('User name or password is wrong.').waitFor();
  equal(await page.getByLabel('User name').inputValue(), 'admin');
});
await check('the first password leads to its change and nowhere else', async () => {
  await page.getByLabel('Password', { exact: true }).fill(firstPassword);
  await page.getByLabel('Password', { exact: true }).press('Enter');
  await page.getByRole('heading', { name: 'Choose your own password' }).waitFor();
  await screenshot(page, 'first-password');
  equal(await page.getByRole('navigation').count(), 0, 'navigations');
});
await check('a new password that will not do is explained', async () => {
  await page.getByLabel('New password', { exact: true }).fill('short');
  await page.getByRole('button', { name: 'Change password' }).click();
  await page.getByText('At least 8 characters, please.').waitFor();
  await page.getByLabel('New password', { exact: true }).fill(password);
  await page.getByLabel('New password again').fill(`${password}x`);
  await page.getByText('The two do not match.').waitFor();
});
await check('the change leads to the devices', async () => {
  await page.getByLabel('New password again').fill(password);
  await page.getByRole('button', { name: 'Change password' }).click();
  await page.getByRole('heading', { name: 'Devices', level: 1 }).waitFor();
});
await check('a page that is loaded anew is still signed in', async () => {
  await page.reload();
  await page.getByRole('heading', { name: 'Devices', level: 1 }).waitFor();
});

await page.getByRole('link', { name: 'API tokens' }).click();
await check('a token is made, shown once and listed', async () => {
  await page.getByLabel('Name').fill('bad name');
  await page.getByRole('button', { name: 'Make token' }).click();
  await page.getByRole('alert').getByText('1 to 64 letters').waitFor();
  await page.getByLabel('Name').fill('home-automation');
  await page.getByRole('button', { name: 'Make token' }).click();
  const token = await page.locator('dialog code').textContent();
  holds(token.length >= 20, `a token: ${token}`);
  await page.locator('dialog').getByRole('button', { name: 'Close' }).last().click();
  await page.getByRole('rowheader', { name: 'home-automation' }).waitFor();
  equal(await page.getByText(token).count(), 0, 'places where the token still stands');
});
await looks(page, 'tokens');
await check('a token is revoked after a question', async () => {
  await page.getByRole('button', { name: 'Revoke: home-automation' }).click();
  await page.getByRole('dialog').getByRole('button', { name: 'Revoke' }).click();
  await page.getByRole('rowheader', { name: 'home-automation' }).waitFor({ state: 'detached' });
});

await check('a session that ended keeps what was typed behind the sign-in', async () => {
  await page.getByLabel('Name').fill('kept');
  await page.context().clearCookies();
  // The dialog may be there already: whichever call is the first to be refused brings it.
  await page.getByRole('button', { name: 'Make token', includeHidden: true }).dispatchEvent('click');
  const dialog = page.getByRole('dialog');
  await dialog.getByText('Your session has ended.').waitFor();
  await screenshot(page, 'expired');
  await dialog.getByLabel('Password').fill(password);
  await dialog.getByRole('button', { name: 'Sign in' }).click();
  await dialog.waitFor({ state: 'detached' });
  equal(await page.getByLabel('Name').inputValue(), 'kept');
});

await page.getByRole('link', { name: 'Account' }).click();
await looks(page, 'account');
await check('the language changes at once and stays', async () => {
  await page.locator('.side').getByLabel('Language').selectOption('de');
  await page.getByRole('heading', { name: 'Konto', level: 1 }).waitFor();
  await page.reload();
  await page.getByRole('heading', { name: 'Konto', level: 1 }).waitFor();
  equal(await page.evaluate(() => document.documentElement.lang), 'de');
  await page.locator('.side').getByLabel('Sprache').selectOption('en');
});
await check('the appearance changes and stays', async () => {
  const background = () => page.evaluate(() => getComputedStyle(document.body).backgroundColor);
  const light = await background();
  await page.locator('.side').getByLabel('Appearance').selectOption('dark');
  await page.reload();
  await page.getByRole('heading', { name: 'Account', level: 1 }).waitFor();
  holds((await background()) !== light, 'dark is another colour');
  await page.locator('.side').getByLabel('Appearance').selectOption('auto');
});
await check('on a telephone the navigation shows the page that one is on', async () => {
  const shown = (id) =>
    page.waitForFunction((page) => {
      const link = document.querySelector('.side nav a[aria-current]');
      const [inner, outer] = [link, link?.closest('nav')].map((each) => each?.getBoundingClientRect());
      // A row's place is a whole number of pixels, its width is not.
      return link?.hash === `#/${page}` && inner.left > outer.left - 1 && inner.right < outer.right + 1;
    }, id);
  await page.setViewportSize(NARROW);
  await page.reload();
  await shown('account'); // the last one
  for (const reducedMotion of ['reduce', 'no-preference']) {
    await page.emulateMedia({ reducedMotion });
    for (const id of ['devices', 'topology', 'account']) {
      await page.evaluate((to) => (location.hash = `#/${to}`), id);
      await shown(id);
    }
  }
  equal(await page.evaluate(() => window.scrollY), 0, 'pixels that the page itself has moved');
  await screenshot(page, 'navigation-narrow');
  await page.emulateMedia({ reducedMotion: 'reduce' });
  await page.setViewportSize(WIDE);
});
await check('signing out ends the session', async () => {
  await page.getByRole('button', { name: 'Sign out' }).click();
  await page.getByRole('heading', { name: 'Sign in' }).waitFor();
  await page.reload();
  await page.getByRole('heading', { name: 'Sign in' }).waitFor();
  await signIn(page);
});
await finish();
