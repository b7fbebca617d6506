import { expect, test } from 'vitest';
import { errorTexts } from '../src/api/errors';
import { remedies } from '../src/shared/remedies';
import { statusTexts } from '../src/shared/status-texts';
import { bytes, duration, transferSize } from '../src/shared/words';

test('every error code has a text and a remedy', () => {
  const codes = [...Object.keys(errorTexts), ...Object.keys(statusTexts)].sort();
  expect(codes.length).toBeGreaterThan(30);
  expect(Object.keys(remedies).sort()).toEqual(codes);
});

test('sizes have the unit that fits', () => {
  expect(bytes(65536)).toBe('64 KiB');
  expect(bytes(1048576)).toBe('1 MiB');
  expect(bytes(1000)).toBe('1,000 bytes');
  expect(transferSize(0)).toBe('The system chooses');
});

test('durations have the unit that fits', () => {
  expect(duration(1)).toBe('1 second');
  expect(duration(1800)).toBe('30 minutes');
  expect(duration(43200)).toBe('12 hours');
});
