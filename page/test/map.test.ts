import { describe, expect, it } from 'vitest';

import { makeDevice } from '../src/devices/device';
import { layOut, shorten } from '../src/pages/map/layout';

const many = (count: number, netif = 'lbr0') =>
  Array.from({ length: count }, (_, each) =>
    makeDevice({ mac: `02:00:00:${netif === 'gbr0' ? '01' : '00'}:00:${each.toString(16).padStart(2, '0')}`, ip: `192.168.1.${each}`, netif }),
  );

describe('the map', () => {
  it('shows the home network even when nobody is there', () => {
    const { networks } = layOut([]);
    expect(networks.map((each) => [each.network, each.devices.length])).toEqual([['local', 0]]);
  });
  it('keeps devices apart and inside the picture', () => {
    const layout = layOut([...many(60), ...many(25, 'gbr0')]);
    const places = layout.networks.flatMap((each) => each.devices);
    expect(places.length).toBe(85);
    for (const one of places) {
      expect(Math.abs(one.x)).toBeLessThan(layout.width);
      expect(Math.abs(one.y)).toBeLessThan(layout.height);
      for (const other of places) {
        if (one !== other) expect(Math.hypot(one.x - other.x, one.y - other.y)).toBeGreaterThan(60);
      }
    }
  });
  it('says how many it leaves out', () => {
    const [home] = layOut(many(200)).networks;
    expect(home?.devices.length).toBe(90);
    expect(home?.more).toBe(110);
  });
  it('leaves who stays at the same place when it is drawn again', () => {
    expect(layOut(many(9))).toEqual(layOut(many(9).reverse()));
  });
  it('cuts names between characters', () => {
    expect(shorten('short')).toBe('short');
    expect(shorten('👩‍👩‍👧'.repeat(20))).toBe(`${'👩‍👩‍👧'.repeat(15)}…`);
  });
});
