// Reads traces of Chromium: what the main thread of a page did in each of its frames.
import type { Browser, Page } from '@playwright/test';

/** An event of a trace, in microseconds. */
export interface TraceEvent {
  name: string;
  ph: string;
  pid: number;
  tid: number;
  ts: number;
  dur?: number;
  /** The CPU time of the thread, which does not grow while other programs have the processor. */
  tdur?: number;
}

/** Milliseconds of CPU time of the main thread in one frame. */
export interface Frame {
  scripts: number;
  /** Scripts, styles, layout and painting. */
  all: number;
}

const CATEGORIES = [
  'devtools.timeline',
  'disabled-by-default-devtools.timeline',
  'toplevel',
  'v8',
  'blink.user_timing',
];
const FRAME = 'BeginCommitCompositorFrame'; // the main thread hands a frame over
const TASK = 'RunTask';
const SCRIPTS = new Set([
  'EvaluateScript',
  'EventDispatch',
  'FireAnimationFrame',
  'FunctionCall',
  'MajorGC',
  'MinorGC',
  'RunMicrotasks',
  'TimerFire',
  'v8.callFunction',
]);

export const MARK = 'bench-page';

/** Adds the CPU time of events to the frames in which they begin. An event inside of another one is counted once. */
function add(events: TraceEvent[], starts: number[], count: (frame: number, milliseconds: number) => void) {
  let end = 0;
  let frame = 0;
  for (const { ts, dur = 0, tdur = dur } of events) {
    if (ts < end) continue;
    end = ts + dur;
    while (frame < starts.length && (starts[frame] ?? 0) <= ts) frame += 1;
    if (frame > 0 && frame < starts.length) count(frame - 1, tdur / 1000);
  }
}

/** The frames of the page that has made the mark. */
export function framesOf(trace: TraceEvent[]): Frame[] {
  const mark = trace.find(({ name }) => name === MARK);
  if (!mark) throw new Error('the trace has no mark');
  const events = trace.filter(({ pid, tid }) => pid === mark.pid && tid === mark.tid).sort((a, b) => a.ts - b.ts);
  const starts = events.filter(({ name }) => name === FRAME).map(({ ts }) => ts);
  const frames = Array.from({ length: Math.max(starts.length - 1, 0) }, () => ({ scripts: 0, all: 0 }));
  const whole = events.filter(({ ph }) => ph === 'X');
  const counter = (kind: keyof Frame) => (index: number, milliseconds: number) => {
    const frame = frames[index];
    if (frame) frame[kind] += milliseconds;
  };
  const isScript = ({ name }: TraceEvent) => SCRIPTS.has(name);
  const isTask = ({ name }: TraceEvent) => name === TASK;
  add(whole.filter(isScript), starts, counter('scripts'));
  add(whole.filter(isTask), starts, counter('all'));
  return frames;
}

/** Traces the page while it is being used. */
export async function trace(browser: Browser, page: Page, use: () => Promise<void>): Promise<Frame[]> {
  await browser.startTracing(page, { categories: CATEGORIES });
  await page.evaluate((mark) => performance.mark(mark), MARK);
  await use();
  const { traceEvents } = JSON.parse((await browser.stopTracing()).toString()) as { traceEvents: TraceEvent[] };
  return framesOf(traceEvents);
}
