// The devices, kept for all pages that show them, and how they are asked for.
import { signal } from '@preact/signals';
import { useEffect } from 'preact/hooks';

import { ApiError, call } from '../api';
import { session } from '../session';
import { type Device, makeDevices, mergeStations, type Station } from './device';

interface Answer {
  stations?: Station[];
  finish?: boolean;
}

export const devices = signal<readonly Device[] | undefined>(undefined);
export const listError = signal<unknown>(undefined);

export interface Listing {
  running: boolean;
  /** how many devices it has found, and how many of them have a name */
  found: number;
  named: number;
  failed: boolean;
}

const IDLE: Listing = { running: false, found: 0, named: 0, failed: false };
export const listing = signal<Listing>(IDLE);

const REFRESH = 10_000; // milliseconds from one list to the next
const ASK = 700; // milliseconds from one look at the listing to the next
const MOST_FAULTS = 5; // that a listing may have in a row

let stored: readonly Station[] = [];
let live: readonly Station[] = [];

function show(): void {
  devices.value = makeDevices(mergeStations(stored, live), devices.value ?? []);
}

/** The list that the router has at hand. */
export async function refreshDevices(byItself = false): Promise<void> {
  try {
    const answer = await call<Answer>('ConnectionList', 1, 'get', { scannertype: 'all' }, { poll: byItself });
    stored = Array.isArray(answer.stations) ? answer.stations : [];
    listError.value = undefined;
    show();
  } catch (fault) {
    listError.value = fault;
  }
}

const pause = (time: number): Promise<void> => new Promise((resolve) => setTimeout(resolve, time));

/** Has the router look at the network anew and follows it. Runs once at a time. */
export async function listAnew(): Promise<void> {
  if (listing.value.running) return;
  listing.value = { ...IDLE, running: true };
  let faults = 0;
  for (let asked = 0; session.value.state === 'in'; asked += 1) {
    try {
      const answer = await call<Answer>('ConnectionList', 1, 'get', {}, { poll: asked > 0 });
      faults = 0;
      if (Array.isArray(answer.stations)) {
        live = answer.stations;
        const named = live.filter((each) => each.hostname).length;
        listing.value = { running: true, found: live.length, named, failed: false };
        show();
      }
      if (answer.finish === true) {
        listing.value = { ...IDLE };
        void refreshDevices(true);
        return;
      }
    } catch (fault) {
      faults += 1;
      // Two pages that follow one listing may take its end from each other; asking again begins another one.
      if (!(fault instanceof ApiError) || faults >= MOST_FAULTS) {
        listing.value = { ...IDLE, failed: true };
        return;
      }
    }
    await pause(ASK);
  }
  listing.value = { ...IDLE };
}

export async function renameDevice(mac: string, name: string, type: string): Promise<void> {
  await call('ConnectionList', 1, 'set', { mac, hostname: name, type });
  const change = (each: Station): Station =>
    each.mac?.toLowerCase() === mac ? { ...each, hostname: name, type } : each;
  stored = stored.map(change);
  live = live.map(change);
  show();
  await refreshDevices();
}

export async function forgetDevice(mac: string): Promise<void> {
  await call('ConnectionList', 1, 'delete', { mac });
  stored = stored.filter((each) => each.mac?.toLowerCase() !== mac);
  live = live.filter((each) => each.mac?.toLowerCase() !== mac);
  show();
  await refreshDevices();
}

/** Keeps the list fresh while a page that shows it is open and looked at. */
export function useDevices(): void {
  useEffect(() => {
    void refreshDevices();
    void listAnew();
    const timer = setInterval(() => {
      if (!document.hidden && session.value.state === 'in') void refreshDevices(true);
    }, REFRESH);
    const look = (): void => {
      if (!document.hidden) void refreshDevices(true);
    };
    document.addEventListener('visibilitychange', look);
    return () => {
      clearInterval(timer);
      document.removeEventListener('visibilitychange', look);
    };
  }, []);
}
