// The network as a picture, with the same in words below it.
import type { JSX } from 'preact';
import { useMemo, useState } from 'preact/hooks';

import { type Device, displayName } from '../devices/device';
import { devices, listError, refreshDevices, useDevices } from '../devices/store';
import { format, t } from '../text';
import { Choice, ErrorNotice, Spinner } from '../ui';
import { layOut, type MapLayout, type MapNetwork } from './map/layout';
import { Picture } from './map/picture';

export function MapPage(): JSX.Element {
  useDevices();
  const words = t().map;
  const [all, setAll] = useState(false);
  const known = devices.value;
  const shown = useMemo(() => (known ?? []).filter((each) => all || each.online), [known, all]);
  const layout = useMemo(() => layOut(shown), [shown]);
  return (
    <>
      <div class="toolbar">
        <Choice
          label={t().devices.state}
          value={all ? 'all' : 'online'}
          options={[
            { value: 'online', label: t().devices.presence.online },
            { value: 'all', label: t().devices.presence.all },
          ]}
          onChange={(value) => setAll(value === 'all')}
        />
        <p class="muted number">{format(words.count, { count: (known ?? []).filter((each) => each.online).length })}</p>
      </div>
      <ErrorNotice error={listError.value} retry={() => void refreshDevices()} />
      {!known && listError.value === undefined && <Spinner />}
      {known && (
        <>
          <div class="card map scroll" role="region" aria-label={words.title} tabIndex={0}>
            <Picture layout={layout} count={shown.length} />
          </div>
          <InWords layout={layout} devices={shown} />
        </>
      )}
    </>
  );
}

function InWords({ layout, devices: shown }: { layout: MapLayout; devices: readonly Device[] }): JSX.Element {
  const words = t().map;
  return (
    <details class="card map-text">
      <summary>{words.text}</summary>
      {layout.networks.map((each) => (
        <NetworkInWords key={each.network} network={each} devices={shown.filter((one) => one.network === each.network)} />
      ))}
    </details>
  );
}

function NetworkInWords({ network, devices: here }: { network: MapNetwork; devices: readonly Device[] }): JSX.Element {
  const words = t().map;
  return (
    <section>
      <h2>{network.network === 'guest' ? words.guest : words.home}</h2>
      {here.length === 0 && <p class="muted">{words.empty}</p>}
      <ul>
        {here.map((device) => (
          <li key={device.mac}>
            {format(words.line, {
              name: displayName(device, t().devices.noName),
              address: device.ip || device.mac,
              connection: device.wireless ? words.wireless : words.wired,
            })}
          </li>
        ))}
      </ul>
    </section>
  );
}
