// What the checks of the page share: a browser, who watches it, and ways to say what must hold.
//
// A check is a program:
//   import { check, finish, open, signIn } from './browser.mjs';
//   const page = await open();            // watched: any error of a script and any policy report fails the check
//   await signIn(page);                   // as the administrator, with a password of its own
//   await check('what must hold', async () => { ... throws when it does not ... });
//   await finish();
import { execFileSync } from 'node:child_process';
import { mkdtempSync, readFileSync, rmSync } from 'node:fs';
import { createRequire } from 'node:module';
import { tmpdir } from 'node:os';
import { join } from 'node:path';

const require = createRequire(new URL('../../page/package.json', import.meta.url));
const { chromium } = require('playwright-core');
const axeSource = readFileSync(require.resolve('axe-core/axe.min.js'), 'utf8');

export const address = process.env.VORN_PAGE;
export const firstPassword = process.env.VORN_FIRST_PASSWORD;
export const password = 'correct horse battery';
export const WIDE = { width: 1400, height: 900 };
export const NARROW = { width: 360, height: 740 };

const FLAGS = [
  '--no-sandbox',
  '--disable-gpu',
  '--disable-quic',
  '--no-first-run',
  '--disable-background-networking',
  '--disable-component-update',
  '--disable-sync',
  '--no-proxy-server',
];
const LIMIT = 15_000; // milliseconds that anything may take to show up

let failures = 0;
const contexts = [];
const folders = [];

/** @param action  throws when what the description says does not hold */
export async function check(description, action) {
  try {
    await action();
    console.log(`PASS ${description}`);
  } catch (fault) {
    failures += 1;
    console.log(`FAIL ${description}\n  ${String(fault?.stack ?? fault).replaceAll('\n', '\n  ')}`);
  }
}

export function equal(got, wanted, what = 'value') {
  if (JSON.stringify(got) !== JSON.stringify(wanted)) {
    throw new Error(`${what}: wanted ${JSON.stringify(wanted)}, got ${JSON.stringify(got)}`);
  }
}

export function holds(truth, what) {
  if (!truth) throw new Error(`not so: ${what}`);
}

/** What a watched page has complained of, since it was last asked. A failed request is no complaint by itself. */
const complaints = [];
export function takeComplaints() {
  return complaints.splice(0);
}

function watch(page) {
  page.on('pageerror', (fault) => complaints.push(`script: ${fault}`));
  page.on('dialog', (dialog) => {
    complaints.push(`dialog: ${dialog.message()}`);
    void dialog.dismiss();
  });
  page.on('console', (message) => {
    const text = message.text();
    if (message.type() === 'error' && !text.startsWith('Failed to load resource')) complaints.push(`console: ${text}`);
    if (text.startsWith('policy: ')) complaints.push(text);
  });
  page.on('request', (request) => {
    const url = request.url();
    if (!url.startsWith(address) && !url.startsWith('data:') && !url.startsWith('blob:')) complaints.push(`elsewhere: ${url}`);
  });
}

/** A page in a browser that knows nothing yet. */
export async function open({ viewport = WIDE, colorScheme = 'light', locale = 'en-GB', path = '' } = {}) {
  const folder = mkdtempSync(join(tmpdir(), 'vorn-browser-'));
  folders.push(folder);
  const context = await chromium.launchPersistentContext(folder, {
    executablePath: process.env.VORN_CHROMIUM ?? '/usr/bin/chromium',
    headless: true,
    args: FLAGS,
    viewport,
    colorScheme,
    locale,
    reducedMotion: 'reduce',
  });
  contexts.push(context);
  context.setDefaultTimeout(LIMIT);
  await context.addInitScript(() => {
    document.addEventListener('securitypolicyviolation', (event) => {
      console.log(`policy: ${event.violatedDirective} ${event.blockedURI} ${event.sourceFile}:${event.lineNumber}`);
    });
  });
  const page = context.pages()[0] ?? (await context.newPage());
  watch(page);
  await page.goto(address + path);
  return page;
}

/** As the administrator; the very first time this changes the first password to `password`. */
export async function signIn(page) {
  await page.getByLabel('Password', { exact: true }).waitFor();
  for (const each of [password, firstPassword]) {
    await page.getByLabel('Password', { exact: true }).fill(each);
    await page.getByRole('button', { name: 'Sign in' }).click();
    const outcome = await Promise.race([
      page.getByRole('navigation').waitFor().then(() => 'in'),
      page.getByLabel('New password', { exact: true }).waitFor().then(() => 'first'),
      page.getByText('User name or password is wrong.').waitFor().then(() => 'wrong'),
    ]);
    if (outcome === 'in') return;
    if (outcome === 'first') {
      await page.getByLabel('New password', { exact: true }).fill(password);
      await page.getByLabel('New password again').fill(password);
      await page.getByRole('button', { name: 'Change password' }).click();
      await page.getByRole('navigation').waitFor();
      return;
    }
  }
  throw new Error('neither password is right');
}

/** Accessibility: what axe finds on the page as it is. */
export async function accessible(page) {
  await page.evaluate(axeSource); // by the debugger, which the page's policy does not bind
  const found = await page.evaluate(() => globalThis.axe.run(document, { resultTypes: ['violations'] }));
  const text = found.violations.map(
    (each) => `${each.id} (${each.impact}): ${each.nodes.map((node) => `${node.target} ${node.failureSummary}`).join('; ')}`,
  );
  equal(text, [], 'findings');
}

/** Nothing of the page reaches beyond its sides. */
export async function fits(page) {
  const [inner, outer] = await page.evaluate(() => [document.documentElement.scrollWidth, window.innerWidth]);
  holds(inner <= outer, `${inner} pixels of content in ${outer}`);
}

export async function screenshot(page, name) {
  await page.screenshot({ path: join(process.env.VORN_SCREENSHOTS ?? '.', `${name}.png`) });
}

/** Every look of a page: both colours, both widths, with axe and a picture of each. */
export async function looks(page, name) {
  for (const colorScheme of ['light', 'dark']) {
    for (const [width, viewport] of [['wide', WIDE], ['narrow', NARROW]]) {
      await page.emulateMedia({ colorScheme, reducedMotion: 'reduce' });
      await page.setViewportSize(viewport);
      await screenshot(page, `${name}-${colorScheme}-${width}`);
      await check(`${name}, ${colorScheme}, ${width}: axe finds nothing`, () => accessible(page));
      await check(`${name}, ${colorScheme}, ${width}: fits`, () => fits(page));
    }
  }
  await page.emulateMedia({ colorScheme: 'light' });
  await page.setViewportSize(WIDE);
}

/** Runs a program on a host of the home. */
export function on(host, ...command) {
  const [program, ...options] = process.env.VORN_HOME.split(' ');
  return execFileSync(program, [...options, 'exec', host, ...command], { encoding: 'utf8' });
}

/** Gives every device of a list a lease, as dnsmasq would write it, and with that a place in the device store. */
export function lease(devices) {
  const lines = devices.map(({ mac, ip, name }) => `4102444800 ${mac} ${ip} ${name} *`).join('\n');
  const script = `file=/var/lib/misc/dnsmasq.leases; old=$(cat "$file"); printf '%s\\n' "$1" "$old" >"$file"`;
  on('router', 'sh', '-c', script, 'sh', lines);
}

/** Makes an answer of the list of devices anything. @param answer  (parameters) => data, or undefined: ask the server */
export async function scriptDevices(page, answer) {
  await page.route('**/*ConnectionList/1/get', async (route) => {
    const data = answer(JSON.parse(route.request().postData() ?? '{}'));
    if (data === undefined) await route.continue();
    else await route.fulfill({ json: { success: true, data } });
  });
}

export async function finish() {
  await check('no script failed, nothing broke the policy, nothing was asked elsewhere', () => equal(takeComplaints(), []));
  await Promise.all(contexts.map((each) => each.close()));
  for (const folder of folders) rmSync(folder, { recursive: true, force: true });
  process.exit(failures === 0 ? 0 : 1);
}
