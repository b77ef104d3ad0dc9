// A week of hours that is painted with the mouse, a finger or keys. Days are rows for whoever hears the page; on a narrow
// screen they are drawn as columns, so that an hour is large enough for a finger.
import type { JSX } from 'preact';
import { useRef, useState } from 'preact/hooks';

import { dayOrder, hours, isCut, moveSlot, paint, paintShown, slotAt, type Slot, slotOf } from '../../logic/schedule';
import { format, t } from '../../text';
import { dayText, hourText } from './words';

const NARROW = '(max-width: 42rem)';
const allHours = Array.from({ length: hours }, (_, hour) => hour);

interface WeekGridProps {
  schedule: string;
  name: string;
  now: Slot;
  onChange: (schedule: string) => void;
}

/** A stroke under way: from where, over what, and whether it cuts. */
interface Stroke {
  anchor: Slot;
  base: string;
  cut: boolean;
}

const same = (one: Slot, other: Slot): boolean => one.day === other.day && one.hour === other.hour;

/** The slot under the pointer, which captures no element while it paints. */
function slotUnder(event: PointerEvent): Slot | undefined {
  const under = document.elementFromPoint(event.clientX, event.clientY);
  const index = under instanceof HTMLElement ? under.dataset['slot'] : undefined;
  return index === undefined ? undefined : slotAt(Number(index));
}

const steps: Record<string, [days: number, hours: number]> = {
  ArrowLeft: [0, -1],
  ArrowRight: [0, 1],
  ArrowUp: [-1, 0],
  ArrowDown: [1, 0],
  Home: [0, -hours],
  End: [0, hours],
  PageUp: [-7, 0],
  PageDown: [7, 0],
};

/** What a key moves: an arrow goes where it points, and the days may be drawn as columns. */
function stepOf(key: string): [number, number] | undefined {
  const step = steps[key];
  const isTurned = key.startsWith('Arrow') && matchMedia(NARROW).matches;
  if (!step || !isTurned) return step;
  return [Math.sign(step[1]), Math.sign(step[0])];
}

export function WeekGrid({ schedule, name, now, onChange }: WeekGridProps): JSX.Element {
  const texts = t().parental;
  const order = dayOrder(texts.firstDay);
  const grid = useRef<HTMLDivElement>(null);
  const [at, setAt] = useState<Slot>(now);
  const stroke = useRef<Stroke | undefined>(undefined);
  const keyStroke = useRef<Stroke | undefined>(undefined);

  const goTo = (slot: Slot): void => {
    setAt(slot);
    grid.current?.querySelector<HTMLElement>(`[data-slot="${slotOf(slot)}"]`)?.focus();
  };
  const drawTo = (to: Slot, by: Stroke): void => onChange(paintShown(by.base, order, by.anchor, to, by.cut));

  const keys = (event: KeyboardEvent): void => {
    const step = stepOf(event.key);
    if (step) {
      const to = moveSlot(at, order, ...step);
      if (event.shiftKey) {
        keyStroke.current ??= { anchor: at, base: schedule, cut: isCut(schedule, at) };
        drawTo(to, keyStroke.current);
      } else {
        keyStroke.current = undefined;
      }
      goTo(to);
    } else if (event.key === ' ' || event.key === 'Enter') {
      keyStroke.current = undefined;
      onChange(paint(schedule, at, at, !isCut(schedule, at)));
    } else if (event.key === 'a' && (event.ctrlKey || event.metaKey)) {
      onChange(paint(schedule, { day: 0, hour: 0 }, { day: 6, hour: hours - 1 }, !isCut(schedule, at)));
    } else {
      return;
    }
    event.preventDefault();
  };

  const press = (event: PointerEvent): void => {
    const slot = event.button === 0 ? slotUnder(event) : undefined;
    if (!slot) return;
    event.preventDefault();
    // A finger is captured by what it touches first; the stroke is to go over others.
    if (event.target instanceof Element) event.target.releasePointerCapture(event.pointerId);
    keyStroke.current = undefined;
    stroke.current = { anchor: slot, base: schedule, cut: !isCut(schedule, slot) };
    goTo(slot);
    drawTo(slot, stroke.current);
  };
  const draw = (event: PointerEvent): void => {
    if (!stroke.current) return;
    if (event.buttons === 0) {
      stroke.current = undefined; // let go outside of the window
      return;
    }
    const slot = slotUnder(event);
    if (slot) drawTo(slot, stroke.current);
  };

  return (
    <div
      class="week"
      role="grid"
      aria-label={format(texts.week, { name })}
      ref={grid}
      onKeyDown={keys}
      onPointerDown={press}
      onPointerMove={draw}
      onPointerUp={() => (stroke.current = undefined)}
      onPointerCancel={() => (stroke.current = undefined)}
    >
      <div role="row">
        <span role="columnheader" class="week-corner">
          <span class="hidden">{texts.asWords}</span>
        </span>
        {allHours.map((hour) => (
          <span key={hour} role="columnheader" class="week-hour number" data-hour={hour} style={{ '--hour': hour }}>
            {hour}
          </span>
        ))}
      </div>
      {order.map((day, row) => (
        <div key={day} role="row">
          <span role="rowheader" class={`week-day ${day === now.day ? 'today' : ''}`} style={{ '--day': row }}>
            <span aria-hidden="true">{texts.daysShort[day]}</span>
            <span class="hidden">{dayText(day)}</span>
          </span>
          {allHours.map((hour) => {
            const slot = { day, hour };
            return (
              <Cell
                key={hour}
                slot={slot}
                row={row}
                cut={isCut(schedule, slot)}
                isNow={same(slot, now)}
                isFocus={same(slot, at)}
                onFocus={() => setAt(slot)}
              />
            );
          })}
        </div>
      ))}
    </div>
  );
}

interface CellProps {
  slot: Slot;
  row: number;
  cut: boolean;
  isNow: boolean;
  isFocus: boolean;
  onFocus: () => void;
}

function Cell({ slot, row, cut, isNow, isFocus, onFocus }: CellProps): JSX.Element {
  const texts = t().parental;
  const label = format(isNow ? texts.slotNow : texts.slot, {
    day: dayText(slot.day),
    from: hourText(slot.hour),
    to: hourText(slot.hour + 1),
    state: cut ? texts.cut : texts.free,
  });
  return (
    <span
      role="gridcell"
      class={`slot ${cut ? 'cut' : ''} ${isNow ? 'now' : ''}`}
      data-slot={slotOf(slot)}
      tabIndex={isFocus ? 0 : -1}
      aria-selected={cut}
      aria-label={label}
      title={label}
      style={{ '--day': row, '--hour': slot.hour }}
      onFocus={onFocus}
    />
  );
}
