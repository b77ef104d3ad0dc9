// What the device store keeps as a name, told before it is sent.
const LONGEST = 255; // bytes

export type NameFault = 'nameEmpty' | 'nameLong' | 'nameControl';

export function nameFault(text: string): NameFault | undefined {
  const name = text.trim();
  if (name === '') return 'nameEmpty';
  if (/\p{Cc}/u.test(name)) return 'nameControl';
  return new TextEncoder().encode(name).length > LONGEST ? 'nameLong' : undefined;
}
