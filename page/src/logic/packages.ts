export interface Package {
  id: string;
  name: string;
  about: string;
}

const LIMIT = 200; // nobody reads more

const textOf = (value: unknown): string => (typeof value === 'string' ? value : '');

/** The package server's answer, as far as it is understood. @return nothing when there is no list in it */
export function packagesOf(answer: unknown): Package[] | undefined {
  const list = (answer as { packages?: unknown } | null)?.packages;
  if (!Array.isArray(list)) return undefined;
  return list.slice(0, LIMIT).flatMap((each: unknown, at): Package[] => {
    const object = (typeof each === 'object' && each !== null ? each : {}) as Record<string, unknown>;
    const name = textOf(object['name']) || textOf(object['id']);
    return name ? [{ id: `${at} ${textOf(object['id'])}`, name, about: textOf(object['desc']) }] : [];
  });
}
