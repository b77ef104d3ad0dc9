// What the server asks of a password, told before it is sent.
const SHORTEST = 8; // bytes, as the server counts
const LONGEST = 256;

export type PasswordFault = 'tooShort' | 'tooLong' | 'same';

export function checkPassword(old: string, fresh: string): PasswordFault | undefined {
  const length = new TextEncoder().encode(fresh).length;
  if (length < SHORTEST) return 'tooShort';
  if (length > LONGEST) return 'tooLong';
  return fresh === old ? 'same' : undefined;
}
