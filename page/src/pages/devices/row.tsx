import type { JSX } from 'preact';

import { type Device, displayName, signalBars } from '../../devices/device';
import { language } from '../../settings';
import { format, t } from '../../text';
import { Button, Icon } from '../../ui';
import { editing } from './editing';
import { Editor } from './editor';

interface Props {
  device: Device;
  index: number;
  top: number; // pixels from the list's upper edge
  edited: boolean;
  onForget: (device: Device) => void;
}

export function DeviceRow({ device, index, top, edited, onForget }: Props): JSX.Element {
  const place = { transform: `translateY(${top}px)` };
  const common = { role: 'row' as const, 'aria-rowindex': index + 2, 'data-mac': device.mac, style: place };
  if (edited) {
    return (
      <div {...common} class="device-row edited">
        <span role="cell" class="whole">
          <Editor device={device} onForget={onForget} />
        </span>
      </div>
    );
  }
  return (
    <div {...common} class={`device-row ${device.online ? '' : 'offline'}`}>
      <Name device={device} />
      <span role="cell" class="at-vendor" title={device.brand}>
        {device.brand}
      </span>
      <span role="cell" class="at-address number">
        {device.ip ? <span>{device.ip}</span> : <span class="muted">{t().devices.noAddress}</span>}
        <small title={device.random ? t().devices.randomMacHint : undefined}>
          {device.mac}
          {device.random && <span class="random"> · {t().devices.randomMac}</span>}
        </small>
      </span>
      <span role="cell" class="at-network">
        <span class={`badge ${device.network === 'guest' ? 'warning' : ''}`}>
          {device.network === 'guest' ? t().devices.guestNet : t().devices.localNet}
        </span>
      </span>
      <Connection device={device} />
      <State device={device} />
      <span role="cell" class="at-edit">
        <Button
          kind="quiet"
          icon="edit"
          label={format(t().devices.edit, { name: displayName(device, t().devices.noName) })}
          onClick={() => (editing.value = device.mac)}
        />
      </span>
    </div>
  );
}

function Name({ device }: { device: Device }): JSX.Element {
  const name = displayName(device, t().devices.noName);
  return (
    <span role="cell" class="at-name">
      <span class="type" title={t().devices.types[device.type]}>
        <Icon name={device.type} label={t().devices.types[device.type]} size={20} />
      </span>
      <span class="names">
        <span class={`name ${device.name ? '' : 'muted'}`} title={name}>
          {name}
        </span>
        {device.model && device.name && <small title={device.model}>{device.model}</small>}
      </span>
    </span>
  );
}

function Connection({ device }: { device: Device }): JSX.Element {
  const words = t().devices;
  const bars = device.signal === undefined ? undefined : signalBars(device.signal);
  return (
    <span role="cell" class="at-connection">
      {device.wireless ? <Signal bars={bars} /> : <Icon name="cable" />}
      <span>
        {device.wireless ? words.wireless : words.wired}
        {device.signal !== undefined && bars !== undefined && (
          <small class="number">
            {words.signalWords[bars]} · {format(words.signal, { dbm: device.signal })}
          </small>
        )}
      </span>
    </span>
  );
}

/** @param bars  how many of the four are full; unknown: all are empty */
function Signal({ bars = 0 }: { bars?: number | undefined }): JSX.Element {
  return (
    <svg class="bars" viewBox="0 0 18 18" width={18} height={18} aria-hidden="true">
      {[0, 1, 2, 3].map((each) => (
        <rect key={each} x={1 + each * 4.2} y={12 - each * 3.4} width={3} height={5 + each * 3.4} rx={1} data-on={each < bars} />
      ))}
    </svg>
  );
}

function State({ device }: { device: Device }): JSX.Element {
  const words = t().devices;
  return (
    <span role="cell" class="at-state">
      <span class="dot" aria-hidden="true" />
      <span>
        {device.online ? words.online : words.offline}
        {!device.online && device.seen > 0 && <small>{seenText(device.seen)}</small>}
      </span>
    </span>
  );
}

/** The hour for today, the day for what lies further back. */
export function seenText(seen: number, now = Date.now()): string {
  const time = new Date(seen);
  const today = time.toDateString() === new Date(now).toDateString();
  return today
    ? time.toLocaleTimeString(language.value, { hour: '2-digit', minute: '2-digit' })
    : time.toLocaleDateString(language.value, { dateStyle: 'medium' });
}
