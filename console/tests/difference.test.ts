import { expect, test } from 'vitest';
import { addedLines, linesOf } from '../src/shared/difference';

const DIFFERENCE = '--- /etc/x\n+++ /etc/x\n@@ -1,2 +1,2 @@\n same\n-old\n+new\n+--- odd\n';

test('lines have their kinds', () => {
  expect(linesOf(DIFFERENCE).map((line) => line.kind)).toEqual(['place', 'same', 'removed', 'added', 'added']);
});

test('added lines come without their marks', () => {
  expect(addedLines(DIFFERENCE)).toEqual(['new', '--- odd']);
});
