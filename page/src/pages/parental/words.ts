// Schedules in words.
import { hours, type HourRange, nextChange, rangesOf, type Slot } from '../../logic/schedule';
import type { TimeRule } from '../../router';
import { format, t } from '../../text';

export const hourText = (hour: number): string => `${String(hour).padStart(2, '0')}:00`;

export const dayText = (day: number): string => t().parental.days[day] ?? '';

function whenText(slot: Slot, now: Slot): string {
  const texts = t().parental;
  const ahead = (slot.day - now.day + 7) % 7;
  const hour = hourText(slot.hour);
  if (ahead === 0 && slot.hour > now.hour) return format(texts.whenToday, { hour });
  return ahead === 1 ? format(texts.whenTomorrow, { hour }) : format(texts.when, { day: dayText(slot.day), hour });
}

/** What holds now, and until when. */
export function stateText(rule: TimeRule, now: Slot, isCutNow: boolean): string {
  const texts = t().parental;
  if (!rule.tcenable) return texts.ruleOff;
  const next = nextChange(rule.schedule, now);
  if (!next) return isCutNow ? texts.cutAlways : texts.freeAlways;
  return format(isCutNow ? texts.cutNowUntil : texts.freeNowUntil, { when: whenText(next, now) });
}

const rangeText = (range: HourRange): string =>
  format(t().parental.range, { from: hourText(range.from), to: hourText(range.to) });

export function dayWords(schedule: string, day: number): string {
  const texts = t().parental;
  const ranges = rangesOf(schedule, day);
  const isWhole = ranges[0]?.from === 0 && ranges[0].to === hours;
  const words = isWhole ? texts.dayCut : ranges.length === 0 ? texts.dayFree : ranges.map(rangeText).join(', ');
  return format(texts.dayRanges, { day: dayText(day), ranges: words });
}
