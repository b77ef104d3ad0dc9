// The DMZ host: what no rule takes goes to it.
import type { JSX } from 'preact';
import { useState } from 'preact/hooks';

import { judgeTarget, type Lan } from '../../logic/forwards';
import { type Device, type Dmz, getDmz, setDmz } from '../../router';
import { format, t } from '../../text';
import { announce, Button, ErrorNotice, Form, Notice, Spinner, useAction, useLoad } from '../../ui';
import { deviceName, DevicePick, Switch } from '../shared';

interface DmzProps {
  devices: Device[];
  lans: Lan[] | undefined;
}

export function DmzCard({ devices, lans }: DmzProps): JSX.Element {
  const texts = t().portforward;
  const { data, error, loading, reload } = useLoad(getDmz);
  return (
    <section class="card stack" aria-labelledby="dmz">
      <div>
        <h2 id="dmz">{texts.dmz}</h2>
        <p class="lead">{texts.dmzLead}</p>
      </div>
      <ErrorNotice error={error} retry={reload} />
      {!data && loading && <Spinner />}
      {data && <DmzForm dmz={data} devices={devices} lans={lans} onStored={reload} />}
    </section>
  );
}

function DmzForm({ dmz, devices, lans, onStored }: DmzProps & { dmz: Dmz; onStored: () => void }): JSX.Element {
  const texts = t().portforward;
  const [enable, setEnable] = useState(dmz.enable ?? false);
  const [ip, setIp] = useState(dmz.ip ?? '');
  const [other, setOther] = useState(false);
  const [tried, setTried] = useState(false);
  const [busy, run, error] = useAction(setDmz);
  const fault = enable ? (lans ? judgeTarget(ip, lans) : undefined) : undefined;
  const isChanged = enable !== (dmz.enable ?? false) || (enable && ip !== (dmz.ip ?? ''));
  const submit = async (): Promise<void> => {
    setTried(true);
    if (fault || !(await run(enable, ip))) return;
    setTried(false);
    announce(texts.dmzSaved);
    onStored();
  };
  const stored = devices.find((device) => device.ip === dmz.ip);
  return (
    <Form class="stack narrow" onSubmit={() => void submit()}>
      {dmz.enable && dmz.ip !== undefined && (
        <Notice kind="warning">
          {format(texts.dmzActive, { name: stored ? `${deviceName(stored)} (${dmz.ip})` : dmz.ip })}
        </Notice>
      )}
      <Switch on={enable} label={texts.dmzEnable} onChange={setEnable} />
      {enable && (
        <DevicePick
          devices={devices}
          value={ip}
          other={other}
          onOther={setOther}
          error={fault && (tried || ip !== '') ? texts.faults[fault as keyof typeof texts.faults] : undefined}
          onChange={setIp}
        />
      )}
      <ErrorNotice error={error} />
      <div>
        <Button kind="primary" type="submit" busy={busy} disabled={!isChanged}>
          {t().common.save}
        </Button>
      </div>
    </Form>
  );
}
