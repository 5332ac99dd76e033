// A series above the hydrograph, such as precipitation, from the top down.
import { axis, tip, tooltip, type ChartPlan, type Option } from '../chart';
import { timesOf, type Series } from '../data';
import { shorten } from '../dom';
import { moment, number } from '../format';

const kRoom = 3; // the largest value takes a third of the height

type Points = { seriesName: string; value?: unknown }[];

/** The chart of the hydrograph, with the series above it if there is one. */
export function withSeriesAbove(plan: ChartPlan, { above }: Series): ChartPlan {
  if (!above) return plan;
  const times = timesOf(above, above.values.length);
  const step = times.length > 1 ? times[1]! - times[0]! : 86400000;
  const largest = above.values.reduce<number>((most, value) => Math.max(most, value ?? 0), 0);
  const points = times.map((time, index) => [time, above.values[index] ?? null]);
  const name = `${above.name} (above)`;
  const list = (value: unknown) => (Array.isArray(value) ? value : [value]) as Record<string, unknown>[];
  return {
    ...plan,
    note: `${typeof plan.note === 'function' ? plan.note() : plan.note ?? ''} Above, from the top down: ${shorten(above.name, 60)}${above.thinned ? ', the largest value of each short span' : ''}.`,
    option: (look, is): Option => {
      const option = plan.option(look, is);
      const formatter = (list(option.tooltip)[0]?.formatter ?? (() => '')) as (points: Points) => HTMLElement | string;
      const yAxes = list(option.yAxis);
      return {
        ...option,
        grid: list(option.grid).map((grid) => ({ ...grid, right: 52 })),
        yAxis: [...yAxes, axis(look, {
          gridIndex: 0, inverse: true, position: 'right', min: 0, max: largest > 0 ? kRoom * largest : 1, splitLine: { show: false }, splitNumber: 6,
          axisLine: { show: false }, axisTick: { show: false },
          axisLabel: { formatter: (value: number) => (value <= largest * 1.01 ? number(value, 3) : '') },
        })],
        tooltip: tooltip(look, { trigger: 'axis', formatter: (all: Points) => {
          const own = all.find(({ seriesName }) => seriesName === name);
          const rest = all.filter((point) => point !== own);
          if (!own) return formatter(rest);
          const [time, value] = own.value as [number, number | null];
          if (rest.length === 0) return tip(moment(time, step), [[shorten(above.name, 40), number(value)]]);
          const shown = formatter(rest);
          if (shown instanceof HTMLElement) shown.append(...tip('', [[shorten(above.name, 40), number(value)]]).querySelectorAll('div'));
          return shown;
        } }),
        series: [...list(option.series), {
          name, type: 'bar', xAxisIndex: 0, yAxisIndex: yAxes.length, data: points, large: true, largeThreshold: 500, z: 1,
          itemStyle: { color: look.band }, barMinWidth: 1,
        }],
      };
    },
  };
}
