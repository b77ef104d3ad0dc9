import { describe, expect, it } from 'vitest';

import { addressKey, isRandomMac, normalMac, parseIpv4, parseIpv6 } from '../src/devices/address';
import { type Device, displayName, makeDevice, makeDevices, mergeStations, parseSeen, signalBars } from '../src/devices/device';
import { nameFault } from '../src/devices/name';
import { countByRange, matches, readView, selectDevices, type View } from '../src/devices/view';
import { visibleRows } from '../src/pages/devices/window';

const view: View = { search: '', range: 'all', presence: 'all', column: 'name', down: false };
const names = (list: readonly Device[]): string[] => list.map((each) => each.name);
const device = (hostname: string, more: object = {}): Device =>
  makeDevice({ mac: `00:00:5e:00:53:${hostname.length.toString(16).padStart(2, '0')}`, hostname, status: true, ...more });

describe('addresses', () => {
  it('sort as numbers, IPv4 before IPv6 before none', () => {
    const sorted = ['192.168.1.2', '192.168.1.10', '192.168.1.100', '192.168.2.1', '2001:db8::2', '2001:db8::10', ''];
    expect([...sorted].reverse().sort((one, other) => (addressKey(one) < addressKey(other) ? -1 : 1))).toEqual(sorted);
  });
  it('are refused when they are none', () => {
    for (const bad of ['', '1.2.3', '1.2.3.256', '1.2.3.4.5', '1.2.3.x', '1..2.3', ' 1.2.3.4']) expect(parseIpv4(bad)).toBeUndefined();
    for (const bad of ['', '1:2', ':::', '1::2::3', '1:2:3:4:5:6:7:8:9', '12345::', 'g::', '1.2.3.4']) {
      expect(parseIpv6(bad), bad).toBeUndefined();
    }
  });
  it('reads what an IPv6 address leaves out', () => {
    expect(parseIpv6('::1')).toEqual([0, 0, 0, 0, 0, 0, 0, 1]);
    expect(parseIpv6('fe80::1%eth0')).toEqual([0xfe80, 0, 0, 0, 0, 0, 0, 1]);
    expect(parseIpv6('::ffff:192.0.2.1')).toEqual([0, 0, 0, 0, 0, 0xffff, 0xc000, 0x201]);
  });
  it('of hardware have one form, and tell when they are made up', () => {
    expect(normalMac('AA-BB-CC-00-11-22')).toBe('aa:bb:cc:00:11:22');
    expect(isRandomMac('02:00:00:00:00:01')).toBe(true);
    expect(isRandomMac('00:00:5e:00:53:01')).toBe(false);
  });
});

describe('a device', () => {
  it('has the router’s word for a nameless one not as its name', () => {
    expect(makeDevice({ hostname: 'Network Device' }).name).toBe('');
    expect(displayName(makeDevice({ hostname: '', brand: 'Maker' }), 'nobody')).toBe('Maker');
    expect(displayName(makeDevice({}), 'nobody')).toBe('nobody');
  });
  it('takes values of wrong types for none', () => {
    const strange = { hostname: 5, ip: null, type: [], signalstrength: {}, connection: 1 } as unknown as object;
    expect(makeDevice(strange)).toMatchObject({ name: '', ip: '', type: 'others', signal: undefined, wireless: false });
  });
  it('reads when it was seen', () => {
    expect(parseSeen('20:15:03 2026/11/21')).toBe(new Date(2026, 10, 21, 20, 15, 3).getTime());
    expect(parseSeen('yesterday')).toBe(0);
  });
  it('has signal only by radio', () => {
    expect(makeDevice({ connection: 'wifi', signalstrength: -60 }).signal).toBe(-60);
    expect(makeDevice({ connection: 'wifi', signalstrength: '-60' }).signal).toBe(-60);
    expect(makeDevice({ connection: 'ethernet', signalstrength: -60 }).signal).toBeUndefined();
    expect([-90, -80, -70, -60, -40].map(signalBars)).toEqual([0, 1, 2, 3, 4]);
  });
});

describe('the store and the listing made one', () => {
  const stored = { mac: '00:00:5e:00:53:01', hostname: 'mine', ip: '192.168.1.2', status: false, connection: 'ethernet' };
  it('keeps the stored name, and that the device has gone', () => {
    const [merged] = mergeStations([stored], [{ mac: '00:00:5E:00:53:01', hostname: 'FOUND', status: true }]);
    expect(merged).toMatchObject({ hostname: 'mine', status: false, ip: '192.168.1.2' });
  });
  it('takes a name where there is none', () => {
    const [merged] = mergeStations([{ ...stored, hostname: 'Network Device' }], [{ mac: stored.mac, hostname: 'FOUND' }]);
    expect(merged?.hostname).toBe('FOUND');
  });
  it('adds who is only in the listing, and drops who has no MAC address', () => {
    const merged = mergeStations([stored], [{ mac: '00:00:5e:00:53:02' }, { hostname: 'nobody' }]);
    expect(merged.map((each) => each.mac)).toEqual([stored.mac, '00:00:5e:00:53:02']);
  });
  it('keeps the objects of what has not changed', () => {
    const before = makeDevices([stored, { mac: '00:00:5e:00:53:02', hostname: 'b' }], []);
    const after = makeDevices([stored, { mac: '00:00:5e:00:53:02', hostname: 'c' }], before);
    expect(after[0]).toBe(before[0]);
    expect(after[1]).not.toBe(before[1]);
  });
});

describe('the view', () => {
  const list = [
    device('pc10', { ip: '192.168.1.10', brand: 'B' }),
    device('pc9x', { ip: '192.168.1.9', mac: '00:00:5e:00:53:aa' }),
    device('', { ip: '192.168.1.1', mac: '00:00:5e:00:53:bb', status: false }),
    device('Guest', { ip: '192.168.2.5', netif: 'gbr0' }),
  ];
  it('sorts names with numbers in them, nameless ones last', () => {
    expect(names(selectDevices(list, view, 'en'))).toEqual(['Guest', 'pc9x', 'pc10', '']);
  });
  it('sorts addresses as numbers, both ways', () => {
    const by = (down: boolean): string[] => selectDevices(list, { ...view, column: 'address', down }, 'en').map((each) => each.ip);
    expect(by(false)).toEqual(['192.168.1.1', '192.168.1.9', '192.168.1.10', '192.168.2.5']);
    expect(by(true)).toEqual(by(false).reverse());
  });
  it('keeps who is of a network and there', () => {
    expect(names(selectDevices(list, { ...view, range: 'guest' }, 'en'))).toEqual(['Guest']);
    expect(names(selectDevices(list, { ...view, presence: 'offline' }, 'en'))).toEqual(['']);
    expect(countByRange(list, 'all')).toEqual({ all: 4, local: 3, guest: 1 });
    expect(countByRange(list, 'online')).toEqual({ all: 3, local: 2, guest: 1 });
  });
  it('finds words in any order and takes every sign for itself', () => {
    expect(matches(list[0] as Device, 'B pc1')).toBe(true);
    expect(matches(list[0] as Device, 'pc.*')).toBe(false);
  });
  it('is read from the address of the page, whatever stands there', () => {
    expect(readView(new Map([['sort', 'address'], ['order', 'down'], ['net', 'guest'], ['search', 'x']]))).toEqual({
      search: 'x', range: 'guest', presence: 'all', column: 'address', down: true,
    });
    expect(readView(new Map([['sort', 'constructor'], ['net', '__proto__']]))).toEqual(view);
  });
  it('sorts 2,000 devices within a frame or two', () => {
    const many = Array.from({ length: 2000 }, (_, each) => makeDevice({ mac: normalMac(each.toString(16).padStart(12, '0')), hostname: `d${(each * 7919) % 2000}`, ip: `10.0.${each >> 8}.${each & 255}` }));
    selectDevices(many, view, 'en'); // the collator is made once
    const start = performance.now();
    const sorted = selectDevices(many, view, 'en');
    expect(performance.now() - start).toBeLessThan(100);
    expect(names(sorted).slice(0, 3)).toEqual(['d0', 'd1', 'd2']);
  });
});

describe('the rows in sight', () => {
  it('are those of the viewport and a few more', () => {
    expect(visibleRows(0, 520, 52, 2000)).toEqual({ first: 0, end: 18 });
    expect(visibleRows(-5200, 520, 52, 2000)).toEqual({ first: 92, end: 118 });
  });
  it('end with the list', () => {
    expect(visibleRows(-103_480, 520, 52, 2000)).toEqual({ first: 1982, end: 2000 });
    expect(visibleRows(600, 520, 52, 3)).toEqual({ first: 0, end: 3 });
    expect(visibleRows(0, 520, 52, 0)).toEqual({ first: 0, end: 0 });
  });
});

describe('a name', () => {
  it('is refused where the store would', () => {
    expect(nameFault('  ')).toBe('nameEmpty');
    expect(nameFault('a\u0007b')).toBe('nameControl');
    expect(nameFault('ä'.repeat(128))).toBe('nameLong');
    expect(nameFault('<b>Küche</b> 🍳')).toBeUndefined();
  });
});
