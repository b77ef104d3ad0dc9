import { afterEach, describe, expect, it, vi } from 'vitest';

import { bringIntoSight, lessMotion } from '../src/logic/sight';

/** An element that remembers how it was scrolled to. */
function element(): { asked: unknown[]; scrollIntoView: (how?: unknown) => void } {
  const asked: unknown[] = [];
  return { asked, scrollIntoView: (how) => void asked.push(how) };
}

function askedForLessMotion(wish: boolean): void {
  vi.stubGlobal('window', {
    matchMedia: (query: string) => ({ matches: wish && query === '(prefers-reduced-motion: reduce)' }),
  });
}

afterEach(() => vi.unstubAllGlobals());

describe('the link of the page that is shown', () => {
  it('comes into sight between its neighbours, and moves the page itself no further than needed', () => {
    const link = element();
    bringIntoSight(link, true);
    expect(link.asked).toEqual([{ block: 'nearest', inline: 'center', behavior: 'smooth' }]);
  });
  it('is there at once when nothing shall glide', () => {
    const link = element();
    bringIntoSight(link, false);
    expect(link.asked).toEqual([{ block: 'nearest', inline: 'center', behavior: 'instant' }]);
  });
  it('may be missing', () => {
    expect(() => bringIntoSight(null, true)).not.toThrow();
  });
});

describe('less motion', () => {
  it('is what the system was asked for', () => {
    askedForLessMotion(true);
    expect(lessMotion()).toBe(true);
    askedForLessMotion(false);
    expect(lessMotion()).toBe(false);
  });
});
