import { describe, expect, it } from 'vitest';
import { type Following, follow, modesOf, obstacle, placesOf } from '../src/logic/topology';

const state = { net_topology: 'router', switching: false, support_net_topology: true, supported_mode: 'router, bridge,bridge,', bridge_mode_forbidden: false };
const start: Following = { from: 'router', to: 'bridge', phase: 'asked', seen: false, since: 0 };

describe('the topology', () => {
  it('offers what is supported', () => {
    expect(modesOf(state)).toEqual(['router', 'bridge']);
    expect(obstacle(state, 'bridge')).toBeUndefined();
    expect(obstacle(state, 'router')).toBe('current');
    expect(obstacle(state, 'client')).toBe('unsupported');
    expect(obstacle({ ...state, switching: true }, 'bridge')).toBe('switching');
    expect(obstacle({ ...state, bridge_mode_forbidden: true }, 'bridge')).toBe('portTaken');
    expect(obstacle({ ...state, support_net_topology: false }, 'bridge')).toBe('unsupported');
  });
  it('says where the router will be, and makes links of addresses only', () => {
    const redirect = { redirect: true, secure: true, port: '8443', ip_list: ['203.0.113.7', '2001:db8::1', 'javascript:alert(1)', 'evil.example/'] };
    expect(placesOf(redirect)).toEqual(['https://203.0.113.7:8443/', 'https://[2001:db8::1]:8443/']);
    expect(placesOf({ redirect: true, secure: false, port: '80', ip_list: ['10.0.0.1'] })).toEqual(['http://10.0.0.1/']);
  });
  it('follows a switch to its end', () => {
    let now = follow(start, { net_topology: 'router', switching: false }, 500);
    expect(now.phase).toBe('asked'); // it has not begun yet
    now = follow(now, { net_topology: 'router', switching: true }, 1000);
    expect(now.phase).toBe('switching');
    now = follow(now, undefined, 2000);
    expect(now.phase).toBe('silent');
    expect(follow(now, { net_topology: 'bridge', switching: false }, 3000).phase).toBe('done');
    expect(follow(now, { net_topology: 'router', switching: false }, 3000).phase).toBe('undone');
  });
  it('gives up on a switch that never began', () => {
    expect(follow(start, { net_topology: 'router', switching: false }, 16_000).phase).toBe('undone');
    expect(follow(start, undefined, 16_000).phase).toBe('silent');
  });
});
