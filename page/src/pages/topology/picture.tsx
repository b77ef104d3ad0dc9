// A small drawing of each mode. The words beside it say the same, so that it is hidden from screen readers.
import type { JSX } from 'preact';

import { t } from '../../text';

const homes: Record<string, { split: boolean; radio: boolean }> = {
  router: { split: true, radio: false },
  bridge: { split: false, radio: false },
  client: { split: true, radio: true },
};

export function ModePicture({ mode }: { mode: string }): JSX.Element | null {
  const home = homes[mode];
  const texts = t().topology;
  if (!home) return null;
  return (
    <svg class="mode-picture" viewBox="0 0 300 110" aria-hidden="true" focusable="false">
      <rect class="net" x={home.split ? 158 : 70} y="6" width={home.split ? 136 : 224} height="84" rx="12" />
      <path class={home.radio ? 'line radio' : 'line'} d={home.split ? 'M52 48H140' : 'M52 48H84'} />
      <path class="line" d="M176 48H236M236 48V26H246M236 48V70H246M236 48H246" />
      {!home.split && <path class="line" d="M116 48H144" />}
      <path class="cloud" d="M18 60a12 12 0 0 1 0-24 16 16 0 0 1 30-3 14 14 0 0 1 0 27z" />
      {!home.split && <rect class="box" x="84" y="34" width="32" height="28" rx="6" />}
      <rect class="box own" x="140" y="32" width="36" height="32" rx="7" />
      {[19, 41, 63].map((y) => (
        <rect key={y} class="device" x="246" y={y} width="24" height="14" rx="3" />
      ))}
      <text x="33" y="104">{texts.internet}</text>
      {!home.split && <text x="100" y="104">{texts.other}</text>}
      <text x="178" y="104">{t().common.router}</text>
      <text x="258" y="104">{texts.devices}</text>
    </svg>
  );
}
