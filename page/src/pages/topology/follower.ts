// Follows a switch to its end, also while another page is shown: it is not over because somebody looks elsewhere.
import { signal } from '@preact/signals';

import { follow, type Following, placesOf, type Redirect, type TopologyState } from '../../logic/topology';
import { getTopology, setTopology } from '../../router';

const PERIOD = 1000; // ms between two looks
const PATIENCE = 4000; // ms for an answer: a connection to an address that is gone hangs
const LAN_KEY = 'vorn-lan';

export interface Watched extends Following {
  places: string[];
  /** the home network's address, when this browser has seen it */
  lan: string;
  seconds: number;
}

export const following = signal<Watched | undefined>(undefined);

let timer = 0;

export function rememberLan(ip: string): void {
  try {
    localStorage.setItem(LAN_KEY, ip);
  } catch {
    // a browser that keeps nothing shows one hint less
  }
}

function knownLan(): string {
  try {
    return localStorage.getItem(LAN_KEY) ?? '';
  } catch {
    return '';
  }
}

/** No answer, and one that takes too long, are among the things that are told. */
async function ask(): Promise<TopologyState | undefined> {
  const late = new Promise<undefined>((resolve) => setTimeout(resolve, PATIENCE, undefined));
  return Promise.race([getTopology(true).catch(() => undefined), late]);
}

async function look(): Promise<void> {
  const before = following.value;
  if (!before) return;
  const answer = await ask();
  if (following.value?.since !== before.since) return; // dismissed meanwhile
  const now = Date.now();
  const next = follow(before, answer, now);
  following.value = { ...before, ...next, seconds: Math.round((now - before.since) / 1000) };
  if (next.phase !== 'done' && next.phase !== 'undone') start();
}

function start(): void {
  window.clearTimeout(timer);
  timer = window.setTimeout(() => void look(), PERIOD);
}

function begin(from: string, to: string, redirect: Redirect | undefined): void {
  following.value = {
    from,
    to,
    phase: 'asked',
    seen: false,
    since: Date.now(),
    seconds: 0,
    places: redirect?.redirect ? placesOf(redirect) : [],
    lan: to === 'router' ? knownLan() : '',
  };
  start();
}

/** Orders the switch; throws what the router refused it with. */
export async function switchTo(from: string, to: string): Promise<void> {
  const redirect = await setTopology(to);
  begin(from, to, redirect);
}

/** A switch that somebody else began. */
export function watchOther(from: string): void {
  if (following.value) return;
  begin(from, from === 'bridge' ? 'router' : 'bridge', undefined);
  following.value = { ...following.value!, phase: 'switching', seen: true };
}

export function goOn(): void {
  window.clearTimeout(timer);
  following.value = undefined;
}
