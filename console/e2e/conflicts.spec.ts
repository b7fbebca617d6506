import { copyFile, readFile } from 'node:fs/promises';
import path from 'node:path';
import { expect, open, signIn, test, type Box } from './base';

// Somebody else changes what a dialog is about while it is open.
test.use({ foreseen: [/412 \(Precondition Failed\)/] });

const IDMAP = 'VORN.Core.FileServ.NFS.IDMap/v1';
const mappings = async (box: Box) => {
  const { idmap } = (await box.call(`${IDMAP}/list`, {})) as { idmap: { id: string; local_name: string }[] };
  return idmap.map(({ id, local_name }) => `${id} ${local_name}`);
};

test('a mapping that is changed: both are shown', async ({ page, box, axe }) => {
  const idmap = ['one', 'other'].map((name) => ({ kerberos_principal: `${name}@STORAGE.EXAMPLE`, local_name: 'root' }));
  await box.call(`${IDMAP}/create`, { idmap });
  await signIn(page, box, '/idmap');
  const dialog = page.getByRole('dialog');
  const edit = async () => {
    await page.getByRole('button', { name: 'Change the mapping of one@STORAGE.EXAMPLE' }).click();
    await dialog.getByRole('textbox', { name: 'Principal' }).fill('mine@STORAGE.EXAMPLE');
  };
  const change = (id: string, user: string) =>
    box.call(`${IDMAP}/set`, { id, kerberos_principal: id, local_name: user });
  // A change of another mapping is no conflict.
  await edit();
  await change('other@STORAGE.EXAMPLE', 'carol');
  await dialog.getByRole('button', { name: 'Review and save' }).click();
  await expect(dialog.getByText('+mine@STORAGE.EXAMPLE = root')).toBeVisible();
  await dialog.getByRole('button', { name: 'Cancel' }).click();
  await change('one@STORAGE.EXAMPLE', 'carol');
  await dialog.getByRole('button', { name: 'Review and save' }).click();
  await expect(dialog.getByRole('row', { name: 'User of the box root carol' })).toBeVisible();
  await axe();
  await dialog.getByRole('button', { name: 'Take what is stored' }).click();
  await expect(dialog).toBeHidden();
  expect(await mappings(box)).toContain('one@STORAGE.EXAMPLE carol');
  await edit();
  await change('one@STORAGE.EXAMPLE', 'root');
  await dialog.getByRole('button', { name: 'Review and save' }).click();
  await dialog.getByRole('button', { name: 'Keep mine' }).click();
  await dialog.getByRole('button', { name: 'Save', exact: true }).click();
  await expect(dialog).toBeHidden();
  expect(await mappings(box)).toContain('mine@STORAGE.EXAMPLE carol');
});

test('a mapping that is deleted: both are shown', async ({ page, box }) => {
  await box.call(`${IDMAP}/create`, { idmap: [{ kerberos_principal: 'one@STORAGE.EXAMPLE', local_name: 'root' }] });
  await signIn(page, box, '/idmap');
  await page.getByRole('button', { name: 'Delete the mapping of one@STORAGE.EXAMPLE' }).click();
  const dialog = page.getByRole('dialog');
  await expect(dialog.getByText('-one@STORAGE.EXAMPLE = root')).toBeVisible();
  await box.call(`${IDMAP}/set`, {
    id: 'one@STORAGE.EXAMPLE',
    kerberos_principal: 'one@STORAGE.EXAMPLE',
    local_name: 'carol',
  });
  await dialog.getByRole('button', { name: 'Delete', exact: true }).click();
  await expect(dialog.getByRole('row', { name: 'User of the box none carol' })).toBeVisible();
  await dialog.getByRole('button', { name: 'Keep mine' }).click();
  await dialog.getByRole('button', { name: 'Delete', exact: true }).click();
  await expect(dialog).toBeHidden();
  expect(await mappings(box)).toEqual([]);
});

test('the list of shared folders', async ({ page, box, axe }) => {
  await signIn(page, box, '/shares');
  const dialog = page.getByRole('dialog');
  await page.getByRole('button', { name: 'Share a folder' }).click();
  await dialog.getByRole('textbox', { name: 'Name' }).fill('photos');
  await dialog.getByRole('textbox', { name: 'Folder on the box' }).fill('/volume1/photos');
  await box.call('VORN.Core.Share/v1/delete', { name: 'data' });
  await dialog.getByRole('button', { name: 'Review' }).click();
  await expect(dialog.getByRole('row', { name: /^photos \/volume1\/photos –$/ })).toBeVisible();
  await expect(
    dialog.getByRole('row', { name: /^data \/volume1\/data, no rules, nobody may mount it –$/ }),
  ).toBeVisible();
  await expect(dialog.getByRole('row')).toHaveCount(3);
  await axe();
  await dialog.getByRole('button', { name: 'Go on with mine' }).click();
  await dialog.getByRole('button', { name: 'Share the folder' }).click();
  await expect(page.getByRole('heading', { name: 'photos' })).toBeVisible();
  await open(page, '/shares');
  await page.getByRole('button', { name: 'Stop sharing photos' }).click();
  await expect(dialog.getByText('-photos = /volume1/photos')).toBeVisible();
  await box.call('VORN.Core.Share/v1/create', { name: 'data', path: '/volume1/data' });
  await dialog.getByRole('button', { name: 'Stop sharing' }).click();
  await expect(dialog.getByRole('row', { name: /^data – \/volume1\/data/ })).toBeVisible();
  await dialog.getByRole('button', { name: 'Give mine up' }).click();
  await expect(dialog).toBeHidden();
  await expect(page.getByRole('link', { name: 'photos' })).toBeVisible();
  await expect(page.getByRole('link', { name: 'data', exact: true })).toBeVisible();
});

test('the history of which a change is undone', async ({ page, box }) => {
  const domain = (name: string) =>
    box.call('VORN.Core.FileServ.NFS/v1/set', { enable_nfs: false, nfs_v4_domain: `${name}.example` });
  await domain('first');
  await signIn(page, box, '/history');
  await page.getByRole('button', { name: 'Undo Settings' }).click();
  const dialog = page.getByRole('dialog');
  await expect(dialog.getByText('-Domain = first.example')).toBeVisible();
  await box.call('VORN.Core.Share/v1/delete', { name: 'data' });
  await dialog.getByRole('button', { name: 'Undo the change' }).click();
  await expect(dialog.getByRole('row', { name: /Shared folder no longer shared – .*shares\.conf/ })).toBeVisible();
  await dialog.getByRole('button', { name: 'Go on with mine' }).click();
  await dialog.getByRole('button', { name: 'Undo the change' }).click();
  await expect(dialog).toBeHidden();
  expect(await readFile(path.join(box.root, 'etc/idmapd.conf'), 'utf8')).not.toContain('first.example');
});

test('a keytab', async ({ page, box }) => {
  await signIn(page, box, '/kerberos');
  await page.locator('input[type=file]').setInputFiles(box.keytab);
  const dialog = page.getByRole('dialog');
  await expect(dialog.getByText('nfs/box.example@STORAGE.EXAMPLE').first()).toBeVisible();
  await copyFile(box.keytab, path.join(box.root, 'etc/nfs/krb5.keytab'));
  await dialog.getByRole('button', { name: 'Install' }).click();
  await expect(
    dialog.getByRole('row', { name: 'Keytab nfs.keytab nfs/box.example@STORAGE.EXAMPLE (1)' }),
  ).toBeVisible();
  await dialog.getByRole('button', { name: 'Keep mine' }).click();
  await dialog.getByRole('button', { name: 'Install' }).click();
  await expect(dialog).toBeHidden();
});
