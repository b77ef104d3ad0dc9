import { describe, expect, it } from 'vitest';
import { parseMac, sameMac } from '../src/logic/mac';
import { move, sameOrder } from '../src/logic/order';

describe('an order', () => {
  it('moves one element and keeps the others in theirs', () => {
    expect(move(['a', 'b', 'c'], 0, 2)).toEqual(['b', 'c', 'a']);
    expect(move(['a', 'b', 'c'], 2, 0)).toEqual(['c', 'a', 'b']);
    expect(move(['a', 'b'], 0, 9)).toEqual(['b', 'a']);
    expect(move(['a', 'b'], 7, 0)).toEqual(['a', 'b']);
    expect(sameOrder(['a', 'b'], ['a', 'b'])).toBe(true);
    expect(sameOrder(['a', 'b'], ['b', 'a'])).toBe(false);
  });
});

describe("a station's address", () => {
  it('is written in one way', () => {
    expect(parseMac(' 02-AA-00-00-00-01 ')).toBe('02:aa:00:00:00:01');
    expect(sameMac('02-AA-00-00-00-01', '02:aa:00:00:00:01')).toBe(true);
  });
  it('is neither a group nor nothing', () => {
    for (const text of ['', '01:00:5e:00:00:01', 'ff:ff:ff:ff:ff:ff', '00:00:00:00:00:00', '02:aa:00:00:00', '02aa00000001']) {
      expect(parseMac(text), text).toBeUndefined();
    }
  });
});
