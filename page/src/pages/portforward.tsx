// Port forwarding, the DMZ host, and the networks whose devices they lead to.
import type { JSX } from 'preact';

import { getLans, getTopology } from '../router';
import { t } from '../text';
import { ErrorNotice, Notice, Spinner, useLoad } from '../ui';
import { DmzCard } from './portforward/dmz';
import { Rules } from './portforward/rules';
import { useDevices } from './shared';
import './shared.css';
import './portforward/portforward.css';

export function PortForwardPage(): JSX.Element {
  const texts = t().portforward;
  const devices = useDevices();
  const lans = useLoad(getLans);
  const topology = useLoad(() => getTopology());
  return (
    <div class="stack">
      <p class="lead">{texts.lead}</p>
      {topology.data?.net_topology === 'bridge' && <Notice kind="warning">{texts.noEffect}</Notice>}
      <Rules devices={devices.data ?? []} lans={lans.data} />
      <DmzCard devices={devices.data ?? []} lans={lans.data} />
      <section class="card stack" aria-labelledby="lans">
        <div>
          <h2 id="lans">{texts.lans}</h2>
          <p class="lead">{texts.lansLead}</p>
        </div>
        <ErrorNotice error={lans.error} retry={lans.reload} />
        {!lans.data && lans.loading && <Spinner />}
        {lans.data?.length === 0 && <Notice>{texts.noLans}</Notice>}
        {lans.data && lans.data.length > 0 && (
            <table class="table blocks">
              <thead>
                <tr>
                  <th scope="col">{texts.lan}</th>
                  <th scope="col">{texts.ownAddress}</th>
                  <th scope="col">{texts.netmask}</th>
                </tr>
              </thead>
              <tbody>
                {lans.data.map((lan) => (
                  <tr key={lan.netif}>
                    <th scope="row">{lan.netif}</th>
                    <td class="number">{lan.ip}</td>
                    <td class="number">{lan.mask}</td>
                  </tr>
                ))}
              </tbody>
            </table>
        )}
      </section>
    </div>
  );
}
