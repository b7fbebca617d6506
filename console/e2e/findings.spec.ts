import { enterAsReader, expect, picture, signIn, test } from './base';

const MAPPING = { idmap: [{ kerberos_principal: 'root@STORAGE.EXAMPLE', local_name: 'root' }] };

test('a rehearsal warns of what a change leads to, and tells what it settles @view', async ({ page, box, axe }, {
  project,
}) => {
  await signIn(page, box, '/shares/media');
  const menu = async (rule: RegExp, item: string) => {
    await page.getByRole('button', { name: rule }).click();
    await page.getByRole('menuitem', { name: item, exact: true }).click();
  };
  const dialog = page.getByRole('dialog');
  await menu(/Actions of rule 1/, 'Copy');
  await dialog.getByRole('textbox', { name: 'Client' }).fill('10.20.5.0/24');
  await dialog.getByRole('combobox', { name: 'Access' }).selectOption('read and write');
  await dialog.getByRole('button', { name: 'Add the rule' }).click();
  await page.getByRole('button', { name: 'Review and save' }).click();
  await expect(dialog.getByRole('heading', { name: 'A rule has no effect' })).toBeVisible();
  await expect(dialog.getByText(/the earlier rule for 10\.20\.0\.0\/16 .* decides/)).toBeVisible();
  await expect(dialog.getByText('What the change settles')).toHaveCount(0);
  await picture(page, 'rehearsal', project.name);
  await axe();
  await dialog.getByRole('button', { name: 'Save', exact: true }).click();
  await expect(dialog).toBeHidden();
  await menu(/Actions of rule 3/, 'Move up');
  await menu(/Actions of rule 2/, 'Move up');
  await page.getByRole('button', { name: 'Review and save' }).click();
  await expect(dialog.getByRole('heading', { name: 'What the change settles' })).toBeVisible();
  await expect(dialog.getByRole('listitem').filter({ hasText: 'the earlier rule for 10.20.0.0/16' })).toBeVisible();
  await expect(dialog.getByRole('heading', { name: 'A rule has no effect' })).toHaveCount(0);
});

test('a finding has its remedy one click away', async ({ page, box, axe }) => {
  await box.call('VORN.Core.FileServ.NFS.IDMap/v1/create', MAPPING);
  await signIn(page, box);
  const finding = page.getByRole('heading', { name: 'A principal is mapped to the superuser' });
  await expect(finding).toBeVisible();
  await page.getByRole('button', { name: 'Look at the remedy' }).click();
  const dialog = page.getByRole('dialog');
  await expect(dialog.getByText('-root@STORAGE.EXAMPLE = root')).toBeVisible();
  await expect(dialog.getByRole('heading', { name: 'What the change settles' })).toBeVisible();
  await axe();
  await dialog.getByRole('button', { name: 'Carry it out' }).click();
  await expect(dialog).toBeHidden();
  await expect(finding).toHaveCount(0);
});

test('a reader sees findings and carries nothing out', async ({ page, box }) => {
  await box.call('VORN.Core.FileServ.NFS.IDMap/v1/create', MAPPING);
  await enterAsReader(page, box, '/');
  await expect(page.getByRole('heading', { name: 'A principal is mapped to the superuser' })).toBeVisible();
  await expect(page.getByRole('button', { name: 'Look at the remedy' })).toHaveCount(0);
});
