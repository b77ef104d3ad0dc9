import { describe, expect, it } from 'vitest';
import { type Forward, judgeForwards, judgeTarget, parsePorts } from '../src/logic/forwards';

const lans = [{ netif: 'lbr0', ip: '192.168.1.1', mask: '255.255.255.0' }];
const rule = (change: Partial<Forward> = {}): Forward => ({
  enabled: true, service: 'web', sourcePort: '80', protocol: 'tcp', targetIP: '192.168.1.10', targetPort: '80', ...change,
});
const judge = (rules: Forward[], managementPorts: number[] = []) => judgeForwards(rules, { lans, managementPorts });
const codes = (rules: Forward[], managementPorts: number[] = []) =>
  judge(rules, managementPorts).map((verdict) => (verdict.state === 'leftOut' ? verdict.fault.code : verdict.state));

describe('port forwarding', () => {
  it('reads ports and ranges', () => {
    expect(parsePorts('80')).toEqual({ first: 80, last: 80 });
    expect(parsePorts('5000-5010')).toEqual({ first: 5000, last: 5010 });
    for (const text of ['', '0', '080', '65536', '5-4', '1-2-3', '-5', '5-', ' 80', '8a', '+80']) {
      expect(parsePorts(text), text).toBeUndefined();
    }
  });
  it('lets the earlier of two rules have a port, and names it at the later one', () => {
    const verdicts = judge([rule({ service: 'first', sourcePort: '5000-5010', targetPort: '80' }), rule({ sourcePort: '5005' })]);
    expect(verdicts[0]).toEqual({ state: 'active' });
    expect(verdicts[1]).toEqual({
      state: 'leftOut',
      fault: { field: 'sourcePort', code: 'taken', other: { index: 0, service: 'first', ports: '5000-5010' } },
    });
  });
  it('sees no conflict between TCP and UDP, but one with both', () => {
    expect(codes([rule(), rule({ protocol: 'udp' })])).toEqual(['active', 'active']);
    expect(codes([rule({ protocol: 'udp' }), rule({ protocol: 'BOTH' })])).toEqual(['active', 'taken']);
    expect(codes([rule({ protocol: 'tcp/udp' }), rule({ protocol: 'udp' })])).toEqual(['active', 'taken']);
  });
  it('lets a rule that is off or left out take no port', () => {
    expect(codes([rule({ enabled: false }), rule()])).toEqual(['disabled', 'active']);
    expect(codes([rule({ targetIP: '10.0.0.1' }), rule()])).toEqual(['noLan', 'active']);
  });
  it('protects the ports of the router itself, for TCP', () => {
    expect(codes([rule({ sourcePort: '1-1000', targetPort: '1-1000' })], [443])).toEqual(['managementPort']);
    expect(codes([rule({ sourcePort: '443', protocol: 'udp' })], [443])).toEqual(['active']);
  });
  it('judges targets', () => {
    expect(judgeTarget('192.168.1.10', lans)).toBeUndefined();
    expect(judgeTarget('192.168.1.1', lans)).toBe('routerItself');
    expect(judgeTarget('192.168.1.0', lans)).toBe('noDevice');
    expect(judgeTarget('192.168.1.255', lans)).toBe('noDevice');
    expect(judgeTarget('192.168.10.1', lans)).toBe('noLan');
    expect(judgeTarget('10.1.1.0', [{ netif: 'x', ip: '10.1.1.1', mask: '255.255.255.254' }])).toBeUndefined();
    expect(judgeTarget('printer', lans)).toBe('badAddress');
  });
  it('names the first wrong field', () => {
    expect(codes([rule({ sourcePort: '0' })])).toEqual(['badPorts']);
    expect(codes([rule({ protocol: 'icmp' })])).toEqual(['badProtocol']);
    expect(codes([rule({ sourcePort: '10-12', targetPort: '10-11' })])).toEqual(['otherLength']);
    expect(codes([rule({ sourcePort: '10-12', targetPort: '99' })])).toEqual(['active']);
  });
});
