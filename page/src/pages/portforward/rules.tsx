// The rules in a table, each with what becomes of it.
import type { JSX } from 'preact';
import { useState } from 'preact/hooks';

import { type Forward, judgeForwards, type Lan, protocolOf, type Verdict } from '../../logic/forwards';
import { type Device, getForwards, setForwards } from '../../router';
import { format, t } from '../../text';
import { announce, Button, Confirm, ErrorNotice, Icon, Notice, Spinner, useAction, useLoad } from '../../ui';
import { deviceName, Switch } from '../shared';
import { FileButtons } from './file_buttons';
import { RuleDialog } from './rule_dialog';
import { faultText, managementPorts } from './words';

interface RulesProps {
  devices: Device[];
  /** none yet: whether an address is in a network of the router is not known */
  lans: Lan[] | undefined;
}

export function Rules({ devices, lans }: RulesProps): JSX.Element {
  const texts = t().portforward;
  const { data, error, loading, reload } = useLoad(getForwards);
  const [edited, setEdited] = useState<number | 'new'>();
  const [removed, setRemoved] = useState<number>();
  const [turning, turn, turnError] = useAction(setForwards);
  const store = async (rules: Forward[], said: string): Promise<void> => {
    await setForwards(rules);
    announce(said);
    reload();
  };
  const enable = async (at: number, enabled: boolean): Promise<void> => {
    if (turning) return;
    await turn((data ?? []).map((rule, index) => (index === at ? { ...rule, enabled } : rule)));
    reload();
  };
  const nameOf = (at: number): string => data?.[at]?.service || texts.noName;
  return (
    <section class="card stack" aria-labelledby="rules">
      <div class="card-head">
        <h2 id="rules">{texts.rules}</h2>
        <div class="toolbar">
          {data && <FileButtons rules={data} lans={lans} onStore={store} />}
          <Button icon="plus" kind="primary" disabled={!data} onClick={() => setEdited('new')}>
            {texts.add}
          </Button>
        </div>
      </div>
      <ErrorNotice error={error} retry={reload} />
      <ErrorNotice error={turnError} />
      {!data && loading && <Spinner />}
      {data?.length === 0 && <Notice>{texts.none}</Notice>}
      {data && data.length > 0 && (
        <RuleTable
          rules={data}
          devices={devices}
          lans={lans}
          onEnable={(at, on) => void enable(at, on)}
          onEdit={setEdited}
          onRemove={setRemoved}
        />
      )}
      {edited !== undefined && data && (
        <RuleDialog
          rules={data}
          at={edited === 'new' ? undefined : edited}
          devices={devices}
          lans={lans}
          onStore={(rules) => store(rules, texts.saved)}
          onClose={() => setEdited(undefined)}
        />
      )}
      {removed !== undefined && data && (
        <Confirm
          title={format(texts.removeTitle, { name: nameOf(removed) })}
          lead={texts.removeLead}
          button={t().common.remove}
          act={() => store(data.filter((_, at) => at !== removed), texts.removed).then(() => setRemoved(undefined))}
          onClose={() => setRemoved(undefined)}
        />
      )}
    </section>
  );
}

function protocolText(protocol: string): string {
  const known = protocolOf(protocol);
  if (!known) return protocol;
  const names = t().portforward.protocols;
  return known.tcp && known.udp ? names.both : known.tcp ? names.tcp : names.udp;
}

interface TableProps extends RulesProps {
  rules: Forward[];
  onEnable: (at: number, on: boolean) => void;
  onEdit: (at: number) => void;
  onRemove: (at: number) => void;
}

function RuleTable({ rules, devices, lans, onEnable, onEdit, onRemove }: TableProps): JSX.Element {
  const texts = t().portforward;
  // Until the networks are known, every target is taken to be in one.
  const anywhere: Lan[] = [{ netif: '', ip: '0.0.0.1', mask: '0.0.0.0' }];
  const verdicts = judgeForwards(rules, { lans: lans ?? anywhere, managementPorts: managementPorts() });
  return (
    <table class="table blocks">
      <thead>
        <tr>
          <th scope="col">{texts.on}</th>
          <th scope="col">{texts.name}</th>
          <th scope="col">{texts.outside}</th>
          <th scope="col">{texts.target}</th>
          <th scope="col">{texts.state}</th>
          <td />
        </tr>
      </thead>
      <tbody>
        {rules.map((rule, at) => {
          const name = rule.service || texts.noName;
          const device = devices.find((each) => each.ip === rule.targetIP);
          return (
            <tr key={at}>
              <td>
                <Switch
                  on={rule.enabled}
                  label={format(texts.onOf, { name })}
                  quiet
                  onChange={(on) => onEnable(at, on)}
                />
              </td>
              <th scope="row" class="wrap">
                {name}
              </th>
              <td class="number whole">
                {protocolText(rule.protocol)} {rule.sourcePort}
              </td>
              <td class="wrap">
                <Icon name="right" size={14} /> {device ? `${deviceName(device)} ` : ''}
                <span class="number muted">
                  {rule.targetIP}:{rule.targetPort}
                </span>
              </td>
              <td class="whole">
                <RuleState verdict={verdicts[at]!} />
              </td>
              <td class="actions">
                <Button kind="quiet" icon="edit" label={format(texts.edit, { name })} onClick={() => onEdit(at)} />
                <Button kind="quiet" icon="trash" label={format(texts.remove, { name })} onClick={() => onRemove(at)} />
              </td>
            </tr>
          );
        })}
      </tbody>
    </table>
  );
}

function RuleState({ verdict }: { verdict: Verdict }): JSX.Element {
  const texts = t().portforward;
  if (verdict.state === 'active') return <span class="badge ok">{texts.active}</span>;
  if (verdict.state === 'disabled') return <span class="badge">{texts.disabled}</span>;
  return (
    <>
      <span class="badge error">{texts.leftOut}</span>
      <p class="why error">{faultText(verdict.fault)}</p>
    </>
  );
}
