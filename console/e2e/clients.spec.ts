import { readFile } from 'node:fs/promises';
import { enterAsReader, expect, picture, signIn, test } from './base';
import { addClient, controlOf, recordMount, refuseAddress, refuseFolder, removeClient } from './kernel';

test('shows who uses what, who was turned away and why @view', async ({ page, box, axe }, { project }) => {
  await addClient(box, 8, '10.0.0.6');
  await recordMount(box, '10.0.0.9', '/volume1/media');
  await refuseAddress(box, '10.7.7.7');
  await refuseFolder(box, '10.0.0.0/24', '/volume1/backup');
  await signIn(page, box, '/clients');
  const row = (client: string) => page.getByRole('row').filter({ hasText: client });
  await expect(page.getByText('4 clients', { exact: true })).toBeVisible();
  const worker = row('10.0.0.5');
  await expect(worker).toContainText('Linux NFSv4.2 work05.example.net');
  await expect(worker).toContainText('NFSv4.2');
  await expect(worker).toContainText('/volume1/data');
  await expect(worker).toContainText('/volume1/backup turned away No rule of this folder admits this client.');
  await expect(worker.getByRole('gridcell', { name: /^(Open files )?2$/ })).toBeVisible();
  await expect(worker.getByRole('gridcell', { name: /^(Locks )?1$/ })).toBeVisible();
  await expect(row('10.0.0.9')).toContainText('not connected');
  await expect(row('10.0.0.9').getByRole('gridcell', { name: 'not visible' })).toHaveCount(2);
  await expect(row('10.0.0.9').getByRole('button', { name: /^Disconnect/ })).toHaveCount(0);
  await expect(row('10.7.7.7')).toContainText('No rule admits this client.');
  await page.getByRole('button', { name: 'What the box cannot see' }).click();
  await picture(page, 'clients-of-a-box', project.name);
  await axe();
  await worker.getByRole('button', { name: 'Details of 10.0.0.5' }).click();
  const dialog = page.getByRole('dialog');
  await expect(dialog).toContainText('Linux 6.1.0-18-amd64');
  const data = dialog.getByRole('row').filter({ hasText: '/volume1/data' });
  await expect(data).toContainText('10.0.0.0/24');
  await expect(data.getByRole('gridcell', { name: /^(Read )?4 KiB$/ })).toBeVisible();
  await expect(data.getByRole('gridcell', { name: /^(Written )?1 MiB$/ })).toBeVisible();
  await picture(page, 'client', project.name);
  await axe();
  await dialog.getByRole('link', { name: 'What may this client do, and why?' }).click();
  await expect(page.getByRole('textbox', { name: /^Client/ })).toHaveValue('10.0.0.5');
});

test('finds a client among many, and turns pages', async ({ page, box }) => {
  for (let id = 100; id < 145; id += 1) await addClient(box, id, `10.1.0.${id}`);
  await signIn(page, box, '/clients');
  await expect(page.getByText('46 clients', { exact: true })).toBeVisible();
  await expect(page.getByRole('row')).toHaveCount(21);
  const pages = page.getByRole('navigation', { name: 'Pages of the clients' });
  await pages.getByRole('button', { name: 'Next page' }).click();
  await expect(page.getByRole('button', { name: 'Details of 10.1.0.119' })).toBeVisible();
  await pages.getByRole('button', { name: 'Last page' }).click();
  await expect(page.getByRole('row')).toHaveCount(7);
  await page.getByRole('textbox', { name: 'Search' }).fill('10.1.0.14');
  await expect(page.getByText('5 clients', { exact: true })).toBeVisible();
  await expect(page.getByRole('row')).toHaveCount(6);
  await page.getByRole('textbox', { name: 'Search' }).fill('nobody');
  await expect(page.getByText('No client matches')).toBeVisible();
  await page.getByRole('button', { name: 'Reset' }).click();
  await removeClient(box, 144);
  await page.getByRole('button', { name: 'Refresh' }).click();
  await expect(page.getByText('45 clients', { exact: true })).toBeVisible();
});

test('disconnects a client after saying what it will notice', async ({ page, box, axe }) => {
  await addClient(box, 8, '10.0.0.6');
  await signIn(page, box, '/clients');
  await page.getByRole('button', { name: 'Disconnect 10.0.0.5' }).click();
  const dialog = page.getByRole('dialog');
  await expect(dialog).toContainText('2 open files, 1 lock');
  await expect(dialog).toContainText('gets its files and locks again');
  await expect(dialog).toContainText('This does not keep the client out.');
  await expect(dialog).toContainText('The client loses its open files and locks.');
  await axe();
  expect(await readFile(controlOf(box, 7), 'utf8')).toBe('');
  await dialog.getByRole('button', { name: 'Disconnect' }).click();
  await expect(dialog).toBeHidden();
  await expect(page.getByText('The client was disconnected')).toBeVisible();
  expect(await readFile(controlOf(box, 7), 'utf8')).toBe('expire\n');
  expect(await readFile(controlOf(box, 8), 'utf8')).toBe('');
});

test.describe('a client that has left', () => {
  test.use({ foreseen: [/404 \(/] });

  test('is not disconnected', async ({ page, box }) => {
    await signIn(page, box, '/clients');
    await page.getByRole('button', { name: 'Disconnect 10.0.0.5' }).click();
    const dialog = page.getByRole('dialog');
    await expect(dialog).toContainText('The client is disconnected.');
    await removeClient(box, 7);
    await dialog.getByRole('button', { name: 'Disconnect' }).click();
    await expect(dialog.getByText('Error code 2395')).toBeVisible();
    await expect(dialog.getByText('Reload the page: the client has gone meanwhile.')).toBeVisible();
  });
});

test('a reader sees the clients and disconnects none', async ({ page, box }) => {
  await enterAsReader(page, box, '/clients');
  await expect(page.getByText('You may look, but not change anything')).toBeVisible();
  await expect(page.getByRole('button', { name: 'Details of 10.0.0.5' })).toBeVisible();
  await expect(page.getByRole('button', { name: /^Disconnect/ })).toHaveCount(0);
});
