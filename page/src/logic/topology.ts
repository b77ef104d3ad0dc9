// What can be chosen, and where the router is found after a switch.

export interface TopologyState {
  net_topology: string;
  switching: boolean;
  support_net_topology: boolean;
  supported_mode: string;
  bridge_mode_forbidden: boolean;
}

export interface Redirect {
  redirect: boolean;
  secure: boolean;
  port: string;
  ip_list: string[];
}

export const modesOf = (state: TopologyState): string[] =>
  state.supported_mode
    .split(',')
    .map((mode) => mode.trim())
    .filter((mode, at, all) => mode !== '' && all.indexOf(mode) === at);

/** Why a mode cannot be chosen now. "bridge" is also forbidden while it is what stands. */
export function obstacle(state: TopologyState, mode: string): 'unsupported' | 'current' | 'switching' | 'portTaken' | undefined {
  if (!state.support_net_topology || !modesOf(state).includes(mode)) {
    return 'unsupported';
  }
  if (mode === state.net_topology) {
    return 'current';
  }
  if (state.switching) {
    return 'switching';
  }
  return mode === 'bridge' && state.bridge_mode_forbidden ? 'portTaken' : undefined;
}

const isAddress = (text: string): boolean => /^[0-9a-f:.]+$/i.test(text);

/** Links to where the router may be found: what came from the network is only ever an address. */
export function placesOf(redirect: Redirect): string[] {
  const port = /^\d{1,5}$/.test(redirect.port) ? redirect.port : '';
  const standard = redirect.secure ? '443' : '80';
  return redirect.ip_list.filter(isAddress).map((ip) => {
    const host = ip.includes(':') ? `[${ip}]` : ip;
    return `${redirect.secure ? 'https' : 'http'}://${host}${port && port !== standard ? `:${port}` : ''}/`;
  });
}

export type Phase = 'asked' | 'switching' | 'silent' | 'done' | 'undone';

export interface Following {
  from: string;
  to: string;
  phase: Phase;
  /** whether the router was seen switching: before, the old topology says nothing */
  seen: boolean;
  since: number; // ms
}

const startLimit = 15_000; // ms in which a switch that was accepted begins

/** One observation of a switch under way: the router's answer, or none. */
export function follow(
  now: Following,
  answer: Pick<TopologyState, 'net_topology' | 'switching'> | undefined,
  time: number,
): Following {
  if (!answer) {
    return { ...now, phase: 'silent' };
  }
  if (answer.switching) {
    return { ...now, phase: 'switching', seen: true };
  }
  if (answer.net_topology === now.to) {
    return { ...now, phase: 'done' };
  }
  const isOver = now.seen || time - now.since > startLimit;
  return { ...now, phase: isOver ? 'undone' : 'asked' };
}
