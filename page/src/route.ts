// Which page is shown, and with which choices: "#/devices?sort=ip". The choices survive a reload and can be kept as a
// bookmark.
import { signal } from '@preact/signals';

export interface Route {
  page: string;
  choices: ReadonlyMap<string, string>;
}

export function parseRoute(hash: string): Route {
  const [path = '', query = ''] = hash.replace(/^#\/?/, '').split('?', 2);
  return { page: path, choices: new Map(new URLSearchParams(query)) };
}

export function formatRoute(route: Route): string {
  const query = new URLSearchParams([...route.choices].filter(([, value]) => value !== '')).toString();
  return `#/${route.page}${query ? `?${query}` : ''}`;
}

export const route = signal<Route>({ page: '', choices: new Map() });

/** Changes choices of the page that is shown; an empty one goes. The way back stays one step a page. */
export function choose(changes: Record<string, string>): void {
  const choices = new Map(route.value.choices);
  for (const [name, value] of Object.entries(changes)) {
    if (value === '') choices.delete(name);
    else choices.set(name, value);
  }
  route.value = { page: route.value.page, choices };
  history.replaceState(null, '', formatRoute(route.value));
}

export function followRoute(): void {
  const take = (): void => {
    route.value = parseRoute(location.hash);
  };
  window.addEventListener('hashchange', take);
  take();
}
