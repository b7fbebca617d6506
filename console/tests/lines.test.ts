import { expect, test } from 'vitest';
import { parseLines } from '../src/pages/idmap/lines';

test('lines of a CSV file are mappings', () => {
  const mapping = { kerberos_principal: 'alice@X', local_name: 'alice' };
  for (const line of [
    'alice@X,alice',
    'alice@X; alice',
    'alice@X\talice',
    '"alice@X","alice"',
    '\nalice@X, alice\r\n',
  ]) {
    expect(parseLines(line), line).toMatchObject({ mappings: [mapping], faulty: [] });
  }
});

test('each mapping has the number of its line', () => {
  expect(parseLines('\na@X,a\n\nb@X,b\n').numbers).toEqual([2, 4]);
});

test('other lines are named by their numbers', () => {
  expect(parseLines('a@X\n\nb@X,\nc@X,c,c\n,d').faulty).toEqual([1, 3, 4, 5]);
});
