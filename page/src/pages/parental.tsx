// Hours in which devices are cut off: whose, a week of each, and what holds now.
import type { JSX } from 'preact';
import { useEffect, useState } from 'preact/hooks';

import { sameMac } from '../logic/mac';
import { isCut, normalize, slotOfDate, type Slot } from '../logic/schedule';
import { type Device, getTimeRules, getTopology, setTimeRules, type TimeRule } from '../router';
import { format, t } from '../text';
import { announce, Confirm, ErrorNotice, Notice, Spinner, useAction, useLoad } from '../ui';
import { SaveBar, useDevices } from './shared';
import { ChooseDevice, People } from './parental/people';
import { RuleWeek } from './parental/rule_week';
import './shared.css';
import './parental/parental.css';

const HALF_MINUTE = 30_000; // ms

/** The hour of the clock of this device, which is taken for the router's until it proves another. */
function useNow(): Slot {
  const [now, setNow] = useState(() => slotOfDate(new Date()));
  useEffect(() => {
    const timer = setInterval(() => setNow(slotOfDate(new Date())), HALF_MINUTE);
    return () => clearInterval(timer);
  }, []);
  return now;
}

interface Loaded {
  rules: TimeRule[];
  /** whether the router found another hour than this device's clock shows */
  clockDiffers: boolean;
}

async function load(): Promise<Loaded> {
  const before = slotOfDate(new Date());
  const rules = await getTimeRules();
  const now = slotOfDate(new Date());
  const isSameHour = before.hour === now.hour;
  const differs = (rule: TimeRule): boolean =>
    rule.status !== undefined && rule.schedule !== '' && isCut(rule.schedule, now) !== (rule.status === 1);
  return { rules, clockDiffers: isSameHour && rules.some(differs) };
}

export function ParentalPage(): JSX.Element {
  const texts = t().parental;
  const rules = useLoad(load);
  const devices = useDevices();
  const topology = useLoad(() => getTopology());
  return (
    <div class="stack">
      <p class="lead">{texts.lead}</p>
      {topology.data?.net_topology === 'bridge' && <Notice kind="warning">{texts.bridge}</Notice>}
      {rules.data?.clockDiffers && <Notice kind="warning">{texts.clockDiffers}</Notice>}
      <ErrorNotice error={rules.error} retry={rules.reload} />
      {!rules.data && rules.loading && <Spinner />}
      {rules.data && (
        <Editor stored={rules.data.rules} devices={devices.data ?? []} onStored={rules.reload} />
      )}
      <ErrorNotice error={rules.data && devices.error} retry={devices.reload} />
    </div>
  );
}

const kept = (rules: TimeRule[]): string =>
  JSON.stringify(rules.map(({ mac, clientname, schedule, tcenable }) => [mac, clientname, normalize(schedule), tcenable]));

interface EditorProps {
  stored: TimeRule[];
  devices: Device[];
  onStored: () => void;
}

function Editor({ stored, devices, onStored }: EditorProps): JSX.Element {
  const texts = t().parental;
  const now = useNow();
  const [draft, setDraft] = useState<TimeRule[]>();
  const [chosen, setChosen] = useState(0);
  const [removed, setRemoved] = useState<number>();
  const [busy, save, error] = useAction(setTimeRules);
  const rules = draft ?? stored;
  const at = Math.min(chosen, rules.length - 1);
  const rule = rules[at];
  const nameOf = (each: TimeRule): string =>
    devices.find((device) => sameMac(device.mac, each.mac))?.hostname || each.clientname || each.mac;
  const change = (part: Partial<TimeRule>): void =>
    setDraft(rules.map((each, index) => (index === at ? { ...each, ...part } : each)));
  const add = (device: Device): void => {
    const name = device.hostname.replace(/[\r\n]/g, ' '); // the router keeps one line
    setDraft([...rules, { mac: device.mac, clientname: name, schedule: normalize(''), tcenable: true }]);
    setChosen(rules.length);
  };
  const store = async (): Promise<void> => {
    if (!(await save(rules))) return;
    announce(texts.saved);
    onStored();
  };
  // A removal is stored by itself; what else was changed stays a draft.
  const remove = async (index: number): Promise<void> => {
    const victim = rules[index]!;
    if (stored.some((each) => each.mac === victim.mac)) {
      await setTimeRules(stored.filter((each) => each.mac !== victim.mac));
      announce(texts.removed);
      onStored();
    }
    setDraft(draft?.filter((_, place) => place !== index));
    setRemoved(undefined);
  };
  return (
    <>
      <div class="parental-columns">
        <section class="card stack" aria-labelledby="people">
          <h2 id="people">{texts.devices}</h2>
          {rules.length === 0 && <Notice>{texts.none}</Notice>}
          <People rules={rules} chosen={at} now={now} nameOf={nameOf} onChoose={setChosen} onRemove={setRemoved} />
          <ChooseDevice
            devices={devices.filter((device) => !rules.some((each) => sameMac(each.mac, device.mac)))}
            onAdd={add}
          />
        </section>
        {rule && <RuleWeek key={rule.mac} rule={rule} name={nameOf(rule)} now={now} onChange={change} />}
      </div>
      {kept(rules) !== kept(stored) && (
        <SaveBar
          text={texts.changed}
          busy={busy}
          error={error}
          onSave={() => void store()}
          onDiscard={() => setDraft(undefined)}
        />
      )}
      {removed !== undefined && rules[removed] && (
        <Confirm
          title={format(texts.removeTitle, { name: nameOf(rules[removed]) })}
          lead={texts.removeLead}
          button={t().common.remove}
          act={() => remove(removed)}
          onClose={() => setRemoved(undefined)}
        />
      )}
    </>
  );
}
