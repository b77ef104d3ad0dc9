// Devices that can be put on the list: known ones by a click, others by their address.
import type { JSX } from 'preact';
import { useState } from 'preact/hooks';

import { parseMac, sameMac } from '../../logic/mac';
import type { Device, FilterEntry } from '../../router';
import { format, t } from '../../text';
import { Button, Form, Icon, Notice, TextField } from '../../ui';
import { deviceName } from '../shared';

interface AddProps {
  list: FilterEntry[];
  devices: Device[];
  onAdd: (mac: string, desc: string) => void;
}

const rank = (device: Device): number => (device.connection === 'wifi' ? 0 : 2) + (device.status ? 0 : 1);

export function AddDevices({ list, devices, onAdd }: AddProps): JSX.Element {
  const texts = t().wifi;
  const isListed = (mac: string): boolean => list.some((entry) => sameMac(entry.mac, mac));
  const free = devices
    .filter((device) => parseMac(device.mac) !== undefined && !isListed(device.mac))
    .sort((one, other) => rank(one) - rank(other) || deviceName(one).localeCompare(deviceName(other)));
  const [mac, setMac] = useState('');
  const [fault, setFault] = useState<string>();
  const submit = (): void => {
    const good = parseMac(mac);
    const wrong = !good ? texts.badMac : isListed(good) ? texts.onList : undefined;
    setFault(wrong);
    if (wrong || !good) return;
    onAdd(good, '');
    setMac('');
  };
  return (
    <section class="card stack" aria-labelledby="filter-add">
      <div>
        <h2 id="filter-add">{texts.add}</h2>
        <p class="lead">{texts.addLead}</p>
      </div>
      {free.length === 0 && devices.length > 0 && <Notice>{texts.noDevices}</Notice>}
      <ul class="candidates">
        {free.map((device) => (
          <li key={device.mac}>
            <button
              type="button"
              class="candidate"
              title={format(texts.addOf, { name: deviceName(device) })}
              onClick={() => onAdd(device.mac, device.hostname)}
            >
              <Icon name={device.connection === 'wifi' ? 'wifi' : 'cable'} />
              <span class="wrap">
                {deviceName(device)} <code class="muted">{device.mac}</code>
              </span>
              <span class="muted">{device.connection === 'wifi' ? texts.wireless : texts.wired}</span>
              <Icon name="plus" />
            </button>
          </li>
        ))}
      </ul>
      <Form onSubmit={submit} class="row fields">
        <TextField
          label={texts.addByHand}
          value={mac}
          hint={texts.macHint}
          error={fault}
          autocomplete="off"
          onInput={(text) => {
            setMac(text);
            setFault(undefined);
          }}
        />
        <div class="field-button">
          <Button type="submit" icon="plus">
            {t().parental.add}
          </Button>
        </div>
      </Form>
    </section>
  );
}
