// Line icons on a 24 x 24 grid, drawn for this page.
import type { JSX } from 'preact';

export const ICON_PATHS = {
  computer: 'M4 5.5h16v10H4zM2.5 19h19M9.5 15.5v3.5M14.5 15.5v3.5',
  tablet: 'M7 3h10a1.5 1.5 0 0 1 1.5 1.5v15a1.5 1.5 0 0 1-1.5 1.5H7a1.5 1.5 0 0 1-1.5-1.5v-15A1.5 1.5 0 0 1 7 3zM11 18h2',
  ipcam: 'M4 7.5l13-3 1.5 6-13 3zM12 12.5v5.5M12 18H5.5M3.5 15v6M18.5 7.5l2.5-.5',
  player: 'M3.5 5h17v11.5h-17zM8 20h8M10.5 8.3v5l4-2.5z',
  printer: 'M7 9V3.5h10V9M7 17H4.5a1 1 0 0 1-1-1v-5.5A1.5 1.5 0 0 1 5 9h14a1.5 1.5 0 0 1 1.5 1.5V16a1 1 0 0 1-1 1H17M7 14h10v6.5H7zM17 11.7h.01',
  nas: 'M4.5 4h15v7h-15zM4.5 13h15v7h-15zM8 7.5h.01M8 16.5h.01M12 7.5h4.5M12 16.5h4.5',
  others: 'M5 5h14v14H5zM9.7 9.6a2.4 2.4 0 1 1 3.3 2.2c-.7.3-1 .8-1 1.5M12 16.3h.01',
  devices: 'M3 5.5h13v9H3zM1.8 18h10M18 9h3.5v10.5H15V17M18 17h.01',
  map: 'M12 9.5V13M12 13H5.5v3M12 13h6.5v3M9 3.5h6v6H9zM2.7 16h5.6v4.5H2.7zM15.7 16h5.6v4.5h-5.6z',
  topology: 'M3.5 14h17v6h-17zM7 17h.01M10.5 17h.01M12 14V9.5M8.5 7a5 5 0 0 1 7 0M5.7 4.3a9 9 0 0 1 12.6 0',
  internet: 'M12 3a9 9 0 1 0 0 18 9 9 0 0 0 0-18zM3 12h18M12 3c2.7 2.5 4 5.5 4 9s-1.3 6.5-4 9c-2.7-2.5-4-5.5-4-9s1.3-6.5 4-9z',
  portforward: 'M3 12h10.5M10 8l4 4-4 4M14 4h6.5v16H14',
  wifi: 'M12 19h.01M8.8 15.5a4.6 4.6 0 0 1 6.4 0M5.5 12a9.2 9.2 0 0 1 13 0M2.3 8.5a13.8 13.8 0 0 1 19.4 0',
  parental: 'M12 3.5a8.5 8.5 0 1 0 0 17 8.5 8.5 0 0 0 0-17zM12 7.5V12l3 2',
  packages: 'M12 3l8 4.3v9.4L12 21l-8-4.3V7.3zM4 7.3l8 4.4 8-4.4M12 11.7V21M8 5.2l8 4.3',
  tokens: 'M8 15.5a4.5 4.5 0 1 1 4.2-6.1l8.3.1V13h-2.5v2.5h-3V13h-2.8A4.5 4.5 0 0 1 8 15.5zM7.5 11h.01',
  account: 'M12 12a4 4 0 1 0 0-8 4 4 0 0 0 0 8zM4.5 20.5c.8-3.7 3.7-5.5 7.5-5.5s6.7 1.8 7.5 5.5',
  signout: 'M13.5 4H5v16h8.5M10 12h11M17 8l4 4-4 4',
  search: 'M10.5 4a6.5 6.5 0 1 0 0 13 6.5 6.5 0 0 0 0-13zM15.3 15.3L21 21',
  edit: 'M4 20l1-4.5L16.5 4 20 7.5 8.5 19zM14 6.5l3.5 3.5',
  trash: 'M4 6.5h16M9 6.5V4h6v2.5M6 6.5L7 20.5h10l1-14M10 10.5v6M14 10.5v6',
  check: 'M4.5 12.5l5 5 10-11',
  close: 'M5.5 5.5l13 13M18.5 5.5l-13 13',
  up: 'M6 14.5l6-6 6 6',
  down: 'M6 9.5l6 6 6-6',
  left: 'M14.5 6l-6 6 6 6',
  right: 'M9.5 6l6 6-6 6',
  warning: 'M12 4l9 16H3zM12 10v4.5M12 17.3h.01',
  info: 'M12 3.5a8.5 8.5 0 1 0 0 17 8.5 8.5 0 0 0 0-17zM12 11v5.5M12 7.7h.01',
  refresh: 'M20 12a8 8 0 1 1-2.5-5.8M20 3.5v4.5h-4.5',
  plus: 'M12 5v14M5 12h14',
  minus: 'M5 12h14',
  copy: 'M9 9h11v11H9zM15 9V4H4v11h5',
  cable: 'M7 4h10v8h-2.5v3h-5v-3H7zM12 15v6M10.5 7v2M13.5 7v2',
  drag: 'M9 6h.01M15 6h.01M9 12h.01M15 12h.01M9 18h.01M15 18h.01',
  upload: 'M12 16V4M7.5 8.5L12 4l4.5 4.5M4 16v4h16v-4',
  download: 'M12 4v12M7.5 11.5L12 16l4.5-4.5M4 16v4h16v-4',
  lock: 'M6 11h12v9.5H6zM8.5 11V7.5a3.5 3.5 0 0 1 7 0V11M12 15v2',
  pause: 'M8 5v14M16 5v14',
  play: 'M7 4.5v15l12-7.5z',
  more: 'M5 12h.01M12 12h.01M19 12h.01',
  sun: 'M12 8a4 4 0 1 0 0 8 4 4 0 0 0 0-8zM12 2.5v2M12 19.5v2M2.5 12h2M19.5 12h2M5.3 5.3l1.4 1.4M17.3 17.3l1.4 1.4M18.7 5.3l-1.4 1.4M6.7 17.3l-1.4 1.4',
} as const;

export type IconName = keyof typeof ICON_PATHS;

/** @param label  for an icon that stands alone; one beside words is hidden from screen readers */
export function Icon({ name, label, size = 18 }: { name: IconName; label?: string; size?: number }): JSX.Element {
  return (
    <svg
      class="icon"
      viewBox="0 0 24 24"
      width={size}
      height={size}
      role={label ? 'img' : undefined}
      aria-label={label}
      aria-hidden={label ? undefined : 'true'}
      focusable="false"
    >
      <path d={ICON_PATHS[name]} />
    </svg>
  );
}
