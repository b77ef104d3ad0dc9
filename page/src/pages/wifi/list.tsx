import type { JSX } from 'preact';

import { sameMac } from '../../logic/mac';
import type { Device, FilterEntry } from '../../router';
import { format, t } from '../../text';
import { Button, Notice } from '../../ui';
import { Switch } from '../shared';

interface FilterListProps {
  list: FilterEntry[];
  devices: Device[];
  nameOf: (entry: FilterEntry) => string;
  onChange: (list: FilterEntry[]) => void;
  onRemove: (entry: FilterEntry) => void;
}

export function FilterList({ list, devices, nameOf, onChange, onRemove }: FilterListProps): JSX.Element {
  const texts = t().wifi;
  const change = (entry: FilterEntry, part: Partial<FilterEntry>): void =>
    onChange(list.map((each) => (each === entry ? { ...each, ...part } : each)));
  return (
    <section class="card stack" aria-labelledby="filter-list">
      <h2 id="filter-list">{texts.list}</h2>
      {list.length === 0 && <Notice>{texts.empty}</Notice>}
      <ul class="entries">
        {list.map((entry, at) => {
          const name = nameOf(entry);
          const device = devices.find((each) => sameMac(each.mac, entry.mac));
          return (
            <li key={`${entry.mac} ${at}`} class="entry">
              <Switch
                on={entry.mac_filter_enabled !== false}
                label={format(texts.onOf, { name })}
                quiet
                onChange={(on) => change(entry, { mac_filter_enabled: on })}
              />
              <div class="entry-text">
                <input
                  type="text"
                  aria-label={`${texts.description}: ${entry.mac}`}
                  value={entry.desc ?? ''}
                  placeholder={name}
                  maxLength={64}
                  onInput={(event) => change(entry, { desc: event.currentTarget.value })}
                />
                <span class="row muted">
                  <code>{entry.mac}</code>
                  {device?.status && <span class="badge ok">{texts.here}</span>}
                </span>
              </div>
              <Button kind="quiet" icon="trash" label={format(texts.remove, { name })} onClick={() => onRemove(entry)} />
            </li>
          );
        })}
      </ul>
    </section>
  );
}
