// IPv4 and IPv6 addresses as numbers: comparing them as texts takes 192.168.1.10 for a part of 192.168.1.1.

export type Family = 'ipv4' | 'ipv6';

export const addressBits = (family: Family): number => (family === 'ipv4' ? 32 : 128);

/** Strict dotted quad, without leading zeros: somebody may read those as octal. */
export function parseIpv4(text: string): bigint | undefined {
  const parts = text.split('.');
  if (parts.length !== 4 || !parts.every((part) => /^(0|[1-9]\d{0,2})$/.test(part) && Number(part) <= 255)) {
    return undefined;
  }
  return parts.reduce((value, part) => (value << 8n) | BigInt(part), 0n);
}

// A dotted quad may stand for the last two groups of an address, and nowhere else.
function parseGroups(text: string, endsAddress: boolean): bigint[] | undefined {
  if (text === '') {
    return [];
  }
  const groups: bigint[] = [];
  const parts = text.split(':');
  for (const [index, part] of parts.entries()) {
    if (part.includes('.')) {
      const last = endsAddress && index === parts.length - 1 ? parseIpv4(part) : undefined;
      if (last === undefined) {
        return undefined;
      }
      groups.push(last >> 16n, last & 0xffffn);
    } else if (/^[0-9a-f]{1,4}$/i.test(part)) {
      groups.push(BigInt(`0x${part}`));
    } else {
      return undefined;
    }
  }
  return groups;
}

/** RFC 4291, section 2.2, without a zone. */
export function parseIpv6(text: string): bigint | undefined {
  const halves = text.split('::');
  if (halves.length > 2) {
    return undefined;
  }
  const head = parseGroups(halves[0] ?? '', halves.length === 1);
  const tail = halves.length === 2 ? parseGroups(halves[1] ?? '', true) : [];
  if (!head || !tail) {
    return undefined;
  }
  const missing = 8 - head.length - tail.length;
  if (halves.length === 2 ? missing < 1 : missing !== 0) {
    return undefined;
  }
  const groups = [...head, ...new Array<bigint>(missing).fill(0n), ...tail];
  return groups.reduce((value, group) => (value << 16n) | group, 0n);
}

export function parseAddress(text: string, family: Family): bigint | undefined {
  return family === 'ipv4' ? parseIpv4(text) : parseIpv6(text);
}

export function maskOfLength(length: number, family: Family): bigint {
  const bits = BigInt(addressBits(family));
  const all = (1n << bits) - 1n;
  return all ^ ((1n << (bits - BigInt(length))) - 1n);
}

/** @return the prefix length of a netmask; nothing when it has holes or is none */
export function lengthOfMask(text: string): number | undefined {
  const mask = parseIpv4(text);
  for (let length = 0; mask !== undefined && length <= 32; length++) {
    if (maskOfLength(length, 'ipv4') === mask) {
      return length;
    }
  }
  return undefined;
}

export function formatIpv4(value: bigint): string {
  return [24n, 16n, 8n, 0n].map((shift) => ((value >> shift) & 255n).toString()).join('.');
}

export const maskText = (length: number): string => formatIpv4(maskOfLength(length, 'ipv4'));

export function contains(network: bigint, length: number, address: bigint, family: Family): boolean {
  return ((network ^ address) & maskOfLength(length, family)) === 0n;
}

/** Orders addresses by their numbers, those that are none after them, as texts. */
export function compareAddresses(one: string, other: string): number {
  const value = (text: string) => parseIpv4(text) ?? parseIpv6(text);
  const [a, b] = [value(one), value(other)];
  if (a === undefined || b === undefined) {
    return a === b ? one.localeCompare(other) : a === undefined ? 1 : -1;
  }
  return a === b ? 0 : a < b ? -1 : 1;
}
