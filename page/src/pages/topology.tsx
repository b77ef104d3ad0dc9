// The topology: what it is, what can be chosen, and the switch with its reconnect.
import type { JSX } from 'preact';
import { useEffect, useState } from 'preact/hooks';

import { modesOf, obstacle, type TopologyState } from '../logic/topology';
import { getLans, getTopology } from '../router';
import { format, t } from '../text';
import { Button, ErrorNotice, Spinner, useLoad } from '../ui';
import { ModePicture } from './topology/picture';
import { Journey } from './topology/journey';
import { ConfirmSwitch } from './topology/confirm';
import { following, goOn, rememberLan, watchOther } from './topology/follower';
import './shared.css';
import './topology/topology.css';

export function modeTexts(mode: string): { name: string; about: string } {
  const known = t().topology.modes as Record<string, { name: string; about: string }>;
  return known[mode] ?? { name: mode, about: t().topology.otherMode };
}

export function TopologyPage(): JSX.Element {
  const { data, error, loading, reload } = useLoad(() => getTopology());
  const [asking, setAsking] = useState<string>();
  const lans = useLoad(getLans);
  useEffect(() => {
    if (data?.net_topology === 'router' && lans.data?.[0]) rememberLan(lans.data[0].ip);
  }, [data, lans.data]);
  useEffect(() => {
    if (data?.switching) watchOther(data.net_topology);
  }, [data]);
  const end = (): void => {
    goOn();
    reload();
  };
  return (
    <div class="stack">
      <p class="lead">{t().topology.lead}</p>
      <ErrorNotice error={following.value ? undefined : error} retry={reload} />
      {following.value && <Journey onEnd={end} />}
      {!data && loading && !following.value && <Spinner />}
      {data && !following.value && <Modes state={data} onAsk={setAsking} />}
      {asking !== undefined && data && (
        <ConfirmSwitch
          from={data.net_topology}
          mode={asking}
          onClose={() => setAsking(undefined)}
          onUnderWay={reload}
        />
      )}
    </div>
  );
}

function Modes({ state, onAsk }: { state: TopologyState; onAsk: (mode: string) => void }): JSX.Element {
  const texts = t().topology;
  const [wanted, setWanted] = useState(state.net_topology);
  useEffect(() => setWanted(state.net_topology), [state.net_topology]);
  const modes = modesOf(state);
  const shown = modes.includes(state.net_topology) ? modes : [state.net_topology, ...modes];
  const stop = obstacle(state, wanted);
  return (
    <>
      <fieldset class="modes">
        <legend class="hidden">{texts.choose}</legend>
        {shown.map((mode) => (
          <ModeCard
            key={mode}
            mode={mode}
            state={state}
            chosen={wanted === mode}
            onChoose={() => setWanted(mode)}
          />
        ))}
      </fieldset>
      {wanted !== state.net_topology && (
        <section class="card stack" aria-labelledby="effects">
          <h2 id="effects">{texts.what}</h2>
          <Effects mode={wanted} />
          <p class="muted">{texts.keeps}</p>
          <div class="row">
            <Button kind="primary" disabled={stop !== undefined} onClick={() => onAsk(wanted)}>
              {format(texts.button, { mode: modeTexts(wanted).name })}
            </Button>
          </div>
        </section>
      )}
    </>
  );
}

function ModeCard(props: {
  mode: string;
  state: TopologyState;
  chosen: boolean;
  onChoose: () => void;
}): JSX.Element {
  const texts = t().topology;
  const { name, about } = modeTexts(props.mode);
  const stop = obstacle(props.state, props.mode);
  const isCurrent = stop === 'current' || props.mode === props.state.net_topology;
  return (
    <label class={`card mode ${props.chosen ? 'chosen' : ''}`}>
      <span class="row">
        <input
          type="radio"
          name="mode"
          checked={props.chosen}
          disabled={stop !== undefined && !isCurrent}
          onChange={props.onChoose}
        />
        <strong>{name}</strong>
        {isCurrent && <span class="badge ok">{texts.current}</span>}
      </span>
      <ModePicture mode={props.mode} />
      <span class="muted">{about}</span>
      {stop !== undefined && !isCurrent && <span class="danger">{texts.obstacles[stop]}</span>}
    </label>
  );
}

export function Effects({ mode }: { mode: string }): JSX.Element | null {
  const known = t().topology.effects as Record<string, string[]>;
  const lines = known[mode];
  return lines ? (
    <ul class="effects">
      {lines.map((line) => (
        <li key={line}>{line}</li>
      ))}
    </ul>
  ) : null;
}
