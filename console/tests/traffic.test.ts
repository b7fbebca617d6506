import { expect, test } from 'vitest';
import { meansOf, parseSample, ratesOf, SPAN, withSample } from '../src/traffic/samples';

const METRICS = `# TYPE vorn_nfs_bytes_total counter
vorn_nfs_bytes_total{direction="read"} 4096
vorn_nfs_bytes_total{direction="written"} 1.5e+10
`;

test('the counters of a box are read', () => {
  expect(parseSample(METRICS, 7)).toEqual({ time: 7, read: 4096, written: 1.5e10 });
  expect(parseSample('vorn_nfs_enabled 0\n', 7)).toBeNull();
});

test('samples of the last hour are kept', () => {
  const old = { time: 0, read: 0, written: 0 };
  const sample = { time: SPAN, read: 1, written: 1 };
  expect(withSample([old], sample)).toHaveLength(2);
  expect(withSample([old], { ...sample, time: SPAN + 1 })).toHaveLength(1);
});

test('rates are per second, and unknown after a pause and after a new beginning', () => {
  const samples = [
    { time: 0, read: 0, written: 50 },
    { time: 10, read: 1000, written: 50 },
    { time: 1000, read: 2000, written: 60 },
    { time: 1010, read: 0, written: 70 },
  ];
  expect(ratesOf(samples)).toEqual([
    { time: 10, read: 100, written: 0 },
    { time: 1000, read: null, written: null },
    { time: 1010, read: null, written: null },
  ]);
  expect(ratesOf([])).toEqual([]);
});

test('a period has the mean of what is known', () => {
  const rates = [
    { time: 10, read: 100, written: null },
    { time: 20, read: 200, written: null },
    { time: 310, read: 5, written: 6 },
  ];
  expect(meansOf(rates, 300)).toEqual([
    { time: 300, read: 5, written: 6 },
    { time: 0, read: 150, written: null },
  ]);
});
