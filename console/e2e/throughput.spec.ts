import { expect, picture, signIn, test } from './base';
import { countBytes } from './kernel';

const MIB = 1 << 20;

test('the overview draws what clients transfer, and pauses while nobody looks @view', async ({ page, box, axe }, {
  project,
}) => {
  await page.clock.install();
  await signIn(page, box);
  await expect(page.getByText('The box has no figures')).toBeVisible();
  for (let step = 0; step < 8; step += 1) {
    await countBytes(box, step * step * 100 * MIB, step * 50 * MIB);
    const sampled = page.waitForResponse('**/metrics');
    await page.clock.fastForward(10_000);
    await sampled;
  }
  await expect(page.getByText(/^Clients read \d+ MiB\/s and write \d(\.\d+)? MiB\/s\.$/)).toBeVisible();
  await page.getByRole('button', { name: 'Show as a table' }).click();
  const rows = page.getByRole('grid', { name: 'Throughput' }).getByRole('row');
  await expect(rows.nth(1)).toContainText(/\d+ MiB\/s/);
  // The graph has both lines.
  const canvas = page.locator('.chart canvas');
  await expect(canvas).toBeVisible();
  const colors = await canvas.evaluate((element: HTMLCanvasElement) => {
    const pixels = element.getContext('2d')?.getImageData(0, 0, element.width, element.height).data ?? [];
    const found = new Set<string>();
    for (let at = 0; at < pixels.length; at += 4) found.add([pixels[at], pixels[at + 1], pixels[at + 2]].join(' '));
    return [...found];
  });
  const isLight = project.name.endsWith('light');
  expect(colors).toContain(isLight ? '0 102 204' : '115 188 247');
  expect(colors).toContain(isLight ? '179 89 0' : '244 182 120');
  await canvas.scrollIntoViewIfNeeded();
  await picture(page, 'throughput', project.name);
  await axe();
  await page.clock.fastForward('16:00');
  await page.clock.fastForward(10_000);
  await expect(page.getByText('nobody has used this page for 15 minutes')).toBeVisible();
  const resumed = page.waitForResponse('**/metrics');
  await page.keyboard.press('Shift');
  await resumed;
  await expect(page.getByText('nobody has used this page for 15 minutes')).toBeHidden();
});
