// The results of an uncertainty analysis: distributions, and the band of every simulated series.
import { axis, chart, legend, lineEntries, timeZoom, tip, tooltip, type ChartPlan } from '../chart';
import { timesOf, variableParameters, type Band, type Distribution, type Maybe, type ReportData } from '../data';
import { shorten } from '../dom';
import { count, moment, number, percent } from '../format';
import { nearest } from '../lines';
import { finite, histogram, spaced, type Bin } from '../numbers';
import { logRange } from '../ticks';
import { judgements } from './search';
import { grid, heading, paragraph, type Section } from './section';
import { labelOf, outside, outsidePeriod } from './series';

const kBandPoints = 1500; // across the chart: more than it has pixels
const kFewValues = 150; // observed values up to which each has a dot

// How many of `count` values the distribution has in each bin; the last bin has its upper end, too.
function expected({ quantiles }: Distribution, bins: Bin[], count: number): number[] {
  const places = finite(quantiles);
  return bins.map(({ from, to }, index) =>
    (count * places.filter((value) => value >= from && (value < to || (index === bins.length - 1 && value === to))).length) / places.length);
}

function histogramPlan(name: string, values: Maybe[], wantsLog = false, distribution?: Distribution): ChartPlan {
  const log = wantsLog && finite(values).every((value) => value > 0);
  const bins = histogram(values, log);
  const wanted = distribution ? expected(distribution, bins, finite(values).length) : [];
  const middle = ({ from, to }: Bin) => (log ? Math.sqrt(from * to) : (from + to) / 2);
  const bounds = (bin: Bin) => `${number(bin.from)} to ${number(bin.to)}`;
  return {
    title: name,
    ...(distribution ? { note: `Drawn from: ${shorten(distribution.text, 120)}; the line has as many in each bar.` } : {}),
    height: 210,
    small: true,
    option: (look) => ({
      grid: { left: 16, right: 14, top: 12, bottom: 16 },
      xAxis: axis(look, { splitNumber: 4, splitLine: { show: false }, axisLabel: { showMinLabel: false, showMaxLabel: false },
        ...(log ? logRange([bins.flatMap(({ from, to }) => [from, to])]) : {}), min: bins[0]?.from, max: bins[bins.length - 1]?.to }),
      yAxis: axis(look, { scale: false, splitNumber: 3, minInterval: 1 }),
      tooltip: tooltip(look, { formatter: (bar: { dataIndex: number }) =>
        tip(bounds(bins[bar.dataIndex]!), [['evaluations', count(bins[bar.dataIndex]!.count)],
          ...(distribution ? [['expected', number(wanted[bar.dataIndex], 3)] as [string, string]] : [])]) }),
      series: [{
        type: 'custom', color: look.bars, encode: { x: [0, 1], y: 2 }, data: bins.map((bin) => [bin.from, bin.to, bin.count]),
        renderItem: (_: unknown, api: CustomApi) => {
          const [left, top] = api.coord([api.value(0), api.value(2)]);
          const [right, bottom] = api.coord([api.value(1), 0]);
          return { type: 'rect', shape: { x: left!, y: top!, width: Math.max(1, right! - left! - 1), height: bottom! - top! }, style: { fill: look.bars } };
        },
      }, ...(distribution ? [{
        type: 'line', symbol: 'none', color: look.initial, lineStyle: { color: look.initial, width: 2 },
        data: bins.map((bin, index) => [middle(bin), wanted[index]]),
      }] : [])],
    }),
    values: () => ({
      columns: [{ title: 'From' }, ...['To', 'Evaluations', ...(distribution ? ['Expected'] : [])].map((title) => ({ title, number: true }))],
      length: bins.length,
      row: (index) => [number(bins[index]!.from), number(bins[index]!.to), count(bins[index]!.count),
        ...(distribution ? [number(wanted[index], 4)] : [])],
    }),
  };
}

/** What the charting library hands to a custom series. */
export interface CustomApi {
  value: (dimension: number) => number;
  coord: (point: number[]) => number[];
}

type Place = number | null; // of a band; null: a gap
interface Extent {
  time: number;
  low: number;
  high: number;
}

// All places with values, and a gap before those that are not to be joined with the last.
function withGaps(values: Maybe[], gaps: Set<number>): Place[] {
  return values.flatMap((value, place): Place[] => (value === null ? [] : gaps.has(place) ? [null, place] : [place]));
}

// The stretches without gaps of the band between two places, as its widest extent over each span of times that falls on
// one pixel, so that thinning loses no flood and joins nothing over a gap.
function stretches(band: Band, times: number[], gaps: Set<number>, from: number, to: number): Extent[][] {
  const edges = new Set(spaced(to - from, Math.min(to - from, kBandPoints)).map((index) => index + from));
  const found: Extent[][] = [];
  let stretch: Extent[] = [];
  let isFirstOfSpan = true;
  const close = () => {
    if (stretch.length > 0) found.push(stretch);
    stretch = [];
  };
  for (let place = from; place < to; ++place) {
    const [low, high] = [band.p5[place] ?? null, band.p95[place] ?? null];
    if (gaps.has(place) || low === null || high === null) close();
    if (edges.has(place)) isFirstOfSpan = true;
    if (low === null || high === null) continue;
    const extent = stretch[stretch.length - 1];
    if (isFirstOfSpan || !extent) {
      stretch.push({ time: times[place]!, low, high });
    } else {
      extent.low = Math.min(extent.low, low);
      extent.high = Math.max(extent.high, high);
    }
    isFirstOfSpan = false;
  }
  close();
  return found;
}

// One closed outline per stretch: along the upper edge and back along the lower. A single time is a line.
function bandShapes(found: Extent[][], coord: (point: number[]) => number[], color: string): object[] {
  return found.map((stretch) => {
    const upper = stretch.map(({ time, high }) => coord([time, high]));
    const lower = stretch.map(({ time, low }) => coord([time, low]));
    const [[x1, y1], [x2, y2]] = [upper[0] as [number, number], lower[0] as [number, number]];
    return stretch.length > 1
      ? { type: 'polygon', shape: { points: [...upper, ...lower.reverse()] }, style: { fill: color, opacity: 0.45 } }
      : { type: 'line', shape: { x1, y1, x2, y2 }, style: { stroke: color, lineWidth: 2, opacity: 0.6 } };
  });
}

function runsNote({ runs, fewestRuns, mostRuns }: Band): string {
  if (!mostRuns) return '';
  if (!runs) return ` The quantiles are of those of ${count(mostRuns)} runs that have a value at the time.`;
  return ` The quantiles are of ${fewestRuns === mostRuns ? '' : `${count(fewestRuns ?? 0)} to `}${count(mostRuns)} runs.`;
}

function coverageNote(band: Band): string {
  if (band.n === 0) return 'No observed value has a simulated one at its time.';
  const width = band.width == null ? '' : ` It is ${number(band.width)}${band.unit ? ` ${band.unit}` : ''} wide on average at them${
    band.relativeWidth == null ? '' : `, ${number(band.relativeWidth, 3)} of their standard deviation`}.`;
  return `${percent(band.inside)} of ${band.n === null ? 'the' : count(band.n)} observed values lie within the band.${width}`;
}

function bandPlan(band: Band, period: [number, number] | null): ChartPlan {
  const times = timesOf(band, band.p5.length);
  const step = times.length > 1 ? times[1]! - times[0]! : 86400000;
  const positive = (value: Maybe | undefined) => (value != null && value > 0 ? value : null);
  const gaps = new Set(band.gaps ?? []);
  const median = withGaps(band.p50, gaps);
  const observed = withGaps(band.observed, new Set(band.observedGaps ?? []));
  const isGap = (index: number) => (observed[index] ?? null) === null;
  const alone = observed.filter((_, index) => !isGap(index) && isGap(index - 1) && isGap(index + 1));
  const few = finite(band.observed).length <= kFewValues;
  return {
    title: band.isTotal ? 'The 5 to 95 % band of what would be observed, with the errors' : 'The 5 to 95 % band of the simulated values, and the observed',
    note: `${coverageNote(band)}${runsNote(band)}${band.thinned ? ' Of so many times the extremes of short spans are drawn.' : ''}${outside(times, period).length > 0 ? ' Shaded: outside the evaluation period.' : ''} Drag across the chart to zoom in.`,
    height: 440,
    zoom: 'x',
    thinned: band.thinned,
    switches: [{ key: 'log', label: 'Log' }],
    option: (look, is) => {
      const scaled = (value: Maybe | undefined) => (is('log') ? positive(value) : value ?? null);
      const shown = is('log') ? { ...band, p5: band.p5.map(positive), p95: band.p95.map(positive) } : band;
      const points = (places: Place[], values: Maybe[]) => places.map((place, index) =>
        (place === null ? [times[places[index + 1]!]!, null] : [times[place]!, scaled(values[place])]));
      const lines = { type: 'line', symbol: 'none', connectNulls: false }; // not sampled by the library, which joins lines over gaps
      const [first, last] = [times[0]!, times[times.length - 1]!];
      return {
        legend: legend(look, { data: ['5 to 95 %', ...lineEntries(['median', 'observed'])], itemWidth: 34 }),
        grid: { left: 72, right: 16, top: 36, bottom: 72 },
        xAxis: [axis(look, { type: 'time', min: first, max: last })],
        yAxis: axis(look, { name: labelOf(band), log: is('log'), nameGap: 48, ...(is('log') ? {} : { scale: false }) }),
        dataZoom: timeZoom(look, [0], 'filter', (time) => moment(time, step)),
        tooltip: tooltip(look, { trigger: 'axis', formatter: (found: { axisValue: number }[]) => {
          const place = nearest(times, found[0]!.axisValue);
          return tip(moment(times[place]!, step), [['observed', number(band.observed[place])], ['median', number(band.p50[place])],
            ['5 %', number(band.p5[place])], ['95 %', number(band.p95[place])],
            ...(band.runs ? [['runs', count(band.runs[place] ?? 0)] as [string, string]] : [])]);
        } }),
        series: [
          {
            name: '5 to 95 %', type: 'custom', color: look.band, clip: true, tooltip: { show: false },
            // The first place in view draws the whole band; all of them give the value axis its extent.
            encode: { x: 0, y: [1, 2] }, data: times.map((time, place) => [time, shown.p5[place], shown.p95[place]]), progressive: 0,
            renderItem: (info: { dataIndexInside: number; coordSys: { x: number; width: number } }, api: CustomApi & { size: (of: number[]) => number[] }) => {
              if (info.dataIndexInside > 0) return null;
              const origin = api.coord([first, api.value(1)])[0]!;
              const scale = api.size([1, 0])[0]!;
              const from = Math.max(0, times.findIndex((time) => origin + (time - first) * scale >= info.coordSys.x) - 1);
              const end = times.findIndex((time) => origin + (time - first) * scale > info.coordSys.x + info.coordSys.width);
              const found = stretches(shown, times, gaps, from, end < 0 ? times.length : Math.min(times.length, end + 2));
              return { type: 'group', children: bandShapes(found, api.coord, look.band) };
            },
          },
          { ...lines, name: 'median', data: points(median, band.p50), color: look.best, lineStyle: { color: look.best, width: 1.3 } },
          { ...lines, name: 'observed', data: points(observed, band.observed), color: look.observed, lineStyle: { color: look.observed, width: 1.1 }, z: 4, ...outsidePeriod(look, times, period) },
          // Values without a neighbour have no line, and a line through a few hides where they are.
          { name: 'observed', type: 'scatter', data: points(few ? observed : alone, band.observed), symbolSize: 5, itemStyle: { color: look.observed }, z: 4 },
        ],
      };
    },
    values: () => ({
      columns: [{ title: 'Time' }, ...['observed', '5 %', 'median', '95 %'].map((title) => ({ title, number: true, unit: band.unit })),
        ...(band.runs ? [{ title: 'runs', number: true }] : [])],
      length: times.length,
      row: (place) => [moment(times[place]!, step), ...[band.observed, band.p5, band.p50, band.p95].map((values) => number(values[place])),
        ...(band.runs ? [count(band.runs[place] ?? 0)] : [])],
      reason: (_, column) => (column === 1 ? 'not observed' : 'no run has a value at this time'),
    }),
  };
}

export function bandSection(data: ReportData): Section | null {
  const shown = data.band.filter(({ p5, p95 }) => finite(p5).length > 0 && finite(p95).length > 0);
  if (shown.length === 0) return null;
  const period = data.run.period?.map((time) => Date.parse(`${time.replace(' ', 'T')}Z`)) as [number, number] | undefined ?? null;
  return { id: 'band', title: 'Uncertainty band', content: shown.flatMap((band) => [band.isTotal ? null : heading(band.measure), chart(bandPlan(band, period))]) };
}

export function distributionSection(data: ReportData): Section | null {
  // The sets that chains try are not distributed as the posterior, which has a section of its own.
  const inputs = data.posterior ? [] : variableParameters(data).map(({ name, transformation }, index) =>
    chart(histogramPlan(name, data.evaluations.parameters[index] ?? [], transformation === 'logarithmic', data.distributions?.[index])));
  const outputs = judgements(data).map(({ name, values }) => chart(histogramPlan(name, values)));
  if (data.evaluations.count < 2 || inputs.length + outputs.length === 0) return null;
  return {
    id: 'distributions',
    title: 'Distributions',
    content: [
      paragraph(`How often a value came up among ${count(data.evaluations.count)} evaluations.`),
      ...(inputs.length > 0 ? [heading('Parameters'), grid(...inputs)] : []),
      ...(outputs.length > 0 ? [heading('Objectives and measures'), grid(...outputs)] : []),
    ],
  };
}

