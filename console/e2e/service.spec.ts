import { readFile } from 'node:fs/promises';
import path from 'node:path';
import { expect, flip, reviewAndSave, signIn, test } from './base';

test('shows what saving does, and saves', async ({ page, box, axe }) => {
  await signIn(page, box, '/service');
  await flip(page.getByRole('switch', { name: 'NFS service' }));
  await page.getByRole('textbox', { name: 'NFSv4 domain' }).fill('new.example');
  await page.getByRole('button', { name: 'Review and save' }).click();
  const dialog = page.getByRole('dialog');
  await expect(dialog.getByText('The NFS service is started. Clients can mount from then on.')).toBeVisible();
  await expect(dialog.getByText('+Domain = new.example')).toBeVisible();
  await axe();
  expect(await readFile(path.join(box.root, 'etc/idmapd.conf'), 'utf8')).not.toContain('new.example');
  await dialog.getByRole('button', { name: 'Save', exact: true }).click();
  await expect(page.getByRole('heading', { name: /Saved$/ })).toBeVisible();
  expect(await readFile(path.join(box.root, 'etc/idmapd.conf'), 'utf8')).toContain('new.example');
  await expect(page.getByRole('button', { name: 'Review and save' })).toBeDisabled();
  await expect(page.getByRole('textbox', { name: 'NFSv4 domain' })).toHaveValue('new.example');
});

test.describe('a refusal', () => {
  test.use({ foreseen: [/409 \(Conflict\)/] });

  test('has its code, its reasons and a remedy, and loses nothing', async ({ page, box }) => {
    await signIn(page, box, '/advanced');
    await flip(page.getByRole('switch', { name: 'Fixed ports' }));
    await page.getByRole('spinbutton', { name: 'status daemon' }).fill('4051');
    await page.getByRole('spinbutton', { name: 'lock manager' }).fill('2049');
    await page.getByRole('button', { name: 'Review and save' }).click();
    const dialog = page.getByRole('dialog');
    await expect(dialog.getByText('Error code 2303')).toBeVisible();
    await expect(dialog.getByText('Choose a port that nothing else uses.', { exact: true })).toBeVisible();
    await expect(dialog.getByRole('button', { name: 'Save', exact: true })).toBeDisabled();
    await page.keyboard.press('Escape');
    await expect(dialog).toBeHidden();
    await expect(page.getByRole('spinbutton', { name: 'lock manager' })).toHaveValue('2049');
  });

  test('is shown while a port is typed', async ({ page, box, axe }) => {
    await signIn(page, box, '/advanced');
    await flip(page.getByRole('switch', { name: 'Fixed ports' }));
    const statd = page.getByRole('spinbutton', { name: 'status daemon' });
    const lockd = page.getByRole('spinbutton', { name: 'lock manager' });
    await statd.fill('70000');
    await expect(page.getByText('Enter a number from 1 to 65535.').first()).toBeVisible();
    await statd.fill('4051');
    await lockd.fill('4051');
    await expect(page.getByText('Both daemons need a port of their own.').first()).toBeVisible();
    await lockd.fill('2049');
    await expect(page.getByText('A port is in use by another service')).toBeVisible();
    await expect(lockd).toHaveAccessibleDescription(/^Another service uses this port\./);
    await expect(statd).toHaveAccessibleDescription('');
    await axe();
    await lockd.fill('4052');
    await expect(page.getByText('A port is in use by another service')).toBeHidden();
    await reviewAndSave(page);
    expect(await box.call('VORN.Core.FileServ.NFS.AdvancedSetting/v1/get', {})).toMatchObject({
      custom_port_enable: 1,
      statd_port: 4051,
      nlm_port: 4052,
    });
  });
});

test.describe('a change of somebody else', () => {
  test.use({ foreseen: [/412 \(Precondition Failed\)/] });

  for (const choice of ['Keep mine', 'Take what is stored'] as const) {
    test(`is shown beside mine: ${choice}`, async ({ page, box, axe }) => {
      await signIn(page, box, '/service');
      const domain = page.getByRole('textbox', { name: 'NFSv4 domain' });
      await domain.fill('mine.example');
      await box.call('VORN.Core.FileServ.NFS/v1/set', { enable_nfs: false, nfs_v4_domain: 'theirs.example' });
      await page.getByRole('button', { name: 'Review and save' }).click();
      const dialog = page.getByRole('dialog');
      await expect(dialog.getByRole('row', { name: 'NFSv4 domain mine.example theirs.example' })).toBeVisible();
      await expect(dialog.getByRole('row')).toHaveCount(2);
      await axe();
      await dialog.getByRole('button', { name: choice }).click();
      if (choice === 'Keep mine') {
        await dialog.getByRole('button', { name: 'Save', exact: true }).click();
        await expect(dialog).toBeHidden();
        await expect(domain).toHaveValue('mine.example');
      } else {
        await expect(dialog).toBeHidden();
        await expect(domain).toHaveValue('theirs.example');
      }
      const settings = await box.call('VORN.Core.FileServ.NFS/v1/get', {});
      const stored = choice === 'Keep mine' ? 'mine.example' : 'theirs.example';
      expect(settings).toMatchObject({ nfs_v4_domain: stored });
    });
  }
});

test('asks before unsaved changes are left', async ({ page, box }) => {
  await signIn(page, box, '/service');
  const domain = page.getByRole('textbox', { name: 'NFSv4 domain' });
  await domain.fill('unsaved.example');
  await page.getByRole('link', { name: 'Advanced' }).click();
  const dialog = page.getByRole('dialog');
  await expect(dialog.getByText('Leave without saving?')).toBeVisible();
  await dialog.getByRole('button', { name: 'Stay' }).click();
  await expect(domain).toHaveValue('unsaved.example');
  await page.getByRole('link', { name: 'Overview' }).click();
  await dialog.getByRole('button', { name: 'Discard the changes' }).click();
  await expect(page.getByRole('heading', { name: 'Overview' })).toBeVisible();
});
