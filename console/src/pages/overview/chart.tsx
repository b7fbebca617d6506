import { useEffect, useRef } from 'react';
import uPlot from 'uplot';
import 'uplot/dist/uPlot.min.css';
import { i18n } from '@lingui/core';
import { perSecond } from '../../shared/words';
import { SPAN, type Rate } from '../../traffic/samples';

const HEIGHT = 220; // pixels
const LABELS = 95; // pixels for the labels of the rates

/** Distances between two labels: round numbers of KiB, MiB and so on. */
const STEPS = Array.from({ length: 60 }, (_, power) => 2 ** power);

/** A colour of the theme that is shown at this moment. */
const color = (name: string) => () => getComputedStyle(document.documentElement).getPropertyValue(name);

const AXIS: uPlot.Axis = { stroke: color('--chart-text'), grid: { stroke: color('--chart-grid'), width: 1 } };

const options = (width: number): uPlot.Options => ({
  width,
  height: HEIGHT,
  legend: { show: false },
  cursor: { show: false },
  scales: {
    x: {
      range: () => {
        const now = Date.now() / 1000;
        return [now - SPAN, now];
      },
    },
    y: { range: (_plot, _least, most) => [0, Math.max(most * 1.1, 1024)] },
  },
  axes: [
    {
      ...AXIS,
      values: (_plot, times) => times.map((time) => i18n.date(new Date(time * 1000), { timeStyle: 'short' })),
    },
    { ...AXIS, size: LABELS, incrs: STEPS, values: (_plot, rates) => rates.map(perSecond) },
  ],
  series: [
    {},
    { stroke: color('--chart-read'), width: 2 },
    { stroke: color('--chart-written'), width: 2, dash: [6, 4] },
  ],
});

const columns = (rates: Rate[]): uPlot.AlignedData => [
  rates.map(({ time }) => time),
  rates.map(({ read }) => read),
  rates.map(({ written }) => written),
];

/** The graph. It has no meaning for a screen reader: a table beside it has the numbers. */
export default function Chart({ rates }: { rates: Rate[] }) {
  const box = useRef<HTMLDivElement>(null);
  const plot = useRef<uPlot | null>(null);
  useEffect(() => {
    const frame = box.current;
    if (!frame) return;
    const drawn = new uPlot(options(frame.clientWidth), [[], [], []], frame);
    plot.current = drawn;
    const resize = new ResizeObserver(() => {
      drawn.setSize({ width: frame.clientWidth, height: HEIGHT });
    });
    const theme = new MutationObserver(() => {
      drawn.redraw(false, true);
    });
    resize.observe(frame);
    theme.observe(document.documentElement, { attributeFilter: ['class'] });
    return () => {
      resize.disconnect();
      theme.disconnect();
      drawn.destroy();
    };
  }, []);
  useEffect(() => {
    plot.current?.setData(columns(rates));
  }, [rates]);
  return <div ref={box} dir="ltr" className="chart" aria-hidden />;
}
