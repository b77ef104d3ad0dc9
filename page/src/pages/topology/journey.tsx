// The switch under way, and where to find the router.
import type { JSX } from 'preact';

import type { Phase } from '../../logic/topology';
import { format, t } from '../../text';
import { Button, Icon, Notice } from '../../ui';
import { modeTexts } from '../topology';
import { following, type Watched } from './follower';

const LONG = 45; // seconds after which a person should do something

const reached: Record<Phase, number> = { asked: 1, switching: 2, silent: 2, done: 3, undone: 3 };

export function Journey({ onEnd }: { onEnd: () => void }): JSX.Element | null {
  const now = following.value;
  const texts = t().topology;
  if (!now) return null;
  const isOver = now.phase === 'done' || now.phase === 'undone';
  const mode = modeTexts(now.to).name;
  const kind = now.phase === 'done' ? 'ok' : now.phase === 'undone' ? 'error' : 'info';
  return (
    <section class="card stack" aria-labelledby="journey">
      <h2 id="journey">{format(texts.confirmTitle, { mode }).replace(/[?]$/, '')}</h2>
      <Steps phase={now.phase} />
      <Notice kind={kind}>{format(texts.phases[now.phase], { mode })}</Notice>
      {!isOver && <p class="muted number">{format(texts.seconds, { count: now.seconds })}</p>}
      {!isOver && <Where now={now} />}
      {!isOver && now.seconds >= LONG && <Notice kind="warning">{texts.long}</Notice>}
      {isOver && (
        <div class="row">
          <Button kind="primary" onClick={onEnd}>
            {now.phase === 'done' ? texts.ok : texts.hide}
          </Button>
        </div>
      )}
    </section>
  );
}

function Steps({ phase }: { phase: Phase }): JSX.Element {
  const texts = t().topology.steps;
  const done = reached[phase];
  const steps = [texts.ordered, texts.switching, texts.reconnect];
  return (
    <ol class="steps">
      {steps.map((step, at) => {
        const isOver = at < done - 1 || phase === 'done' || (at === 0 && done >= 1);
        const isNow = !isOver && at === done - 1;
        return (
          <li key={step} class={isOver ? 'over' : isNow ? 'now' : ''} aria-current={isNow ? 'step' : undefined}>
            <span class="step-mark" aria-hidden="true">
              {isOver ? <Icon name="check" size={14} /> : isNow ? <span class="spinner" /> : at + 1}
            </span>
            {step}
          </li>
        );
      })}
    </ol>
  );
}

function Where({ now }: { now: Watched }): JSX.Element {
  const texts = t().topology;
  const lan = now.lan ? `${location.protocol}//${now.lan}${location.port ? `:${location.port}` : ''}/` : '';
  return (
    <div class="stack where">
      <h3>{texts.where}</h3>
      {now.places.length > 0 || lan ? <p>{texts.whereTry}</p> : <p>{texts.whereNone}</p>}
      <ul>
        {lan && (
          <li>
            <a href={lan}>{lan}</a> <span class="muted">({texts.whereLan})</span>
          </li>
        )}
        {now.places.map((place) => (
          <li key={place}>
            <a href={place}>{place}</a>
          </li>
        ))}
      </ul>
      <p class="muted">{texts.whereGateway}</p>
    </div>
  );
}
