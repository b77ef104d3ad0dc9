import { describe, expect, it } from 'vitest';
import { exportForwards, importForwards } from '../src/logic/forward_file';

const rules = [
  { id: '0', enabled: true, service: 'Täst "<b>"', sourcePort: '80', protocol: 'tcp', targetIP: '192.168.1.10', targetPort: '8080' },
  { id: '1', enabled: false, service: '', sourcePort: '1-5', protocol: 'both', targetIP: '192.168.1.11', targetPort: '1-5' },
];
const file = (change: object) => JSON.stringify({ ...JSON.parse(exportForwards(rules)), ...change });

describe('the file of rules', () => {
  it('comes back as it went, without the places', () => {
    const back = importForwards(exportForwards(rules));
    expect(back.problems).toEqual([]);
    expect(back.rules).toEqual(rules.map(({ id: _id, ...rest }) => rest));
  });
  it('is taken with a byte order mark in front', () => {
    expect(importForwards('\uFEFF' + exportForwards(rules)).rules).toHaveLength(2);
  });
  it.each([
    ['noJson', '{'],
    ['otherFormat', '[]'],
    ['otherFormat', 'null'],
    ['otherFormat', file({ format: 'x' })],
    ['newerVersion', file({ version: 2 })],
    ['noRules', file({ rules: {} })],
    ['noRules', file({ rules: [] })],
    ['tooMany', file({ rules: new Array(1001).fill(rules[0]) })],
    ['tooLarge', ' '.repeat((1 << 20) + 1)],
  ])('is refused as a whole: %s', (code, text) => {
    expect(importForwards(text)).toEqual({ rules: [], problems: [{ code }] });
  });
  it.each([
    ['noObject', [], ''],
    ['unknownMember', { ...rules[0], zone: 'x' }, 'zone'],
    ['wrongType', { ...rules[0], enabled: 'yes' }, 'enabled'],
    ['wrongType', { ...rules[0], sourcePort: 80 }, 'sourcePort'],
    ['tooLong', { ...rules[0], service: 'x'.repeat(256) }, 'service'],
    ['controlCharacter', { ...rules[0], service: 'a\nb' }, 'service'],
  ])('names the rule and the field: %s', (code, rule, field) => {
    expect(importForwards(file({ rules: [rules[0], rule] }))).toEqual({ rules: [], problems: [{ code, rule: 2, field }] });
  });
  it('names a rule that cannot work, and takes none of the others', () => {
    const read = importForwards(file({ rules: [rules[0], { ...rules[0], targetIP: '1.2.3' }] }));
    expect(read.rules).toEqual([]);
    expect(read.problems[0]).toMatchObject({ code: 'fault', rule: 2, field: 'targetIP', fault: { code: 'badAddress' } });
  });
});
