// Measures the page against a vornd on a trial root. bench/console says what, and prints the results.
import { writeFile } from 'node:fs/promises';
import type { Browser, Page } from '@playwright/test';
import { expect, signIn, test, type Box } from '../e2e/base';
import { trace, type Frame } from './trace';

const MAPPINGS = 100_000;
const BATCH = 10_000; // mappings of a call; a request has at most 1 MiB
const ROUNDS = 3;
const LOADS = 9;
const STEPS = 300;
const SIZES = [120, 400]; // pixels of a step: a turn of the wheel, and a fast one

const results = process.env.BENCH_RESULTS ?? '';

async function createMappings(box: Box) {
  for (let first = 0; first < MAPPINGS; first += BATCH) {
    const idmap = Array.from({ length: BATCH }, (_, index) => ({
      kerberos_principal: `user${String(first + index).padStart(6, '0')}@STORAGE.EXAMPLE`,
      local_name: 'root',
    }));
    await box.call('VORN.Core.FileServ.NFS.IDMap/v1/create', { idmap });
  }
}

/** A plain list that does only the necessary work: when it scrolls, it writes the texts of the rows in sight. */
async function openPlainList(page: Page, rows: number) {
  await page.goto('about:blank');
  await page.evaluate(
    ({ rows, total }) => {
      const height = 45;
      const box = document.createElement('div');
      box.id = 'rows';
      box.style.cssText = 'height: 480px; overflow: auto; position: relative';
      const table = document.createElement('table');
      table.style.cssText = 'position: absolute; width: 100%; border-spacing: 0';
      const cells = Array.from({ length: rows }, () => {
        const row = table.insertRow();
        row.style.height = `${height}px`;
        return [row.insertCell(), row.insertCell()] as const;
      });
      const filler = document.createElement('div');
      filler.style.height = `${height * total}px`;
      const render = () => {
        const first = Math.max(0, Math.min(Math.floor(box.scrollTop / height) - 10, total - rows));
        table.style.top = `${first * height}px`;
        cells.forEach(([principal, user], index) => {
          principal.textContent = `user${String(first + index).padStart(6, '0')}@STORAGE.EXAMPLE`;
          user.textContent = 'root';
        });
      };
      box.append(table, filler);
      box.addEventListener('scroll', render);
      document.body.append(box);
      render();
    },
    { rows, total: MAPPINGS },
  );
  return page.locator('#rows');
}

/** Scrolls a part of the page from its beginning on, one step in each frame. */
async function scroll(browser: Browser, page: Page, selector: string, step: number): Promise<Frame[]> {
  await page.bringToFront();
  const place = page.locator(selector);
  await place.evaluate((element) => {
    element.scrollTop = 0;
  });
  await page.waitForLoadState('networkidle');
  return trace(browser, page, () =>
    place.evaluate(
      (element, { step, count }) =>
        new Promise<void>((resolve) => {
          let left = count;
          const next = () => {
            if (left === 0) {
              resolve();
              return;
            }
            left -= 1;
            element.scrollTop += step;
            requestAnimationFrame(() => setTimeout(next)); // when the frame is painted: the layout is known then
          };
          next();
        }),
      { step, count: STEPS },
    ),
  );
}

interface Load {
  /** Milliseconds until the first text or picture is painted. */
  paint: number;
  /** Milliseconds until the page has a heading; null for a page without one. */
  heading: number | null;
}

/** Opens an address with an empty cache. */
async function load(browser: Browser, address: string, session: string | null): Promise<Load> {
  const context = await browser.newContext();
  const page = await context.newPage();
  await page.addInitScript((token) => {
    if (token) sessionStorage.setItem('session', token);
    new MutationObserver(() => {
      if (document.querySelector('h1') && performance.getEntriesByName('heading').length === 0) {
        performance.mark('heading');
      }
    }).observe(document, { childList: true, subtree: true });
  }, session);
  await page.goto(address);
  if (session) await page.getByRole('heading', { level: 1 }).waitFor();
  const paint = await page.waitForFunction(() => performance.getEntriesByName('first-contentful-paint')[0]?.startTime);
  const heading = await page.evaluate(() => performance.getEntriesByName('heading')[0]?.startTime ?? null);
  const result = { paint: (await paint.jsonValue()) ?? NaN, heading };
  await context.close();
  return result;
}

test('first content', async ({ box, browser }) => {
  const { token } = (await box.call('VORN.Server.Token/v1/create', { name: 'bench', role: 'administrator' })) as {
    token: string;
  };
  const pages = [
    ['overview', box.url, token],
    ['sign-in', box.url, null],
    ['floor', `${box.url}healthz/live`, null],
  ] as const;
  const loads: Record<string, Load[]> = {};
  for (let round = 0; round < LOADS; round += 1) {
    for (const [name, address, session] of pages) {
      (loads[name] ??= []).push(await load(browser, address, session));
    }
  }
  await writeFile(`${results}/loads.json`, JSON.stringify(loads));
});

test('scrolling', async ({ page, box, browser, context }) => {
  await createMappings(box);
  await signIn(page, box, '/idmap');
  await expect(page.getByText('100,000 mappings')).toBeVisible();
  await expect(page.getByText('user000000@STORAGE.EXAMPLE').first()).toBeVisible();
  const rows = await page.locator('.rows tbody tr:not([aria-hidden])').count();
  const plain = await context.newPage();
  await openPlainList(plain, rows);
  const scrolls: { step: number; table: Frame[]; floor: Frame[] }[] = [];
  for (const step of SIZES) {
    const measured: (typeof scrolls)[number] = { step, table: [], floor: [] };
    for (let round = 0; round < ROUNDS; round += 1) {
      measured.table.push(...(await scroll(browser, page, '.rows', step)));
      measured.floor.push(...(await scroll(browser, plain, '#rows', step)));
    }
    scrolls.push(measured);
  }
  await writeFile(`${results}/scrolls.json`, JSON.stringify({ mappings: MAPPINGS, rows, scrolls }));
});
