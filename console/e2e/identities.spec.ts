import { readFile, writeFile } from 'node:fs/promises';
import path from 'node:path';
import type { Page } from '@playwright/test';
import { expect, signIn, test, type Box } from './base';

test.describe('ID mappings', () => {
  test.use({ foreseen: [/409 \(Conflict\)/] });

  test('are added, found, changed and deleted, and conflicts are named', async ({ page, box, axe }) => {
    await signIn(page, box, '/idmap');
    await page.getByRole('button', { name: 'Add mappings' }).click();
    const dialog = page.getByRole('dialog');
    const lines = dialog.getByRole('textbox', { name: 'Mappings' });
    await lines.fill('alice@STORAGE.EXAMPLE');
    await expect(dialog.getByText('These lines are no mappings: 1')).toBeVisible();
    await lines.fill('one@STORAGE.EXAMPLE, root\ntwo@STORAGE.EXAMPLE, root\n');
    await axe();
    await dialog.getByRole('button', { name: 'Review' }).click();
    await expect(dialog.getByText('+one@STORAGE.EXAMPLE = root')).toBeVisible();
    await dialog.getByRole('button', { name: 'Add', exact: true }).click();
    await expect(dialog).toBeHidden();
    await expect(page.getByRole('link', { name: 'Undo it in the history' })).toHaveAttribute('href', '#/history');

    await page.getByRole('button', { name: 'Add mappings' }).click();
    await lines.fill('new@STORAGE.EXAMPLE, root\none@STORAGE.EXAMPLE, root');
    await expect(dialog.getByText('Some principals are mapped already')).toBeVisible();
    await expect(dialog.getByRole('listitem').getByText('Line 2: one@STORAGE.EXAMPLE')).toBeVisible();
    await axe();
    await dialog.getByRole('button', { name: 'Review' }).click();
    await expect(dialog.getByText('Error code 2351')).toBeVisible();
    await expect(dialog.getByRole('listitem').getByText('one@STORAGE.EXAMPLE')).toBeVisible();
    await dialog.getByRole('button', { name: 'Cancel' }).click();
    await dialog.getByRole('button', { name: 'Cancel' }).click();

    await page.getByRole('textbox', { name: 'Filter' }).fill('two@');
    await expect(page.getByText('1 mapping', { exact: true })).toBeVisible();
    await page.getByRole('button', { name: 'Change the mapping of two@STORAGE.EXAMPLE' }).click();
    await dialog.getByRole('textbox', { name: 'Principal' }).fill('three@STORAGE.EXAMPLE');
    await dialog.getByRole('button', { name: 'Review and save' }).click();
    await dialog.getByRole('button', { name: 'Save', exact: true }).click();
    await expect(dialog).toBeHidden();
    await page.getByRole('textbox', { name: 'Filter' }).fill('three@');
    await page.getByRole('button', { name: 'Delete the mapping of three@STORAGE.EXAMPLE' }).click();
    await dialog.getByRole('button', { name: 'Delete', exact: true }).click();
    await expect(dialog).toBeHidden();
    await expect(page.getByText('No mapping', { exact: true })).toBeVisible();
    await axe();
  });
});

test('a table of many mappings scrolls to its end', async ({ page, box }) => {
  const idmap = Array.from({ length: 3000 }, (_, index) => ({
    kerberos_principal: `user${String(index).padStart(5, '0')}@STORAGE.EXAMPLE`,
    local_name: 'root',
  }));
  await box.call('VORN.Core.FileServ.NFS.IDMap/v1/create', { idmap });
  await signIn(page, box, '/idmap');
  await page.getByRole('textbox', { name: 'Filter' }).fill('user');
  await expect(page.getByText('3,000 mappings')).toBeVisible();
  const rows = page.getByRole('region', { name: 'ID mappings' });
  await rows.evaluate((box) => {
    box.scrollTop = box.scrollHeight;
  });
  await expect(page.getByText('user02999@STORAGE.EXAMPLE')).toBeVisible();
  expect(await rows.getByRole('row').count()).toBeLessThan(80);
});

test('a CSV file is dragged or chosen, and cleared', async ({ page, box }) => {
  await signIn(page, box, '/idmap');
  await page.getByRole('button', { name: 'Add mappings' }).click();
  const dialog = page.getByRole('dialog');
  const lines = dialog.getByRole('textbox', { name: 'Mappings' });
  const name = dialog.getByRole('textbox', { name: 'CSV file' });
  const field = page.locator('[class*=file-upload]').first();
  const dataTransfer = await page.evaluateHandle(() => {
    const transfer = new DataTransfer();
    transfer.items.add(new File(['one@STORAGE.EXAMPLE, root\n'], 'dragged.csv'));
    return transfer;
  });
  await field.dispatchEvent('dragenter', { dataTransfer });
  await expect(field).toHaveClass(/drag-hover/);
  await field.dispatchEvent('drop', { dataTransfer });
  await expect(field).not.toHaveClass(/drag-hover/);
  await expect(name).toHaveValue('dragged.csv');
  await expect(lines).toHaveValue('one@STORAGE.EXAMPLE, root\n');
  for (const attempt of ['first', 'again']) {
    await dialog.getByRole('button', { name: 'Clear' }).click();
    await expect(lines, attempt).toHaveValue('');
    const chooser = page.waitForEvent('filechooser');
    await dialog.getByRole('button', { name: 'Choose' }).click();
    const csv = { name: 'chosen.csv', mimeType: 'text/csv', buffer: Buffer.from('two@STORAGE.EXAMPLE, root\n') };
    await (await chooser).setFiles(csv);
    await expect(name).toHaveValue('chosen.csv');
    await expect(lines, attempt).toHaveValue('two@STORAGE.EXAMPLE, root\n');
  }
});

test.describe('a keytab', () => {
  test.use({ foreseen: [/422 \(/] });

  test('is installed, and another file is refused', async ({ page, box, axe }) => {
    await signIn(page, box, '/kerberos');
    await expect(page.getByText('No keytab is installed yet.')).toBeVisible();
    const chooser = page.locator('input[type=file]');
    await chooser.setInputFiles({ name: 'wrong', mimeType: 'text/plain', buffer: Buffer.from('no keytab') });
    const dialog = page.getByRole('dialog');
    await expect(dialog.getByText('Error code 2331')).toBeVisible();
    await dialog.getByRole('button', { name: 'Cancel' }).click();
    await chooser.setInputFiles(box.keytab);
    await expect(dialog.getByText('nfs/box.example@STORAGE.EXAMPLE').first()).toBeVisible();
    await axe();
    await dialog.getByRole('button', { name: 'Install' }).click();
    await expect(dialog).toBeHidden();
    await expect(page.getByRole('row', { name: 'nfs/box.example@STORAGE.EXAMPLE 1 aes256' })).toBeVisible();
    await axe();
    // Whether its principal fits the name of the box.
    await expect(page.getByRole('heading', { name: 'The name cannot be checked' })).toBeVisible();
    const nameBox = async (name: string) => {
      await writeFile(path.join(box.root, 'etc/hostname'), `${name}\n`);
      await page.reload();
    };
    await nameBox('box.example');
    await expect(page.getByText('The keytab has a key for the name of the box.')).toBeVisible();
    await nameBox('other.example');
    await expect(page.getByRole('heading', { name: 'The keytab has no key for the name of the box' })).toBeVisible();
    await axe();
  });
});

test('a token is shown once, and revoked', async ({ page, box, axe }) => {
  await signIn(page, box, '/people');
  await expect(page.getByText('this session')).toBeVisible();
  await page.getByRole('button', { name: 'Create a token' }).click();
  const dialog = page.getByRole('dialog');
  await dialog.getByRole('textbox', { name: 'Name' }).fill('backup');
  await dialog.getByRole('textbox', { name: 'Only these APIs' }).fill('VORN.Core.FileServ.NFS.SharePrivilege');
  await dialog.getByRole('textbox', { name: 'Only these shared folders' }).fill('media, data');
  await axe();
  await dialog.getByRole('button', { name: 'Create', exact: true }).click();
  await expect(dialog.getByRole('textbox', { name: 'Token' })).toHaveValue(/^vorn_[0-9a-f]{72}$/);
  await dialog.getByRole('button', { name: 'I have copied it' }).click();
  await expect(page.getByRole('row', { name: /^backup Reader/ })).toContainText(
    'VORN.Core.FileServ.NFS.SharePrivilege, media, data',
  );
  await axe();
  await page.getByRole('button', { name: 'Revoke backup' }).click();
  await dialog.getByRole('button', { name: 'Revoke' }).click();
  await expect(dialog).toBeHidden();
  await expect(page.getByText('There are no tokens.')).toBeVisible();
});

/** Bytes a second: a file of 900 kB is on its way for 50 seconds, and the server does not refuse the rate. */
const SLOW = 18_000;

/** Lets the page send this number of bytes a second; -1 is as many as it can. */
async function limitUpload(page: Page, uploadThroughput: number) {
  const network = await page.context().newCDPSession(page);
  const latency = { offline: false, latency: 0, downloadThroughput: -1 };
  await network.send('Network.emulateNetworkConditions', { ...latency, uploadThroughput });
}

test('the upload of a keytab shows its progress, and can be given up', async ({ page, box, axe }) => {
  test.skip(Boolean(process.env.VORN_SLOW), 'it sets the speed of the network itself');
  await signIn(page, box, '/kerberos');
  await limitUpload(page, SLOW);
  const chooser = page.locator('input[type=file]');
  await chooser.setInputFiles({ name: 'large', mimeType: 'text/plain', buffer: Buffer.alloc(900_000) });
  const dialog = page.getByRole('dialog');
  const progress = dialog.getByRole('progressbar', { name: 'Sending the file' });
  await expect(progress).toHaveAttribute('aria-valuenow', /^[1-9]\d?$/);
  await expect(dialog.getByText(/^[1-9]\d?%$/)).toBeVisible();
  await axe();
  const ended = page.waitForEvent('requestfailed');
  await dialog.getByRole('button', { name: 'Cancel' }).click();
  await expect(dialog).toBeHidden();
  expect((await ended).url()).toContain('/upload_key');
  await limitUpload(page, -1);
  await chooser.setInputFiles(box.keytab);
  await expect(dialog.getByText('nfs/box.example@STORAGE.EXAMPLE').first()).toBeVisible();
  await expect(progress).toHaveCount(0);
});

const keysOf = async (box: Box) => {
  const { keytab } = (await box.call('VORN.Core.FileServ.NFS.Kerberos/v1/list', {})) as { keytab: unknown[] };
  return keytab.length;
};

test('the installation of a keytab can be given up while it is being sent', async ({ page, box }) => {
  test.skip(Boolean(process.env.VORN_SLOW), 'it sets the speed of the network itself');
  const hole = Buffer.alloc(900_000);
  hole.writeInt32BE(4 - hole.length); // a negative length: the place of a deleted entry
  const large = Buffer.concat([await readFile(box.keytab), hole]);
  await signIn(page, box, '/kerberos');
  const chooser = page.locator('input[type=file]');
  await chooser.setInputFiles({ name: 'large', mimeType: 'text/plain', buffer: large });
  const dialog = page.getByRole('dialog');
  const install = dialog.getByRole('button', { name: 'Install' });
  await expect(install).toBeEnabled();
  await limitUpload(page, SLOW);
  await install.click();
  const progress = dialog.getByRole('progressbar', { name: 'Sending the file' });
  await expect(progress).toHaveAttribute('aria-valuenow', /^[1-9]\d?$/);
  const ended = page.waitForEvent('requestfailed');
  await dialog.getByRole('button', { name: 'Cancel' }).click();
  await expect(dialog).toBeHidden();
  expect((await ended).url()).toMatch(/\/upload_key$/);
  expect(await keysOf(box)).toBe(0);
  await expect(page.getByText('No keytab is installed yet.')).toBeVisible();
});

test('the installation of a keytab cannot be given up once it is sent', async ({ page, box }) => {
  await signIn(page, box, '/kerberos');
  await page.locator('input[type=file]').setInputFiles(box.keytab);
  const dialog = page.getByRole('dialog');
  const install = dialog.getByRole('button', { name: 'Install' });
  await expect(install).toBeEnabled();
  process.kill(box.process, 'SIGSTOP'); // the call is sent, and not answered
  await install.click();
  await expect(dialog.getByRole('button', { name: 'Cancel' })).toBeDisabled();
  await page.keyboard.press('Escape');
  await expect(dialog).toBeVisible();
  process.kill(box.process, 'SIGCONT');
  await expect(dialog).toBeHidden();
  expect(await keysOf(box)).toBe(1);
  await expect(page.getByText('The keytab is installed')).toBeVisible();
});
