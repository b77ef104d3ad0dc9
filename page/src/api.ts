// Calls of the router's web API.
import { endSession, session, startSession, type SessionAnswer } from './session';

/** The server's answers come within seconds; a topology switch or a name look-up may take longer. */
const TIME_LIMIT = 45_000; // milliseconds

export class ApiError extends Error {
  override name = 'ApiError';
  constructor(
    /** of HTTP; 0: there was no answer at all */
    readonly status: number,
    /** of the module or, when it was not reached, the HTTP status again */
    readonly code: number,
    readonly data: unknown,
    /** the server's own words, for the log */
    message = '',
    /** seconds that the server asks to wait; 0: nothing said */
    readonly wait = 0,
  ) {
    super(message || `error ${code}`);
  }
}

interface Body {
  success?: boolean;
  data?: unknown;
  error?: { code?: number; message?: string; data?: unknown };
}

async function send(path: string, parameters: object, poll: boolean): Promise<Response> {
  const headers: Record<string, string> = { 'Content-Type': 'application/json' };
  if (session.value.csrf) headers['X-CSRF-Token'] = session.value.csrf;
  if (poll) headers['X-Poll'] = '1';
  try {
    return await fetch(path, {
      method: 'POST',
      headers,
      body: JSON.stringify(parameters),
      credentials: 'same-origin',
      cache: 'no-store',
      signal: AbortSignal.timeout(TIME_LIMIT),
    });
  } catch (fault) {
    throw new ApiError(0, 0, undefined, String(fault));
  }
}

async function post<T>(path: string, parameters: object = {}, poll = false): Promise<T> {
  const csrf = session.value.csrf;
  const response = await send(path, parameters, poll);
  let body: Body;
  try {
    body = (await response.json()) as Body;
  } catch (fault) {
    throw new ApiError(response.ok ? 0 : response.status, response.ok ? 0 : response.status, undefined, String(fault));
  }
  if (response.ok && body.success) return body.data as T;
  // An answer to a call of the session before this one says nothing of this one.
  if (response.status === 401 && csrf && csrf === session.value.csrf && path !== '/webapi/password') endSession(true);
  const wait = Number(response.headers.get('Retry-After')) || 0;
  throw new ApiError(response.status, body.error?.code ?? response.status, body.error?.data, body.error?.message, wait);
}

/**
 * @param api      last part of its name: "Topology", "Gateway.List"
 * @param options  poll: the page asks by itself, nobody may be there, and the session is not kept alive by it
 */
export function call<T>(
  api: string,
  version: number,
  method: string,
  parameters: object = {},
  options: { poll?: boolean } = {},
): Promise<T> {
  return post<T>(`/webapi/VORN.Core.Network.Router.${api}/${version}/${method}`, parameters, options.poll ?? false);
}

/** Finds out whether the browser has a session already, as after a reload. */
export async function resume(): Promise<void> {
  try {
    startSession(await post<SessionAnswer>('/webapi/session'));
  } catch (fault) {
    if (!(fault instanceof ApiError) || fault.status === 0) throw fault;
    endSession(false);
  }
}

export async function login(user: string, password: string): Promise<void> {
  startSession(await post<SessionAnswer>('/webapi/login', { user, password }));
}

export async function logout(): Promise<void> {
  try {
    await post('/webapi/logout');
  } catch (fault) {
    if (!(fault instanceof ApiError) || fault.status !== 401) throw fault;
  }
  endSession(false);
}

/** The server ends every session with the change; this one is taken up again with the new password. */
export async function changePassword(old: string, fresh: string): Promise<void> {
  const user = session.value.user || 'admin';
  await post('/webapi/password', { old, new: fresh });
  await login(user, fresh);
}

export interface Token {
  id: string;
  name: string;
  access: 'read' | 'full';
  made: number; // Unix times
  expires: number;
  used: number | null;
}

export const tokens = {
  list: (): Promise<Token[]> => post('/webapi/tokens/list'),
  make: (name: string, access: Token['access'], days: number): Promise<{ id: string; token: string }> =>
    post('/webapi/tokens/make', { name, access, days }),
  revoke: (id: string): Promise<unknown> => post('/webapi/tokens/revoke', { id }),
};
