// Static routes: the list with what became of each, and what may be done with one.
import type { JSX } from 'preact';
import { useState } from 'preact/hooks';

import type { Family } from '../../logic/ip';
import { type Interface, lengthText, reasonCode, type RouteRule } from '../../logic/routes';
import { getGateways, getLans, getRoutes, setRoutes } from '../../router';
import { format, t } from '../../text';
import { announce, Button, Confirm, ErrorNotice, Notice, Spinner, useAction, useLoad } from '../../ui';
import { familyName } from '../internet';
import { Switch } from '../shared';
import { RouteDialog } from './route_dialog';

export const networkText = (rule: RouteRule, family: Family): string => `${rule.ip}/${lengthText(rule, family)}`;

/** Interfaces that a route can take: those that the router has told of. */
async function interfacesOf(): Promise<Interface[]> {
  const ways = (family: Family): Promise<Interface[]> =>
    getGateways(family).then((list) => list.map((each) => ({ name: each.ifname, state: each.state })));
  const lans = getLans().then((list) => list.map((lan): Interface => ({ name: lan.netif, lan })));
  const asked = await Promise.allSettled([lans, ways('ipv4'), ways('ipv6')]);
  const all = asked.flatMap((each) => (each.status === 'fulfilled' ? each.value : []));
  return all.filter((each, at) => all.findIndex((other) => other.name === each.name) === at);
}

export function Routes({ family }: { family: Family }): JSX.Element {
  const texts = t().internet;
  const { data, error, loading, reload } = useLoad(() => getRoutes(family));
  const ports = useLoad(interfacesOf);
  const [edited, setEdited] = useState<number | 'new'>();
  const [removed, setRemoved] = useState<number>();
  const [, turn, turnError] = useAction((rules: RouteRule[]) => setRoutes(family, rules));
  const store = async (rules: RouteRule[], said: string): Promise<void> => {
    await setRoutes(family, rules);
    announce(said);
    reload();
  };
  const enable = async (at: number, on: boolean): Promise<void> => {
    await turn((data ?? []).map((rule, index) => (index === at ? { ...rule, enable: on } : rule)));
    reload();
  };
  return (
    <section class="card stack" aria-labelledby="routes">
      <div class="card-head">
        <div>
          <h2 id="routes">{texts.routes}</h2>
          <p class="lead">{texts.routesLead}</p>
        </div>
        <Button icon="plus" disabled={!data} onClick={() => setEdited('new')}>
          {texts.add}
        </Button>
      </div>
      <ErrorNotice error={error} retry={reload} />
      <ErrorNotice error={turnError} />
      {!data && loading && <Spinner />}
      {data?.length === 0 && <Notice>{format(texts.noRoutes, { family: familyName(family) })}</Notice>}
      {data && data.length > 0 && (
        <RouteTable
          rules={data}
          family={family}
          onEnable={(at, on) => void enable(at, on)}
          onEdit={setEdited}
          onRemove={setRemoved}
        />
      )}
      {edited !== undefined && data && (
        <RouteDialog
          family={family}
          rules={data}
          at={edited === 'new' ? undefined : edited}
          interfaces={ports.data ?? []}
          onStore={(rules) => store(rules, texts.routeSaved)}
          onClose={() => setEdited(undefined)}
        />
      )}
      {removed !== undefined && data?.[removed] && (
        <Confirm
          title={format(texts.removeTitle, { network: networkText(data[removed], family) })}
          lead={texts.removeLead}
          button={t().common.remove}
          act={() => store(data.filter((_, at) => at !== removed), texts.removed).then(() => setRemoved(undefined))}
          onClose={() => setRemoved(undefined)}
        />
      )}
    </section>
  );
}

function RouteTable(props: {
  rules: RouteRule[];
  family: Family;
  onEnable: (at: number, on: boolean) => void;
  onEdit: (at: number) => void;
  onRemove: (at: number) => void;
}): JSX.Element {
  const texts = t().internet;
  const { family } = props;
  return (
    <table class="table blocks">
      <thead>
        <tr>
          <th scope="col">{t().portforward.on}</th>
          <th scope="col">{texts.network}</th>
          <th scope="col">{texts.gateway}</th>
          <th scope="col">{texts.iface}</th>
          <th scope="col">{texts.state}</th>
          <td />
        </tr>
      </thead>
      <tbody>
        {props.rules.map((rule, at) => {
          const network = networkText(rule, family);
          return (
            <tr key={`${network} ${at}`}>
              <td>
                <Switch
                  on={rule.enable}
                  label={format(texts.on, { network })}
                  quiet
                  onChange={(on) => props.onEnable(at, on)}
                />
              </td>
              <th scope="row" class="number wrap">
                {network}
              </th>
              <td class="number wrap">{rule.gateway || <span class="muted">{texts.onLink}</span>}</td>
              <td>{rule.ifname}</td>
              <td class="whole">
                <RouteState rule={rule} />
              </td>
              <td class="actions">
                <Button kind="quiet" icon="edit" label={format(texts.edit, { network })} onClick={() => props.onEdit(at)} />
                <Button
                  kind="quiet"
                  icon="trash"
                  label={format(texts.remove, { network })}
                  onClick={() => props.onRemove(at)}
                />
              </td>
            </tr>
          );
        })}
      </tbody>
    </table>
  );
}

function RouteState({ rule }: { rule: RouteRule }): JSX.Element {
  const texts = t().internet;
  if (rule.installed) return <span class="badge ok">{texts.installed}</span>;
  const code = reasonCode(rule.reason ?? '');
  if (!rule.enable) return <span class="badge">{texts.off}</span>;
  return (
    <>
      <span class="badge error">{texts.notInstalled}</span>
      <p class="why error">{code ? texts.faults[code] : rule.reason}</p>
    </>
  );
}
