import { readFile } from 'node:fs/promises';
import path from 'node:path';
import { expect, picture, reviewAndSave, signIn, test, type Box } from './base';

const exportsOf = (box: Box) => readFile(path.join(box.root, 'etc/exports'), 'utf8');

test('a rule is added, shown as a line of exports(5), and saved', async ({ page, box, axe }) => {
  await signIn(page, box, '/shares');
  await page.getByRole('textbox', { name: 'Search' }).fill('dat');
  await expect(page.getByRole('row')).toHaveCount(2);
  await page.getByRole('link', { name: 'data', exact: true }).click();
  await expect(page.getByText('Nobody may mount this folder')).toBeVisible();
  await page.getByRole('button', { name: 'Add a rule' }).click();
  const form = page.getByRole('dialog', { name: 'New rule' });
  const client = form.getByRole('textbox', { name: 'Client' });
  await client.fill('10.0.0.0/33');
  await expect(form.getByText('This is no host name, address or network.')).toBeVisible();
  await expect(form.getByRole('button', { name: 'Add the rule' })).toBeDisabled();
  await client.fill('10.0.0.0/24');
  await expect(form.getByText('A network with 256 addresses.')).toBeVisible();
  await form.getByRole('combobox', { name: 'Access' }).selectOption('read and write');
  await axe();
  await form.getByRole('button', { name: 'Add the rule' }).click();
  await expect(page.getByRole('region', { name: 'Lines of exports(5)' })).toContainText(
    '/volume1/data 10.0.0.0/24(rw,',
  );
  await expect(page.getByRole('textbox', { name: 'Mount command' })).toHaveValue(
    'mount -t nfs 127.0.0.1:/volume1/data /mnt/data',
  );
  await axe();
  expect(await exportsOf(box)).not.toContain('/volume1/data');
  await page.getByRole('button', { name: 'Review and save' }).click();
  const effects = page.getByRole('dialog').getByRole('listitem');
  await expect(effects.filter({ hasText: '10.0.0.0/24' })).toContainText('gets access');
  await expect(effects.filter({ hasText: 'work05.example.net (10.0.0.5)' })).toContainText('gets access');
  await page.getByRole('dialog').getByRole('button', { name: 'Save', exact: true }).click();
  await expect(page.getByRole('dialog')).toBeHidden();
  expect(await exportsOf(box)).toContain('/volume1/data 10.0.0.0/24(rw,');
});

test('rules are copied, moved and deleted', async ({ page, box }) => {
  await signIn(page, box, '/shares/media');
  const menu = async (rule: RegExp, item: string) => {
    await page.getByRole('button', { name: rule }).click();
    await page.getByRole('menuitem', { name: item, exact: true }).click();
  };
  await menu(/Actions of rule 1/, 'Copy');
  const form = page.getByRole('dialog', { name: 'New rule' });
  await form.getByRole('textbox', { name: 'Client' }).fill('10.20.5.0/24');
  await expect(form.getByText('Rule 1 (10.20.0.0/16) decides for the clients of both.')).toBeVisible();
  await form.getByRole('button', { name: 'Add the rule' }).click();
  await menu(/Actions of rule 3/, 'Move up');
  await menu(/Actions of rule 2/, 'Move up');
  await menu(/Actions of rule 3/, 'Delete');
  await reviewAndSave(page);
  const { rule } = (await box.call('VORN.Core.FileServ.NFS.SharePrivilege/v1/load', { share_name: 'media' })) as {
    rule: { client: string }[];
  };
  expect(rule.map(({ client }) => client)).toEqual(['10.20.5.0/24', '10.20.0.0/16']);
  expect(await exportsOf(box)).toContain('# The render farm');
});

test('a folder is shared, and no longer', async ({ page, box, axe }) => {
  await signIn(page, box, '/shares');
  await page.getByRole('button', { name: 'Share a folder' }).click();
  const dialog = page.getByRole('dialog');
  await dialog.getByRole('textbox', { name: 'Name' }).fill('photos');
  await dialog.getByRole('textbox', { name: 'Folder on the box' }).fill('/volume1/photos');
  await dialog.getByRole('button', { name: 'Review' }).click();
  await expect(dialog.getByText('/etc/vorn/shares.conf')).toBeVisible();
  await axe();
  await dialog.getByRole('button', { name: 'Share the folder' }).click();
  await expect(page.getByRole('heading', { name: 'photos' })).toBeVisible();
  await page.getByRole('navigation', { name: 'Path' }).getByRole('link', { name: 'Shared folders' }).click();
  await page.getByRole('button', { name: 'Stop sharing photos' }).click();
  await dialog.getByRole('button', { name: 'Stop sharing' }).click();
  await expect(dialog).toBeHidden();
  await expect(page.getByRole('link', { name: 'photos' })).toHaveCount(0);
});

test.describe('refusals', () => {
  test.use({ foreseen: [/4(04|09|22) \(|500 \(/] });

  test('a folder that does not exist is named', async ({ page, box }) => {
    await signIn(page, box, '/shares');
    await page.getByRole('button', { name: 'Share a folder' }).click();
    const dialog = page.getByRole('dialog');
    await dialog.getByRole('textbox', { name: 'Name' }).fill('none');
    await dialog.getByRole('textbox', { name: 'Folder on the box' }).fill('/volume1/none');
    await dialog.getByRole('button', { name: 'Review' }).click();
    await expect(dialog.getByText('Error code 2374')).toBeVisible();
    await expect(dialog.getByText('Check the path. The folder must exist on the box.')).toBeVisible();
    await dialog.getByRole('button', { name: 'Cancel' }).click();
    await expect(dialog.getByRole('textbox', { name: 'Folder on the box' })).toHaveValue('/volume1/none');
  });

  test('a shared folder that is not there is named', async ({ page, box }) => {
    await signIn(page, box, '/shares/nothing');
    await expect(page.getByText('Error code 2370')).toBeVisible();
  });
});

test('explains why a client cannot mount a folder', async ({ page, box, axe }) => {
  await signIn(page, box, '/access');
  await page.getByRole('textbox', { name: /^Client/ }).fill('10.20.0.5');
  await page.getByRole('button', { name: 'Check', exact: true }).click();
  await expect(page.getByRole('row', { name: /^media (cannot mount|read only) 10\.20\.0\.0\/16/ })).toBeVisible();
  await expect(page.getByRole('row', { name: /^data cannot mount none/ })).toBeVisible();
  await page.getByRole('button', { name: 'Why has the client these rights in data?' }).click();
  await expect(page.getByRole('heading', { name: 'The client cannot mount the folder' })).toBeVisible();
  await expect(page.getByRole('grid', { name: 'Conditions' }).getByText('failed').first()).toBeVisible();
  await axe();
});

test('shows the rights of all clients of a folder side by side @view', async ({ page, box, axe }, { project }) => {
  await box.call('VORN.Core.FileServ.NFS/v1/set', { enable_nfs: true });
  await signIn(page, box, '/shares/media');
  await page.getByRole('link', { name: 'Who can get in, and why can a client not mount it?' }).click();
  const folder = page.getByRole('combobox', { name: 'Shared folder' });
  await expect(folder).toHaveValue('media');
  await folder.selectOption('backup');
  await expect(page.getByRole('grid', { name: 'Who can get into backup' })).toBeVisible();
  await folder.selectOption('media');
  const row = page
    .getByRole('grid', { name: 'Who can get into media' })
    .getByRole('row')
    .filter({ hasText: '10.20.0.0/16' });
  await expect(row.getByRole('gridcell', { name: /^(sys )?read only$/ })).toBeVisible();
  await expect(row.getByRole('gridcell', { name: /^(krb5[ip]? )?cannot mount$/ })).toHaveCount(3);
  await picture(page, 'share-access', project.name);
  await axe();
  await row.getByRole('button', { name: 'Why has 10.20.0.0/16 these rights?' }).click();
  await expect(page.getByRole('heading', { name: 'The client can mount the folder' })).toBeVisible();
  await expect(page.getByRole('textbox', { name: /^Client/ })).toHaveValue('10.20.0.1');
  await expect(row).toBeVisible();
});
