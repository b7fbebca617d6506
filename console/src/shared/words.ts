// Values in words, in the language of the page.
import { i18n } from '@lingui/core';

export const yesNo = (value: boolean) => (value ? i18n._('yes') : i18n._('no'));

/** A number of bytes: "64 KiB". */
export function bytes(count: number): string {
  if (count >= 1 << 20 && count % (1 << 20) === 0) return `${i18n.number(count / (1 << 20))} MiB`;
  if (count >= 1 << 10 && count % (1 << 10) === 0) return `${i18n.number(count / (1 << 10))} KiB`;
  return i18n._('{count} bytes', { count: i18n.number(count) });
}

const UNITS = ['KiB', 'MiB', 'GiB', 'TiB', 'PiB', 'EiB'];

/** A rounded amount of data: "1.5 GiB". */
export function volume(count: number): string {
  if (count < 1024) return bytes(Math.round(count));
  const unit = Math.min(Math.floor(Math.log2(count) / 10), UNITS.length);
  const value = i18n.number(count / 1024 ** unit, { maximumSignificantDigits: 3 });
  return `${value} ${UNITS[unit - 1] ?? ''}`;
}

/** A rate of transfer: "1.5 MiB/s". */
export const perSecond = (rate: number) => i18n._('{volume}/s', { volume: volume(rate) });

/** The largest size of a transfer. */
export const transferSize = (size: number) => (size === 0 ? i18n._('The system chooses') : bytes(size));

/** A time in seconds since 1970. */
export const time = (seconds: number) =>
  i18n.date(new Date(seconds * 1000), { dateStyle: 'medium', timeStyle: 'short' });

/** How long something takes: "2 hours". */
export function duration(seconds: number): string {
  if (seconds < 60) return i18n._('{n, plural, one {# second} other {# seconds}}', { n: seconds });
  if (seconds < 3600) return i18n._('{n, plural, one {# minute} other {# minutes}}', { n: Math.round(seconds / 60) });
  return i18n._('{n, plural, one {# hour} other {# hours}}', { n: Math.round(seconds / 3600) });
}
