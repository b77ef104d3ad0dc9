import { describe, expect, it } from 'vitest';
import { compareAddresses, contains, lengthOfMask, maskText, parseIpv4, parseIpv6 } from '../src/logic/ip';

describe('addresses', () => {
  it('reads a dotted quad and nothing like it', () => {
    expect(parseIpv4('192.168.1.10')).toBe(0xc0a8010an);
    for (const text of ['', '1.2.3', '1.2.3.4.5', '256.1.1.1', '01.2.3.4', ' 1.2.3.4', '1.2.3.4 ', '1.2.3.-4', '0x1.2.3.4']) {
      expect(parseIpv4(text), text).toBeUndefined();
    }
  });
  it('reads IPv6 as RFC 4291 writes it', () => {
    expect(parseIpv6('::')).toBe(0n);
    expect(parseIpv6('::1')).toBe(1n);
    expect(parseIpv6('2001:DB8::1')).toBe(0x20010db8000000000000000000000001n);
    expect(parseIpv6('1:2:3:4:5:6:7:8')).toBe(0x00010002000300040005000600070008n);
    expect(parseIpv6('::ffff:192.0.2.1')).toBe(0xffffc0000201n);
    for (const text of ['', ':', ':::', '1::2::3', '1:2:3:4:5:6:7', '1:2:3:4:5:6:7:8:9', '1:2:3:4:5:6:7::8', 'fe80::1%eth0', '12345::', '1.2.3.4::']) {
      expect(parseIpv6(text), text).toBeUndefined();
    }
  });
  it('takes netmasks without holes only', () => {
    expect(lengthOfMask('255.255.255.0')).toBe(24);
    expect(lengthOfMask('0.0.0.0')).toBe(0);
    expect(lengthOfMask('255.255.255.255')).toBe(32);
    expect(lengthOfMask('255.0.255.0')).toBeUndefined();
    expect(maskText(20)).toBe('255.255.240.0');
  });
  it('compares by number, so that .10 stands after .9 and is no part of .1', () => {
    expect(['192.168.1.10', 'x', '192.168.1.9', '192.168.1.100', '192.168.1.1'].sort(compareAddresses)).toEqual([
      '192.168.1.1', '192.168.1.9', '192.168.1.10', '192.168.1.100', 'x',
    ]);
    expect(contains(parseIpv4('192.168.1.0')!, 24, parseIpv4('192.168.10.1')!, 'ipv4')).toBe(false);
  });
});
