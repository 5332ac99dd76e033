// The results of an uncertainty analysis: distributions, and the band of every simulated series.
import { axis, chart, legend, lineEntries, timeZoom, tip, tooltip, type ChartPlan } from '../chart';
import { timesOf, variableParameters, type Band, type Maybe, type ReportData } from '../data';
import { count, moment, number, percent } from '../format';
import { finite, histogram, spaced, type Bin } from '../numbers';
import { judgements } from './search';
import { grid, heading, paragraph, type Section } from './section';

const kBandPoints = 1500; // across the chart: more than it has pixels

function histogramPlan(name: string, values: Maybe[], wantsLog = false): ChartPlan {
  const log = wantsLog && finite(values).every((value) => value > 0);
  const bins = histogram(values, log);
  const bounds = (bin: Bin) => `${number(bin.from)} to ${number(bin.to)}`;
  return {
    title: name,
    height: 210,
    small: true,
    option: (look) => ({
      grid: { left: 16, right: 14, top: 12, bottom: 16 },
      xAxis: axis(look, { log, splitNumber: 4, splitLine: { show: false }, min: bins[0]?.from, max: bins[bins.length - 1]?.to, axisLabel: { showMinLabel: false, showMaxLabel: false } }),
      yAxis: axis(look, { scale: false, splitNumber: 3, minInterval: 1 }),
      tooltip: tooltip(look, { formatter: (bar: { dataIndex: number }) =>
        tip(bounds(bins[bar.dataIndex]!), [['evaluations', count(bins[bar.dataIndex]!.count)]]) }),
      series: [{
        type: 'custom', color: look.bars, encode: { x: [0, 1], y: 2 }, data: bins.map((bin) => [bin.from, bin.to, bin.count]),
        renderItem: (_: unknown, api: CustomApi) => {
          const [left, top] = api.coord([api.value(0), api.value(2)]);
          const [right, bottom] = api.coord([api.value(1), 0]);
          return { type: 'rect', shape: { x: left!, y: top!, width: Math.max(1, right! - left! - 1), height: bottom! - top! }, style: { fill: look.bars } };
        },
      }],
    }),
    values: () => ({
      columns: [{ title: 'From' }, { title: 'To', number: true }, { title: 'Evaluations', number: true }],
      length: bins.length,
      row: (index) => [number(bins[index]!.from), number(bins[index]!.to), count(bins[index]!.count)],
    }),
  };
}

/** What the charting library hands to a custom series. */
export interface CustomApi {
  value: (dimension: number) => number;
  coord: (point: number[]) => number[];
}

// One closed outline per stretch of values without gaps: along the upper edge and back along the lower.
function bandOutlines(times: number[], low: Maybe[], high: Maybe[], places: number[]): number[][][] {
  const outlines: number[][][] = [];
  let run: number[] = [];
  const close = () => {
    if (run.length > 1) outlines.push([...run.map((place) => [times[place]!, high[place]!]), ...run.reverse().map((place) => [times[place]!, low[place]!])]);
    run = [];
  };
  for (const place of places) {
    if (low[place] == null || high[place] == null) close();
    else run.push(place);
  }
  close();
  return outlines;
}

// The widest extent of the band over each stretch of times that falls on one pixel, so that thinning loses no flood.
function widest(band: Band, from: number, to: number): { places: number[]; low: Maybe[]; high: Maybe[] } {
  const length = to - from;
  const edges = spaced(length, Math.min(length, kBandPoints)).map((index) => index + from);
  const low: Maybe[] = [];
  const high: Maybe[] = [];
  edges.forEach((edge, index) => {
    let [least, most]: [Maybe, Maybe] = [band.p5[edge] ?? null, band.p95[edge] ?? null];
    for (let place = edge + 1; place < (edges[index + 1] ?? edge + 1); ++place) {
      const [below, above] = [band.p5[place] ?? null, band.p95[place] ?? null];
      if (below !== null && least !== null) least = Math.min(least, below);
      if (above !== null && most !== null) most = Math.max(most, above);
    }
    low[edge] = least;
    high[edge] = most;
  });
  return { places: edges, low, high };
}

function bandPlan(band: Band): ChartPlan {
  const times = timesOf(band, band.p5.length);
  const step = times.length > 1 ? times[1]! - times[0]! : 86400000;
  const positive = (value: Maybe | undefined) => (value != null && value > 0 ? value : null);
  return {
    title: 'The 5 to 95 % band of the simulated values, and the observed',
    note: `${percent(band.inside)} of ${band.n === null ? 'the' : count(band.n)} observed values lie within the band. Drag across the chart to zoom in.`,
    height: 440,
    zoom: 'x',
    switches: [{ key: 'log', label: 'Log' }],
    option: (look, is) => {
      const scaled = (values: Maybe[]) => (is('log') ? values.map(positive) : values);
      const shown = is('log') ? { ...band, p5: scaled(band.p5), p95: scaled(band.p95) } : band;
      const lines = { type: 'line', symbol: 'none', sampling: 'lttb' };
      const [first, last] = [times[0]!, times[times.length - 1]!];
      return {
        dataset: { source: { time: times, p5: scaled(band.p5), p50: scaled(band.p50), p95: scaled(band.p95), observed: scaled(band.observed) },
          dimensions: ['time', 'p5', 'p50', 'p95', 'observed'] },
        legend: legend(look, { data: ['5 to 95 %', ...lineEntries(['median', 'observed'])], itemWidth: 34 }),
        grid: { left: 72, right: 16, top: 36, bottom: 72 },
        xAxis: [axis(look, { type: 'time', min: first, max: last })],
        yAxis: axis(look, { name: band.unit || 'Value', log: is('log'), nameGap: 48, ...(is('log') ? {} : { scale: false }) }),
        dataZoom: timeZoom(look, [0], 'none', (time) => moment(time, step)),
        tooltip: tooltip(look, { trigger: 'axis', formatter: (points: { dataIndex: number }[]) => {
          const place = points[points.length - 1]!.dataIndex;
          return tip(moment(times[place]!, step), [['observed', number(band.observed[place])], ['median', number(band.p50[place])],
            ['5 %', number(band.p5[place])], ['95 %', number(band.p95[place])]]);
        } }),
        series: [
          {
            name: '5 to 95 %', type: 'custom', color: look.band, clip: true, tooltip: { show: false },
            // One item draws the whole band; its two corners give the axes their extent.
            data: [[first, finite(shown.p5).reduce((a, b) => Math.min(a, b), Infinity)], [last, finite(shown.p95).reduce((a, b) => Math.max(a, b), -Infinity)]],
            renderItem: (info: { dataIndex: number; coordSys: { x: number; width: number } }, api: CustomApi & { size: (of: number[]) => number[] }) => {
              if (info.dataIndex > 0) return null;
              const origin = api.coord([first, api.value(1)])[0]!;
              const scale = api.size([1, 0])[0]!;
              const from = Math.max(0, times.findIndex((time) => origin + (time - first) * scale >= info.coordSys.x) - 1);
              const end = times.findIndex((time) => origin + (time - first) * scale > info.coordSys.x + info.coordSys.width);
              const { places, low, high } = widest(shown, from, end < 0 ? times.length : Math.min(times.length, end + 1));
              return { type: 'group', children: bandOutlines(times, low, high, places).map((outline) => ({
                type: 'polygon', shape: { points: outline.map((point) => api.coord(point)) }, style: { fill: look.band, opacity: 0.45 },
              })) };
            },
          },
          { ...lines, name: 'median', encode: { x: 'time', y: 'p50' }, color: look.best, lineStyle: { color: look.best, width: 1.3 } },
          { ...lines, name: 'observed', encode: { x: 'time', y: 'observed' }, color: look.observed, lineStyle: { color: look.observed, width: 1.1 }, z: 4 },
        ],
      };
    },
    values: () => ({
      columns: [{ title: 'Time' }, ...['observed', '5 %', 'median', '95 %'].map((title) => ({ title, number: true, unit: band.unit }))],
      length: times.length,
      row: (place) => [moment(times[place]!, step), ...[band.observed, band.p5, band.p50, band.p95].map((values) => number(values[place]))],
    }),
  };
}

export function bandSection(data: ReportData): Section | null {
  const shown = data.band.filter(({ p5, p95 }) => finite(p5).length > 0 && finite(p95).length > 0);
  if (shown.length === 0) return null;
  return { id: 'band', title: 'Uncertainty band', content: shown.flatMap((band) => [heading(band.measure), chart(bandPlan(band))]) };
}

export function distributionSection(data: ReportData): Section | null {
  const inputs = variableParameters(data).map(({ name, transformation }, index) =>
    chart(histogramPlan(name, data.evaluations.parameters[index] ?? [], transformation === 'logarithmic')));
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

