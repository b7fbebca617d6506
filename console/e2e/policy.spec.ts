import type { Page } from '@playwright/test';
import { expect, signIn, test } from './base';

/** What the content policy forbids, each with what the page says about it. */
const FORBIDDEN: [string, () => unknown][] = [
  [
    'policy style-src-elem inline',
    () => {
      const style = document.createElement('style');
      style.append('#root { display: none }');
      document.head.append(style);
    },
  ],
  [
    'policy style-src-attr inline',
    () => {
      document.getElementById('root')?.setAttribute('style', 'display: none');
    },
  ],
  [
    'policy require-trusted-types-for trusted-types-sink Element onclick',
    () => {
      document.body.setAttribute('onclick', 'document.title = "injected"');
    },
  ],
  [
    'policy require-trusted-types-for trusted-types-sink HTMLScriptElement src',
    () => {
      const script = document.createElement('script');
      script.src = '/injected.js';
      document.head.append(script);
    },
  ],
  [
    'policy require-trusted-types-for trusted-types-sink Element innerHTML',
    () => {
      document.body.innerHTML = '';
    },
  ],
  [
    'policy img-src http://foreign.invalid/picture',
    () => {
      document.createElement('img').src = 'http://foreign.invalid/picture';
    },
  ],
  ['policy connect-src http://foreign.invalid/data', () => fetch('http://foreign.invalid/data')],
];

/** Does something in the page that may throw. */
async function attempt(page: Page, act: () => unknown) {
  await page.evaluate(act).catch(() => undefined);
}

test.describe('what the content policy forbids', () => {
  test.use({ foreseen: [/^policy |Content Security Policy|Trusted(HTML|Script)/] });

  test('has no effect, and is reported', async ({ page, box, said }) => {
    await signIn(page, box);
    for (const [report, act] of FORBIDDEN) {
      await attempt(page, act);
      await expect.poll(() => said, report).toContainEqual(expect.stringContaining(report));
    }
    await expect(page.getByRole('heading', { name: 'Overview' })).toBeVisible();
    await expect(page).not.toHaveTitle(/injected/);
  });
});

// The check that all tests share is able to fail: this test passes if it does.
test('a violation that is not foreseen fails a test', async ({ page, box, said }) => {
  test.fail();
  await signIn(page, box);
  await attempt(page, () => (document.body.innerHTML = ''));
  await expect.poll(() => said.some((text) => text.startsWith('policy'))).toBe(true);
});
