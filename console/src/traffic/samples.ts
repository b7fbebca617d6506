// The bytes that clients have transferred, sampled while the page is open.

export interface Sample {
  time: number; // seconds since 1970
  read: number; // bytes since the kernel's NFS server was loaded
  written: number;
}

/** Bytes per second; null where they are not known. */
export interface Rate {
  time: number;
  read: number | null;
  written: number | null;
}

export const SPAN = 3600; // seconds that are kept
export const STEP = 10; // seconds between two samples
const GAP = 3 * STEP; // seconds without a sample, of which nothing is known

function counterOf(metrics: string, direction: string): number | null {
  const line = new RegExp(`^vorn_nfs_bytes_total\\{direction="${direction}"\\} (\\S+)$`, 'm').exec(metrics);
  return line ? Number(line[1]) : null;
}

/** The counters in the text of /metrics; null while there is no NFS server that counts. */
export function parseSample(metrics: string, time: number): Sample | null {
  const read = counterOf(metrics, 'read');
  const written = counterOf(metrics, 'written');
  return read === null || written === null ? null : { time, read, written };
}

/** The samples with one more, without those that are older than the span. */
export const withSample = (samples: Sample[], sample: Sample) =>
  [...samples, sample].filter(({ time }) => time >= sample.time - SPAN);

/** What was transferred from each sample to the next one. A counter that began anew tells nothing. */
export function ratesOf(samples: Sample[]): Rate[] {
  return samples.slice(1).map(({ time, read, written }, index) => {
    const before = samples[index] ?? { time, read, written };
    const seconds = time - before.time;
    const isKnown = seconds > 0 && seconds <= GAP && read >= before.read && written >= before.written;
    return {
      time,
      read: isKnown ? (read - before.read) / seconds : null,
      written: isKnown ? (written - before.written) / seconds : null,
    };
  });
}

const mean = (values: (number | null)[]) => {
  const known = values.filter((value) => value !== null);
  return known.length > 0 ? known.reduce((sum, value) => sum + value, 0) / known.length : null;
};

/** The means of periods of this number of seconds, the newest first. The time is the beginning of the period. */
export function meansOf(rates: Rate[], period: number): Rate[] {
  const beginOf = ({ time }: Rate) => Math.floor(time / period) * period;
  const periods = new Map<number, Rate[]>();
  for (const rate of rates) periods.set(beginOf(rate), [...(periods.get(beginOf(rate)) ?? []), rate]);
  return [...periods]
    .map(([time, part]) => ({
      time,
      read: mean(part.map((rate) => rate.read)),
      written: mean(part.map((rate) => rate.written)),
    }))
    .reverse();
}
