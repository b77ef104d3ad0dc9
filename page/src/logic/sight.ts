/** What can be scrolled to: an element, as far as it is asked here. */
export type InSight = Pick<Element, 'scrollIntoView'>;

/** Whether the person has asked the system for less motion. */
export const lessMotion = (): boolean => window.matchMedia('(prefers-reduced-motion: reduce)').matches;

/**
 * Brings an element of a row into sight, with its neighbours on both sides, and the row itself as little as needs be.
 * @param glide  move there visibly, which says where one comes from
 */
export function bringIntoSight(element: InSight | null | undefined, glide: boolean): void {
  element?.scrollIntoView({ block: 'nearest', inline: 'center', behavior: glide ? 'smooth' : 'instant' });
}
