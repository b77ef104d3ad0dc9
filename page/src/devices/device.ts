// A client device as the page has it, made of what the device store and the live listing say.
import { addressKey, isRandomMac, normalMac } from './address';

/** A record of ConnectionList's answers. What comes from the network may lack anything. */
export interface Station {
  mac?: string;
  asso_time?: string;
  ip?: string;
  hostname?: string;
  status?: boolean;
  type?: string;
  brand?: string;
  model?: string;
  connection?: string;
  netif?: string;
  signalstrength?: number | string;
}

export const TYPES = ['computer', 'tablet', 'ipcam', 'player', 'printer', 'nas', 'others'] as const;
export type DeviceType = (typeof TYPES)[number];
export type Network = 'local' | 'guest';

export interface Device {
  mac: string;
  /** empty: nobody knows */
  name: string;
  type: DeviceType;
  brand: string;
  model: string;
  ip: string;
  ipKey: string;
  netif: string;
  network: Network;
  wireless: boolean;
  /** dBm, of a wireless device that is online */
  signal: number | undefined;
  online: boolean;
  /** milliseconds of Unix time; 0: unknown */
  seen: number;
  random: boolean;
  /** what a search looks in, in small letters */
  text: string;
}

/** What the store calls a device without a name. */
const NAMELESS = 'Network Device';

const textOf = (value: unknown): string => (typeof value === 'string' ? value : '');

/** "20:15:03 2026/11/21" in the router's own time, which is taken for the reader's. */
export function parseSeen(text: string): number {
  const parts = /^(\d\d):(\d\d):(\d\d) (\d{4})\/(\d\d)\/(\d\d)$/.exec(text)?.slice(1).map(Number);
  if (!parts) return 0;
  const [hour = 0, minute = 0, second = 0, year = 0, month = 1, day = 1] = parts;
  return new Date(year, month - 1, day, hour, minute, second).getTime();
}

function signalOf(value: unknown): number | undefined {
  const number = typeof value === 'string' && value !== '' ? Number(value) : value;
  return typeof number === 'number' && Number.isFinite(number) && number < 0 ? number : undefined;
}

export function makeDevice(station: Station): Device {
  const mac = normalMac(textOf(station.mac));
  const name = textOf(station.hostname) === NAMELESS ? '' : textOf(station.hostname);
  const type = TYPES.find((each) => each === station.type) ?? 'others';
  const wireless = station.connection === 'wifi';
  const netif = textOf(station.netif);
  const ip = textOf(station.ip);
  const brand = textOf(station.brand);
  const model = textOf(station.model);
  return {
    mac,
    name,
    type,
    brand,
    model,
    ip,
    ipKey: addressKey(ip),
    netif,
    network: netif.includes('g') ? 'guest' : 'local',
    wireless,
    signal: wireless ? signalOf(station.signalstrength) : undefined,
    online: station.status === true,
    seen: parseSeen(textOf(station.asso_time)),
    random: isRandomMac(mac),
    text: [name, ip, mac, brand, model].join('\n').toLowerCase(),
  };
}

/**
 * The store knows what lasts, and who is really there: a neighbour that the kernel still lists may have gone. The
 * listing adds who the store has not met yet, a name where there is none, and the signal.
 */
export function mergeStations(stored: readonly Station[], live: readonly Station[]): Station[] {
  const byMac = new Map<string, Station>();
  for (const each of stored) byMac.set(normalMac(textOf(each.mac)), each);
  for (const each of live) {
    const mac = normalMac(textOf(each.mac));
    if (mac === '') continue;
    const known = byMac.get(mac);
    if (!known) {
      byMac.set(mac, each);
      continue;
    }
    const nameless = textOf(known.hostname) === '' || known.hostname === NAMELESS;
    byMac.set(mac, {
      ...known,
      hostname: nameless && each.hostname ? each.hostname : (known.hostname ?? ''),
      ip: known.ip || (each.ip ?? ''),
      netif: known.netif || (each.netif ?? ''),
      connection: each.connection === 'wifi' ? 'wifi' : (known.connection ?? 'ethernet'),
      signalstrength: signalOf(known.signalstrength) ?? each.signalstrength ?? 0,
    });
  }
  return [...byMac.values()];
}

function isSame(one: Device, other: Device): boolean {
  return (Object.keys(one) as (keyof Device)[]).every((key) => one[key] === other[key]);
}

/** Makes devices of records; one that is as it was stays the same object, so that its row is not drawn again. */
export function makeDevices(stations: readonly Station[], before: readonly Device[]): Device[] {
  const old = new Map(before.map((each) => [each.mac, each]));
  return stations.map((station) => {
    const fresh = makeDevice(station);
    const known = old.get(fresh.mac);
    return known && isSame(known, fresh) ? known : fresh;
  });
}

/** 0 (none) to 4 (excellent) bars. */
export function signalBars(dbm: number): number {
  const steps = [-85, -75, -67, -55];
  return steps.filter((step) => dbm >= step).length;
}

/** How a device without a name is called. */
export function displayName(device: Device, noName: string): string {
  return device.name || device.model || device.brand || noName;
}
