import { describe, expect, it } from 'vitest';

import { formatRoute, parseRoute } from '../src/route';

describe('the route in the address', () => {
  it('keeps a page and its choices', () => {
    const route = { page: 'devices', choices: new Map([['search', 'a & b=c #?/ä'], ['sort', 'ip']]) };
    expect(parseRoute(formatRoute(route))).toEqual(route);
  });
  it('leaves out what is not chosen', () => {
    expect(formatRoute({ page: 'map', choices: new Map([['range', '']]) })).toBe('#/map');
  });
  it('takes an empty or strange address for no page', () => {
    expect(parseRoute('')).toEqual({ page: '', choices: new Map() });
    expect(parseRoute('#devices').page).toBe('devices');
    expect(parseRoute('#/a?%E0%A4%A').page).toBe('a');
  });
});
