// Which devices may connect by radio.
import type { JSX } from 'preact';
import { useState } from 'preact/hooks';

import { ApiError } from '../api';
import { parseMac, sameMac } from '../logic/mac';
import { type Device, type FilterEntry, getMacFilter, type MacFilter, setMacFilter } from '../router';
import { format, t } from '../text';
import { announce, Button, ErrorNotice, Notice, Spinner, useAction, useLoad } from '../ui';
import { deviceName, SaveBar, useDevices } from './shared';
import { AddDevices } from './wifi/add';
import { FilterList } from './wifi/list';
import './shared.css';
import './wifi/wifi.css';

const FAILED = 4300; // the router's code when there is no adapter to ask
const POLICIES = ['disable', 'allow', 'deny'] as const;
type Policy = (typeof POLICIES)[number];

interface Draft {
  policy: Policy;
  list: FilterEntry[];
}

const draftOf = (filter: MacFilter): Draft => ({
  policy: POLICIES.find((policy) => policy === filter.mac_filter_policy) ?? 'disable',
  list: filter.mac_filter_list,
});

const kept = ({ policy, list }: Draft): string =>
  JSON.stringify([policy, list.map((entry) => [entry.mac, entry.desc ?? '', entry.mac_filter_enabled !== false])]);

export function WifiPage(): JSX.Element {
  const texts = t().wifi;
  const filter = useLoad(getMacFilter);
  const devices = useDevices();
  return (
    <div class="stack">
      <p class="lead">{texts.lead}</p>
      {filter.error instanceof ApiError && filter.error.code === FAILED ? (
        <Notice
          kind="error"
          actions={
            <Button icon="refresh" busy={filter.loading} onClick={filter.reload}>
              {t().common.retry}
            </Button>
          }
        >
          {texts.noRadio}
        </Notice>
      ) : (
        <ErrorNotice error={filter.error} retry={filter.reload} />
      )}
      {!filter.data && filter.loading && <Spinner />}
      {filter.data && <Filter filter={filter.data} devices={devices.data ?? []} onStored={filter.reload} />}
      <ErrorNotice error={filter.data && devices.error} retry={devices.reload} />
    </div>
  );
}

interface FilterProps {
  filter: MacFilter;
  devices: Device[];
  onStored: () => void;
}

function Filter({ filter, devices, onStored }: FilterProps): JSX.Element {
  const texts = t().wifi;
  const stored = draftOf(filter);
  const [draft, setDraft] = useState<Draft>();
  const { policy, list } = draft ?? stored;
  const [busy, save, error] = useAction(setMacFilter);
  const isChanged = draft !== undefined && kept(draft) !== kept(stored);
  const change = (part: Partial<Draft>): void => setDraft({ policy, list, ...part });
  const store = async (): Promise<void> => {
    if (!(await save(policy, list))) return;
    announce(texts.saved);
    onStored();
  };
  const nameOf = (entry: FilterEntry): string => {
    const device = devices.find((each) => sameMac(each.mac, entry.mac));
    return entry.desc || (device ? deviceName(device) : entry.mac);
  };
  const add = (mac: string, desc: string): void => {
    change({ list: [...list, { mac: parseMac(mac) ?? mac, desc, mac_filter_enabled: true }] });
    announce(format(texts.added, { name: desc || mac }));
  };
  const counts = list.some((entry) => entry.mac_filter_enabled !== false);
  return (
    <>
      <fieldset class="card stack policies">
        <legend class="hidden">{texts.policy}</legend>
        <h2 aria-hidden="true">{texts.policy}</h2>
        {POLICIES.map((each) => (
          <label key={each} class={`policy ${each === policy ? 'chosen' : ''}`}>
            <input
              type="radio"
              name="policy"
              value={each}
              checked={each === policy}
              onChange={() => change({ policy: each })}
            />
            <span>
              <strong>{texts.policies[each].name}</strong>
              <span class="muted">{texts.policies[each].about}</span>
            </span>
          </label>
        ))}
        {policy === 'allow' && !counts && <Notice kind="warning">{texts.lockout}</Notice>}
      </fieldset>
      <div class="wifi-columns">
        <FilterList
          list={list}
          devices={devices}
          nameOf={nameOf}
          onChange={(entries) => change({ list: entries })}
          onRemove={(entry) => {
            change({ list: list.filter((each) => each !== entry) });
            announce(format(texts.taken, { name: nameOf(entry) }));
          }}
        />
        <AddDevices list={list} devices={devices} onAdd={add} />
      </div>
      {isChanged && (
        <SaveBar
          text={texts.changed}
          busy={busy}
          error={error}
          onSave={() => void store()}
          onDiscard={() => setDraft(undefined)}
        />
      )}
    </>
  );
}

