// Sobol' indices: which parameters the variance of an output comes from, how sure that is, and how it changes over time.
import { axis, chart, legend, lineEntries, timeZoom, tip, tooltip, type ChartPlan } from '../chart';
import type { Maybe, ReportData, Sobol, SobolIndex, SobolOutput, SobolSeries } from '../data';
import { make, shorten, table } from '../dom';
import { count, kMissing, moment, number, percent } from '../format';
import { nearest } from '../lines';
import { finite } from '../numbers';
import { extentOf, heatmap } from './heatmap';
import { heading, kLogSays, paragraph, type Section } from './section';
import { labelOf } from './series';
import type { CustomApi } from './uncertainty';

const kMostLines = 8; // factors with a line of their own
const kMostRows = 40;

const limits = ([, lower, upper]: SobolIndex) => (lower === null || upper === null ? 'no limits' : `${number(lower, 3)} to ${number(upper, 3)}`);

const missing = (index: SobolIndex | undefined) => index?.[4] || kLogSays;

/** The places of the factors, that with the largest total index first. */
function byTotal(output: SobolOutput): number[] {
  const key = (place: number) => output.total[place]?.[0] ?? -Infinity;
  return output.total.map((_, place) => place).sort((one, other) => key(other) - key(one) || one - other);
}

function indexPlan({ factors, negligible }: Sobol, output: SobolOutput): ChartPlan {
  const order = byTotal(output).slice(0, kMostRows);
  const names = order.map((place) => factors[place]!);
  const kinds = [
    { name: 'first-order', shift: -5, of: output.first },
    { name: 'total', shift: 5, of: output.total },
  ];
  return {
    title: `First-order and total indices: ${output.name}`,
    note: `A dot is an index, a share of the variance; the line holds it with 95 %. The first-order index is what a parameter does by itself, the total index what it does with all of its interactions. A parameter whose total line ends left of ${number(negligible)} (dotted) can be fixed. What is estimated below 0 is noise: an index cannot be negative.`,
    height: 70 + Math.max(24, Math.min(36, 900 / names.length)) * names.length,
    option: (look) => {
      const colors = [look.initial, look.best];
      return {
        legend: legend(look, { data: kinds.map(({ name }) => name) }),
        grid: { left: 24, right: 24, top: 34, bottom: 16 },
        xAxis: axis(look, { scale: false }),
        yAxis: axis(look, { type: 'category', data: names, inverse: true, axisTick: { show: false },
          axisLabel: { color: look.ink, formatter: (name: string) => shorten(name, 24), interval: 0 } }),
        tooltip: tooltip(look, { formatter: (item: { value: number[] }) => {
          const place = order[item.value[0]!]!;
          return tip(shorten(factors[place]!, 80), kinds.map(({ name, of }) => [name, `${number(of[place]![0], 3)} (${limits(of[place]!)})`] as [string, string]));
        } }),
        series: kinds.map(({ name, shift, of }, kind) => ({
          name, type: 'custom', color: colors[kind], encode: { x: [1, 2, 3], y: 0 },
          data: order.flatMap((place, row) => {
            const [value, lower, upper] = of[place]!;
            return value === null ? [] : [[row, lower ?? value, value, upper ?? value]];
          }),
          markLine: kind === 0 ? { silent: true, symbol: 'none', label: { show: false }, lineStyle: { color: look.muted, type: 'dotted' }, data: [{ xAxis: negligible }] } : undefined,
          renderItem: (_: unknown, api: CustomApi) => {
            const [left, y] = api.coord([api.value(1), api.value(0)]);
            const [middle] = api.coord([api.value(2), api.value(0)]);
            const [right] = api.coord([api.value(3), api.value(0)]);
            const at = y! + shift;
            return { type: 'group', children: [
              { type: 'line', shape: { x1: left, y1: at, x2: right, y2: at }, style: { stroke: colors[kind], lineWidth: 2 } },
              { type: 'circle', shape: { cx: middle, cy: at, r: 4 }, style: { fill: colors[kind], stroke: look.surface, lineWidth: 1 } },
            ] };
          },
        })),
      };
    },
    values: () => ({
      columns: [{ title: 'Parameter' }, ...kinds.flatMap(({ name }) => [{ title: name, number: true }, { title: 'limits' }]), { title: 'blocks', number: true }],
      length: order.length,
      row: (row) => {
        const place = order[row]!;
        return [factors[place]!, ...kinds.flatMap(({ of }) => [number(of[place]![0], 4), of[place]![1] === null ? kMissing : limits(of[place]!)]), count(output.total[place]![3] ?? 0)];
      },
      reason: (row, column) => missing(kinds[column < 3 ? 0 : 1]!.of[order[row]!]),
    }),
  };
}

function convergencePlan({ factors }: Sobol, output: SobolOutput): ChartPlan {
  const shown = byTotal(output).slice(0, kMostLines);
  return {
    title: `Total indices as the sample grew: ${output.name}`,
    note: 'From the first blocks of the same design. Lines that still move, or change places, ask for a larger sample.',
    height: 300,
    option: (look) => ({
      legend: legend(look, { data: lineEntries(shown.map((place) => factors[place]!)), itemWidth: 34 }),
      grid: { left: 40, right: 24, top: 44, bottom: 30 },
      xAxis: axis(look, { type: 'category', data: output.rows.map((rows) => count(rows)), name: 'blocks' }),
      yAxis: axis(look, { scale: false }),
      tooltip: tooltip(look, { trigger: 'axis', formatter: (found: { dataIndex: number }[]) => {
        const stage = found[0]!.dataIndex;
        return tip(`${count(output.rows[stage]!)} blocks`, shown.map((place) =>
          [shorten(factors[place]!, 40), `${number(output.stages[stage]!.total[place]![0], 3)} (${limits(output.stages[stage]!.total[place]!)})`] as [string, string]));
      } }),
      series: shown.map((place, line) => ({
        name: factors[place], type: 'line', symbolSize: 6, color: look.many[line % look.many.length],
        data: output.stages.map(({ total }) => total[place]?.[0] ?? null),
      })),
    }),
    values: () => ({
      columns: [{ title: 'Blocks', number: true }, ...shown.map((place) => ({ title: factors[place]!, number: true }))],
      length: output.rows.length,
      row: (stage) => [count(output.rows[stage]!), ...shown.map((place) => number(output.stages[stage]!.total[place]?.[0], 4))],
      reason: () => 'too few of these blocks have all runs that the index needs, or their values do not vary',
    }),
  };
}

/** The factors that matter most over the whole series: the mean of the index, weighed by the variance of each time. */
function leaders(series: SobolSeries): number[] {
  const weight = series.total.map((of) => of.reduce<number>((sum, value, time) => sum + (value ?? 0) * (series.deviation[time] ?? 0) ** 2, 0));
  return weight.map((_, place) => place).sort((one, other) => weight[other]! - weight[one]!).slice(0, kMostLines);
}

function seriesPlan({ factors }: Sobol, series: SobolSeries): ChartPlan {
  const { times } = series;
  const shown = leaders(series);
  const step = times.length > 1 ? times[1]! - times[0]! : 86400000;
  const points = (values: Maybe[]) => times.map((time, place) => [time, values[place] ?? null]);
  return {
    title: 'Indices over time, under the hydrograph',
    note: `Above, the observed values and the mean of the runs; below, how much of the variance of the runs at each time comes from a parameter.${series.stride > 1 ? ` Of so many times every ${count(series.stride)}th is drawn.` : ''} Where the runs hardly differ, indices say little. Drag across the chart to zoom in.`,
    height: 560,
    zoom: 'x',
    thinned: series.stride > 1,
    switches: [{ key: 'first', label: 'First-order', hint: 'First-order instead of total indices' }],
    option: (look, is) => {
      const of = is('first') ? series.first : series.total;
      const lines = { type: 'line', symbol: 'none', connectNulls: false };
      const [first, last] = [times[0]!, times[times.length - 1]!];
      return {
        legend: legend(look, { data: lineEntries(['observed', 'mean', ...shown.map((place) => factors[place]!)]), itemWidth: 34 }),
        grid: [{ left: 72, right: 16, top: 52, height: 190 }, { left: 72, right: 16, top: 280, bottom: 72 }],
        xAxis: [axis(look, { type: 'time', min: first, max: last, axisLabel: { show: false } }), axis(look, { type: 'time', min: first, max: last, gridIndex: 1 })],
        yAxis: [axis(look, { name: labelOf(series), nameGap: 48, scale: false }), axis(look, { gridIndex: 1, name: is('first') ? 'first-order index' : 'total index', nameGap: 48, scale: false, max: (range: { max: number }) => Math.max(1, Math.min(1.5, range.max)), min: (range: { min: number }) => Math.max(-0.2, Math.min(0, range.min)) })],
        dataZoom: timeZoom(look, [0, 1], 'filter', (time) => moment(time, step)),
        tooltip: tooltip(look, { trigger: 'axis', formatter: (found: { axisValue: number }[]) => {
          const place = nearest(times, found[0]!.axisValue);
          return tip(moment(times[place]!, step), [['observed', number(series.observed[place])], ['mean', number(series.mean[place])],
            ['standard deviation', number(series.deviation[place])],
            ...shown.map((factor) => [shorten(factors[factor]!, 40), number(of[factor]![place], 3)] as [string, string])]);
        } }),
        series: [
          { ...lines, name: 'observed', data: points(series.observed), color: look.observed, lineStyle: { color: look.observed, width: 1.1 } },
          { ...lines, name: 'mean', data: points(series.mean), color: look.muted, lineStyle: { color: look.muted, width: 1.3, type: 'dashed' } },
          ...shown.map((factor, line) => ({
            ...lines, name: factors[factor], xAxisIndex: 1, yAxisIndex: 1, data: points(of[factor]!), color: look.many[line % look.many.length], lineStyle: { width: 1.2 },
          })),
        ],
      };
    },
    values: () => ({
      columns: [{ title: 'Time' }, { title: 'observed', number: true, unit: series.unit }, { title: 'mean', number: true, unit: series.unit },
        ...factors.flatMap((name) => [{ title: `S ${name}`, number: true }, { title: `ST ${name}`, number: true }])],
      length: times.length,
      row: (place) => [moment(times[place]!, step), number(series.observed[place]), number(series.mean[place]),
        ...factors.flatMap((_, factor) => [number(series.first[factor]?.[place], 3), number(series.total[factor]?.[place], 3)])],
      reason: (_, column) => (column === 1 ? 'not observed' : 'the runs do not differ at this time, or too few have a value'),
    }),
  };
}

/** Which parameters can be fixed, judged by the limits and not by the index alone. */
function verdict({ factors, negligible }: Sobol, output: SobolOutput): Node {
  const order = byTotal(output);
  const isInert = (place: number) => output.total[place]!.slice(0, 3).every((value) => value === 0);
  const named = (places: number[]) => places.map((place) => `\u2068${shorten(factors[place]!, 60)}\u2069 (${isInert(place) ? 'no effect in any block' : limits(output.total[place]!)})`).join(', ');
  if (output.total.every(([value, lower]) => value === null || lower === null)) {
    return paragraph('Which parameters can be fixed is not said, as the indices have no limits: too few runs succeeded, or a few of them make nearly all of the variance. The log says which.');
  }
  const fixable = order.filter((place) => (output.total[place]![2] ?? Infinity) < negligible);
  const fewest = Math.min(...fixable.map((place) => output.total[place]![3]));
  const open = order.filter((place) => {
    const [, lower, upper] = output.total[place]!;
    return lower !== null && upper !== null && lower < negligible && upper >= negligible;
  });
  const interacting = order.filter((place) => (output.interactions[place]![1] ?? 0) > 0 && (output.interactions[place]![0] ?? 0) >= negligible);
  const [sum] = output.sumOfFirst;
  const lines = [
    fixable.length > 0 ? `Can be fixed, with the limits of the total index: ${named(fixable)}. What acts in less than ${percent(1 - 0.05 ** (1 / fewest))} of the space may have gone unseen in ${count(fewest)} blocks (95 %).` : `No parameter has a total index that is below ${number(negligible)} for certain: none can be fixed.`,
    ...(open.length > 0 ? [`Undecided, as the limits include ${number(negligible)}; a larger sample decides: ${named(open)}.`] : []),
    ...(interacting.length > 0 ? [`Interact with others: ${interacting.map((place) => `\u2068${shorten(factors[place]!, 60)}\u2069`).join(', ')}.`] : []),
    ...(sum ? [`By themselves the parameters explain ${number(sum[0], 3)} (${limits(sum)}) of the variance.`] : []),
  ];
  return make('ul', {}, ...lines.map((line) => make('li', {}, line)));
}

export function sobolSection(data: ReportData): Section | null {
  const { sobol } = data;
  if (!sobol || sobol.factors.length === 0) return null;
  const hasValues = (output: SobolOutput) => output.total.some(([value]) => value !== null);
  const objectives = sobol.outputs.filter(({ kind }) => kind === 'objective');
  const shown = objectives.length > 0 ? objectives : sobol.outputs;
  const others = sobol.outputs.filter((output) => !shown.includes(output));
  const content: Node[] = [];
  for (const output of shown) {
    if (!hasValues(output)) {
      const why = missing(output.total[0]);
      content.push(heading(output.name), paragraph(why === kLogSays ? `There are no indices; ${why}.` : `${why[0]!.toUpperCase()}${why.slice(1)}.`));
      continue;
    }
    content.push(heading(output.name), verdict(sobol, output), chart(indexPlan(sobol, output)));
    if (output.rows.length > 1) content.push(chart(convergencePlan(sobol, output)));
    if (output.second.length > 0) {
      content.push(chart(heatmap(`Interactions of two: ${output.name}`, sobol.factors, sobol.factors, output.second, extentOf(output.second),
        'Indices of second order: the share of the variance that comes from the interaction of the two alone.',
        (row, column) => (row === column ? 'no interaction of a parameter with itself' : 'no block of the design has all runs that the index needs'))));
    }
  }
  if (others.length > 0) {
    content.push(heading('Total indices of the output measures'), table(
      [{ title: 'Parameter' }, ...others.map(({ name }) => ({ title: shorten(name, 40), hint: name, number: true }))],
      sobol.factors.map((name, place) => [name, ...others.map(({ total }) => number(total[place]![0], 3))]), 'Total indices of the output measures',
      (row, column) => missing(others[column - 1]?.total[row])));
  }
  for (const series of sobol.series.filter(({ mean }) => finite(mean).length > 0)) {
    content.push(heading(series.measure), chart(seriesPlan(sobol, series)));
  }
  return { id: 'sobol', title: 'Sobol\u2019 indices', content };
}
