import { afterEach, expect, test, vi } from 'vitest';
import { call, Failure, Unreachable } from '../src/api/call';

const answerWith = (body: string, init?: ResponseInit) => {
  const send = vi.fn<typeof fetch>(() => Promise.resolve(new Response(body, init)));
  vi.stubGlobal('fetch', send);
  return send;
};

afterEach(() => {
  vi.unstubAllGlobals();
  sessionStorage.clear();
});

test('an answer has data, tag, warnings and rehearsal', async () => {
  const send = answerWith('{"success": true, "data": null, "warnings": ["w"], "rehearsal": {"files": []}}', {
    headers: { ETag: '"t"' },
  });
  sessionStorage.setItem('session', 'secret');
  const answer = await call('VORN.Core.FileServ.NFS/v1/set', { enable_nfs: true }, { ifMatch: '"x"', rehearse: true });
  expect(answer).toEqual({ data: null, tag: '"t"', warnings: ['w'], rehearsal: { files: [] } });
  const [path, init] = send.mock.calls[0] ?? [];
  expect(path).toBe('/api/VORN.Core.FileServ.NFS/v1/set?rehearse=true');
  expect(Object.fromEntries(new Headers(init?.headers))).toEqual({
    authorization: 'Bearer secret',
    'content-type': 'application/json',
    'if-match': '"x"',
  });
});

test('a failure has code, reasons, details and tag', async () => {
  answerWith('{"success": false, "error": {"code": 412, "text": "t", "reasons": ["r"], "details": {"a": 1}}}', {
    status: 412,
    headers: { ETag: '"new"' },
  });
  const error: unknown = await call('VORN.Core.FileServ.NFS/v1/get', {}).catch((caught: unknown) => caught);
  expect(error).toBeInstanceOf(Failure);
  expect(error).toMatchObject({ code: 412, isConflict: true, reasons: ['r'], details: { a: 1 }, tag: '"new"' });
});

test('no answer, half an answer, and the answer of a proxy are told from a failure', async () => {
  vi.stubGlobal('fetch', () => Promise.reject(new TypeError('Failed to fetch')));
  await expect(call('VORN.Core.FileServ.NFS/v1/get', {})).rejects.toBeInstanceOf(Unreachable);
  answerWith('{"success": tr');
  await expect(call('VORN.Core.FileServ.NFS/v1/get', {})).rejects.toBeInstanceOf(Unreachable);
  answerWith('<html>Bad gateway</html>', { status: 502 });
  await expect(call('VORN.Core.FileServ.NFS/v1/get', {})).rejects.toBeInstanceOf(Unreachable);
  answerWith('', { status: 500 });
  await expect(call('VORN.Core.FileServ.NFS/v1/get', {})).rejects.toMatchObject({ code: 500 });
});
