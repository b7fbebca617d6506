import type { ReactNode } from 'react';
import { act, renderHook } from '@testing-library/react';
import { QueryClient, QueryClientProvider } from '@tanstack/react-query';
import { afterEach, beforeEach, expect, test, vi } from 'vitest';
import { type Change, useChange } from '../src/shared/change-dialog';
import { usePreview } from '../src/shared/preview';

const METHOD = 'VORN.Core.FileServ.NFS/v1/set';
const change: Change<typeof METHOD> = { method: METHOD, parameters: { enable_nfs: true }, tag: '"one"' };

interface Request {
  isRehearsal: boolean;
  signal: AbortSignal | null | undefined;
  answer: () => void;
}

let requests: Request[];

beforeEach(() => {
  requests = [];
  vi.useFakeTimers();
  vi.stubGlobal('fetch', (path: string, init?: RequestInit) => {
    return new Promise<Response>((resolve) => {
      const answer = () => {
        resolve(new Response('{"success": true, "data": null}'));
      };
      requests.push({ isRehearsal: path.endsWith('?rehearse=true'), signal: init?.signal, answer });
    });
  });
});

afterEach(() => {
  vi.useRealTimers();
  vi.unstubAllGlobals();
});

/** A page on which a change is edited, previewed and made. */
function page() {
  const client = new QueryClient();
  const wrapper = ({ children }: { children: ReactNode }) => (
    <QueryClientProvider client={client}>{children}</QueryClientProvider>
  );
  const initialProps: { edited: Change<typeof METHOD> | null } = { edited: null };
  return renderHook(
    ({ edited }) => ({ preview: usePreview(edited), save: useChange<typeof METHOD>('Saved', () => {}) }),
    {
      initialProps,
      wrapper,
    },
  );
}

const wait = (milliseconds: number) => act(() => vi.advanceTimersByTimeAsync(milliseconds));

test('a preview is asked for when the edits pause', async () => {
  const { rerender } = page();
  rerender({ edited: change });
  await wait(399);
  expect(requests).toHaveLength(0);
  await wait(10);
  expect(requests.map(({ isRehearsal }) => isRehearsal)).toEqual([true]);
});

test('no preview is asked for while the change is made', async () => {
  const { result, rerender } = page();
  rerender({ edited: change });
  act(() => {
    result.current.save.mutate(change);
  });
  await wait(1000);
  expect(requests.map(({ isRehearsal }) => isRehearsal)).toEqual([false]);
  requests[0]?.answer();
  rerender({ edited: null });
  await wait(1000);
  expect(result.current.save.isSuccess).toBe(true);
  expect(requests).toHaveLength(1);
});

test('a preview that is under way is given up when the change is made', async () => {
  const { result, rerender } = page();
  rerender({ edited: change });
  await wait(500);
  expect(requests[0]?.signal?.aborted).toBe(false);
  act(() => {
    result.current.save.mutate(change);
  });
  await wait(10);
  expect(requests[0]?.signal?.aborted).toBe(true);
  expect(requests.map(({ isRehearsal }) => isRehearsal)).toEqual([true, false]);
});
