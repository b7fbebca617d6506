import { readFile } from 'node:fs/promises';
import path from 'node:path';
import { errorTexts } from '../src/api/errors';
import { remedies } from '../src/shared/remedies';
import { statusTexts } from '../src/shared/status-texts';
import { expect, open, signIn, test } from './base';

const TEXTS = { ...errorTexts, ...statusTexts };
const REASON = 'A reason in the words of the server.';
const ENDED = 401; // a dialog then covers the page, so that this code comes last

interface Described {
  components: { responses: Record<string, unknown> };
  paths: unknown;
}

/** All error codes of the API: those of the methods, and the statuses of the server itself. */
function codesOf({ components, paths }: Described): number[] {
  const lists = [...JSON.stringify(paths).matchAll(/"code":\{"enum":\[([\d,]+)\]/g)].map(([, list]) => list ?? '');
  const statuses = Object.keys(components.responses).map((name) => name.replace('Status', ''));
  return [...new Set([...lists.flatMap((list) => list.split(',')), ...statuses].map(Number))].sort((a, b) => a - b);
}

/** The German texts by the English ones, which are their keys. */
async function german(): Promise<Map<string, string>> {
  const file = await readFile(path.join(import.meta.dirname, '../src/locales/de.po'), 'utf8');
  const entries = file.replaceAll('"\n"', '').matchAll(/^msgid (".+")\nmsgstr (".+")$/gm);
  return new Map(
    [...entries].map(([, key, text]) => [JSON.parse(key ?? ''), JSON.parse(text ?? '')] as [string, string]),
  );
}

test.describe('every error code', () => {
  test.use({ foreseen: [/Failed to load resource/] });

  for (const [language, label, again] of [
    ['en', 'Error code', 'Try again'],
    ['de', 'Fehlercode', 'Noch einmal versuchen'],
  ] as const) {
    test(`is shown with its text, reason and remedy (${language})`, async ({ page, box }) => {
      const translations = await german();
      const spoken = (text: string | undefined) => (language === 'de' ? translations.get(text ?? '') : text);
      await signIn(page, box);
      const document = await page.evaluate(async () => (await (await fetch('/openapi.json')).json()) as Described);
      const codes = codesOf(document);
      expect(codes.map(String)).toEqual(Object.keys(remedies)); // a code without a remedy, or a remedy without a code
      await page.getByRole('combobox').selectOption(language);

      let answered = 0;
      await page.route('**/api/VORN.Core.FileServ.NFS.History/v1/list', (route) =>
        route.fulfill({
          status: answered < 1000 ? answered : 400,
          json: { success: false, error: { code: answered, text: `text of ${answered}`, reasons: [REASON] } },
        }),
      );
      const problem = page.locator('.problem').first();
      for (const code of [...codes.filter((each) => each !== ENDED), ENDED]) {
        const retry = answered !== 0;
        answered = code;
        if (retry) await page.getByRole('button', { name: again }).click();
        else await open(page, '/history');
        await expect(problem).toContainText(`${label} ${code}`);
        for (const text of [TEXTS[code], remedies[code]].map(spoken)) {
          expect(text, String(code)).toBeTruthy();
          await expect(problem).toContainText(text ?? '');
        }
        await expect(problem).toContainText(REASON);
      }
    });
  }
});
