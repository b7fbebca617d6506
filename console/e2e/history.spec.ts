import { readFile } from 'node:fs/promises';
import path from 'node:path';
import { expect, signIn, test } from './base';

test('a change is shown and undone', async ({ page, box, axe }) => {
  await box.call('VORN.Core.FileServ.NFS/v1/set', { enable_nfs: false, nfs_v4_domain: 'other.example' });
  await signIn(page, box, '/history');
  const found = page.getByRole('row', { name: /Content from before the history began/ });
  await expect(found.first()).toContainText('not recorded');
  const row = page.getByRole('row', { name: /Settings of the service/ });
  await row.getByRole('button', { name: 'Show Settings' }).click();
  const dialog = page.getByRole('dialog');
  await expect(dialog.getByText('+Domain = other.example')).toBeVisible();
  await axe();
  await dialog.getByRole('button', { name: 'Close' }).last().click();
  await row.getByRole('button', { name: 'Undo Settings' }).click();
  await expect(dialog.getByText('-Domain = other.example')).toBeVisible();
  await dialog.getByRole('button', { name: 'Undo the change' }).click();
  await expect(dialog).toBeHidden();
  await expect(page.getByRole('row', { name: /Undone change/ })).toBeVisible();
  expect(await readFile(path.join(box.root, 'etc/idmapd.conf'), 'utf8')).not.toContain('other.example');
  await axe();
});
