import type { Locator, Page } from '@playwright/test';
import { enterAsReader, expect, reviewAndSave, signIn, test } from './base';

test.describe('without a session', () => {
  test.use({ foreseen: [/401 \(Unauthorized\)|503 \(Service Unavailable\)/] });

  test('asks for an account, and says why it is refused', async ({ page, box, axe }) => {
    await page.goto(box.url);
    await expect(page.getByRole('heading', { name: 'Sign in to the storage console' })).toBeVisible();
    await axe();
    await page.getByLabel('Account').fill('nobody-of-this-name');
    await page.getByLabel('Password').fill('Passphrase-of-nobody');
    await page.getByRole('button', { name: 'Sign in' }).click();
    await expect(page.getByText('Signing in failed')).toBeVisible();
    await expect(page.getByText(/Error code (401|503)/)).toBeVisible();
    await expect(page.getByLabel('Password')).toHaveValue('');
  });

  test('a code signs in once', async ({ page, box, context }) => {
    await signIn(page, box);
    expect(page.url()).not.toContain('code');
    await expect(page.getByRole('heading', { name: 'Overview' })).toBeVisible();
    const other = await context.newPage();
    await other.goto(`${box.url}#code=${box.code}`);
    await expect(other.getByText('Signing in failed')).toBeVisible();
  });

  test('signing out ends the session', async ({ page, box }) => {
    await signIn(page, box);
    const token = await page.evaluate(() => sessionStorage.getItem('session'));
    await page.getByRole('button', { name: 'Sign out' }).click();
    await expect(page.getByRole('heading', { name: 'Sign in to the storage console' })).toBeVisible();
    expect(await page.evaluate(() => sessionStorage.getItem('session'))).toBeNull();
    const answer = await fetch(`${box.url}api`, { headers: { Authorization: `Bearer ${token ?? ''}` } });
    expect(answer.status).toBe(401);
  });

  test('the end of a session keeps what was typed', async ({ page, box, axe }) => {
    await signIn(page, box, '/service');
    await page.getByRole('textbox', { name: 'NFSv4 domain' }).fill('typed.example');
    const [session] = (await box.call('VORN.Server.Session/v1/list', {})) as [{ id: string }];
    await box.call('VORN.Server.Session/v1/end', { id: session.id });
    await page.getByRole('button', { name: 'Review and save' }).click();
    await expect(page.getByRole('dialog', { name: 'Your session has ended' })).toBeVisible();
    await axe();
  });
});

test.describe('over TLS, with an account and its password', () => {
  test.use({ tls: true, ignoreHTTPSErrors: true, foreseen: [/401 \(Unauthorized\)/] });

  const fill = async (form: Page | Locator, account: string, password: string) => {
    await form.getByLabel('Account').fill(account);
    await form.getByLabel('Password').fill(password);
    await form.getByRole('button', { name: 'Sign in' }).click();
  };

  test('the session is a cookie that scripts cannot read, until the sign-out', async ({ page, box, context }) => {
    await page.goto(box.url);
    await fill(page, 'alice', 'Passphrase-of-bob');
    await expect(page.getByText('Error code 401')).toBeVisible();
    await fill(page, 'alice', 'Passphrase-of-alice');
    await expect(page.getByRole('heading', { name: 'Overview' })).toBeVisible();
    await expect(page.getByText('alice')).toBeVisible();
    const [cookie] = await context.cookies();
    expect(cookie).toMatchObject({ name: '__Host-vorn-session', secure: true, httpOnly: true, sameSite: 'Strict' });
    expect(await page.evaluate(() => document.cookie)).toBe('');
    expect(await page.evaluate(() => sessionStorage.length)).toBe(0);
    await page.reload();
    await expect(page.getByRole('heading', { name: 'Overview' })).toBeVisible();

    await page.getByRole('button', { name: 'Sign out' }).click();
    await expect(page.getByRole('heading', { name: 'Sign in to the storage console' })).toBeVisible();
    expect(await context.cookies()).toEqual([]);
    await context.addCookies([cookie as NonNullable<typeof cookie>]);
    await page.reload();
    await expect(page.getByRole('heading', { name: 'Sign in to the storage console' })).toBeVisible();
  });

  test('a reader may look only', async ({ page, box }) => {
    await page.goto(`${box.url}#/service`);
    await fill(page, 'bob', 'Passphrase-of-bob');
    await expect(page.getByText('You may look, but not change anything')).toBeVisible();
  });

  test('when the session has ended, the password lets the work go on', async ({ page, box }) => {
    await page.goto(`${box.url}#/service`);
    await fill(page, 'alice', 'Passphrase-of-alice');
    const domain = page.getByRole('textbox', { name: 'NFSv4 domain' });
    await domain.fill('typed.example');
    const [session] = (await box.call('VORN.Server.Session/v1/list', {})) as [{ id: string }];
    await box.call('VORN.Server.Session/v1/end', { id: session.id });
    await page.getByRole('button', { name: 'Review and save' }).click();
    const dialog = page.getByRole('dialog', { name: 'Your session has ended' });
    await fill(dialog, 'alice', 'Passphrase-of-alice');
    await expect(dialog).toBeHidden();
    await page.keyboard.press('Escape');
    await expect(domain).toHaveValue('typed.example');
    await reviewAndSave(page);
  });
});

test('a reader sees everything and changes nothing', async ({ page, box, axe }) => {
  await enterAsReader(page, box, '/service');
  await expect(page.getByText('You may look, but not change anything')).toBeVisible();
  await expect(page.getByText('Token auditor')).toBeVisible();
  await expect(page.getByRole('textbox', { name: 'NFSv4 domain' })).toBeDisabled();
  await expect(page.getByRole('switch', { name: 'NFS service' })).toBeDisabled();
  await expect(page.getByRole('button', { name: 'Review and save' })).toHaveCount(0);
  await axe();
});

test.describe('without a connection', () => {
  test.use({ foreseen: [/Failed to load resource/] });

  test('the page says so, and goes on when the box is back', async ({ page, box, axe }) => {
    await signIn(page, box, '/service');
    const domain = page.getByRole('textbox', { name: 'NFSv4 domain' });
    await domain.fill('typed.example');
    await page.route('**/*', (route) => route.abort());
    await page.getByRole('button', { name: 'Review and save' }).click();
    await expect(page.getByRole('heading', { name: 'The box does not answer.' })).toBeVisible();
    await page.keyboard.press('Escape');
    await expect(page.getByRole('heading', { name: 'The box does not answer' })).toBeVisible();
    await axe();
    await page.unroute('**/*');
    await expect(page.getByRole('heading', { name: 'The box does not answer' })).toHaveCount(0);
    await expect(domain).toHaveValue('typed.example');
  });
});

test('speaks German', async ({ page, box }) => {
  await signIn(page, box);
  await page.getByLabel('Language').selectOption('de');
  await expect(page.getByRole('heading', { name: 'Übersicht' })).toBeVisible();
  await expect(page.locator('html')).toHaveAttribute('lang', 'de');
  await page.reload();
  await expect(page.getByRole('heading', { name: 'Übersicht' })).toBeVisible();
});

/** Goes on with the key Tab until something has the focus. */
async function tabTo(page: Page, control: Locator) {
  for (let count = 0; count < 60; count += 1) {
    if (await control.evaluate((element) => element === document.activeElement)) return;
    await page.keyboard.press('Tab');
  }
  throw new Error('the key Tab does not lead there');
}

test('works by keyboard', async ({ page, box }) => {
  await signIn(page, box);
  await page.keyboard.press('Tab');
  await expect(page.getByRole('link', { name: 'Skip to the content' })).toBeFocused();
  await tabTo(page, page.getByRole('navigation', { name: 'Pages' }).getByRole('link', { name: 'Service' }));
  await page.keyboard.press('Enter');
  const domain = page.getByRole('textbox', { name: 'NFSv4 domain' });
  await expect(domain).toBeVisible();
  await page.reload(); // the order of the focus begins anew
  await expect(domain).toBeVisible();
  await page.keyboard.press('Tab');
  await page.keyboard.press('Enter');
  await expect(page.getByRole('main')).toBeFocused();
  await expect(domain).toBeVisible();
  await tabTo(page, page.getByRole('switch', { name: 'NFS service' }));
  await page.keyboard.press('Space');
  await tabTo(page, domain);
  await page.keyboard.type('typed.');
  const review = page.getByRole('button', { name: 'Review and save' });
  await tabTo(page, review);
  await page.keyboard.press('Enter');
  const dialog = page.getByRole('dialog');
  const save = dialog.getByRole('button', { name: 'Save', exact: true });
  await expect(save).toBeEnabled();
  await page.keyboard.press('Escape');
  await expect(dialog).toBeHidden();
  await expect(review).toBeFocused();
  await page.keyboard.press('Enter');
  await expect(save).toBeEnabled();
  await tabTo(page, save);
  await page.keyboard.press('Enter');
  await expect(dialog).toBeHidden();
  expect(await box.call('VORN.Core.FileServ.NFS/v1/get', {})).toMatchObject({ enable_nfs: true });
});
