/** Moves one element; a place beyond the ends is the end. */
export function move<T>(list: readonly T[], from: number, to: number): T[] {
  const out = [...list];
  const [element] = out.splice(from, 1);
  if (element === undefined) {
    return [...list];
  }
  out.splice(Math.max(0, Math.min(out.length, to)), 0, element);
  return out;
}

export const sameOrder = (one: readonly string[], other: readonly string[]): boolean =>
  one.length === other.length && one.every((element, at) => element === other[at]);
