import { createContext, useContext, useEffect, useState, type ReactNode } from 'react';
import { hashKey, useQuery, useQueryClient } from '@tanstack/react-query';
import { call, Failure, type Data, type Parameters } from '../api/call';
import { forgetBearer, keepBearer, takeCode } from './credential';

type Caller = Data<'VORN.Server.Session/v1/get'>;

export interface Session {
  caller: Caller;
  mayWrite: boolean;
  /** The caller has signed in here, and can sign out. */
  hasSession: boolean;
}

const SessionContext = createContext<Session | null>(null);

/** The session of the page. Only for components inside of SessionContext. */
export function useSession(): Session {
  const session = useContext(SessionContext);
  if (!session) throw new Error('no session');
  return session;
}

export const useMayWrite = () => useSession().mayWrite;

export const WHO = ['VORN.Server.Session/v1/get', {}] as const;

/** Who calls; null if nobody has signed in. A one-time code in the address signs in first. */
async function whoCalls(): Promise<Caller | null> {
  const code = takeCode();
  if (code) await signIn({ code });
  try {
    return (await call('VORN.Server.Session/v1/get', {})).data;
  } catch (error) {
    if (error instanceof Failure && error.isUnauthenticated) return null;
    throw error;
  }
}

export async function signIn(credentials: Parameters<'VORN.Server.Session/v1/sign_in'>) {
  forgetBearer();
  const { data } = await call('VORN.Server.Session/v1/sign_in', credentials);
  if (data.token) keepBearer(data.token);
}

export async function signOut() {
  await call('VORN.Server.Session/v1/sign_out', {});
  forgetBearer();
}

export const useCaller = () => useQuery({ queryKey: WHO, queryFn: whoCalls, staleTime: Infinity });

/** Whether a call was answered with 401 since the last sign-in: the session has ended while the page was open. */
export function useSessionEnd(): boolean {
  const client = useQueryClient();
  const [ended, setEnded] = useState(false);
  useEffect(() => {
    const notice = (error: unknown) => {
      if (error instanceof Failure && error.isUnauthenticated) setEnded(true);
    };
    const stopQueries = client.getQueryCache().subscribe((event) => {
      if (event.type !== 'updated') return;
      if (event.action.type === 'error') notice(event.action.error);
      if (event.action.type === 'success' && event.query.queryHash === hashKey(WHO) && event.query.state.data)
        setEnded(false);
    });
    const stopMutations = client.getMutationCache().subscribe((event) => {
      if (event.type === 'updated' && event.action.type === 'error') notice(event.action.error);
    });
    return () => {
      stopQueries();
      stopMutations();
    };
  }, [client]);
  return ended;
}

export function SessionProvider({ caller, children }: { caller: Caller; children: ReactNode }) {
  const session = { caller, mayWrite: caller.role === 'administrator', hasSession: caller.session !== null };
  return <SessionContext value={session}>{children}</SessionContext>;
}
