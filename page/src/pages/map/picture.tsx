import type { JSX } from 'preact';

import { displayName } from '../../devices/device';
import { ICON_PATHS, type IconName } from '../../icons';
import { format, t } from '../../text';
import type { MapDevice, MapLayout, MapNetwork, Place } from './layout';
import { shorten } from './layout';

export function Picture({ layout, count }: { layout: MapLayout; count: number }): JSX.Element {
  const { width, height, internet, networks } = layout;
  const words = t().map;
  return (
    <svg
      class="picture"
      role="img"
      aria-label={format(words.picture, { networks: networks.length, devices: count })}
      viewBox={`${-width} ${-height} ${2 * width} ${2 * height}`}
      style={{ maxWidth: `${2 * width}px` }}
    >
      <line class="way out" x1={0} y1={0} x2={internet.x} y2={internet.y} />
      {networks.map((each) => (
        <Ways key={each.network} network={each} />
      ))}
      <Node place={internet} icon="internet" label={words.internet} kind="outside" radius={25} above />
      {networks.map((each) => (
        <NetworkNodes key={each.network} network={each} />
      ))}
      <Node place={{ x: 0, y: 0 }} icon="topology" label={t().common.router} kind="router" radius={34} />
    </svg>
  );
}

/** The lines of a network, bent so that they leave the network towards the outside. */
function Ways({ network }: { network: MapNetwork }): JSX.Element {
  return (
    <g>
      <line class="way" x1={0} y1={0} x2={network.x} y2={network.y} />
      {network.devices.map(({ device, x, y }) => (
        <path
          key={device.mac}
          class={`way ${device.wireless ? 'air' : ''} ${device.online ? '' : 'gone'}`}
          d={`M${network.x} ${network.y}Q${network.x * 1.35} ${network.y * 1.35} ${x} ${y}`}
        />
      ))}
    </g>
  );
}

function NetworkNodes({ network }: { network: MapNetwork }): JSX.Element {
  const words = t().map;
  const guest = network.network === 'guest';
  return (
    <g>
      <Node
        place={network}
        icon={guest ? 'wifi' : 'map'}
        label={guest ? words.guest : words.home}
        kind={guest ? 'guest' : 'home'}
        radius={23}
      />
      {network.devices.map((each) => (
        <DeviceNode key={each.device.mac} node={each} />
      ))}
      {network.more > 0 && (
        <text class="more" x={network.morePlace.x} y={network.morePlace.y}>
          {format(words.more, { count: network.more })}
        </text>
      )}
    </g>
  );
}

function DeviceNode({ node }: { node: MapDevice }): JSX.Element {
  const { device } = node;
  const name = displayName(device, t().devices.noName);
  return (
    <Node
      place={node}
      icon={device.type}
      label={shorten(name)}
      below={device.ip}
      title={`${name}\n${device.ip}\n${device.mac}`}
      kind={device.online ? 'device' : 'device gone'}
      radius={21}
    />
  );
}

interface NodeProps {
  place: Place;
  icon: IconName;
  label: string;
  kind: string;
  radius: number;
  below?: string;
  title?: string;
  /** the label stands over it, where no line leads */
  above?: boolean;
}

function Node({ place, icon, label, kind, radius, below, title, above = false }: NodeProps): JSX.Element {
  return (
    <g class={`node ${kind}`} style={{ transform: `translate(${place.x}px, ${place.y}px)` }}>
      {title && <title>{title}</title>}
      <circle r={radius} />
      <path d={ICON_PATHS[icon]} transform={`scale(${radius / 21}) translate(-12 -12)`} />
      <text y={above ? -radius - 9 : radius + 16}>{label}</text>
      {below && (
        <text class="below" y={radius + 30}>
          {below}
        </text>
      )}
    </g>
  );
}
