// A week of hours as the router keeps it: 168 characters, Sunday 00:00 first, '1' where a device is cut off.

export const days = 7;
export const hours = 24;
export const slots = days * hours;

export interface Slot {
  day: number; // 0 is Sunday
  hour: number;
}

export const slotOf = ({ day, hour }: Slot): number => day * hours + hour;
export const slotAt = (index: number): Slot => ({ day: Math.floor(index / hours) % days, hour: index % hours });

/** As the router reads a schedule: a missing hour is free, what is beyond the week is not used. */
export function normalize(schedule: string): string {
  let out = '';
  for (let at = 0; at < slots; at++) {
    out += schedule[at] === '1' ? '1' : '0';
  }
  return out;
}

export const isCut = (schedule: string, slot: Slot): boolean => schedule[slotOf(slot)] === '1';

/** Paints the rectangle between two slots, both included, in whichever direction it was drawn. */
export function paint(schedule: string, from: Slot, to: Slot, cut: boolean): string {
  const [firstDay, lastDay] = [Math.min(from.day, to.day), Math.max(from.day, to.day)];
  const [firstHour, lastHour] = [Math.min(from.hour, to.hour), Math.max(from.hour, to.hour)];
  return [...normalize(schedule)]
    .map((old, index) => {
      const { day, hour } = slotAt(index);
      const inside = day >= firstDay && day <= lastDay && hour >= firstHour && hour <= lastHour;
      return inside ? (cut ? '1' : '0') : old;
    })
    .join('');
}

/** The same, with the days in the order in which they are shown: a rectangle on the screen is one of places. */
export function paintShown(schedule: string, order: number[], from: Slot, to: Slot, cut: boolean): string {
  const [a, b] = [order.indexOf(from.day), order.indexOf(to.day)];
  return order
    .slice(Math.min(a, b), Math.max(a, b) + 1)
    .reduce((text, day) => paint(text, { day, hour: from.hour }, { day, hour: to.hour }, cut), schedule);
}

export function copyDay(schedule: string, from: number, targets: number[]): string {
  const week = normalize(schedule);
  const source = week.slice(from * hours, (from + 1) * hours);
  let out = '';
  for (let day = 0; day < days; day++) {
    out += targets.includes(day) ? source : week.slice(day * hours, (day + 1) * hours);
  }
  return out;
}

export interface HourRange {
  from: number;
  to: number; // up to 24, not included
}

/** The cut hours of a day, as ranges. */
export function rangesOf(schedule: string, day: number): HourRange[] {
  const ranges: HourRange[] = [];
  for (let hour = 0; hour < hours; hour++) {
    if (!isCut(schedule, { day, hour })) {
      continue;
    }
    const last = ranges[ranges.length - 1];
    if (last && last.to === hour) {
      last.to = hour + 1;
    } else {
      ranges.push({ from: hour, to: hour + 1 });
    }
  }
  return ranges;
}

export const cutHours = (schedule: string): number => [...normalize(schedule)].filter((slot) => slot === '1').length;

/** The first slot after `now` in which it is the other way; nothing when it is the same all week. */
export function nextChange(schedule: string, now: Slot): Slot | undefined {
  const week = normalize(schedule);
  const start = slotOf(now);
  for (let ahead = 1; ahead < slots; ahead++) {
    const index = (start + ahead) % slots;
    if (week[index] !== week[start]) {
      return slotAt(index);
    }
  }
  return undefined;
}

export const slotOfDate = (date: Date): Slot => ({ day: date.getDay(), hour: date.getHours() });

/** 'Sunday first' or 'Monday first' orders of the days. */
export const dayOrder = (first: number): number[] => Array.from({ length: days }, (_, at) => (first + at) % days);

/** The place of the next slot for a key; the day moves along the order in which the days are shown. */
export function moveSlot(slot: Slot, order: number[], byDays: number, byHours: number): Slot {
  const clamp = (value: number, limit: number) => Math.max(0, Math.min(limit - 1, value));
  const place = clamp(order.indexOf(slot.day) + byDays, days);
  return { day: order[place]!, hour: clamp(slot.hour + byHours, hours) };
}
