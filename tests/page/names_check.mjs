// Names that come from the network are only ever text.
import { check, equal, finish, holds, lease, looks, open, scriptDevices, signIn, takeComplaints } from './browser.mjs';

const call = 'window.pwned=1';
const NAMES = [
  `<script>${call}</script>`, `<img src=x onerror=${call}>`, `<svg onload=${call}>`, `"><script>${call}</script>`, `'><img src=x onerror='${call}'>`,
  `</title><script>${call}</script>`, `</textarea><script>${call}</script>`, `<iframe src="javascript:${call}">`, `<a href="javascript:${call}">x</a>`, `javascript:${call}`,
  `<body onload=${call}>`, `<style>*{display:none}</style>`, `<link rel=stylesheet href=//evil.test/x.css>`, `<meta http-equiv=refresh content=0;url=//evil.test>`, `<base href=//evil.test/>`,
  `<math><mtext><img src=x onerror=${call}></math>`, `<!--<img src="--><img src=x onerror=${call}//">`, `<template><script>${call}</script></template>`, '{{constructor.constructor("window.pwned=1")()}}', '${window.pwned=1}',
  '`${window.pwned=1}`', '&lt;script&gt;window.pwned=1&lt;/script&gt;', '&#60;script&#62;', '%3Cscript%3E', '\\u003cscript\\u003e',
  '__proto__', 'constructor', 'toString', '{name}', '{count}',
  '\u0000null', 'bell\u0007\u001b[31mred', 'line\nbreak\ttab', '\u202egnp.exe', 'a\u200db\u200bc', '\ufeffmark', '\ud800 half', 'ä'.repeat(120), 'W'.repeat(255), '👩‍👩‍👧‍👦 家族 <b>bold</b>',
];
const macOf = (each) => `00:00:5e:00:53:${each.toString(16).padStart(2, '0')}`;

// Tall enough for every row to be in sight.
const page = await open({ viewport: { width: 1400, height: 2800 } });
await signIn(page);
const shownNames = () => page.locator('.devices-body .name').allTextContents();

await check('there are 40 of them', () => equal(NAMES.length, 40));

// As a device would: in its DHCP request. What has spaces or control characters has no place in a lease.
const leased = NAMES.map((name, each) => ({ mac: macOf(each), ip: `192.168.1.${each + 20}`, name })).filter(({ name }) => /^[!-~\u00a1-\uffff]+$/.test(name) && !name.includes('\u202e') && name.length < 200);
await check('names of leases go through the store to the page as they are', async () => {
  holds(leased.length > 15, `${leased.length} fit into a lease`);
  lease(leased);
  await page.getByRole('searchbox').fill('00:00:5e:00:53');
  await page.waitForFunction((count) => document.querySelectorAll('.devices-body .name').length >= count, leased.length, { timeout: 40_000 });
  const shown = await shownNames();
  for (const { name } of leased) holds(shown.includes(name), `${name} in ${JSON.stringify(shown)}`);
});
await check('the owner’s own words are kept as they are', async () => {
  const markup = NAMES.filter((each) => !/[\u0000-\u001f\u202e\ud800]/.test(each)).slice(0, 12);
  for (const [each, name] of markup.entries()) {
    await page.evaluate(async ([mac, hostname]) => {
      const { data } = await (await fetch('/webapi/session', { method: 'POST', headers: { 'Content-Type': 'application/json' }, body: '{}' })).json();
      const answer = await fetch('/webapi/VORN.Core.Network.Router.ConnectionList/1/set', {
        method: 'POST', headers: { 'Content-Type': 'application/json', 'X-CSRF-Token': data.csrf }, body: JSON.stringify({ mac, hostname, type: 'computer' }),
      });
      if (!(await answer.json()).success) throw new Error(`${hostname} was refused`);
    }, [leased[each].mac, name]);
  }
  await page.reload();
  await page.waitForFunction((count) => document.querySelectorAll('.devices-body .name').length >= count, leased.length);
  const shown = await shownNames();
  for (const name of markup) holds(shown.includes(name), `${name} in ${JSON.stringify(shown)}`);
});

// What the store would not let through either: the page relies on nobody.
await scriptDevices(page, (asked) =>
  asked.scannertype
    ? { stations: NAMES.map((name, each) => ({ mac: macOf(each), ip: name, hostname: name, brand: name, model: name, netif: name, type: name, connection: name, asso_time: name, status: true })) }
    : { stations: NAMES.map((name, each) => ({ mac: macOf(each), hostname: name })), finish: true },
);
await check('every name is text, whatever it is and wherever it stands', async () => {
  await page.goto(`${page.url().split('#')[0]}#/devices`);
  await page.reload();
  await page.waitForFunction(() => document.querySelector('.devices')?.getAttribute('aria-rowcount') === '41');
  const seen = new Set();
  for (let at = 0; at < 3000; at += 400) {
    await page.evaluate((to) => window.scrollTo(0, to), at);
    await page.waitForTimeout(60);
    for (const name of await shownNames()) seen.add(name);
  }
  for (const name of NAMES) holds(seen.has(name.toWellFormed?.() ?? name) || seen.has(name), JSON.stringify(name));
});
await looks(page, 'hostile-devices');
await check('they are text in the editor, in a question and on the map', async () => {
  await page.evaluate(() => window.scrollTo(0, 0));
  for (const each of [0, 1, 2]) {
    await page.locator('.devices-body [role=row] .at-edit button').nth(each).click();
    await page.getByRole('button', { name: 'Forget' }).click();
    await page.getByRole('dialog').getByRole('button', { name: 'Cancel' }).click();
    await page.getByRole('button', { name: 'Cancel' }).click();
  }
  await page.goto(`${page.url().split('#')[0]}#/map`);
  await page.waitForFunction(() => document.querySelectorAll('.node.device').length === 40);
  await page.locator('details summary').click();
});
await looks(page, 'hostile-map');
await check('no script of a name ran, and none was there to be stopped', async () => {
  equal(await page.evaluate(() => window.pwned ?? null), null);
  equal(await page.evaluate(() => document.querySelectorAll('#app script, #app iframe, #app img, #app link, #app base, #app meta, #app style').length), 0);
  equal(takeComplaints(), []);
});
await finish();
