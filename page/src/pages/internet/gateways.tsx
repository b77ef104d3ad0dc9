// The order of the ways to the internet, changed by dragging, by buttons or with Alt and the arrow keys.
import type { JSX } from 'preact';
import { useEffect, useLayoutEffect, useRef, useState } from 'preact/hooks';

import type { Family } from '../../logic/ip';
import { move, sameOrder } from '../../logic/order';
import { type Gateway, getGateways, setGateways } from '../../router';
import { format, t } from '../../text';
import { announce, Button, ErrorNotice, Icon, Notice, Spinner, useAction, useLoad } from '../../ui';
import { familyName } from '../internet';
import { SaveBar } from '../shared';

const PERIOD = 5000; // ms between two looks at which way carries the traffic

const known = (gateways: Gateway[], order: string[]): string[] => {
  const names = gateways.map((gateway) => gateway.ifname);
  return [...order.filter((name) => names.includes(name)), ...names.filter((name) => !order.includes(name))];
};

export function Gateways({ family }: { family: Family }): JSX.Element {
  const texts = t().internet;
  const { data, error, loading, reload } = useLoad(() => getGateways(family, true)); // looked at again and again, also when nobody is there
  const [order, setOrder] = useState<string[]>();
  const [busy, save, saveError] = useAction((names: string[]) => setGateways(family, names));
  useEffect(() => {
    const timer = setInterval(() => document.visibilityState === 'visible' && reload(), PERIOD);
    return () => clearInterval(timer);
  }, [reload]);
  const names = data?.map((gateway) => gateway.ifname) ?? [];
  const shown = data ? known(data, order ?? names) : [];
  const isChanged = !sameOrder(shown, names);
  const store = async (): Promise<void> => {
    if (!(await save(shown))) return;
    announce(texts.orderSaved);
    setOrder(shown); // until the list says the same
    reload();
  };
  return (
    <section class="card stack" aria-labelledby="gateways">
      <div>
        <h2 id="gateways">{texts.gateways}</h2>
        <p class="lead">{texts.gatewaysLead}</p>
      </div>
      <ErrorNotice error={error} retry={reload} />
      {!data && loading && <Spinner />}
      {data?.length === 0 && <Notice>{format(texts.noGateways, { family: familyName(family) })}</Notice>}
      {data && data.length > 0 && !data.some((gateway) => gateway.active) && (
        <Notice kind="warning">{format(texts.noneActive, { family: familyName(family) })}</Notice>
      )}
      {data && <Order gateways={data} order={shown} onOrder={setOrder} />}
      {data && isChanged && (
        <SaveBar
          text={texts.changed}
          save={texts.saveOrder}
          busy={busy}
          error={saveError}
          onSave={() => void store()}
          onDiscard={() => setOrder(undefined)}
        />
      )}
    </section>
  );
}

interface OrderProps {
  gateways: Gateway[];
  order: string[];
  onOrder: (order: string[]) => void;
}

function Order({ gateways, order, onOrder }: OrderProps): JSX.Element {
  const list = useRef<HTMLOListElement>(null);
  const [dragged, setDragged] = useState<string>();
  // A row that is moved in the document loses the focus.
  const focused = useRef<Element | null>(null);
  useLayoutEffect(() => {
    const before = focused.current;
    focused.current = null;
    if (before instanceof HTMLElement && before !== document.activeElement) before.focus();
  });
  const place = (name: string, to: number, isSaid = true): void => {
    const from = order.indexOf(name);
    if (to === from || to < 0 || to >= order.length) return;
    focused.current = isSaid ? document.activeElement : null;
    onOrder(move(order, from, to));
    if (isSaid) announce(format(t().internet.moved, { name, place: to + 1, count: order.length }));
  };
  const dragTo = (name: string, y: number): void => {
    const rows = [...(list.current?.children ?? [])];
    const under = rows.findIndex((row) => {
      const box = row.getBoundingClientRect();
      return y < box.top + box.height / 2;
    });
    const from = order.indexOf(name);
    const to = under < 0 ? rows.length - 1 : under > from ? under - 1 : under;
    place(name, to, false);
  };
  return (
    <ol class="order" ref={list}>
      {order.map((name, at) => {
        const gateway = gateways.find((each) => each.ifname === name);
        return (
          gateway && (
            <Way
              key={name}
              gateway={gateway}
              at={at}
              count={order.length}
              isDragged={dragged === name}
              onPlace={(to) => place(name, to)}
              onDrag={(y) => {
                setDragged(name);
                dragTo(name, y);
              }}
              onDrop={() => setDragged(undefined)}
            />
          )
        );
      })}
    </ol>
  );
}

interface WayProps {
  gateway: Gateway;
  at: number;
  count: number;
  isDragged: boolean;
  onPlace: (to: number) => void;
  onDrag: (y: number) => void;
  onDrop: () => void;
}

function stateText(state: string): string {
  return (t().internet.states as Record<string, string>)[state] ?? state;
}

function Way({ gateway, at, count, isDragged, onPlace, onDrag, onDrop }: WayProps): JSX.Element {
  const texts = t().internet;
  const name = gateway.ifname;
  const keys = (event: KeyboardEvent): void => {
    const step = event.key === 'ArrowUp' ? -1 : event.key === 'ArrowDown' ? 1 : 0;
    if (!event.altKey || step === 0) return;
    event.preventDefault();
    onPlace(at + step);
  };
  return (
    <li class={`gateway ${isDragged ? 'dragged' : ''} ${gateway.active ? 'carries' : ''}`} onKeyDown={keys}>
      <DragHandle onDrag={onDrag} onDrop={onDrop} />
      <span class="way-place number" aria-hidden="true">
        {at + 1}
      </span>
      <div class="way-text">
        <div class="row">
          <strong>{name}</strong>
          {gateway.active && <span class="badge ok">{texts.traffic}</span>}
          {!(gateway.active && gateway.state === 'ready') && (
            <span class={`badge ${gateway.state === 'ready' ? '' : 'warning'}`}>{stateText(gateway.state)}</span>
          )}
        </div>
        <p class="muted">
          {[
            gateway.gateway && format(texts.via, { gateway: gateway.gateway }),
            gateway.dns && format(texts.dns, { servers: gateway.dns.split(' ').join(', ') }),
          ]
            .filter(Boolean)
            .join(' · ')}
        </p>
      </div>
      <div class="way-buttons">
        <Button kind="quiet" icon="up" label={format(texts.up, { name })} onClick={() => onPlace(at - 1)} />
        <Button kind="quiet" icon="down" label={format(texts.down, { name })} onClick={() => onPlace(at + 1)} />
      </div>
      {count > 1 && <span class="hidden">{format(texts.place, { place: at + 1 })}</span>}
    </li>
  );
}

/** For the mouse and fingers; keys have the buttons. */
function DragHandle({ onDrag, onDrop }: { onDrag: (y: number) => void; onDrop: () => void }): JSX.Element {
  const latest = useRef({ onDrag, onDrop });
  latest.current = { onDrag, onDrop };
  // The row moves in the document while it is dragged, and would lose a captured pointer: the window keeps it.
  const begin = (event: PointerEvent): void => {
    if (event.button !== 0) return;
    event.preventDefault();
    const id = event.pointerId;
    const moved = (each: PointerEvent): void => {
      if (each.pointerId === id) latest.current.onDrag(each.clientY);
    };
    const ended = (each: PointerEvent): void => {
      if (each.pointerId !== id) return;
      window.removeEventListener('pointermove', moved);
      window.removeEventListener('pointerup', ended);
      window.removeEventListener('pointercancel', ended);
      latest.current.onDrop();
    };
    window.addEventListener('pointermove', moved);
    window.addEventListener('pointerup', ended);
    window.addEventListener('pointercancel', ended);
    onDrag(event.clientY);
  };
  return (
    <span class="drag-handle" aria-hidden="true" onPointerDown={begin}>
      <Icon name="drag" />
    </span>
  );
}
