// Simulated against observed series: how well they fit, at which times they do not, and in which range of values.
import { axis, chart, legend, lineEntries, timeZoom, tip, tooltip, type ChartPlan } from '../chart';
import { timesOf, withUnit, type Figures, type Maybe, type ReportData, type Series } from '../data';
import { shorten, table } from '../dom';
import { count, moment, number } from '../format';
import type { Look } from '../look';
import { later, lineOf, nearest, pointsOf, type Line } from '../lines';
import { durationCurve, finite, spaced, thin } from '../numbers';
import { logRange } from '../ticks';
import { withSeriesAbove } from './above';
import { kFigures } from './figures';
import { grid, heading, type Section } from './section';
import { kShadedNote, shadedPeriods, spansOf } from './validation';
import { viewsOf } from './views';

const kCurvePoints = 700;

interface Simulated {
  key: 'initial' | 'best';
  name: string;
  values: Maybe[];
}

// In scenario runs the best is one of those that have names.
function bestName(data: ReportData, number: number): string {
  const name = data.run.runNames?.[number - 1];
  return name ? `best (${shorten(name, 40)}, evaluation ${count(number)})` : `best (evaluation ${count(number)})`;
}

function simulations(data: ReportData, series: Series): Simulated[] {
  const number = series.bestNumber ?? data.best?.number;
  return [
    { key: 'initial' as const, name: data.initialLabel ?? 'initial parameters', values: series.initial ?? [] },
    { key: 'best' as const, name: number == null ? 'best' : bestName(data, number), values: series.best ?? [] },
  ].filter(({ values }) => finite(values).length > 0);
}

/** What an axis says of the values: "Discharge [m3/s]". */
export const labelOf = ({ quantity, unit }: { quantity?: string | null; unit?: string | null }) => [shorten(quantity ?? '', 60), unit ? `[${shorten(unit, 20)}]` : ''].filter(Boolean).join(' ') || 'Value';
const onLog = (values: Maybe[], log: boolean) => (log ? values.map((value) => (value !== null && value > 0 ? value : null)) : values);
const lineStyles = (look: Look) => ({
  initial: { color: look.initial, width: 1.2, type: 'dashed' as const },
  best: { color: look.best, width: 2.2 },
  observed: { color: look.observed, width: 1 },
});

/** Names that fit a small chart. */
const short = (data: ReportData, series: Series) => simulations(data, series).map((one) => ({ ...one, name: one.key === 'initial' && data.initialLabel === 'first evaluation' ? 'first' : one.key }));

export function outside(times: number[], period: Series['period']): [number, number][] {
  const [first, last] = [times[0], times[times.length - 1]];
  if (!period || first === undefined || last === undefined) return [];
  return ([[first, period[0]], [period[1], last]] as [number, number][]).filter(([from, to]) => to > from);
}

/** Areas outside the evaluation period, where values do not count. */
export function outsidePeriod(look: Look, times: number[], period: Series['period']): object {
  const areas = outside(times, period);
  return areas.length === 0 ? {} : { markArea: { silent: true, itemStyle: { color: look.rule, opacity: 0.45 }, data: areas.map(([from, to]) => [{ xAxis: from }, { xAxis: to }]) } };
}

/** A line and the dots on it; both have one entry in the legend. The library's sampling joins lines over gaps. */
export function drawnLine(name: string, line: Line, log: boolean, color: string, more: object): object[] {
  const { dots } = line;
  const data = pointsOf(line, log);
  return [
    { name, type: 'line', symbol: 'none', sampling: data.some(Number.isNaN) ? undefined : 'lttb', connectNulls: false, color, data, ...more },
    ...(dots.length > 0 ? [{ name, type: 'scatter', symbolSize: 5, itemStyle: { color }, large: dots.length > 3000, ...more,
      data: dots.filter(([, value]) => !log || value > 0) }] : []),
  ];
}

/** In the legend. */
export const observedEntry = (isPoints: boolean) => (isPoints ? [{ name: 'observed', icon: 'circle' }] : lineEntries(['observed']));

/** Whether zero belongs on the axis: not where it would press the values together, such as water levels. */
export const reachesZero = (columns: Maybe[][]) => {
  const all = columns.flatMap((values) => { const own = finite(values); return own.length > 0 ? [own.reduce((a, b) => Math.min(a, b)), own.reduce((a, b) => Math.max(a, b))] : []; });
  return Math.min(...all) < 0.7 * Math.max(...all);
};

function hydrographPlan(data: ReportData, series: Series): ChartPlan {
  const times = timesOf(series, series.observed.length);
  const simulated = simulations(data, series);
  const judged = simulated.find(({ key }) => key === 'best') ?? simulated[0];
  const residuals = judged?.values.map((value, place) => {
    const observed = series.observed[place] ?? null;
    return value === null || observed === null ? null : Number((value - observed).toPrecision(7)); // the digits of the values
  });
  const step = times.slice(1, 1000).reduce((least, time, at) => Math.min(least, time - times[at]!), 86400000);
  const breaks = series.breaks ?? {};
  const isPoints = series.observedAsPoints ?? false;
  const linesLater = later(() => ({
    observed: lineOf(times, series.observed, breaks.observed, isPoints, true),
    lines: simulated.map((one) => ({ ...one, line: lineOf(times, one.values, breaks[one.key]) })),
    apart: residuals ? lineOf(times, residuals, [...breaks.observed ?? [], ...breaks[judged!.key] ?? []].sort((a, b) => a - b), isPoints) : null,
  }));
  const all = [series.observed, ...simulated.map(({ values }) => values)];
  return {
    title: 'Simulated and observed, and the residuals',
    note: `Residual: ${judged ? shorten(judged.name, 60) : 'simulated'} less observed.${series.periods ? kShadedNote : outside(times, series.period).length > 0 ? ' Shaded: outside the evaluation period.' : ''} ${series.thinned ? ' Of so many times the extremes of short spans are drawn.' : ''} Drag across the chart to zoom in, move the slider below to go along.`,
    height: 492,
    zoom: 'x',
    thinned: series.thinned,
    spans: spansOf(series),
    switches: [{ key: 'log', label: 'Log' }],
    option: (look, is) => {
      const { observed, lines, apart } = linesLater();
      const style = lineStyles(look);
      const ends = { type: 'time', min: times[0], max: times[times.length - 1] };
      const below = { xAxisIndex: 1, yAxisIndex: 1 };
      return {
        legend: legend(look, { itemWidth: 34, data: [...observedEntry(isPoints), ...lineEntries(simulated.map(({ name }) => name))] }),
        axisPointer: { link: [{ xAxisIndex: 'all' }], lineStyle: { color: look.muted } },
        grid: [{ left: 72, right: 16, top: 36, height: 262, outerBoundsMode: 'none' }, { left: 72, right: 16, top: 338, height: 86, outerBoundsMode: 'none' }],
        xAxis: [
          axis(look, { ...ends, axisLabel: { show: false }, axisTick: { show: false } }),
          axis(look, { ...ends, gridIndex: 1, axisLine: { onZero: false } }),
        ],
        yAxis: [
          axis(look, { name: labelOf(series), nameGap: 48, ...(is('log') ? logRange(all) : { scale: !reachesZero(all) }) }),
          axis(look, { name: withUnit('Residual', series.unit), gridIndex: 1, nameGap: 48, splitNumber: 2, scale: false }),
        ],
        dataZoom: timeZoom(look, [0, 1], 'filter', (time) => moment(time, step)),
        tooltip: tooltip(look, {
          trigger: 'axis',
          formatter: (points: { axisValue: number }[]) => {
            const place = nearest(times, points[0]!.axisValue);
            return tip(moment(times[place]!, step), [
              ['observed', number(series.observed[place])],
              ...simulated.map(({ name, values }): [string, string] => [shorten(name, 40), number(values[place])]),
              ['residual', number(residuals?.[place])],
            ]);
          },
        }),
        series: [
          ...lines.flatMap(({ key, name, line }) => drawnLine(name, line, is('log'), style[key].color, { lineStyle: style[key], z: key === 'best' ? 3 : 2 })),
          ...drawnLine('observed', isPoints ? { ...observed, times: [], values: [] } : observed, is('log'), style.observed.color,
            { lineStyle: style.observed, z: 4, ...(series.periods ? shadedPeriods(look, series) : outsidePeriod(look, times, series.period)) }),
          ...(apart ? drawnLine('residual', isPoints ? { ...apart, times: [], values: [] } : apart, false, look.best,
            { ...below, lineStyle: { color: look.best, width: 1 }, areaStyle: { color: look.best, opacity: 0.2 } }) : []),
        ],
      };
    },
    values: () => ({
      columns: [{ title: 'Time' }, ...['observed', ...simulated.map(({ name }) => name), 'residual'].map((title) => ({ title, number: true, unit: series.unit }))],
      length: times.length,
      row: (place) => [moment(times[place]!, step), number(series.observed[place]), ...simulated.map(({ values }) => number(values[place])),
        number(residuals?.[place])],
    }),
  };
}

/** "dry (evaluation 2)", or the number alone. */
function scenarioName(data: ReportData, number: number): string {
  const name = data.run.runNames?.[number - 1];
  return name ? `${shorten(name, 60)} (${count(number)})` : `scenario ${count(number)}`;
}

function scenarioPlan(data: ReportData, series: Series): ChartPlan {
  const times = timesOf(series, series.observed.length);
  const isPoints = series.observedAsPoints ?? false;
  const observed = lineOf(times, series.observed, series.breaks?.observed, isPoints, true);
  const runs = (series.scenarios ?? []).map((one) => {
    const own = timesOf(one, one.values.length);
    return { name: scenarioName(data, one.number), times: own, values: one.values, line: later(() => lineOf(own, one.values, one.breaks)) };
  });
  const all = [series.observed, ...runs.map(({ values }) => values)];
  const step = [times, ...runs.map((run) => run.times)].flatMap((own) => own.slice(1, 1000).map((time, at) => time - own[at]!)).reduce((a, b) => Math.min(a, b), 86400000);
  return {
    title: 'The scenarios',
    note: `An entry of the legend switches its scenario off and on.${series.periods ? kShadedNote : ''} Drag across the chart to zoom in, move the slider below to go along.`,
    height: 430,
    zoom: 'x',
    thinned: (series.scenarios ?? []).some(({ thinned }) => thinned),
    spans: spansOf(series),
    switches: [{ key: 'log', label: 'Log' }],
    option: (look, is) => ({
      legend: legend(look, { itemWidth: 34, data: [...lineEntries(runs.map(({ name }) => name)), ...observedEntry(isPoints)] }),
      grid: { left: 64, right: 16, top: 36, height: 318, outerBoundsMode: 'none' },
      xAxis: axis(look, { type: 'time' }),
      yAxis: axis(look, { name: labelOf(series), nameGap: 48, ...(is('log') ? logRange(all) : { scale: !reachesZero(all) }) }),
      dataZoom: timeZoom(look, [0], 'filter', (time) => moment(time, step)),
      tooltip: tooltip(look, {
        trigger: 'axis',
        formatter: (points: { axisValue: number }[]) => {
          const time = points[0]!.axisValue;
          const at = (own: number[], values: Maybe[]) => {
            const place = nearest(own, time);
            return own[place] !== undefined && Math.abs(own[place]! - time) < step / 2 ? values[place] : null;
          };
          return tip(moment(time, step), [
            ...runs.map((run): [string, string] => [run.name, number(at(run.times, run.values))]),
            ['observed', number(at(times, series.observed))],
          ]);
        },
      }),
      series: [
        ...runs.flatMap(({ name, line }, index) => drawnLine(name, line(), is('log'), look.many[index % look.many.length]!, {
          lineStyle: { color: look.many[index % look.many.length], width: 1.6, type: (['solid', 'dashed', 'dotted'] as const)[Math.floor(index / look.many.length) % 3] },
        })),
        ...drawnLine('observed', isPoints ? { ...observed, times: [], values: [] } : observed, is('log'), look.observed,
          { lineStyle: { color: look.observed, width: 1 }, z: 4, ...(series.periods ? shadedPeriods(look, series) : {}) }),
      ],
    }),
    values: () => {
      const longest = runs.reduce((most, run) => (run.times.length > most.length ? run.times : most), [] as number[]);
      return {
        columns: [{ title: 'Time' }, ...runs.map(({ name }) => ({ title: name, number: true, unit: series.unit }))],
        length: longest.length,
        row: (place) => [moment(longest[place]!, step), ...runs.map((run) => number(run.values[nearest(run.times, longest[place]!)]))],
      };
    },
  };
}

/** Places in the evaluation period with an observed value: those by which a simulation is judged. */
function judgedPlaces(series: Series): number[] {
  const times = timesOf(series, series.observed.length);
  const [from, to] = series.period ?? [-Infinity, Infinity];
  return series.observed.flatMap((value, place) => (value !== null && times[place]! >= from && times[place]! <= to ? [place] : []));
}

function scatterPlan(data: ReportData, series: Series): ChartPlan {
  const places = judgedPlaces(series);
  const times = timesOf(series, series.observed.length);
  const observed = places.map((place) => series.observed[place] ?? null);
  const simulated = short(data, series);
  return {
    title: 'Simulated against observed',
    height: 340,
    small: true,
    thinned: series.thinned,
    zoom: 'xy',
    switches: [{ key: 'log', label: 'Log' }],
    option: (look, is) => {
      const scaled = (values: Maybe[]) => onLog(values, is('log')).map((value) => (value !== null && is('log') ? Math.log(value) : value));
      const dots = simulated.map(({ key, name, values }) => {
        const column = places.map((place) => values[place] ?? null);
        const drawn = thin(scaled(observed), scaled(column), 240, 200);
        return { key, name, data: drawn.map((at) => [observed[at]!, column[at]!, places[at]!]) };
      });
      const all = dots.flatMap(({ data: points }) => points.flatMap(([x, y]) => [x!, y!]));
      const low = all.reduce((least, value) => Math.min(least, value), Infinity);
      const high = all.reduce((most, value) => Math.max(most, value), -Infinity);
      const both = { log: is('log'), min: low, max: high, splitNumber: 4, axisLabel: { showMinLabel: false, showMaxLabel: false } };
      return {
        legend: legend(look, { data: dots.map(({ name }) => name), selected: dots.length > 1 ? { [dots[0]!.name]: false } : {} }),
        grid: { left: 26, right: 16, top: 36, bottom: 28 },
        xAxis: axis(look, { ...both, name: withUnit('Observed', series.unit), nameGap: 26 }),
        yAxis: axis(look, { ...both, name: withUnit('Simulated', series.unit), nameGap: 44 }),
        tooltip: tooltip(look, { formatter: (point: { value?: number[]; seriesName: string }) => (point.value && point.value.length > 2
          ? tip(moment(times[point.value[2]!]!), [['observed', number(point.value[0])], [shorten(point.seriesName, 40), number(point.value[1])]])
          : '') }),
        series: [
          ...dots.map(({ key, name, data: points }) => ({
            name, type: 'scatter', data: points, symbolSize: 4, symbol: key === 'initial' ? 'rect' : 'circle',
            itemStyle: { color: key === 'initial' ? look.initial : look.best, opacity: 0.45 },
          })),
          { name: '1:1', type: 'line', symbol: 'none', silent: true, data: Number.isFinite(low) ? [[low, low], [high, high]] : [],
            lineStyle: { color: look.ink, width: 1.2, type: 'dashed' } },
        ],
      };
    },
    csv: () => ({
      columns: [{ title: 'Time' }, ...['observed', ...simulated.map(({ name }) => name)].map((title) => ({ title, unit: series.unit }))],
      length: places.length,
      row: (at) => [moment(times[places[at]!]!), number(observed[at]), ...simulated.map(({ values }) => number(values[places[at]!]))],
    }),
  };
}

// For a thinned series the data contain the curve of all its values.
function givenCurve({ flowDuration }: Series, key: 'observed' | 'initial' | 'best'): [number, number][] | null {
  const values = flowDuration?.[key];
  if (!values) return null;
  return flowDuration!.exceedance.flatMap((share, index): [number, number][] => (values[index] == null ? [] : [[share, values[index]!]]));
}

function durationPlan(data: ReportData, series: Series): ChartPlan {
  const places = judgedPlaces(series);
  const curves = [
    ...short(data, series),
    { key: 'observed' as const, name: 'observed', values: series.observed },
  ].map((curve) => {
    const points = givenCurve(series, curve.key) ?? durationCurve(places.map((place) => curve.values[place] ?? null));
    return { ...curve, points, drawn: spaced(points.length, kCurvePoints).map((index) => points[index]!) };
  });
  const positive = curves.every(({ points }) => points.some(([, value]) => value > 0));
  return {
    title: 'Duration curve',
    height: 340,
    small: true,
    thinned: series.thinned,
    zoom: 'xy',
    switches: positive ? [{ key: 'log', label: 'Log', on: true }] : [],
    option: (look, is) => ({
      legend: legend(look, { data: lineEntries(curves.map(({ name }) => name)), itemWidth: 34 }),
      grid: { left: 26, right: 16, top: 36, bottom: 28 },
      xAxis: axis(look, { name: 'Time exceeded (%)', min: 0, max: 100, nameGap: 26 }),
      yAxis: axis(look, { name: labelOf(series), nameGap: 44, ...(is('log') ? logRange(curves.map(({ points }) => points.map(([, value]) => value))) : {}) }),
      tooltip: tooltip(look, { trigger: 'axis', formatter: (points: { seriesName: string; value: number[] }[]) =>
        tip(`Exceeded ${number(points[0]!.value[0], 3)} % of the time`, points.map((point) => [shorten(point.seriesName, 40), number(point.value[1])])) }),
      series: curves.map(({ key, name, drawn }) => ({
        name, type: 'line', symbol: 'none', lineStyle: { ...lineStyles(look)[key], width: 1.8 }, color: lineStyles(look)[key].color,
        data: is('log') ? drawn.filter(([, value]) => value > 0) : drawn,
      })),
    }),
    values: () => ({
      columns: [{ title: 'Time exceeded (%)', number: true }, ...curves.map(({ name }) => ({ title: name, number: true, unit: series.unit }))],
      length: Math.max(...curves.map(({ points }) => points.length)),
      row: (index) => [number(curves[curves.length - 1]!.points[index]?.[0]), ...curves.map(({ points }) => number(points[index]?.[1]))],
    }),
  };
}

function figuresTable(data: ReportData, series: Series): HTMLElement | null {
  const rows: [string, Figures][] = [];
  if (series.figures?.initial) rows.push([data.initialLabel ?? 'initial parameters', series.figures.initial]);
  if (series.figures?.best) rows.push(['best', series.figures.best]);
  if (rows.length === 0) return null;
  return table([{ title: 'Evaluation period' }, ...kFigures.map(([key, title, hint]) => ({ title: key === 'rmse' ? withUnit(title, series.unit) : title, hint, number: true }))],
    rows.map(([name, figures]) => [name, ...kFigures.map(([key]) => (key === 'n' ? number(figures.n, 9) : number(figures[key])))]),
    `Figures of ${series.measure}`);
}

export function seriesSection(data: ReportData): Section | null {
  const shown = data.series.filter((series) => simulations(data, series).length > 0 || finite(series.observed).length > 0);
  if (shown.length === 0) return null;
  return {
    id: 'series',
    title: 'Series',
    content: shown.flatMap((series) => [
      heading(series.measure),
      figuresTable(data, series),
      (series.scenarios?.length ?? 0) > 1 ? chart(scenarioPlan(data, series)) : null,
      chart(withSeriesAbove(hydrographPlan(data, series), series)),
      ...(judgedPlaces(series).length > 0 && simulations(data, series).length > 0
        ? [grid(chart(scatterPlan(data, series)), chart(durationPlan(data, series)))] : []),
      ...viewsOf(series, labelOf(series)),
    ]),
  };
}

