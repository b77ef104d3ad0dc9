// Where everything of the map is: the router in the middle, the way out above it, and each network in a sector of the
// circle, with its devices on rings around the router.
import type { Device, Network } from '../../devices/device';

export interface Place {
  x: number;
  y: number;
}

export interface MapDevice extends Place {
  device: Device;
}

export interface MapNetwork extends Place {
  network: Network;
  devices: MapDevice[];
  /** how many have no place in the picture, and where that is said */
  more: number;
  morePlace: Place;
}

export interface MapLayout {
  /** half the width and half the height of the picture */
  width: number;
  height: number;
  internet: Place;
  networks: MapNetwork[];
}

const HUB = 118; // distance of a network from the router; all in units of the picture
const FIRST_RING = 232;
const RING = 104; // from ring to ring
const ROOM = 112; // that a device and its name take along a ring
const MARGIN = 76;
const MOST = 90; // devices that a network shows
const WAY_OUT = 50; // degrees at the top that are the internet's
const NARROWEST = 75; // degrees of a network's sector

const rad = (degrees: number): number => (degrees * Math.PI) / 180;

/** @param degrees  clockwise from the top */
function at(degrees: number, distance: number): Place {
  return { x: Math.round(Math.sin(rad(degrees)) * distance), y: Math.round(-Math.cos(rad(degrees)) * distance) };
}

/** Puts `count` things on rings within a sector. */
function ringPlaces(count: number, from: number, sector: number): { places: Place[]; radius: number } {
  const places: Place[] = [];
  let radius = FIRST_RING;
  for (let left = count; left > 0; radius += RING) {
    const fits = Math.max(1, Math.floor((rad(sector) * radius) / ROOM));
    const here = Math.min(fits, left);
    for (let each = 0; each < here; each += 1) places.push(at(from + (sector * (each + 0.5)) / here, radius));
    left -= here;
  }
  return { places, radius: count > 0 ? radius - RING : HUB };
}

/** A device keeps its place among the others as long as it is there: the order is that of the addresses. */
function inOrder(devices: readonly Device[]): Device[] {
  return [...devices].sort((one, other) => (one.ipKey + one.mac < other.ipKey + other.mac ? -1 : 1));
}

export function layOut(devices: readonly Device[]): MapLayout {
  const groups = (['local', 'guest'] as const)
    .map((network) => ({ network, all: inOrder(devices.filter((each) => each.network === network)) }))
    .filter(({ network, all }) => network === 'local' || all.length > 0);
  const room = 360 - WAY_OUT;
  const shown = groups.map(({ all }) => Math.min(all.length, MOST) + 1);
  const total = shown.reduce((sum, each) => sum + each, 0);
  const fair = shown.map((each) => (groups.length === 1 ? room : Math.max(NARROWEST, (room * each) / total)));
  const scale = room / fair.reduce((sum, each) => sum + each, 0);
  let from = WAY_OUT / 2;
  let outer = FIRST_RING;
  const networks = groups.map(({ network, all }, index): MapNetwork => {
    const sector = (fair[index] ?? room) * scale;
    const more = Math.max(0, all.length - MOST);
    const drawn = all.slice(0, MOST);
    const { places, radius } = ringPlaces(drawn.length + Number(more > 0), from, sector);
    const middle = from + sector / 2;
    from += sector;
    outer = Math.max(outer, radius);
    return {
      network,
      ...at(middle, HUB),
      devices: drawn.map((device, each) => ({ device, ...(places[each] as Place) })),
      more,
      morePlace: places[drawn.length] ?? at(middle, HUB),
    };
  });
  return { width: outer + MARGIN, height: outer + MARGIN * 0.7, internet: at(0, HUB + 70), networks };
}

const LONGEST = 16;

/** A name that fits under its device. Cut between characters as a person sees them. */
export function shorten(name: string, longest = LONGEST): string {
  const letters = [...new Intl.Segmenter().segment(name)].map((each) => each.segment);
  return letters.length <= longest ? name : `${letters.slice(0, longest - 1).join('')}…`;
}
