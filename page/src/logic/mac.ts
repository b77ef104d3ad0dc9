/** An address as stations have it, in the router's own way of writing; nothing for a group's or the empty one. */
export function parseMac(text: string): string | undefined {
  const plain = text.trim().toLowerCase();
  if (!/^[0-9a-f]{2}([:-][0-9a-f]{2}){5}$/.test(plain)) {
    return undefined;
  }
  const mac = plain.replaceAll('-', ':');
  const isGroup = (parseInt(mac.slice(0, 2), 16) & 1) === 1;
  return isGroup || mac === '00:00:00:00:00:00' ? undefined : mac;
}

export const sameMac = (one: string, other: string): boolean => (parseMac(one) ?? one) === (parseMac(other) ?? other);
