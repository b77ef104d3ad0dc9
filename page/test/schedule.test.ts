import { describe, expect, it } from 'vitest';
import { copyDay, cutHours, dayOrder, moveSlot, nextChange, normalize, paint, paintShown, rangesOf, slotOfDate } from '../src/logic/schedule';

const free = '0'.repeat(168);

describe('a week', () => {
  it('is 168 slots, Sunday first', () => {
    const painted = paint(free, { day: 0, hour: 0 }, { day: 0, hour: 0 }, true);
    expect(painted).toBe('1' + '0'.repeat(167));
    expect(paint(free, { day: 6, hour: 23 }, { day: 6, hour: 23 }, true)).toBe('0'.repeat(167) + '1');
    expect(slotOfDate(new Date(2026, 10, 22, 13, 59))).toEqual({ day: 0, hour: 13 }); // a Sunday
  });
  it('reads what is short, long or strange as the router does', () => {
    expect(normalize('')).toBe(free);
    expect(normalize('1x1')).toBe('101' + '0'.repeat(165));
    expect(normalize('1'.repeat(200))).toBe('1'.repeat(168));
  });
  it('paints a rectangle whichever corner comes first', () => {
    const one = paint(free, { day: 1, hour: 20 }, { day: 3, hour: 23 }, true);
    expect(one).toBe(paint(free, { day: 3, hour: 20 }, { day: 1, hour: 23 }, true));
    expect(one).toBe(paint(free, { day: 3, hour: 23 }, { day: 1, hour: 20 }, true));
    expect(cutHours(one)).toBe(12);
    expect(paint(one, { day: 0, hour: 0 }, { day: 6, hour: 23 }, false)).toBe(free);
  });
  it('paints along the days as they are shown: from Saturday to Sunday are two days', () => {
    const painted = paintShown(free, dayOrder(1), { day: 6, hour: 0 }, { day: 0, hour: 1 }, true);
    expect(rangesOf(painted, 6)).toEqual([{ from: 0, to: 2 }]);
    expect(rangesOf(painted, 0)).toEqual([{ from: 0, to: 2 }]);
    expect(cutHours(painted)).toBe(4);
  });
  it('copies a day to others and leaves the rest', () => {
    const monday = paint(free, { day: 1, hour: 20 }, { day: 1, hour: 23 }, true);
    const copied = copyDay(paint(monday, { day: 2, hour: 5 }, { day: 2, hour: 5 }, true), 1, [2, 3]);
    expect([0, 1, 2, 3, 4].map((day) => rangesOf(copied, day).length)).toEqual([0, 1, 1, 1, 0]);
    expect(rangesOf(copied, 2)).toEqual([{ from: 20, to: 24 }]);
  });
  it('finds until when it lasts, past midnight and round the week', () => {
    const night = paint(paint(free, { day: 6, hour: 21 }, { day: 6, hour: 23 }, true), { day: 0, hour: 0 }, { day: 0, hour: 5 }, true);
    expect(nextChange(night, { day: 6, hour: 22 })).toEqual({ day: 0, hour: 6 });
    expect(nextChange(night, { day: 0, hour: 6 })).toEqual({ day: 6, hour: 21 });
    expect(nextChange(free, { day: 0, hour: 0 })).toBeUndefined();
    expect(nextChange('1'.repeat(168), { day: 3, hour: 3 })).toBeUndefined();
  });
  it('moves with the keys and stops at the edges', () => {
    expect(moveSlot({ day: 1, hour: 0 }, dayOrder(1), -1, -1)).toEqual({ day: 1, hour: 0 });
    expect(moveSlot({ day: 6, hour: 23 }, dayOrder(1), 1, 1)).toEqual({ day: 0, hour: 23 });
  });
});
