// client.ts SOCKET CODE: calls all methods of a vornd on a trial root with a client whose types come from its OpenAPI document.
// The compiler checks the types of all parameters and answers; each "@ts-expect-error" is a request or a use of an answer
// that must not compile.
import assert from 'node:assert/strict';
import { request } from 'node:http';
import createClient from 'openapi-fetch';
import type { paths } from './schema.js';

const [socketPath, code] = process.argv.slice(2); // the code signs in once
const called = new Set<string>();

// The function fetch() over the Unix socket, as the caller root or the server's own user.
async function fetchOverSocket(input: Request): Promise<Response> {
  const url = new URL(input.url);
  const body = Buffer.from(await input.arrayBuffer());
  called.add(url.pathname);
  return new Promise((resolve, reject) => {
    const sent = request(
      {
        socketPath,
        path: url.pathname,
        method: input.method,
        headers: { ...Object.fromEntries(input.headers), 'content-length': body.length },
      },
      (answer) => {
        const pieces: Buffer[] = [];
        answer.on('data', (piece: Buffer) => pieces.push(piece));
        answer.on('end', () => {
          const headers = new Headers(
            Object.entries(answer.headers).map(([name, value]): [string, string] => [name, String(value)]),
          );
          const status = answer.statusCode ?? 0;
          resolve(new Response(Buffer.concat(pieces), { status, headers }));
        });
        answer.on('error', reject);
      },
    );
    sent.on('error', reject);
    sent.end(body);
  });
}

const client = createClient<paths>({ baseUrl: 'http://localhost', fetch: fetchOverSocket });

// The data of an answer that must be a success.
function dataOf<Data>(answer: { data?: { data: Data }; error?: unknown }): Data {
  assert.ok(answer.data, JSON.stringify(answer.error));
  return answer.data.data;
}

// Expects a success without data. The types of openapi-fetch lack members that can only be null.
function expectDone(answer: { data?: { success: true }; error?: unknown }) {
  assert.ok(answer.data, JSON.stringify(answer.error));
  assert.equal((answer.data as { data?: unknown }).data, null);
}

async function settings() {
  const set = await client.POST('/api/VORN.Core.FileServ.NFS/v1/set', {
    body: { enable_nfs: true, enable_nfs_v4: true, nfs_v4_domain: 'typed.example', read_size: 65536 },
  });
  expectDone(set);
  const get = dataOf(await client.POST('/api/VORN.Core.FileServ.NFS/v1/get', { body: {} }));
  const domain: string = get.nfs_v4_domain;
  assert.equal(domain, 'typed.example');
  assert.equal(get.read_size, 65536);
  // @ts-expect-error: the switch is a boolean
  const wrong: string = get.enable_nfs;
  assert.equal(wrong, true);
}

async function versionTwo() {
  expectDone(await client.POST('/api/VORN.Core.FileServ.NFS/v2/set', { body: { enable_nfs: false, enable_nfs_v4: null } }));
  assert.equal(dataOf(await client.POST('/api/VORN.Core.FileServ.NFS/v2/get', { body: {} })).enable_nfs, false);
}

async function advancedSettings() {
  const body = {
    read_size: 0,
    write_size: 0,
    unix_pri_enable: true,
    custom_port_enable: true,
    statd_port: 4060,
    nlm_port: 4061,
  };
  expectDone(await client.POST('/api/VORN.Core.FileServ.NFS.AdvancedSetting/v1/set', { body }));
  const get = dataOf(await client.POST('/api/VORN.Core.FileServ.NFS.AdvancedSetting/v1/get', { body: {} }));
  const enabled: number = get.custom_port_enable; // answered as an integer
  assert.deepEqual([enabled, get.statd_port, get.nlm_port], [1, 4060, 4061]);
}

async function kerberos() {
  const status = dataOf(await client.POST('/api/VORN.Core.FileServ.NFS.Kerberos/v1/get', { body: {} }));
  assert.equal(status.kerberos_support, true);
  const refused = await client.POST('/api/VORN.Core.FileServ.NFS.Kerberos/v1/upload_key', {
    body: { keytab_file: 'no keytab' },
    bodySerializer: (body) => {
      const form = new FormData();
      form.append('keytab_file', new Blob([body.keytab_file]), 'file');
      return form;
    },
  });
  assert.equal(refused.error?.error.code, 2331);
  // @ts-expect-error: 2351 is not among the codes of this method
  assert.ok(refused.error?.error.code !== 2351);
  const list = dataOf(await client.POST('/api/VORN.Core.FileServ.NFS.Kerberos/v1/list', { body: {} }));
  assert.equal(list.keytab.length, 0);
}

async function idMap() {
  const idmap = [{ kerberos_principal: 'alice@TYPED', local_name: 'alice' }];
  const created = await client.POST('/api/VORN.Core.FileServ.NFS.IDMap/v1/create', { body: { idmap } });
  assert.deepEqual(dataOf(created).id, ['alice@TYPED']);
  const again = await client.POST('/api/VORN.Core.FileServ.NFS.IDMap/v1/create', { body: { idmap } });
  assert.deepEqual(again.error?.error, {
    code: 2351,
    text: again.error?.error.text,
    details: { principal_conflict: ['alice@TYPED'] },
  });
  const change = { id: 'alice@TYPED', kerberos_principal: 'alice@TYPED', local_name: 'bob' };
  expectDone(await client.POST('/api/VORN.Core.FileServ.NFS.IDMap/v1/set', { body: change }));
  const page = dataOf(await client.POST('/api/VORN.Core.FileServ.NFS.IDMap/v1/list', { body: { limit: 1 } }));
  assert.deepEqual([page.total, page.idmap[0]?.local_name], [1, 'bob']);
  expectDone(await client.POST('/api/VORN.Core.FileServ.NFS.IDMap/v1/delete', { body: { id: ['alice@TYPED'] } }));
  expectDone(await client.POST('/api/VORN.Core.FileServ.NFS.IDMap/v1/delete', { body: { id: 'alice@TYPED' } }));
}

async function sharePrivilege() {
  const rule = {
    client: '10.1.0.0/16',
    privilege: 'rw' as const,
    root_squash: 'guest' as const,
    async: false,
    insecure: true,
    crossmnt: false,
    security_flavor: { sys: true as const }, // at least one is true
  };
  expectDone(
    await client.POST('/api/VORN.Core.FileServ.NFS.SharePrivilege/v1/save', {
      body: { share_name: 'data', rule: [rule] },
    }),
  );
  const load = await client.POST('/api/VORN.Core.FileServ.NFS.SharePrivilege/v1/load', { body: { share_name: 'data' } });
  const stored = dataOf(load).rule[0];
  assert.equal(stored?.root_squash, 'guest');
  assert.equal(stored?.security_flavor?.kerberos, false);
  await client.POST('/api/VORN.Core.FileServ.NFS.SharePrivilege/v1/save', {
    // @ts-expect-error: "RW" is not a privilege
    body: { share_name: 'data', rule: [{ ...rule, privilege: 'RW' }] },
  });
  // @ts-expect-error: the share is missing
  const refused = await client.POST('/api/VORN.Core.FileServ.NFS.SharePrivilege/v1/load', { body: {} });
  assert.deepEqual(refused.error?.error.reasons, ['"share_name" is missing.']);
}

async function shares() {
  const photos = { name: 'photos', path: '/volume1/photos' };
  expectDone(await client.POST('/api/VORN.Core.Share/v1/create', { body: photos }));
  const again = await client.POST('/api/VORN.Core.Share/v1/create', { body: photos });
  assert.equal(again.error?.error.code, 2372);
  const list = dataOf(await client.POST('/api/VORN.Core.Share/v1/list', { body: { filter: 'photos' } }));
  assert.deepEqual(list, { shares: [{ ...photos, rules: 0 }], total: 1 });
  const get = dataOf(await client.POST('/api/VORN.Core.Share/v1/get', { body: { name: 'photos' } }));
  const rules: number = get.rules;
  assert.equal(rules, 0);
  expectDone(await client.POST('/api/VORN.Core.Share/v1/delete', { body: { name: 'photos' } }));
}

async function access() {
  const question = { share: 'data', client: '192.0.2.1' };
  const answer = dataOf(await client.POST('/api/VORN.Core.FileServ.NFS.Access/v1/explain', { body: question }));
  const mountable: boolean = answer.mountable;
  assert.equal(mountable, false);
  assert.deepEqual(answer.addresses, ['192.0.2.1']);
  const unknown = await client.POST('/api/VORN.Core.FileServ.NFS.Access/v1/explain', { body: { ...question, share: 'x' } });
  assert.equal(unknown.error?.error.code, 2370);
}

async function matrix() {
  const answer = dataOf(await client.POST('/api/VORN.Core.FileServ.NFS.Access/v1/matrix', { body: { client: '192.0.2.1' } }));
  const shares: string[] = answer.access.map((row) => row.share);
  assert.equal(shares.length, answer.total);
  assert.ok(shares.includes('data'));
  const clients = dataOf(await client.POST('/api/VORN.Core.FileServ.NFS.Access/v1/matrix', { body: { share: 'data' } }));
  assert.equal(clients.access.length, 0);
  assert.equal(clients.clients.length, clients.total);
  assert.ok(clients.clients.every((row) => row.flavors.length === 0 || row.address !== null));
}

async function history() {
  const list = dataOf(await client.POST('/api/VORN.Core.FileServ.NFS.History/v1/list', { body: { limit: 1 } }));
  const newest = list.changes[0];
  if (newest !== undefined) {
    const shown = dataOf(await client.POST('/api/VORN.Core.FileServ.NFS.History/v1/show', { body: { id: newest.id } }));
    assert.deepEqual(shown.files, newest.files);
  }
  const unknown = await client.POST('/api/VORN.Core.FileServ.NFS.History/v1/undo', { body: { id: 'x' } });
  assert.equal(unknown.error?.error.code, 2390);
}

async function health() {
  const answer = dataOf(await client.POST('/api/VORN.Core.FileServ.NFS.Health/v1/check', { body: { severity: 'warning' } }));
  assert.equal(answer.total, answer.counts.error + answer.counts.warning);
  const kinds: string[] = answer.findings.map((finding) => finding.kind);
  assert.equal(kinds.length, answer.total);
}

async function clients() {
  const list = dataOf(await client.POST('/api/VORN.Core.FileServ.NFS.Client/v1/list', { body: { filter: '192.0.2.1' } }));
  const addresses: (string | null)[] = list.clients.map((row) => row.address);
  assert.deepEqual(addresses, []);
  const gone = await client.POST('/api/VORN.Core.FileServ.NFS.Client/v1/disconnect', { body: { id: 7, client_id: '0x1' } });
  assert.equal(gone.error?.error.code, 2395);
}

async function revisions() {
  const get = await client.POST('/api/VORN.Core.FileServ.NFS/v1/get', { body: {} });
  const tag = get.response.headers.get('etag') ?? '';
  const change = (enable_nfs: boolean) =>
    client.POST('/api/VORN.Core.FileServ.NFS/v1/set', {
      params: { header: { 'If-Match': tag } },
      body: { enable_nfs },
    });
  expectDone(await change(true));
  assert.equal((await change(false)).response.status, 412);
}

function bearer(token: string) {
  return { headers: { authorization: `Bearer ${token}` } };
}

async function sessions() {
  assert.ok(code);
  const signedIn = dataOf(await client.POST('/api/VORN.Server.Session/v1/sign_in', { body: { code } }));
  assert.ok(signedIn.token); // absent behind TLS
  const session = bearer(signedIn.token);
  const caller = dataOf(await client.POST('/api/VORN.Server.Session/v1/get', { body: {}, ...session }));
  const role: 'reader' | 'administrator' = caller.role;
  assert.equal(role, 'administrator');
  const list = dataOf(await client.POST('/api/VORN.Server.Session/v1/list', { body: {} }));
  assert.deepEqual(list.map(({ id }) => id), [caller.session]);
  expectDone(await client.POST('/api/VORN.Server.Session/v1/sign_out', { body: {}, ...session }));
  assert.equal((await client.POST('/api/VORN.Server.Session/v1/get', { body: {}, ...session })).response.status, 401);
  const ended = await client.POST('/api/VORN.Server.Session/v1/end', { body: { id: String(caller.session) } });
  assert.equal(ended.error?.error.code, 404);
  // @ts-expect-error: the code is a string
  const refused = await client.POST('/api/VORN.Server.Session/v1/sign_in', { body: { code: 1 } });
  assert.equal(refused.response.status, 400);
}

async function tokens() {
  const body = { name: 'typed', role: 'reader' as const, apis: ['VORN.Core.FileServ.NFS'] };
  const created = dataOf(await client.POST('/api/VORN.Server.Token/v1/create', { body }));
  const get = await client.POST('/api/VORN.Core.FileServ.NFS/v1/get', { body: {}, ...bearer(created.token) });
  assert.equal(get.response.status, 200);
  const listed = dataOf(await client.POST('/api/VORN.Server.Token/v1/list', { body: {} })).find(
    ({ id }) => id === created.id,
  );
  assert.equal(listed?.expires, null);
  // @ts-expect-error: the list has no secrets
  assert.equal(listed?.token, undefined);
  const again = await client.POST('/api/VORN.Server.Token/v1/create', { body });
  assert.equal(again.error?.error.code, 409);
  // @ts-expect-error: "root" is not a role
  await client.POST('/api/VORN.Server.Token/v1/create', { body: { name: 'other', role: 'root' } });
  expectDone(await client.POST('/api/VORN.Server.Token/v1/revoke', { body: { id: created.id } }));
  const revoked = await client.POST('/api/VORN.Core.FileServ.NFS/v1/get', { body: {}, ...bearer(created.token) });
  assert.equal(revoked.response.status, 401);
}

async function allPathsWereCalled() {
  const { data } = await client.GET('/openapi.json');
  assert.ok(data);
  const described = (data as { paths: Record<string, { post?: unknown }> }).paths;
  const all = Object.keys(described).filter((path) => described[path]?.post);
  assert.deepEqual(
    all.filter((path) => !called.has(path)),
    [],
    'these methods were not called',
  );
  assert.ok(all.length >= 23);
  console.log(`client: ${String(all.length)} methods called`);
}

await settings();
await versionTwo();
await advancedSettings();
await kerberos();
await idMap();
await sharePrivilege();
await shares();
await access();
await matrix();
await health();
await clients();
await history();
await revisions();
await sessions();
await tokens();
await allPathsWereCalled();
