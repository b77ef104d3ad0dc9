// The pages in the order in which the navigation shows them.
import type { JSX } from 'preact';

import type { IconName } from '../icons';
import type { Texts } from '../text';
import { AccountPage } from './account';
import { DevicesPage } from './devices';
import { InternetPage } from './internet';
import { MapPage } from './map';
import { PackagesPage } from './packages';
import { ParentalPage } from './parental';
import { PortForwardPage } from './portforward';
import { TokensPage } from './tokens';
import { TopologyPage } from './topology';
import { WifiPage } from './wifi';

export interface PageEntry {
  id: string;
  title: (texts: Texts) => string;
  icon: IconName;
  component: () => JSX.Element;
}

export const pages: readonly PageEntry[] = [
  { id: 'devices', title: (texts) => texts.devices.title, icon: 'devices', component: DevicesPage },
  { id: 'map', title: (texts) => texts.map.title, icon: 'map', component: MapPage },
  { id: 'internet', title: (texts) => texts.internet.title, icon: 'internet', component: InternetPage },
  { id: 'portforward', title: (texts) => texts.portforward.title, icon: 'portforward', component: PortForwardPage },
  { id: 'wifi', title: (texts) => texts.wifi.title, icon: 'wifi', component: WifiPage },
  { id: 'parental', title: (texts) => texts.parental.title, icon: 'parental', component: ParentalPage },
  { id: 'topology', title: (texts) => texts.topology.title, icon: 'topology', component: TopologyPage },
  { id: 'packages', title: (texts) => texts.packages.title, icon: 'packages', component: PackagesPage },
  { id: 'tokens', title: (texts) => texts.tokens.title, icon: 'tokens', component: TokensPage },
  { id: 'account', title: (texts) => texts.account.title, icon: 'account', component: AccountPage },
];
