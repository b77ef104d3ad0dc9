// Who is signed in. The cookie is out of the page's reach; what it keeps is the token that every call must carry.
import { signal } from '@preact/signals';

export type SessionState =
  | 'unknown' // nobody has asked yet
  | 'out'
  | 'first' // signed in with the first password, which must be changed before anything else
  | 'in'
  | 'expired'; // was in: the page stays as it is, with what was typed, behind the sign-in dialog

export interface Session {
  state: SessionState;
  user: string;
  csrf: string;
}

export const session = signal<Session>({ state: 'unknown', user: '', csrf: '' });

export interface SessionAnswer {
  user: string;
  csrf: string;
  must_change: boolean;
}

export function startSession(answer: SessionAnswer): void {
  session.value = { state: answer.must_change ? 'first' : 'in', user: answer.user, csrf: answer.csrf };
}

/** @param byServer  it ended while somebody was at work */
export function endSession(byServer: boolean): void {
  const wasIn = session.value.state === 'in' || session.value.state === 'expired';
  session.value = { ...session.value, state: byServer && wasIn ? 'expired' : 'out', csrf: '' };
}
