// The router's own calls, with the types of what they take and answer. Lists of rules travel as JSON texts inside the
// JSON object where the API says so ("rules" of port forwarding and parental control, "mac_filter_list").
import { call } from './api';
import type { Family } from './logic/ip';
import type { Forward, Lan } from './logic/forwards';
import type { RouteRule } from './logic/routes';
import type { Redirect, TopologyState } from './logic/topology';

export interface Device {
  mac: string;
  ip: string;
  hostname: string;
  status: boolean;
  type: string;
  brand: string;
  connection: string;
  netif: string;
}

export interface Gateway {
  type: string;
  priority: number;
  ifname: string;
  gateway: string;
  dns: string;
  state: string;
  active: boolean;
}

export interface RouteTable {
  id: number;
  name: string;
}

export interface Dmz {
  enable?: boolean;
  ip?: string;
}

export interface FilterEntry {
  mac: string;
  desc: string | null;
  mac_filter_enabled: boolean | null;
}

export interface MacFilter {
  mac_filter_policy: string | null;
  mac_filter_list: FilterEntry[];
}

export interface TimeRule {
  clientname: string;
  mac: string;
  schedule: string;
  tcenable: boolean;
  /** 1: cut in this very hour, by the router's clock */
  status?: number;
}

const allDevices = { scannertype: 'all', netrange: 'all' };
export const getDevices = async (poll = false): Promise<Device[]> =>
  (await call<{ stations: Device[] | null }>('ConnectionList', 1, 'get', allDevices, { poll })).stations ?? [];

export const getTopology = (poll = false) => call<TopologyState>('Topology', 2, 'get', {}, { poll });
export const setTopology = (mode: string) => call<Redirect>('Topology', 1, 'set', { net_topology: mode });

export const getGateways = async (family: Family, poll = false): Promise<Gateway[]> =>
  (await call<{ configs: Gateway[] }>('Gateway.List', 1, 'get', { iptype: family, type: 'all' }, { poll })).configs;
export const setGateways = (family: Family, ifnames: string[]) =>
  call<null>('Gateway.List', 1, 'set', { iptype: family, ifnames });

export const getRoutes = async (family: Family): Promise<RouteRule[]> =>
  (await call<{ rules: RouteRule[] }>('Static.Route', 1, 'get', { type: family })).rules;
export const setRoutes = (family: Family, rules: RouteRule[]) =>
  call<null>('Static.Route', 1, 'set', { type: family, rules });
export const testRoute = (family: Family, rule: RouteRule) =>
  call<{ valid: boolean }>('Static.Route', 1, 'test', { type: family, rule });
export const getTables = async (family: Family): Promise<RouteTable[]> =>
  (await call<{ tables: RouteTable[] }>('Static.Route', 1, 'tablesget', { type: family })).tables;

export const getForwards = async (): Promise<Forward[]> =>
  (await call<{ rules: Forward[] }>('PortForward', 1, 'get')).rules;
export const setForwards = (rules: Forward[]) =>
  call<null>('PortForward', 1, 'set', { rules: JSON.stringify(rules) });
export const getDmz = async (): Promise<Dmz> => (await call<Dmz | null>('DMZ', 1, 'get')) ?? {};
export const setDmz = (enable: boolean, ip: string) => call<null>('DMZ', 1, 'set', enable ? { enable, ip } : { enable });
export const getLans = async (): Promise<Lan[]> => (await call<{ local_lan: Lan[] }>('LocalLan', 1, 'get')).local_lan;

export const getMacFilter = () => call<MacFilter>('MacFilter', 1, 'get');
export const setMacFilter = (policy: string, list: FilterEntry[]) =>
  call<null>('MacFilter', 1, 'set', { mac_filter_policy: policy, mac_filter_list: JSON.stringify(list) });

export const getTimeRules = async (): Promise<TimeRule[]> =>
  (await call<{ rules: TimeRule[] }>('ParentalControl', 1, 'get')).rules;
export const setTimeRules = (rules: TimeRule[]) =>
  call<null>('ParentalControl', 1, 'set', {
    rules: JSON.stringify(rules.map(({ clientname, mac, schedule, tcenable }) => ({ clientname, mac, schedule, tcenable }))),
  });

/** What the package server told; its members are its own. */
export const getPackages = () => call<unknown>('PkgList', 1, 'get');
