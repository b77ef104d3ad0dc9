// The devices that have hours, and how another gets some.
import type { JSX } from 'preact';
import { useState } from 'preact/hooks';

import { parseMac } from '../../logic/mac';
import { isCut, type Slot } from '../../logic/schedule';
import type { Device, TimeRule } from '../../router';
import { format, t } from '../../text';
import { Button, Form, Select } from '../../ui';
import { deviceName } from '../shared';
import { stateText } from './words';

interface PeopleProps {
  rules: TimeRule[];
  chosen: number;
  now: Slot;
  nameOf: (rule: TimeRule) => string;
  onChoose: (at: number) => void;
  onRemove: (at: number) => void;
}

export function People({ rules, chosen, now, nameOf, onChoose, onRemove }: PeopleProps): JSX.Element {
  const texts = t().parental;
  return (
    <ul class="people">
      {rules.map((rule, at) => {
        const isCutNow = rule.tcenable && isCut(rule.schedule, now);
        return (
          <li key={`${rule.mac} ${at}`} class={at === chosen ? 'chosen' : ''}>
            <button type="button" class="person" aria-pressed={at === chosen} onClick={() => onChoose(at)}>
              <span class="row">
                <strong class="wrap">{nameOf(rule)}</strong>
                {isCutNow && <span class="badge error">{texts.cut}</span>}
              </span>
              <span class="muted">{stateText(rule, now, isCutNow)}</span>
            </button>
            <Button
              kind="quiet"
              icon="trash"
              label={format(texts.remove, { name: nameOf(rule) })}
              onClick={() => onRemove(at)}
            />
          </li>
        );
      })}
    </ul>
  );
}

export function ChooseDevice({ devices, onAdd }: { devices: Device[]; onAdd: (device: Device) => void }): JSX.Element {
  const texts = t().parental;
  const [mac, setMac] = useState('');
  const free = devices
    .filter((device) => parseMac(device.mac) !== undefined)
    .sort((one, other) => deviceName(one).localeCompare(deviceName(other)));
  const device = free.find((each) => each.mac === mac);
  return (
    <Form
      class="stack"
      onSubmit={() => {
        if (device) onAdd(device);
        setMac('');
      }}
    >
      <Select
        label={texts.choose}
        value={device ? mac : ''}
        options={[
          { value: '', label: texts.chooseDevice },
          ...free.map((each) => ({ value: each.mac, label: deviceName(each) })),
        ]}
        onChange={setMac}
      />
      <div>
        <Button type="submit" icon="plus" disabled={!device}>
          {texts.add}
        </Button>
      </div>
    </Form>
  );
}
