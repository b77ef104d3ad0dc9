// Addresses as what they are: numbers.

/** IPv4 address as a number; undefined when the text is none. */
export function parseIpv4(text: string): number | undefined {
  const parts = text.split('.');
  if (parts.length !== 4) return undefined;
  let value = 0;
  for (const part of parts) {
    if (!/^\d{1,3}$/.test(part) || Number(part) > 255) return undefined;
    value = value * 256 + Number(part);
  }
  return value;
}

/** The eight groups of an IPv6 address (RFC 4291, section 2.2); undefined when the text is none. */
export function parseIpv6(text: string): number[] | undefined {
  const bare = text.split('%', 1)[0] ?? '';
  const halves = bare.split('::');
  if (!bare.includes(':') || halves.length > 2) return undefined;
  const read = (half: string): number[] | undefined => {
    if (half === '') return [];
    const groups = half.split(':');
    const last = parseIpv4(groups.at(-1) ?? '');
    if (last !== undefined) groups.splice(-1, 1, (last >>> 16).toString(16), (last & 0xffff).toString(16));
    return groups.every((group) => /^[0-9a-f]{1,4}$/i.test(group)) ? groups.map((group) => parseInt(group, 16)) : undefined;
  };
  const head = read(halves[0] ?? '');
  const tail = halves.length === 2 ? read(halves[1] ?? '') : [];
  if (!head || !tail) return undefined;
  const missing = 8 - head.length - tail.length;
  if (halves.length === 2 ? missing < 1 : missing !== 0) return undefined;
  return [...head, ...new Array<number>(missing).fill(0), ...tail];
}

const hex = (value: number, digits: number): string => value.toString(16).padStart(digits, '0');

/** A text that sorts as the address does: IPv4 before IPv6, what is no address behind both. */
export function addressKey(text: string): string {
  const four = parseIpv4(text);
  if (four !== undefined) return `4${hex(four, 8)}`;
  const six = parseIpv6(text);
  return six ? `6${six.map((group) => hex(group, 4)).join('')}` : `~${text}`;
}

/** Twelve small digits with colons, as the API writes it; whatever separators came. */
export function normalMac(text: string): string {
  const digits = text.toLowerCase().replace(/[^0-9a-f]/g, '');
  return digits.length === 12 ? (digits.match(/../g) as string[]).join(':') : text.toLowerCase();
}

/** Whether the device made its MAC address up (IEEE 802: the "locally administered" bit). */
export function isRandomMac(mac: string): boolean {
  return (parseInt(mac.slice(0, 2), 16) & 2) === 2;
}
