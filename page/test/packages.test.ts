import { describe, expect, it } from 'vitest';
import { packagesOf } from '../src/logic/packages';

describe('the recommended packages', () => {
  it('are what has a name', () => {
    const answer = { packages: [{ id: 'a', name: 'A', desc: 'x' }, { id: 'b' }, {}, null, 7, { name: { html: '<b>' } }] };
    expect(packagesOf(answer)).toEqual([
      { id: '0 a', name: 'A', about: 'x' },
      { id: '1 b', name: 'b', about: '' },
    ]);
  });
  it('are unknown when there is no list', () => {
    for (const answer of [null, [], {}, { packages: {} }, 'text']) expect(packagesOf(answer)).toBeUndefined();
  });
});
