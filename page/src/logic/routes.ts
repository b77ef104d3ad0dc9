// What is wrong with a static route, as far as a browser can know: the same limits as the router's own, so that most
// mistakes are explained while they are typed. The router has the last word ("test").
import type { Lan } from './forwards';
import { addressBits, contains, type Family, lengthOfMask, maskOfLength, maskText, parseAddress, parseIpv4 } from './ip';

/** A rule as the router keeps it; members that the page does not know go back as they came. */
export interface RouteRule {
  ip: string;
  mask?: string;
  prefix_length?: string;
  gateway: string;
  ifname: string;
  enable: boolean;
  installed?: boolean;
  reason?: string;
  [other: string]: unknown;
}

export type RouteField = 'ip' | 'length' | 'gateway' | 'ifname';

export type RouteFaultCode =
  | 'noAddress'
  | 'otherFamily'
  | 'noLength'
  | 'defaultRoute'
  | 'hostBits'
  | 'reserved'
  | 'noInterface'
  | 'duplicate'
  | 'ownAddress'
  | 'notOnLink'
  | 'interfaceDown'
  | 'interfaceGone'
  | 'subnetAddress'
  | 'notInKernel'
  | 'switchedOff';

export interface RouteFault {
  field: RouteField;
  code: RouteFaultCode;
  suggestion?: string;
}

const reserved: Record<Family, [string, number][]> = {
  ipv4: [
    ['0.0.0.0', 8],
    ['127.0.0.0', 8],
    ['169.254.0.0', 16],
    ['224.0.0.0', 3],
  ],
  ipv6: [
    ['::', 96],
    ['::ffff:0:0', 96],
    ['fe80::', 10],
    ['ff00::', 8],
  ],
};

/** "24", "/24" or a netmask for IPv4; "64" or "/64" for IPv6. */
export function parseLength(text: string, family: Family): number | undefined {
  const plain = text.replace(/^\//, '');
  if (/^(0|[1-9]\d{0,2})$/.test(plain) && Number(plain) <= addressBits(family)) {
    return Number(plain);
  }
  return family === 'ipv4' ? lengthOfMask(plain) : undefined;
}

/** Writes a bigint as the family does, without shortening: for suggestions it is shortened by the browser. */
function networkText(value: bigint, family: Family): string {
  if (family === 'ipv4') {
    return [24n, 16n, 8n, 0n].map((shift) => ((value >> shift) & 255n).toString()).join('.');
  }
  const groups = Array.from({ length: 8 }, (_, at) => ((value >> BigInt(112 - at * 16)) & 0xffffn).toString(16));
  const text = groups.join(':');
  const zeros = [...text.matchAll(/(^|:)0(:0)+(:|$)/g)].sort((a, b) => b[0].length - a[0].length)[0];
  return zeros ? text.replace(zeros[0], '::') : text;
}

function addressFault(field: RouteField, text: string, family: Family): RouteFault | undefined {
  if (parseAddress(text, family) !== undefined) {
    return undefined;
  }
  const isOther = parseAddress(text, family === 'ipv4' ? 'ipv6' : 'ipv4') !== undefined;
  return { field, code: isOther ? 'otherFamily' : 'noAddress' };
}

export interface RouteForm {
  ip: string;
  length: string;
  gateway: string;
  ifname: string;
  enable: boolean;
}

export function judgeRoute(form: RouteForm, family: Family): RouteFault | undefined {
  const ipFault = addressFault('ip', form.ip, family);
  if (ipFault) {
    return ipFault;
  }
  const length = parseLength(form.length, family);
  if (length === undefined) {
    return { field: 'length', code: 'noLength' };
  }
  if (length === 0) {
    return { field: 'length', code: 'defaultRoute' };
  }
  const network = parseAddress(form.ip, family)!;
  const whole = network & maskOfLength(length, family);
  if (whole !== network) {
    return { field: 'ip', code: 'hostBits', suggestion: networkText(whole, family) };
  }
  if (reserved[family].some(([text, bits]) => bits <= length && contains(parseAddress(text, family)!, bits, network, family))) {
    return { field: 'ip', code: 'reserved' };
  }
  if (form.gateway !== '') {
    const gatewayFault = addressFault('gateway', form.gateway, family);
    if (gatewayFault) {
      return gatewayFault;
    }
  }
  return form.ifname === '' ? { field: 'ifname', code: 'noInterface' } : undefined;
}

export function toRule(form: RouteForm, family: Family, old?: RouteRule): RouteRule {
  const length = parseLength(form.length, family);
  const { installed: _installed, reason: _reason, ...kept } = old ?? ({} as RouteRule);
  return {
    ...kept,
    ip: form.ip,
    ...(family === 'ipv4' ? { mask: maskText(length ?? 0) } : { prefix_length: String(length ?? '') }),
    gateway: form.gateway,
    ifname: form.ifname,
    enable: form.enable,
  };
}

export function lengthText(rule: RouteRule, family: Family): string {
  return family === 'ipv4' ? String(lengthOfMask(rule.mask ?? '') ?? rule.mask ?? '') : (rule.prefix_length ?? '');
}

export const toForm = (rule: RouteRule, family: Family): RouteForm => ({
  ip: rule.ip,
  length: lengthText(rule, family),
  gateway: rule.gateway ?? '',
  ifname: rule.ifname,
  enable: rule.enable,
});

const sameNetwork = (one: RouteForm, other: RouteForm, family: Family): boolean =>
  parseAddress(one.ip, family) === parseAddress(other.ip, family) &&
  parseLength(one.length, family) === parseLength(other.length, family);

/** Another enabled rule of the same network, by its place. */
export function duplicateOf(form: RouteForm, rules: RouteRule[], family: Family, self?: number): number | undefined {
  const index = rules.findIndex(
    (rule, at) => at !== self && rule.enable && sameNetwork(toForm(rule, family), form, family),
  );
  return form.enable && index >= 0 ? index : undefined;
}

/** Whether the router would hold the tested rule against its own stored self. */
export function isSameNetworkAs(form: RouteForm, rule: RouteRule | undefined, family: Family): boolean {
  return rule !== undefined && rule.enable && sameNetwork(toForm(rule, family), form, family);
}

// The router's reasons, "member: why", in its own words.
const reasons: Record<string, RouteFaultCode> = {
  'the default route belongs to the gateway list': 'defaultRoute',
  'host bits are set': 'hostBits',
  'not a network that can be routed to': 'reserved',
  'an address of the other family': 'otherFamily',
  'no address': 'noAddress',
  'no netmask': 'noLength',
  'no prefix length of 1 to 128': 'noLength',
  'no interface name': 'noInterface',
  'no such interface': 'interfaceGone',
  'the interface is down': 'interfaceDown',
  'an address of this router': 'ownAddress',
  "the subnet's own address or its broadcast address": 'subnetAddress',
  "not on the interface's link": 'notOnLink',
  'the kernel does not have the route': 'notInKernel',
  'switched off': 'switchedOff',
  "duplicate of another rule's network": 'duplicate',
};

export function reasonCode(reason: string): RouteFaultCode | undefined {
  return reasons[reason.slice(reason.indexOf(': ') + 2)];
}

/** What is known of an interface: the router's networks, and the state of its ways to the internet. */
export interface Interface {
  name: string;
  lan?: Lan;
  state?: string;
}

/** Why the router may have refused a route that is written well; nothing when the page cannot tell. */
export function explainRefusal(form: RouteForm, family: Family, interfaces: Interface[]): RouteFaultCode | undefined {
  const interfaceOf = interfaces.find((each) => each.name === form.ifname);
  if (interfaceOf?.state === 'down') return 'interfaceDown';
  if (interfaceOf?.state === 'absent') return 'interfaceGone';
  const gateway = family === 'ipv4' ? parseIpv4(form.gateway) : undefined;
  if (gateway === undefined) return undefined;
  if (interfaces.some((each) => each.lan && parseIpv4(each.lan.ip) === gateway)) return 'ownAddress';
  const own = interfaceOf?.lan && parseIpv4(interfaceOf.lan.ip);
  const length = interfaceOf?.lan && lengthOfMask(interfaceOf.lan.mask);
  if (own === undefined || length === undefined) return undefined;
  return contains(own, length, gateway, 'ipv4') ? 'subnetAddress' : 'notOnLink';
}
