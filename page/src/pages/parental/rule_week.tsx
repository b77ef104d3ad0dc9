// One device's week, with what acts on it.
import type { JSX } from 'preact';
import { useState } from 'preact/hooks';

import { copyDay, cutHours, dayOrder, isCut, normalize, paint, type Slot } from '../../logic/schedule';
import type { TimeRule } from '../../router';
import { format, t } from '../../text';
import { announce, Button, Select } from '../../ui';
import { Switch } from '../shared';
import { WeekGrid } from './week_grid';
import { dayText, dayWords, stateText } from './words';

const WEEKDAYS = [1, 2, 3, 4, 5];
const WEEKEND = [6, 0];

/** An address that a device made up (the locally administered bit, IEEE 802). */
const isMadeUp = (mac: string): boolean => (parseInt(mac.slice(0, 2), 16) & 2) === 2;

/** Every night from 21:00 to 06:00. */
const nights = (): string =>
  paint(
    paint(normalize(''), { day: 0, hour: 21 }, { day: 6, hour: 23 }, true),
    { day: 0, hour: 0 },
    { day: 6, hour: 5 },
    true,
  );

interface RuleWeekProps {
  rule: TimeRule;
  name: string;
  now: Slot;
  onChange: (part: Partial<TimeRule>) => void;
}

export function RuleWeek({ rule, name, now, onChange }: RuleWeekProps): JSX.Element {
  const texts = t().parental;
  const isCutNow = rule.tcenable && isCut(rule.schedule, now);
  const change = (schedule: string): void => onChange({ schedule });
  return (
    <section class="card stack" aria-labelledby="week">
      <div class="card-head">
        <h2 id="week" class="wrap">
          {format(texts.week, { name })}
        </h2>
        <Switch on={rule.tcenable} label={texts.enabled} onChange={(tcenable) => onChange({ tcenable })} />
      </div>
      <p class={`now-state ${isCutNow ? 'cut' : ''}`}>{stateText(rule, now, isCutNow)}</p>
      {isMadeUp(rule.mac) && <p class="muted why-private">{texts.private}</p>}
      <div class={rule.tcenable ? '' : 'week-off'}>
        <WeekGrid schedule={rule.schedule} name={name} now={now} onChange={change} />
      </div>
      <div class="week-legend muted">
        <span>
          <i class="swatch cut" aria-hidden="true" /> {texts.cut}
        </span>
        <span>
          <i class="swatch" aria-hidden="true" /> {texts.free}
        </span>
        <span>
          <i class="swatch now" aria-hidden="true" /> {texts.legendNow}
        </span>
        <span class="number">{format(texts.hoursTotal, { count: cutHours(rule.schedule) })}</span>
      </div>
      <div class="toolbar">
        <Button onClick={() => change(nights())}>{texts.presetNight}</Button>
        <Button onClick={() => change(normalize(''))}>{texts.clear}</Button>
      </div>
      <CopyDay schedule={rule.schedule} now={now} onChange={change} />
      <details>
        <summary>{texts.asWords}</summary>
        <ul class="week-words">
          {dayOrder(texts.firstDay).map((day) => (
            <li key={day}>{dayWords(rule.schedule, day)}</li>
          ))}
        </ul>
      </details>
      <details>
        <summary>{texts.helpTitle}</summary>
        <p class="muted">{texts.help}</p>
      </details>
    </section>
  );
}

interface CopyDayProps {
  schedule: string;
  now: Slot;
  onChange: (schedule: string) => void;
}

function CopyDay({ schedule, now, onChange }: CopyDayProps): JSX.Element {
  const texts = t().parental;
  const order = dayOrder(texts.firstDay);
  const [from, setFrom] = useState(String(now.day));
  const [to, setTo] = useState('all');
  const targets: Record<string, { label: string; days: number[] }> = {
    all: { label: texts.copyTargets.all, days: order },
    weekdays: { label: texts.copyTargets.weekdays, days: WEEKDAYS },
    weekend: { label: texts.copyTargets.weekend, days: WEEKEND },
    ...Object.fromEntries(order.map((day) => [`day${day}`, { label: dayText(day), days: [day] }])),
  };
  const copy = (): void => {
    const target = targets[to];
    if (!target) return;
    onChange(copyDay(schedule, Number(from), target.days));
    announce(format(texts.copied, { day: dayText(Number(from)), target: target.label }));
  };
  return (
    <div class="row fields copy-day">
      <Select
        label={texts.copyFrom}
        value={from}
        options={order.map((day) => ({ value: String(day), label: dayText(day) }))}
        onChange={setFrom}
      />
      <Select
        label={texts.copyTo}
        value={to}
        options={['all', 'weekdays', 'weekend', ...order.map((day) => `day${day}`)].map((value) => ({
          value,
          label: targets[value]?.label ?? '',
        }))}
        onChange={setTo}
      />
      <div class="field-button">
        <Button icon="copy" onClick={copy}>
          {texts.copy}
        </Button>
      </div>
    </div>
  );
}
