import { describe, expect, it } from 'vitest';
import { duplicateOf, explainRefusal, judgeRoute, reasonCode, type RouteForm, toForm, toRule } from '../src/logic/routes';

const form = (change: Partial<RouteForm> = {}): RouteForm => ({ ip: '10.1.0.0', length: '16', gateway: '192.168.1.2', ifname: 'lbr0', enable: true, ...change });
const six = (change: Partial<RouteForm> = {}): RouteForm => ({ ...form(), ip: '2001:db8:5::', length: '48', gateway: '', ...change });

describe('a static route', () => {
  it('is taken when the router would take it', () => {
    expect(judgeRoute(form(), 'ipv4')).toBeUndefined();
    expect(judgeRoute(form({ length: '255.255.0.0' }), 'ipv4')).toBeUndefined();
    expect(judgeRoute(six({ length: '/48' }), 'ipv6')).toBeUndefined();
    expect(judgeRoute(form({ ip: '0.0.0.0', length: '1' }), 'ipv4')).toBeUndefined(); // larger than what is reserved in it
  });
  it.each([
    ['noAddress', form({ ip: '10.1.0' })],
    ['otherFamily', form({ ip: '2001:db8::' })],
    ['noLength', form({ length: '33' })],
    ['noLength', form({ length: '255.0.255.0' })],
    ['defaultRoute', form({ ip: '0.0.0.0', length: '0' })],
    ['hostBits', form({ ip: '10.1.0.5' })],
    ['reserved', form({ ip: '127.0.0.0', length: '8' })],
    ['reserved', form({ ip: '224.0.0.0', length: '4' })],
    ['reserved', form({ ip: '169.254.0.0', length: '16' })],
    ['noAddress', form({ gateway: 'router' })],
    ['otherFamily', form({ gateway: 'fe80::1' })],
    ['noInterface', form({ ifname: '' })],
  ])('is explained: %s', (code, rule) => {
    expect(judgeRoute(rule, 'ipv4')?.code).toBe(code);
  });
  it.each([
    ['otherFamily', six({ ip: '10.0.0.0' })],
    ['noLength', six({ length: '129' })],
    ['hostBits', six({ ip: '2001:db8:5::1' })],
    ['reserved', six({ ip: 'fe80::', length: '64' })],
    ['reserved', six({ ip: 'ff02::', length: '16' })],
  ])('is explained for IPv6: %s', (code, rule) => {
    expect(judgeRoute(rule, 'ipv6')?.code).toBe(code);
  });
  it('suggests the network that was meant', () => {
    expect(judgeRoute(form({ ip: '10.1.2.3', length: '20' }), 'ipv4')?.suggestion).toBe('10.1.0.0');
    expect(judgeRoute(six({ ip: '2001:db8:5::1' }), 'ipv6')?.suggestion).toBe('2001:db8:5::');
  });
  it('keeps members that the page does not know, and drops what only tells', () => {
    const old = { ip: 'x', gateway: '', ifname: 'a', enable: false, note: 'mine', installed: false, reason: 'r' };
    expect(toRule(form(), 'ipv4', old)).toEqual({
      ip: '10.1.0.0', mask: '255.255.0.0', gateway: '192.168.1.2', ifname: 'lbr0', enable: true, note: 'mine',
    });
    expect(toRule(six(), 'ipv6')).toMatchObject({ prefix_length: '48' });
    expect(toForm(toRule(form(), 'ipv4'), 'ipv4')).toEqual(form());
  });
  it('finds another enabled rule of the same network, however it is written', () => {
    const rules = [toRule(six({ ip: '2001:DB8:5:0::' }), 'ipv6'), toRule(six({ enable: false, ip: '2001:db8:6::' }), 'ipv6')];
    expect(duplicateOf(six(), rules, 'ipv6')).toBe(0);
    expect(duplicateOf(six(), rules, 'ipv6', 0)).toBeUndefined();
    expect(duplicateOf(six({ ip: '2001:db8:6::' }), rules, 'ipv6')).toBeUndefined();
    expect(duplicateOf(six({ enable: false }), rules, 'ipv6')).toBeUndefined();
  });
  it("knows the router's reasons", () => {
    expect(reasonCode('ifname: the interface is down')).toBe('interfaceDown');
    expect(reasonCode("gateway: not on the interface's link")).toBe('notOnLink');
    expect(reasonCode('something new')).toBeUndefined();
  });
});

describe('a refusal', () => {
  const interfaces = [
    { name: 'lbr0', lan: { netif: 'lbr0', ip: '192.168.1.1', mask: '255.255.255.0' } },
    { name: 'eth1', state: 'down' },
    { name: 'eth2', state: 'absent' },
    { name: 'eth0', state: 'ready' },
  ];
  it.each([
    ['interfaceDown', form({ ifname: 'eth1' })],
    ['interfaceGone', form({ ifname: 'eth2' })],
    ['notOnLink', form({ gateway: '192.168.10.1' })],
    ['ownAddress', form({ gateway: '192.168.1.1', ifname: 'eth0' })],
    ['subnetAddress', form({ gateway: '192.168.1.255' })],
    [undefined, form({ gateway: '203.0.113.9', ifname: 'eth0' })],
    [undefined, form({ gateway: '', ifname: 'lbr0' })],
  ])('is explained as far as the page can: %s', (code, rule) => {
    expect(explainRefusal(rule, 'ipv4', interfaces)).toBe(code);
  });
});
