import { expect, test } from 'vitest';
import { contrasts } from '../src/shared/conflict';

test('only what differs is shown, in its order', () => {
  const mine = [
    { label: 'a', text: '1' },
    { label: 'b', text: '2' },
    { label: 'mine', text: 'x' },
  ];
  const theirs = [
    { label: 'a', text: '1' },
    { label: 'b', text: '3' },
    { label: 'theirs', text: 'y' },
  ];
  expect(contrasts(mine, theirs)).toEqual([
    { label: 'b', mine: '2', theirs: '3' },
    { label: 'mine', mine: 'x', theirs: '–' },
    { label: 'theirs', mine: '–', theirs: 'y' },
  ]);
});
