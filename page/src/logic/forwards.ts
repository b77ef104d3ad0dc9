// What becomes of port forwarding rules. The router stores them as they are given and leaves out those that make no
// sense; which ones, it tells only its log. The page works the same out from what it knows, rule by rule.
import { contains, lengthOfMask, maskOfLength, parseIpv4 } from './ip';

export interface Forward {
  id?: string;
  enabled: boolean;
  service: string;
  sourcePort: string;
  protocol: string;
  targetIP: string;
  targetPort: string;
}

export interface Lan {
  netif: string;
  ip: string;
  mask: string;
}

export interface Ports {
  first: number;
  last: number;
}

export type ForwardField = 'sourcePort' | 'protocol' | 'targetIP' | 'targetPort';

export type FaultCode =
  | 'badPorts'
  | 'badProtocol'
  | 'badAddress'
  | 'otherLength'
  | 'noLan'
  | 'routerItself'
  | 'noDevice'
  | 'managementPort'
  | 'taken';

export interface Fault {
  field: ForwardField;
  code: FaultCode;
  /** the rule that has the port already: its place in the list, its name and its ports */
  other?: { index: number; service: string; ports: string };
  port?: number;
}

export type Verdict = { state: 'active' } | { state: 'disabled' } | { state: 'leftOut'; fault: Fault };

export interface Surroundings {
  lans: Lan[];
  /** TCP ports on which this router's own pages answer */
  managementPorts: number[];
}

const protocols: Record<string, { tcp: boolean; udp: boolean }> = {
  tcp: { tcp: true, udp: false },
  udp: { tcp: false, udp: true },
  both: { tcp: true, udp: true },
  'tcp/udp': { tcp: true, udp: true },
};

function parsePort(text: string): number | undefined {
  return /^[1-9]\d{0,4}$/.test(text) && Number(text) <= 65535 ? Number(text) : undefined;
}

/** A port, or a range such as "5000-5010". */
export function parsePorts(text: string): Ports | undefined {
  const parts = text.split('-');
  const first = parsePort(parts[0] ?? '');
  const last = parts.length === 1 ? first : parsePort(parts[1] ?? '');
  if (parts.length > 2 || first === undefined || last === undefined || last < first) {
    return undefined;
  }
  return { first, last };
}

export const protocolOf = (text: string) => protocols[text.toLowerCase()];

/** Why an address cannot be forwarded to. */
export function judgeTarget(text: string, lans: Lan[]): FaultCode | undefined {
  const address = parseIpv4(text);
  if (address === undefined) {
    return 'badAddress';
  }
  let isInside = false;
  for (const lan of lans) {
    const own = parseIpv4(lan.ip);
    const length = lengthOfMask(lan.mask);
    if (own === undefined || length === undefined || !contains(own, length, address, 'ipv4')) {
      continue;
    }
    isInside = true;
    if (own === address) {
      return 'routerItself';
    }
    // A network of one or two addresses has no address of its own and no broadcast (RFC 3021).
    const host = address & (maskOfLength(length, 'ipv4') ^ 0xffffffffn);
    if (length < 31 && (host === 0n || host === (maskOfLength(length, 'ipv4') ^ 0xffffffffn))) {
      return 'noDevice';
    }
  }
  return isInside ? undefined : 'noLan';
}

function faultOfFields(rule: Forward, lans: Lan[] | undefined): Fault | undefined {
  const outer = parsePorts(rule.sourcePort);
  if (!outer) {
    return { field: 'sourcePort', code: 'badPorts' };
  }
  if (!protocolOf(rule.protocol)) {
    return { field: 'protocol', code: 'badProtocol' };
  }
  if (parseIpv4(rule.targetIP) === undefined) {
    return { field: 'targetIP', code: 'badAddress' };
  }
  const inner = parsePorts(rule.targetPort);
  if (!inner) {
    return { field: 'targetPort', code: 'badPorts' };
  }
  if (inner.first !== inner.last && inner.last - inner.first !== outer.last - outer.first) {
    return { field: 'targetPort', code: 'otherLength' };
  }
  const target = lans ? judgeTarget(rule.targetIP, lans) : undefined;
  return target && { field: 'targetIP', code: target };
}

/** The fault of a rule by itself, whatever others there are. */
export const judgeAlone = (rule: Forward, lans?: Lan[]): Fault | undefined => faultOfFields(rule, lans);

interface Taken extends Ports {
  index: number;
}

function takenBy(taken: Taken[], ports: Ports): Taken | undefined {
  // The platform names the last of the rules in the way.
  return taken
    .filter((other) => other.first <= ports.last && ports.first <= other.last)
    .sort((a, b) => b.first - a.first)[0];
}

function faultOfPorts(
  rule: Forward,
  rules: Forward[],
  taken: { tcp: Taken[]; udp: Taken[] },
  managementPorts: number[],
): Fault | undefined {
  const outer = parsePorts(rule.sourcePort)!;
  const { tcp, udp } = protocolOf(rule.protocol)!;
  const own = managementPorts.find((port) => tcp && outer.first <= port && port <= outer.last);
  if (own !== undefined) {
    return { field: 'sourcePort', code: 'managementPort', port: own };
  }
  const owner = (tcp && takenBy(taken.tcp, outer)) || (udp && takenBy(taken.udp, outer));
  if (!owner) {
    return undefined;
  }
  const other = rules[owner.index]!;
  return {
    field: 'sourcePort',
    code: 'taken',
    other: { index: owner.index, service: other.service, ports: other.sourcePort },
  };
}

/** One verdict for each rule, in their order: an earlier rule has a port before a later one. */
export function judgeForwards(rules: Forward[], surroundings: Surroundings): Verdict[] {
  const taken: { tcp: Taken[]; udp: Taken[] } = { tcp: [], udp: [] };
  return rules.map((rule, index): Verdict => {
    if (!rule.enabled) {
      return { state: 'disabled' };
    }
    const fault =
      faultOfFields(rule, surroundings.lans) ?? faultOfPorts(rule, rules, taken, surroundings.managementPorts);
    if (fault) {
      return { state: 'leftOut', fault };
    }
    const protocol = protocolOf(rule.protocol)!;
    const ports = { ...parsePorts(rule.sourcePort)!, index };
    if (protocol.tcp) {
      taken.tcp.push(ports);
    }
    if (protocol.udp) {
      taken.udp.push(ports);
    }
    return { state: 'active' };
  });
}
