// What several of the router's pages have.
import type { JSX } from 'preact';
import { useEffect, useRef } from 'preact/hooks';

import { compareAddresses, parseIpv4 } from '../logic/ip';
import { type Device, getDevices } from '../router';
import { t } from '../text';
import { Button, ErrorNotice, Field, type Load, useLoad } from '../ui';

export const deviceName = (device: Pick<Device, 'hostname' | 'ip' | 'mac'>): string =>
  device.hostname || device.ip || device.mac;

const PERIOD = 5000; // ms between two looks at the devices

/** Who can be chosen: a device that is plugged in meanwhile shows up by itself. */
export function useDevices(): Load<Device[]> {
  const devices = useLoad(() => getDevices(true));
  const { reload } = devices;
  useEffect(() => {
    const timer = setInterval(() => document.visibilityState === 'visible' && reload(), PERIOD);
    return () => clearInterval(timer);
  }, [reload]);
  return devices;
}

/** A switch that says what it is for: beside it, or to screen readers alone. */
export function Switch(props: {
  on: boolean;
  label: string;
  quiet?: boolean;
  disabled?: boolean;
  onChange: (on: boolean) => void;
}): JSX.Element {
  return (
    <label class="switch">
      <input
        type="checkbox"
        role="switch"
        checked={props.on}
        disabled={props.disabled ?? false}
        onChange={(event) => {
          const wanted = event.currentTarget.checked;
          event.currentTarget.checked = props.on; // it shows what is; the change may be refused
          props.onChange(wanted);
        }}
      />
      <span class={props.quiet ? 'hidden' : undefined}>{props.label}</span>
    </label>
  );
}

/** The buttons of a dialog whose form is saved. */
export function SaveActions(props: { busy: boolean; disabled?: boolean; onCancel: () => void }): JSX.Element {
  return (
    <>
      <Button onClick={props.onCancel}>{t().common.cancel}</Button>
      <Button kind="primary" type="submit" busy={props.busy} disabled={props.disabled ?? false}>
        {t().common.save}
      </Button>
    </>
  );
}

/** Stands at the window's edge while something is not saved; `error` is why it could not be. */
export function SaveBar(props: {
  text: string;
  save?: string;
  busy: boolean;
  error: unknown;
  onSave: () => void;
  onDiscard: () => void;
}): JSX.Element {
  return (
    <div class="save-bar" role="region" aria-label={props.text}>
      <ErrorNotice error={props.error} />
      <span class="save-text">{props.text}</span>
      <div class="row">
        <Button onClick={props.onDiscard} disabled={props.busy}>
          {t().internet.discard}
        </Button>
        <Button kind="primary" busy={props.busy} onClick={props.onSave}>
          {props.save ?? t().common.save}
        </Button>
      </div>
    </div>
  );
}

const byAddress = (one: Device, other: Device): number =>
  Number(other.status) - Number(one.status) || compareAddresses(one.ip, other.ip);

/** An address, picked from the devices or typed. */
export function DevicePick(props: {
  devices: Device[];
  value: string;
  onChange: (ip: string) => void;
  error?: string | undefined;
  /** whether the typed address is open, though a device may have it */
  other: boolean;
  onOther: (other: boolean) => void;
}): JSX.Element {
  const texts = t().portforward;
  const devices = props.devices.filter((device) => parseIpv4(device.ip) !== undefined).sort(byAddress);
  const known = devices.some((device) => device.ip === props.value);
  const other = props.other || (props.value !== '' && !known);
  const typed = useRef<HTMLInputElement>(null);
  useEffect(() => {
    if (props.other) typed.current?.focus();
  }, [props.other]);
  return (
    <>
      <Field label={texts.device} error={other ? undefined : props.error}>
        {(described) => (
          <select
            {...described}
            value={other ? 'other' : props.value}
            onChange={(event) => {
              const chosen = event.currentTarget.value;
              props.onOther(chosen === 'other');
              if (chosen !== 'other') props.onChange(chosen);
            }}
          >
            <option value="">{texts.deviceChoose}</option>
            {devices.map((device) => (
              <option key={device.mac} value={device.ip}>
                {`${deviceName(device)} · ${device.ip}${device.status ? '' : ` (${texts.offlineDevice})`}`}
              </option>
            ))}
            <option value="other">{texts.deviceOther}</option>
          </select>
        )}
      </Field>
      {other && (
        <Field label={texts.address} error={props.error}>
          {(described) => (
            <input
              {...described}
              ref={typed}
              type="text"
              inputMode="decimal"
              autocomplete="off"
              spellcheck={false}
              value={props.value}
              onInput={(event) => props.onChange(event.currentTarget.value.trim())}
            />
          )}
        </Field>
      )}
    </>
  );
}
