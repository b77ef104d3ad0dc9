import { signal } from '@preact/signals';

/** MAC address of the device whose row is an editor now; empty: none is. */
export const editing = signal('');
