/** What a row and an element in it must have to be scrolled, as far as it is asked here. */
export type Row = Pick<Element, 'scrollLeft' | 'getBoundingClientRect' | 'scrollTo'>;
export type InRow = Pick<Element, 'getBoundingClientRect'>;

/** Whether the person has asked the system for less motion. */
export const lessMotion = (): boolean => window.matchMedia('(prefers-reduced-motion: reduce)').matches;

/**
 * Brings an element of a row into the row's middle, with its neighbours on both sides. Nothing but the row moves: the page
 * stays where the person reads.
 * @param glide  move there visibly, which says where one comes from
 */
export function bringIntoSight(row: Row, element: InRow | null | undefined, glide: boolean): void {
  if (!element) return;
  const [place, own] = [element.getBoundingClientRect(), row.getBoundingClientRect()];
  const left = row.scrollLeft + place.left - own.left - (own.width - place.width) / 2;
  row.scrollTo({ left, behavior: glide ? 'smooth' : 'instant' });
}
