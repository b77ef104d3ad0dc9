// One static route, with the verdict while it is typed.
import type { JSX } from 'preact';
import { useEffect, useState } from 'preact/hooks';

import { ApiError } from '../../api';
import type { Family } from '../../logic/ip';
import {
  duplicateOf,
  explainRefusal,
  type Interface,
  isSameNetworkAs,
  judgeRoute,
  type RouteFault,
  type RouteFaultCode,
  type RouteField,
  type RouteForm,
  type RouteRule,
  toForm,
  toRule,
} from '../../logic/routes';
import { testRoute } from '../../router';
import { errorText, format, t } from '../../text';
import { Button, Dialog, ErrorNotice, Icon, Select, TextField, useAction } from '../../ui';
import { SaveActions, Switch } from '../shared';

const PAUSE = 350; // ms after the last key before the router is asked
const REFUSED = 4300;

type Verdict =
  | { state: 'incomplete' | 'checking' | 'valid' | 'refused' }
  | { state: 'fault'; fault: RouteFault }
  | { state: 'unchecked'; error: unknown };

const empty = (interfaces: Interface[]): RouteForm => ({
  ip: '',
  length: '',
  gateway: '',
  ifname: interfaces[0]?.name ?? '',
  enable: true,
});

/** What is known without the router; nothing: it is to be asked. */
function localVerdict(form: RouteForm, rules: RouteRule[], family: Family, at?: number): Verdict | undefined {
  if (form.ip === '' || form.length === '') return { state: 'incomplete' };
  const fault = judgeRoute(form, family);
  if (fault) return { state: 'fault', fault };
  const isTwice = duplicateOf(form, rules, family, at) !== undefined;
  return isTwice ? { state: 'fault', fault: { field: 'ip', code: 'duplicate' } } : undefined;
}

function useVerdict(form: RouteForm, rules: RouteRule[], family: Family, at?: number): Verdict {
  const [answer, setAnswer] = useState<Verdict>({ state: 'checking' });
  const local = localVerdict(form, rules, family, at);
  const key = JSON.stringify(form);
  useEffect(() => {
    if (local) return undefined;
    let isLate = false;
    setAnswer({ state: 'checking' });
    const timer = setTimeout(() => {
      const rule = toRule(form, family);
      // The router would take the changed rule for a second one to the stored rule's network.
      const isOwn = at !== undefined && isSameNetworkAs(form, rules[at], family);
      testRoute(family, isOwn ? { ...rule, enable: false } : rule).then(
        () => isLate || setAnswer({ state: 'valid' }),
        (error: unknown) => {
          if (isLate) return;
          const isRefused = error instanceof ApiError && error.code === REFUSED;
          setAnswer(isRefused ? { state: 'refused' } : { state: 'unchecked', error });
        },
      );
    }, PAUSE);
    return () => {
      isLate = true;
      clearTimeout(timer);
    };
  }, [key, local === undefined]);
  return local ?? answer;
}

interface RouteDialogProps {
  family: Family;
  rules: RouteRule[];
  at: number | undefined;
  interfaces: Interface[];
  onStore: (rules: RouteRule[]) => Promise<void>;
  onClose: () => void;
}

export function RouteDialog({ family, rules, at, interfaces, onStore, onClose }: RouteDialogProps): JSX.Element {
  const texts = t().internet;
  const old = at === undefined ? undefined : rules[at];
  const [form, setForm] = useState<RouteForm>(() => (old ? toForm(old, family) : empty(interfaces)));
  const verdict = useVerdict(form, rules, family, at);
  const change = (part: Partial<RouteForm>): void => setForm((before) => ({ ...before, ...part }));
  const [busy, run, error] = useAction(async () => {
    const rule = toRule(form, family, old);
    await onStore(at === undefined ? [...rules, rule] : rules.map((each, index) => (index === at ? rule : each)));
  });
  const submit = async (): Promise<void> => {
    if (await run()) onClose();
  };
  const names = [...new Set([...interfaces.map((each) => each.name), form.ifname])].filter((name) => name !== '');
  const fault = verdict.state === 'fault' ? verdict.fault : undefined;
  const wrong = (field: RouteField): string | undefined =>
    fault?.field === field ? texts.faults[fault.code] : undefined;
  const blocked = verdict.state === 'fault' || verdict.state === 'incomplete';
  return (
    <Dialog
      title={old ? texts.editTitle : texts.addTitle}
      onClose={onClose}
      onSubmit={() => void submit()}
      actions={<SaveActions busy={busy} disabled={blocked} onCancel={onClose} />}
    >
      <div class="row fields">
        <TextField
          label={texts.ip}
          value={form.ip}
          hint={texts.ipHint[family]}
          error={wrong('ip')}
          autocomplete="off"
          autofocus
          onInput={(ip) => change({ ip: ip.trim() })}
        />
        <TextField
          label={family === 'ipv4' ? texts.mask : texts.prefix}
          value={form.length}
          hint={family === 'ipv4' ? texts.maskHint : texts.prefixHint}
          error={wrong('length')}
          autocomplete="off"
          onInput={(length) => change({ length: length.trim() })}
        />
      </div>
      {fault?.suggestion !== undefined && (
        <div>
          <Button onClick={() => change({ ip: fault.suggestion! })}>
            {format(texts.useSuggestion, { network: fault.suggestion })}
          </Button>
        </div>
      )}
      <TextField
        label={texts.gateway}
        value={form.gateway}
        hint={texts.gatewayHint}
        error={wrong('gateway')}
        autocomplete="off"
        onInput={(gateway) => change({ gateway: gateway.trim() })}
      />
      <Select
        label={texts.iface}
        value={form.ifname}
        options={[
          ...(form.ifname === '' ? [{ value: '', label: texts.choose }] : []),
          ...names.map((name) => ({ value: name, label: name })),
        ]}
        error={wrong('ifname')}
        onChange={(ifname) => change({ ifname })}
      />
      <Switch on={form.enable} label={texts.enabled} onChange={(enable) => change({ enable })} />
      <VerdictLine verdict={verdict} cause={explainRefusal(form, family, interfaces)} />
      <ErrorNotice error={error} />
    </Dialog>
  );
}

function VerdictLine({ verdict, cause }: { verdict: Verdict; cause: RouteFaultCode | undefined }): JSX.Element {
  const texts = t().internet;
  const words = {
    incomplete: () => texts.incomplete,
    checking: () => texts.checking,
    valid: () => texts.valid,
    refused: () => format(texts.refuses, { why: cause ? texts.faults[cause] : texts.refused }),
    fault: () => (verdict.state === 'fault' ? texts.faults[verdict.fault.code] : ''),
    unchecked: () =>
      verdict.state === 'unchecked' ? format(texts.unchecked, { error: errorText(verdict.error) }) : '',
  };
  const isWrong = verdict.state === 'refused' || verdict.state === 'fault';
  return (
    <p class={`verdict ${verdict.state === 'valid' ? 'ok' : isWrong ? 'wrong' : ''}`} role="status">
      {verdict.state === 'checking' ? (
        <span class="spinner" aria-hidden="true" />
      ) : (
        <Icon name={verdict.state === 'valid' ? 'check' : isWrong ? 'warning' : 'info'} />
      )}
      <span>{words[verdict.state]()}</span>
    </p>
  );
}
