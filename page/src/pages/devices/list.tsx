// The list itself: a table of rows of one height, of which only those in sight are in the document.
import type { JSX } from 'preact';
import { useEffect, useRef, useState } from 'preact/hooks';

import type { Device } from '../../devices/device';
import { COLUMNS, type Column, type View } from '../../devices/view';
import { choose } from '../../route';
import { format, t } from '../../text';
import { Icon } from '../../ui';
import { editing } from './editing';
import { DeviceRow } from './row';
import { useRowWindow } from './window';

const NARROW = '(max-width: 48rem)';
const ROW = 52; // pixels, as .device-row in devices.css
const NARROW_ROW = 92;

function useNarrow(): boolean {
  const [narrow, setNarrow] = useState(() => window.matchMedia(NARROW).matches);
  useEffect(() => {
    const query = window.matchMedia(NARROW);
    const take = (): void => setNarrow(query.matches);
    query.addEventListener('change', take);
    return () => query.removeEventListener('change', take);
  }, []);
  return narrow;
}

interface Props {
  devices: readonly Device[];
  view: View;
  onForget: (device: Device) => void;
}

export function DeviceList({ devices, view, onForget }: Props): JSX.Element {
  const place = useRef<HTMLDivElement>(null);
  const height = useNarrow() ? NARROW_ROW : ROW;
  const { first, end } = useRowWindow(place, height, devices.length);
  return (
    <div class="card devices" role="table" aria-label={t().devices.title} aria-rowcount={devices.length + 1}>
      <div role="rowgroup" class="devices-head">
        <div role="row" aria-rowindex={1} class="device-row head">
          {COLUMNS.map((column) => (
            <Head key={column} column={column} view={view} />
          ))}
          <span role="columnheader">
            <span class="hidden">{t().devices.actions}</span>
          </span>
        </div>
      </div>
      <div role="rowgroup" class="devices-body" ref={place} style={{ height: `${devices.length * height}px` }}>
        {devices.slice(first, end).map((device, index) => (
          <DeviceRow
            key={device.mac}
            device={device}
            index={first + index}
            top={(first + index) * height}
            edited={editing.value === device.mac}
            onForget={onForget}
          />
        ))}
      </div>
    </div>
  );
}

function Head({ column, view }: { column: Column; view: View }): JSX.Element {
  const words = t().devices;
  const active = view.column === column;
  const down = active && !view.down;
  return (
    <span role="columnheader" class={`at-${column}`} aria-sort={active ? (view.down ? 'descending' : 'ascending') : 'none'}>
      <button
        type="button"
        class="sort"
        title={format(t().common.sortBy, { column: words[column] })}
        onClick={() => choose({ sort: column === 'name' ? '' : column, order: down ? 'down' : '' })}
      >
        {words[column]}
        {active && <Icon name={view.down ? 'down' : 'up'} size={14} />}
      </button>
    </span>
  );
}
