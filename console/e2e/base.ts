import { spawn } from 'node:child_process';
import { once } from 'node:events';
import { request as httpRequest } from 'node:http';
import path from 'node:path';
import { createInterface } from 'node:readline';
import { test as base, expect, type Locator, type Page } from '@playwright/test';
import { AxeBuilder } from '@axe-core/playwright';

/** A vornd of the test's own, with a fresh trial root. */
export interface Box {
  url: string;
  root: string;
  code: string;
  keytab: string;
  process: number;
  /** Calls a method at the Unix socket, as somebody else would. */
  call: (method: string, parameters: object) => Promise<unknown>;
}

function callAt(socketPath: string, method: string, parameters: object): Promise<unknown> {
  return new Promise((resolve, reject) => {
    const request = httpRequest(
      { socketPath, path: `/api/${method}`, method: 'POST', headers: { 'Content-Type': 'application/json' } },
      (response) => {
        let text = '';
        response.setEncoding('utf8').on('data', (piece: string) => (text += piece));
        response.on('end', () => {
          const answer = JSON.parse(text) as { success: boolean; data: unknown };
          if (answer.success) resolve(answer.data);
          else reject(new Error(`${method}: ${text}`));
        });
      },
    );
    request.on('error', reject).end(JSON.stringify(parameters));
  });
}

interface Fixtures {
  /** Whether the box has TLS, and accounts with passwords. */
  tls: boolean;
  box: Box;
  /** What the page may write to the console of the browser in this test. */
  foreseen: RegExp[];
  /** What the page has written there, as errors and warnings. */
  said: string[];
  axe: () => Promise<void>;
}

/** Delays all answers and the page's own work, so that a test that acts before the page is ready fails. */
async function slowDown(page: Page) {
  const session = await page.context().newCDPSession(page);
  await session.send('Emulation.setCPUThrottlingRate', { rate: 6 });
  await session.send('Network.enable');
  const unlimited = { downloadThroughput: -1, uploadThroughput: -1 };
  await session.send('Network.emulateNetworkConditions', { offline: false, latency: 700, ...unlimited });
}

export const test = base.extend<Fixtures>({
  tls: [false, { option: true }],

  box: async ({ tls }, use) => {
    const server = spawn('/usr/bin/python3', [path.join(import.meta.dirname, 'server.py'), ...(tls ? ['tls'] : [])], {
      stdio: ['pipe', 'pipe', 'inherit'],
    });
    const [line] = (await once(createInterface(server.stdout), 'line')) as [string];
    const { socket, ...rest } = JSON.parse(line) as Box & { socket: string };
    await use({
      ...rest,
      call: (method, parameters) => callAt(socket, method, parameters),
    });
    const ended = once(server, 'exit');
    server.stdin.end();
    expect((await ended)[0]).toBe(0); // not 0 if a secret is logged
  },

  foreseen: [[], { option: true }],

  // eslint-disable-next-line no-empty-pattern
  said: async ({}, use) => {
    await use([]);
  },

  // Any message that the test did not foresee fails it, among them a violation of the content policy.
  // The box begins before the page, so that it ends after it: a last request of the page would find no server.
  // eslint-disable-next-line @typescript-eslint/no-unused-vars
  page: async ({ page, foreseen, said, box: _box }, use) => {
    page.on('console', (message) => {
      if (message.type() === 'error' || message.type() === 'warning') said.push(message.text());
    });
    page.on('pageerror', (error) => said.push(error.message));
    await page.addInitScript(() => {
      document.addEventListener('securitypolicyviolation', (event) => {
        console.error('policy', event.violatedDirective, event.blockedURI, event.sample);
      });
    });
    if (process.env.VORN_SLOW) await slowDown(page);
    await use(page);
    expect(said.filter((text) => !foreseen.some((pattern) => pattern.test(text)))).toEqual([]);
  },

  axe: async ({ page }, use) => {
    await use(async () => {
      const { violations } = await new AxeBuilder({ page }).analyze();
      expect(violations.map(({ id, nodes }) => `${id}: ${nodes.map((node) => node.html).join(' ')}`)).toEqual([]);
    });
  },
});

/** Opens the console by the one-time link, and goes to a page. */
export async function signIn(page: Page, box: Box, address = '') {
  await page.goto(`${box.url}#code=${box.code}`);
  await expect(page.getByRole('button', { name: 'Sign out' })).toBeVisible();
  if (address) await open(page, address);
}

/** Goes to a page as a link does. */
export async function open(page: Page, address: string) {
  await page.evaluate((target) => {
    location.hash = target;
  }, address);
}

/** Opens the console with a token that may only read, and goes to a page. */
export async function enterAsReader(page: Page, box: Box, address: string) {
  const { token } = (await box.call('VORN.Server.Token/v1/create', { name: 'auditor', role: 'reader' })) as {
    token: string;
  };
  await page.goto(`${box.url}docs`);
  await page.evaluate((secret) => {
    sessionStorage.setItem('session', secret);
  }, token);
  await page.goto(`${box.url}#${address}`);
}

/** The input of a switch is hidden behind its picture. */
export const flip = (control: Locator) => control.click({ force: true });

/** Reviews the changes of a form, and saves them. */
export async function reviewAndSave(page: Page) {
  await page.getByRole('button', { name: 'Review and save' }).click();
  await page.getByRole('dialog').getByRole('button', { name: 'Save', exact: true }).click();
  await expect(page.getByRole('dialog')).toBeHidden();
}

const FRAMES = 'html, [class*=page__main], [class*=modal-box]';

/** The height of what is out of sight in the part of the page that scrolls. */
const hiddenHeight = (page: Page) =>
  page.evaluate(
    (frames) =>
      Math.max(...[...document.querySelectorAll(frames)].map((frame) => frame.scrollHeight - frame.clientHeight)),
    FRAMES,
  );

/** Writes a picture of the whole page, where nothing may be cut off at the side. Regions that scroll by themselves may be. */
export async function picture(page: Page, name: string, view: string) {
  const folder = process.env.VORN_PICTURES ?? path.join(import.meta.dirname, '../../build/console/pictures');
  const size = page.viewportSize();
  if (size) await page.setViewportSize({ ...size, height: size.height + (await hiddenHeight(page)) });
  await page.screenshot({ path: path.join(folder, `${name}-${view}.png`), fullPage: true, animations: 'disabled' });
  if (size) await page.setViewportSize(size);
  const cut = await page.evaluate(
    (frames) =>
      [...document.querySelectorAll(frames)]
        .filter((frame) => frame.scrollWidth > frame.clientWidth + 1)
        .map((frame) => `${frame.className}: ${frame.scrollWidth} > ${frame.clientWidth}`),
    FRAMES,
  );
  expect(cut, `${name} is cut off`).toEqual([]);
}

export { expect };
