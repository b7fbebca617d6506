import { expect, test } from 'vitest';
import { errorTexts } from '../src/api/errors';
import { remedies } from '../src/shared/remedies';
import { statusTexts } from '../src/shared/status-texts';
import { bytes, duration, transferSize, volume } from '../src/shared/words';

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

test('amounts of data are rounded', () => {
  expect(volume(0)).toBe('0 bytes');
  expect(volume(1023)).toBe('1,023 bytes');
  expect(volume(1024)).toBe('1 KiB');
  expect(volume(1024 * 1536)).toBe('1.5 MiB');
  expect(volume(2 ** 40 - 1)).toBe('1,020 GiB');
  expect(volume(2 ** 63)).toBe('8 EiB');
});

test('durations have the unit that fits', () => {
  expect(duration(1)).toBe('1 second');
  expect(duration(1800)).toBe('30 minutes');
  expect(duration(43200)).toBe('12 hours');
});
