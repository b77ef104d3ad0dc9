import { afterEach, describe, expect, it, vi } from 'vitest';

import { bringIntoSight, lessMotion } from '../src/logic/sight';

const box = (left: number, width: number): DOMRect => ({ left, width }) as DOMRect;

/** A row at 10, 200 wide, scrolled by 30, that remembers how it was scrolled. */
function row(): { asked: unknown[]; scrollLeft: number; scrollTo: (how?: unknown) => void; getBoundingClientRect: () => DOMRect } {
  const asked: unknown[] = [];
  return { asked, scrollLeft: 30, scrollTo: (how) => void asked.push(how), getBoundingClientRect: () => box(10, 200) };
}
const link = { getBoundingClientRect: () => box(250, 60) };

function askedForLessMotion(wish: boolean): void {
  vi.stubGlobal('window', {
    matchMedia: (query: string) => ({ matches: wish && query === '(prefers-reduced-motion: reduce)' }),
  });
}

afterEach(() => vi.unstubAllGlobals());

describe('the link of the page that is shown', () => {
  it('comes into the middle of its row, and moves nothing else', () => {
    const links = row();
    bringIntoSight(links, link, true);
    expect(links.asked).toEqual([{ left: 200, behavior: 'smooth' }]);
  });
  it('is there at once when nothing shall glide', () => {
    const links = row();
    bringIntoSight(links, link, false);
    expect(links.asked).toEqual([{ left: 200, behavior: 'instant' }]);
  });
  it('may be missing', () => {
    const links = row();
    bringIntoSight(links, null, true);
    expect(links.asked).toEqual([]);
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
