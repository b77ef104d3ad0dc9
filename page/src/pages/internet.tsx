// The ways to the internet and the static routes, of one Internet protocol at a time.
import type { JSX } from 'preact';

import type { Family } from '../logic/ip';
import { choose, route } from '../route';
import { t } from '../text';
import { Choice } from '../ui';
import { Gateways } from './internet/gateways';
import { Routes } from './internet/routes';
import { Tables } from './internet/tables';
import './shared.css';
import './internet/internet.css';

export const familyName = (family: Family): string => (family === 'ipv4' ? 'IPv4' : 'IPv6');

export function InternetPage(): JSX.Element {
  const family: Family = route.value.choices.get('family') === 'ipv6' ? 'ipv6' : 'ipv4';
  return (
    <div class="stack">
      <div>
        <Choice
          label={t().internet.families}
          value={family}
          options={[
            { value: 'ipv4', label: 'IPv4' },
            { value: 'ipv6', label: 'IPv6' },
          ]}
          onChange={(value) => choose({ family: value === 'ipv6' ? value : '' })}
        />
      </div>
      <Gateways key={`gateways-${family}`} family={family} />
      <Routes key={`routes-${family}`} family={family} />
      <Tables key={`tables-${family}`} family={family} />
    </div>
  );
}
