// Samples the traffic while somebody uses the page. Sampling renews the session, so it must not go on for ever.
import { useEffect, useSyncExternalStore } from 'react';
import { readMetrics } from '../api/metrics';
import { parseSample, STEP, withSample, type Sample } from './samples';

const ATTENTION = 15 * 60; // seconds after the last use of the page, during which it is sampled

export interface Traffic {
  samples: Sample[];
  /** "idle": nobody uses the page. "unknown": the box has no figures, or does not answer. */
  state: 'sampling' | 'idle' | 'unknown';
}

let traffic: Traffic = { samples: [], state: 'sampling' };
const listeners = new Set<() => void>();

function set(next: Traffic) {
  traffic = next;
  for (const listener of listeners) listener();
}

function subscribe(listener: () => void) {
  listeners.add(listener);
  return () => listeners.delete(listener);
}

const now = () => Date.now() / 1000;

async function sample() {
  const time = now();
  const metrics = await readMetrics();
  const taken = metrics === null ? null : parseSample(metrics, time);
  set(
    taken
      ? { samples: withSample(traffic.samples, taken), state: 'sampling' }
      : { samples: traffic.samples, state: 'unknown' },
  );
}

const USES = ['pointerdown', 'pointermove', 'keydown', 'wheel'] as const;

/** Takes samples as long as the component is shown and somebody uses the page. */
export function useSampling() {
  useEffect(() => {
    let lastUse = now();
    const use = () => {
      const wasIdle = now() - lastUse > ATTENTION;
      lastUse = now();
      if (wasIdle) void sample();
    };
    const tick = () => {
      if (now() - lastUse > ATTENTION) set({ ...traffic, state: 'idle' });
      else void sample();
    };
    void sample();
    const timer = setInterval(tick, STEP * 1000);
    for (const event of USES) window.addEventListener(event, use, { passive: true });
    return () => {
      clearInterval(timer);
      for (const event of USES) window.removeEventListener(event, use);
    };
  }, []);
}

export const useTraffic = () => useSyncExternalStore(subscribe, () => traffic);
