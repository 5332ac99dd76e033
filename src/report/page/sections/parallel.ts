// Parameter sets as lines over parallel axes, coloured by one of them.
import { kFileWidth, tip, tooltip, type ChartPlan, type Option, type Pick } from '../chart';
import { shorten } from '../dom';
import { number, tick } from '../format';
import type { Look } from '../look';
import type { Maybe, Parameter } from '../data';

export interface ParallelAxis {
  name: string;
  values: readonly Maybe[];
  log?: boolean;
  integer?: boolean;
  min?: Maybe; // with `Fit axes` off
  max?: Maybe;
}

export interface ParallelLines {
  axes: ParallelAxis[];
  places: number[]; // that are drawn, the last one on top
  colouredBy: number; // axis
  headline: (place: number) => string;
  thick: () => number[]; // places with a thick line in the colour of the text
}

/** The axis of a parameter, between its bounds. */
export function parameterAxis(parameter: Parameter, values: readonly Maybe[]): ParallelAxis {
  const { name, lower, upper, transformation, integer } = parameter;
  return { name, values, log: transformation === 'logarithmic' && (lower ?? 0) > 0, integer, min: lower, max: upper };
}

const rowOf = (axes: ParallelAxis[], place: number) => axes.map(({ values }) => values[place] ?? NaN);

/** The thick lines, as a series that is merged by its id. */
export function thickLines(look: Look, { axes, thick }: ParallelLines): object {
  return { id: 'thick', type: 'parallel', z: 5, silent: true, lineStyle: { width: 3, opacity: 1, color: look.ink }, data: thick().map((place) => ({ value: rowOf(axes, place) })) };
}

// Where axes are close, their names are at a slant and their numbers, which would overlap, are left to the tooltip.
function drawnLines(lines: ParallelLines, look: Look, isFit: boolean, width: number): Option {
  const { axes, places, colouredBy, headline } = lines;
  const apart = (width - 120) / Math.max(1, axes.length - 1);
  const isClose = apart < 110;
  const colours = places.map((place) => axes[colouredBy]!.values[place]).filter((value): value is number => value != null);
  return {
    parallelAxis: axes.map(({ name, log, integer, min, max }, dim) => ({
      dim, name: shorten(name, isClose ? 12 : 18), scale: true, type: log ? 'log' : 'value', minInterval: integer ? 1 : undefined,
      ...(min == null || max == null ? {} : { min: isFit ? 'dataMin' : min, max: isFit ? 'dataMax' : max }),
    })),
    parallel: {
      left: 50, right: 70, top: isClose ? 84 : 48, bottom: 24,
      parallelAxisDefault: {
        nameLocation: 'end', nameGap: 16, nameRotate: isClose ? 45 : undefined, nameTextStyle: { color: look.ink, fontSize: 12 },
        axisLine: { lineStyle: { color: look.muted } }, axisTick: { lineStyle: { color: look.muted } },
        axisLabel: { color: look.muted, fontSize: 10, formatter: apart < 52 ? () => '' : tick },
        areaSelectStyle: { color: look.band, borderColor: look.band, opacity: 0.3, width: 16 },
      },
    },
    visualMap: {
      show: false, dimension: colouredBy, seriesIndex: 0, inRange: { color: look.sequential },
      min: colours.reduce((a, b) => Math.min(a, b), Infinity), max: colours.reduce((a, b) => Math.max(a, b), -Infinity),
    },
    tooltip: tooltip(look, { trigger: 'item', formatter: (line: { dataIndex: number; value: number[] }) => {
      const values = axes.map(({ name }, index): [string, string] => [shorten(name, 40), number(line.value[index], 5)]);
      return tip(headline(places[line.dataIndex]!), values.length > 21 ? [...values.slice(0, 20), values[values.length - 1]!] : values);
    } }),
    series: [
      { id: 'lines', type: 'parallel', data: places.map((place) => ({ value: rowOf(axes, place) })), lineStyle: { width: 1.2, opacity: 0.55 }, inactiveOpacity: 0.04, activeOpacity: 0.8,
        emphasis: { lineStyle: { width: 2.5, opacity: 1 } } },
      thickLines(look, lines),
    ],
  };
}

export interface ParallelPlan {
  title: string;
  note: string;
  lines: ParallelLines;
  csv: ChartPlan['csv'];
  pick?: Pick;
}

export function parallelPlan({ title, note, lines, csv, pick }: ParallelPlan): ChartPlan {
  const canFit = lines.axes.some(({ min }) => min != null);
  return {
    title, note, csv, pick,
    height: 400,
    switches: canFit ? [{ key: 'fit', label: 'Fit axes', hint: 'Axes over the values of these sets instead of the bounds' }] : [],
    fitsWidth: true,
    option: (look, is, width = kFileWidth) => drawnLines(lines, look, is('fit'), width),
  };
}
