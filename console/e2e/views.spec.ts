import { expect, open, picture, signIn, test, type Box } from './base';

const PAGES = [
  ['overview', '/', 'Overview'],
  ['service', '/service', 'Service'],
  ['advanced', '/advanced', 'Advanced'],
  ['shares', '/shares', 'Shared folders'],
  ['share', '/shares/media', 'media'],
  ['clients', '/clients', 'Clients'],
  ['access', '/access', 'Access check'],
  ['idmap', '/idmap', 'ID mapping'],
  ['kerberos', '/kerberos', 'Kerberos'],
  ['people', '/people', 'People and tokens'],
  ['history', '/history', 'History'],
] as const;

/** Fills the pages that a fresh box leaves empty. */
async function fill(box: Box) {
  await box.call('VORN.Core.FileServ.NFS.IDMap/v1/create', {
    idmap: ['alice', 'render-farm.building-seven'].map((name) => ({
      kerberos_principal: `${name}@STORAGE.EXAMPLE`,
      local_name: 'carol',
    })),
  });
  await box.call('VORN.Server.Token/v1/create', { name: 'backup', role: 'reader', shares: ['media'] });
}

// One test a view: signing in takes longer than a picture.
test('all pages @view', async ({ page, box, axe }, { project }) => {
  await fill(box);
  await signIn(page, box);
  for (const [name, address, heading] of PAGES) {
    await open(page, address);
    await expect(page.getByRole('heading', { level: 1, name: heading })).toBeVisible();
    await expect(page.locator('.pf-v6-c-skeleton')).toHaveCount(0);
    await page.waitForLoadState('networkidle');
    await picture(page, name, project.name);
    await axe();
  }
});
