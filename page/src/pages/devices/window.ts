// Which rows of a long list are drawn: those that can be seen, and a few more.
import { useEffect, useState } from 'preact/hooks';
import type { RefObject } from 'preact';

const SPARE = 8; // rows above and below, so that the keyboard finds the next one

export interface RowWindow {
  first: number;
  end: number;
}

/** @param top  where the list's upper edge is, in pixels below that of the viewport */
export function visibleRows(top: number, viewport: number, rowHeight: number, count: number): RowWindow {
  const first = Math.floor(-top / rowHeight) - SPARE;
  const end = Math.ceil((viewport - top) / rowHeight) + SPARE;
  return { first: Math.min(Math.max(first, 0), count), end: Math.min(Math.max(end, 0), count) };
}

export function useRowWindow(place: RefObject<HTMLElement | null>, rowHeight: number, count: number): RowWindow {
  const [rows, setRows] = useState<RowWindow>({ first: 0, end: Math.min(count, 40) });
  useEffect(() => {
    let asked = 0;
    const look = (): void => {
      asked = 0;
      const list = place.current;
      if (!list) return;
      const next = visibleRows(list.getBoundingClientRect().top, window.innerHeight, rowHeight, count);
      setRows((before) => (before.first === next.first && before.end === next.end ? before : next));
    };
    const ask = (): void => {
      asked ||= requestAnimationFrame(look);
    };
    look();
    window.addEventListener('scroll', ask, { passive: true });
    window.addEventListener('resize', ask);
    return () => {
      cancelAnimationFrame(asked);
      window.removeEventListener('scroll', ask);
      window.removeEventListener('resize', ask);
    };
  }, [place, rowHeight, count]);
  return { first: Math.min(rows.first, count), end: Math.min(rows.end, count) };
}
