// Which devices a list shows, and in which order.
import type { Device } from './device';

export const COLUMNS = ['name', 'vendor', 'address', 'network', 'connection', 'state'] as const;
export type Column = (typeof COLUMNS)[number];
export type Range = 'all' | 'local' | 'guest';
export type Presence = 'all' | 'online' | 'offline';

export interface View {
  search: string;
  range: Range;
  presence: Presence;
  column: Column;
  down: boolean;
}

const oneOf = <T extends string>(values: readonly T[], text: string | undefined): T =>
  values.find((each) => each === text) ?? (values[0] as T);

/** What the address of the page says; whatever is unknown there counts as not said. */
export function readView(choices: ReadonlyMap<string, string>): View {
  return {
    search: choices.get('search') ?? '',
    range: oneOf(['all', 'local', 'guest'] as const, choices.get('net')),
    presence: oneOf(['all', 'online', 'offline'] as const, choices.get('state')),
    column: oneOf(COLUMNS, choices.get('sort')),
    down: choices.get('order') === 'down',
  };
}

/** Every word of the search stands somewhere in the device's texts. */
export function matches(device: Device, search: string): boolean {
  return search
    .toLowerCase()
    .split(/\s+/)
    .every((word) => device.text.includes(word));
}

type Compare = (one: Device, other: Device) => number;

function comparison(column: Column, language: string): Compare {
  const collator = new Intl.Collator(language, { numeric: true, sensitivity: 'base' });
  const texts = (one: string, other: string): number => {
    if (one === '' || other === '') return Number(one === '') - Number(other === ''); // nothing stands behind all
    return collator.compare(one, other);
  };
  const address: Compare = (one, other) => (one.ipKey < other.ipKey ? -1 : Number(one.ipKey > other.ipKey));
  const name: Compare = (one, other) => texts(one.name, other.name);
  const by: Record<Column, Compare> = {
    name,
    vendor: (one, other) => texts(one.brand, other.brand),
    address,
    network: (one, other) => texts(one.network + one.netif, other.network + other.netif),
    connection: (one, other) => Number(one.wireless) - Number(other.wireless) || (other.signal ?? 0) - (one.signal ?? 0),
    state: (one, other) => Number(other.online) - Number(one.online) || other.seen - one.seen,
  };
  return (one, other) =>
    by[column](one, other) || name(one, other) || address(one, other) || (one.mac < other.mac ? -1 : 1);
}

export function selectDevices(devices: readonly Device[], view: View, language: string): Device[] {
  const compare = comparison(view.column, language);
  const chosen = devices.filter(
    (each) =>
      (view.range === 'all' || each.network === view.range) &&
      (view.presence === 'all' || each.online === (view.presence === 'online')) &&
      matches(each, view.search),
  );
  return chosen.sort(view.down ? (one, other) => compare(other, one) : compare);
}

export function countByRange(devices: readonly Device[], presence: Presence): Record<Range, number> {
  const count = { all: 0, local: 0, guest: 0 };
  for (const each of devices) {
    if (presence !== 'all' && each.online !== (presence === 'online')) continue;
    count.all += 1;
    count[each.network] += 1;
  }
  return count;
}
