// A device's name and type, changed where they stand.
import type { JSX } from 'preact';
import { useEffect, useId, useRef, useState } from 'preact/hooks';

import { type Device, type DeviceType, TYPES } from '../../devices/device';
import { nameFault } from '../../devices/name';
import { renameDevice } from '../../devices/store';
import { errorText, format, t } from '../../text';
import { announce, Button, Form, useAction } from '../../ui';
import { editing } from './editing';

/** What is typed lives here, so that a row that scrolls out of sight, or is signed out meanwhile, keeps it. */
const typed = new Map<string, { name: string; type: DeviceType }>();

export function Editor({ device, onForget }: { device: Device; onForget: (device: Device) => void }): JSX.Element {
  const words = t().devices;
  const start = typed.get(device.mac) ?? { name: device.name, type: device.type };
  const [name, setName] = useState(start.name);
  const [type, setType] = useState<DeviceType>(start.type);
  const [tried, setTried] = useState(false);
  const [busy, save, error] = useAction(() => renameDevice(device.mac, name.trim(), type));
  const input = useRef<HTMLInputElement>(null);
  const note = useId();
  useEffect(() => input.current?.select(), []);
  useEffect(() => void typed.set(device.mac, { name, type }), [device.mac, name, type]);

  const fault = nameFault(name);
  const wrong = tried && fault ? words[fault] : error !== undefined ? errorText(error) : '';
  const leave = (): void => {
    typed.delete(device.mac);
    editing.value = '';
    requestAnimationFrame(() =>
      document.querySelector<HTMLElement>(`[data-mac="${CSS.escape(device.mac)}"] .at-edit button`)?.focus(),
    );
  };
  const submit = async (): Promise<void> => {
    setTried(true);
    if (fault || !(await save())) return;
    announce(format(words.renamed, { name: name.trim() }));
    leave();
  };
  return (
    <Form class="editor" onSubmit={() => void submit()}>
      <input
        ref={input}
        aria-label={words.name}
        aria-describedby={wrong ? note : undefined}
        aria-invalid={wrong ? true : undefined}
        value={name}
        autocomplete="off"
        spellcheck={false}
        onInput={(event) => setName(event.currentTarget.value)}
        onKeyDown={(event) => event.key === 'Escape' && leave()}
      />
      <select
        aria-label={words.type}
        value={type}
        onChange={(event) => setType(event.currentTarget.value as DeviceType)}
        onKeyDown={(event) => event.key === 'Escape' && leave()}
      >
        {TYPES.map((each) => (
          <option key={each} value={each}>
            {words.types[each]}
          </option>
        ))}
      </select>
      <Button kind="primary" type="submit" busy={busy}>
        {t().common.save}
      </Button>
      <Button kind="quiet" onClick={leave}>
        {t().common.cancel}
      </Button>
      <Button kind="quiet" icon="trash" label={words.forget} onClick={() => onForget(device)} />
      {wrong && (
        <p class="editor-note" id={note} role="alert">
          {wrong}
        </p>
      )}
    </Form>
  );
}
