// Who is in the network.
import type { JSX } from 'preact';
import { useMemo, useState } from 'preact/hooks';

import { type Device, displayName } from '../devices/device';
import { devices, forgetDevice, listAnew, listError, listing, refreshDevices, useDevices } from '../devices/store';
import { countByRange, readView, selectDevices, type View } from '../devices/view';
import { choose, route } from '../route';
import { language } from '../settings';
import { format, t } from '../text';
import { announce, Button, Choice, Confirm, ErrorNotice, Icon, Notice, Progress, Spinner } from '../ui';
import { DeviceList } from './devices/list';

export function DevicesPage(): JSX.Element {
  useDevices();
  const words = t().devices;
  const view = readView(route.value.choices);
  const all = devices.value;
  const shown = useMemo(
    () => (all ? selectDevices(all, view, language.value) : []),
    [all, view.search, view.range, view.presence, view.column, view.down, language.value],
  );
  const [forgetting, setForgetting] = useState<Device | undefined>();
  return (
    <>
      <Tools view={view} all={all ?? []} />
      <ErrorNotice error={listError.value} retry={() => void refreshDevices()} />
      {listing.value.failed && (
        <Notice
          kind="warning"
          actions={
            <Button icon="refresh" onClick={() => void listAnew()}>
              {t().common.retry}
            </Button>
          }
        >
          {words.listingFailed}
        </Notice>
      )}
      {!all && listError.value === undefined && <Spinner />}
      {all && <Counts all={all} shown={shown.length} />}
      {all && shown.length > 0 && <DeviceList devices={shown} view={view} onForget={setForgetting} />}
      {all && shown.length === 0 && <Nobody view={view} any={all.length > 0} />}
      {forgetting && <Forget device={forgetting} onClose={() => setForgetting(undefined)} />}
    </>
  );
}

function Tools({ view, all }: { view: View; all: readonly Device[] }): JSX.Element {
  const words = t().devices;
  const counts = countByRange(all, view.presence);
  return (
    <div class="toolbar">
      <div class="search">
        <Icon name="search" />
        <input
          type="search"
          aria-label={words.search}
          placeholder={words.searchHint}
          value={view.search}
          spellcheck={false}
          onInput={(event) => choose({ search: event.currentTarget.value })}
        />
      </div>
      <Choice
        label={words.network}
        value={view.range}
        options={(['all', 'local', 'guest'] as const).map((value) => ({
          value,
          label: words.ranges[value],
          count: counts[value],
        }))}
        onChange={(value) => choose({ net: value === 'all' ? '' : value })}
      />
      <Choice
        label={words.state}
        value={view.presence}
        options={(['all', 'online', 'offline'] as const).map((value) => ({ value, label: words.presence[value] }))}
        onChange={(value) => choose({ state: value === 'all' ? '' : value })}
      />
      <span class="push" />
      <Button icon="refresh" busy={listing.value.running} onClick={() => (void refreshDevices(), void listAnew())}>
        {t().common.reload}
      </Button>
    </div>
  );
}

function Counts({ all, shown }: { all: readonly Device[]; shown: number }): JSX.Element {
  const words = t().devices;
  const { running, found, named } = listing.value;
  const online = all.filter((each) => each.online).length;
  return (
    <div class="counts">
      <p class="muted number" data-shown={shown}>
        {format(words.countLine, { shown, total: all.length })} · {format(words.onlineCount, { count: online })}
      </p>
      {running && (
        <Progress
          value={found > 0 ? named / found : undefined}
          label={found > 0 ? format(words.lookingCount, { count: found }) : words.looking}
        />
      )}
    </div>
  );
}

function Nobody({ view, any }: { view: View; any: boolean }): JSX.Element {
  const words = t().devices;
  const clear = (): void => choose({ search: '', net: '', state: '' });
  const filtered = view.search !== '' || view.range !== 'all' || view.presence !== 'all';
  return (
    <div class="card empty stack">
      <p>{any ? words.noMatch : words.none}</p>
      {any && filtered && (
        <div>
          <Button onClick={clear}>{words.clear}</Button>
        </div>
      )}
    </div>
  );
}

function Forget({ device, onClose }: { device: Device; onClose: () => void }): JSX.Element {
  const words = t().devices;
  const name = displayName(device, words.noName);
  return (
    <Confirm
      title={format(words.forgetTitle, { name })}
      lead={words.forgetLead}
      button={words.forget}
      act={async () => {
        await forgetDevice(device.mac);
        announce(format(words.forgotten, { name }));
        onClose();
      }}
      onClose={onClose}
    />
  );
}
