// One rule. What is wrong with it is said while it is typed; it may be stored all the same only when it is right.
import type { JSX } from 'preact';
import { useState } from 'preact/hooks';

import { type Fault, type Forward, type ForwardField, judgeForwards, type Lan, protocolOf } from '../../logic/forwards';
import type { Device } from '../../router';
import { t } from '../../text';
import { Dialog, ErrorNotice, Notice, Select, TextField, useAction } from '../../ui';
import { DevicePick, SaveActions, Switch } from '../shared';
import { faultText, managementPorts } from './words';

interface RuleDialogProps {
  rules: Forward[];
  at: number | undefined;
  devices: Device[];
  lans: Lan[] | undefined;
  onStore: (rules: Forward[]) => Promise<void>;
  onClose: () => void;
}

const empty: Forward = { enabled: true, service: '', sourcePort: '', protocol: 'tcp', targetIP: '', targetPort: '' };

const PROTOCOLS = ['tcp', 'udp', 'both'] as const;

function normalProtocol(text: string): (typeof PROTOCOLS)[number] {
  const known = protocolOf(text);
  return known?.tcp && known.udp ? 'both' : known?.udp ? 'udp' : 'tcp';
}

/** The fault that the rule would have among the others; nothing when it would work. */
function faultAmong(rule: Forward, rules: Forward[], place: number, lans: Lan[] | undefined): Fault | undefined {
  const list = [...rules];
  list[place] = { ...rule, enabled: true };
  const surroundings = { lans: lans ?? [{ netif: '', ip: '0.0.0.1', mask: '0.0.0.0' }], managementPorts: managementPorts() };
  const verdict = judgeForwards(list, surroundings)[place];
  return verdict?.state === 'leftOut' ? verdict.fault : undefined;
}

export function RuleDialog({ rules, at, devices, lans, onStore, onClose }: RuleDialogProps): JSX.Element {
  const texts = t().portforward;
  const old = at === undefined ? undefined : rules[at];
  const [form, setForm] = useState<Forward>(() => ({ ...(old ?? empty), protocol: normalProtocol(old?.protocol ?? '') }));
  const [other, setOther] = useState(false);
  const [tried, setTried] = useState(false);
  const change = (part: Partial<Forward>): void => setForm((before) => ({ ...before, ...part }));
  const rule: Forward = { ...form, targetPort: form.targetPort || form.sourcePort };
  const place = at ?? rules.length;
  const fault = faultAmong(rule, rules, place, lans);
  const typed: Record<ForwardField, string> = {
    sourcePort: form.sourcePort,
    protocol: form.protocol,
    targetIP: form.targetIP,
    targetPort: form.targetPort,
  };
  // A field that nobody has touched yet is no mistake.
  const wrong = (field: ForwardField): string | undefined =>
    fault?.field === field && (tried || typed[field] !== '') ? faultText(fault) : undefined;
  const [busy, run, error] = useAction(async () => {
    const list = [...rules];
    list[place] = rule;
    await onStore(list);
  });
  const submit = async (): Promise<void> => {
    setTried(true);
    if (fault && (form.enabled || fault.code.startsWith('bad') || fault.code === 'otherLength')) return;
    if (await run()) onClose();
  };
  return (
    <Dialog
      title={old ? texts.editTitle : texts.addTitle}
      onClose={onClose}
      onSubmit={() => void submit()}
      actions={<SaveActions busy={busy} onCancel={onClose} />}
    >
      <TextField
        label={texts.name}
        value={form.service}
        hint={texts.nameHint}
        maxLength={64}
        autocomplete="off"
        autofocus
        onInput={(service) => change({ service })}
      />
      <div class="two">
        <TextField
          label={texts.outsidePorts}
          value={form.sourcePort}
          hint={texts.portsHint}
          error={wrong('sourcePort')}
          autocomplete="off"
          onInput={(text) => change({ sourcePort: text.replace(/\s/g, '') })}
        />
        <Select
          label={texts.protocol}
          value={form.protocol}
          options={PROTOCOLS.map((value) => ({ value, label: texts.protocols[value] }))}
          onChange={(protocol) => change({ protocol })}
        />
      </div>
      <div class="two">
        <DevicePick
          devices={devices}
          value={form.targetIP}
          other={other}
          onOther={setOther}
          error={wrong('targetIP')}
          onChange={(targetIP) => change({ targetIP })}
        />
        <TextField
          label={texts.innerPorts}
          value={form.targetPort}
          hint={texts.innerHint}
          error={wrong('targetPort')}
          autocomplete="off"
          placeholder={form.sourcePort}
          onInput={(text) => change({ targetPort: text.replace(/\s/g, '') })}
        />
      </div>
      <Switch on={form.enabled} label={texts.enabled} onChange={(enabled) => change({ enabled })} />
      {tried && fault?.field === 'targetPort' && form.targetPort === '' && (
        <Notice kind="error">{faultText(fault)}</Notice>
      )}
      <ErrorNotice error={error} />
    </Dialog>
  );
}
