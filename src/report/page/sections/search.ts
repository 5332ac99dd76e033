// The course of the search, and what the evaluations tell of each parameter.
import { axis, chart, legend, lineEntries, tip, tooltip, type Chart, type ChartPlan } from '../chart';
import { variableParameters, type Maybe, type Parameter, type ReportData } from '../data';
import { choice, shorten } from '../dom';
import { count, number } from '../format';
import { axisTop, bestShare, bestSoFar, correlation, finite, ofDifferentSets, placeBetweenBounds, quantile, sorted, spaced, thin } from '../numbers';
import { heatmap } from './heatmap';
import { parameterAxis, parallelPlan } from './parallel';
import { grid, paragraph, type Section } from './section';

const kGoodShare = 0.1;
const kLinesDrawn = 300;
const dotSize = (dots: number) => (dots < 500 ? 5 : 3);

/** What an evaluation can be judged by: the aggregate, the objective functions, the measures. */
export interface Judgement {
  name: string;
  values: Maybe[];
}

export function judgements(data: ReportData): Judgement[] {
  const { evaluations } = data;
  const all = [
    { name: 'Aggregate', values: evaluations.aggregate },
    ...data.objectives.map(({ name }, index) => ({ name: `Objective function: ${name}`, values: evaluations.objectives[index] ?? [] })),
    ...data.measures.map(({ name }, index) => ({ name: `Measure: ${name}`, values: evaluations.measures[index] ?? [] })),
  ];
  return all.filter(({ values }) => finite(values).length > 0);
}

/** Whether evaluations follow one another for the better; those of other tasks have no order. */
const isSearch = (data: ReportData) => data.run.task === 'optimisation';

const positive = (value: Maybe) => (value !== null && value > 0 ? value : null);

function progressPlan(data: ReportData): ChartPlan {
  const { numbers, aggregate, ok } = data.evaluations;
  const best = bestSoFar(aggregate);
  const failed = numbers.filter((_, place) => ok[place] === 0);
  const top = axisTop(aggregate);
  const above = finite(aggregate).filter((value) => value > top).length;
  const logable = finite(aggregate).every((value) => value > 0);
  const searches = isSearch(data);
  return {
    title: `Aggregate of every evaluation${searches ? ', and the best so far' : ''}`,
    height: 380,
    zoom: 'xy',
    switches: [
      ...(logable ? [{ key: 'log', label: 'Log' }] : []),
      ...(above > 0 ? [{ key: 'all', label: 'All values', hint: 'Let the axis reach to the largest value' }] : []),
    ],
    note: above > 0 ? `${count(above)} of ${count(finite(aggregate).length)} values lie above ${number(top)} and are drawn with \u201cAll values\u201d.` : '',
    option: (look, is) => {
      const pairs = (values: Maybe[]) => values.flatMap((value, place) => (value === null ? [] : [[numbers[place], value]]));
      const steps = best.flatMap((value, place) =>
        (value !== null && (place === best.length - 1 || value !== best[place - 1]) ? [[numbers[place], value]] : []));
      const end = is('all') || is('log') ? undefined : Number.isFinite(top) ? top : undefined;
      return {
        legend: legend(look),
        grid: { left: 24, right: 16, top: 36, bottom: 28 },
        xAxis: axis(look, { name: 'Evaluation', min: 'dataMin', max: 'dataMax', minInterval: 1, nameGap: 26 }),
        yAxis: [axis(look, { log: is('log'), max: end }), { type: 'value', min: 0, max: 1, show: false }],
        tooltip: tooltip(look, { formatter: (point: { seriesName: string; value: number[] }) =>
          tip(`Evaluation ${count(point.value[0]!)}`, point.seriesName === 'failed' ? [['failed', '']] : [[point.seriesName, number(point.value[1], 6)]]) }),
        series: [
          { name: 'evaluation', type: 'scatter', data: pairs(aggregate), symbolSize: dotSize(numbers.length), large: true, largeThreshold: 3000,
            clip: true, itemStyle: { color: look.dots, opacity: 0.75 } },
          ...(searches ? [{ name: 'best so far', type: 'line', step: 'end', data: steps, symbol: 'none', clip: true,
            lineStyle: { color: look.best, width: 2.5 }, itemStyle: { color: look.best } }] : []),
          ...(failed.length > 0 ? [{ name: 'failed', type: 'scatter', yAxisIndex: 1, data: failed.map((value) => [value, 0.012]),
            symbol: 'triangle', symbolSize: 7, large: true, largeThreshold: 3000, itemStyle: { color: look.failed } }] : []),
        ],
      };
    },
    values: () => ({
      columns: [{ title: 'Evaluation' }, { title: 'Aggregate', number: true }, ...(searches ? [{ title: 'Best so far', number: true }] : [])],
      length: numbers.length,
      row: (place) => [count(numbers[place]!), ok[place] === 0 ? 'failed' : number(aggregate[place], 6), ...(searches ? [number(best[place], 6)] : [])],
    }),
  };
}

function dottyPlan(data: ReportData, parameter: Parameter, column: Maybe[], judgement: () => Judgement): ChartPlan {
  const log = parameter.transformation === 'logarithmic' && finite(column).every((value) => value > 0);
  return {
    title: parameter.name,
    height: 230,
    small: true,
    zoom: 'xy',
    switches: [{ key: 'all', label: 'All values', hint: 'Let the axis reach to the largest value' }],
    option: (look, is) => {
      const { name, values } = judgement();
      const top = is('all') ? Infinity : axisTop(values);
      const places = thin(log ? column.map((value) => (value === null ? null : Math.log(value))) : column, values, 160, 110, top);
      const best = bestShare(values, 0)[0];
      return {
        grid: { left: 16, right: 14, top: 12, bottom: 16 },
        xAxis: axis(look, { log, min: parameter.lower ?? undefined, max: parameter.upper ?? undefined, splitNumber: 4, ...(parameter.integer ? { minInterval: 1 } : {}) }),
        yAxis: axis(look, { max: Number.isFinite(top) ? top : undefined, splitNumber: 4 }),
        tooltip: tooltip(look, { formatter: (point: { value: number[] }) => tip(`Evaluation ${count(point.value[2]!)}`,
          [[shorten(parameter.name, 40), number(point.value[0], 6)], [shorten(name, 40), number(point.value[1], 6)]]) }),
        series: [
          { type: 'scatter', symbolSize: dotSize(places.length), itemStyle: { color: look.dots, opacity: 0.7 },
            data: places.map((place) => [column[place], values[place], data.evaluations.numbers[place]]) },
          { type: 'scatter', symbol: 'diamond', symbolSize: 13, z: 5, itemStyle: { color: look.best, borderColor: look.surface, borderWidth: 1 },
            data: best === undefined ? [] : [[column[best], values[best], data.evaluations.numbers[best]]] },
        ],
      };
    },
    csv: () => ({
      columns: [{ title: 'Evaluation' }, { title: parameter.name }, { title: judgement().name }],
      length: column.length,
      row: (place) => [count(data.evaluations.numbers[place]!), number(column[place]), number(judgement().values[place])],
    }),
  };
}

/** Every parameter against a judgement that the reader chooses. */
export function dottySection(data: ReportData, title: string): Section | null {
  const options = judgements(data);
  if (options.length === 0) return null;
  let chosen = options[0]!;
  const charts: Chart[] = variableParameters(data).map((parameter, index) =>
    chart(dottyPlan(data, parameter, data.evaluations.parameters[index] ?? [], () => chosen)));
  if (charts.length === 0) return null;
  const choose = (index: number) => {
    chosen = options[index]!;
    charts.forEach((item) => item.redraw());
  };
  return {
    id: 'dotty',
    title,
    content: [
      paragraph('Each dot is an evaluation. A clear lower edge with one lowest place says that the parameter is identifiable; a flat one says that other values fit as well. The diamond is the best.'),
      options.length > 1 ? choice('Against', options.map(({ name }) => name), choose) : null,
      grid(...charts),
    ],
  };
}

// Of few sets more than a tenth are shown.
function nameOfGood(sets: number, good: number[]): string {
  const isShare = sets * kGoodShare > good.length - 1;
  return isShare ? `best tenth (${count(good.length)} sets)` : `${count(good.length)} best sets`;
}

function goodSetsPlan(data: ReportData, good: number[], name: string): ChartPlan {
  const variable = variableParameters(data);
  const { aggregate, parameters, numbers } = data.evaluations;
  const places = spaced(good.length, kLinesDrawn).map((rank) => good[rank]!).reverse(); // the best on top
  return parallelPlan({
    title: `Parallel coordinates of the ${name}`,
    note: `Each line is a parameter set, the colour its aggregate; the thick line is the best. Drag along an axis to pick lines.${
      good.length > places.length ? ` ${count(places.length)} of ${count(good.length)} lines are drawn.` : ''}`,
    lines: {
      axes: [...variable.map((parameter, index) => parameterAxis(parameter, parameters[index] ?? [])), { name: 'Aggregate', values: aggregate }],
      places,
      colouredBy: variable.length,
      headline: (place) => `Evaluation ${count(numbers[place]!)}`,
      thick: () => places.slice(-1),
    },
    csv: () => ({
      columns: ['Evaluation', ...variable.map(({ name }) => name), 'Aggregate'].map((title) => ({ title })),
      length: good.length,
      row: (rank) => [count(numbers[good[rank]!]!), ...variable.map((_, index) => number(parameters[index]?.[good[rank]!])), number(aggregate[good[rank]!])],
    }),
  });
}

function correlationPlan(data: ReportData, good: number[], name: string): ChartPlan {
  const names = variableParameters(data).map(({ name }) => name);
  const { parameters } = data.evaluations;
  const matrix = names.map((_, row) => names.map((__, column) =>
    (row === column ? 1 : correlation(parameters[row] ?? [], parameters[column] ?? [], good))));
  return heatmap(`Correlation of the parameters among the ${name}`, names, names, matrix, 1,
    'Values near \u00b11 say that two parameters make up for each other.');
}

// Spread in successive blocks of the size of the population: the interquartile range of each parameter, as a share of
// its range.
function spreadPlan(data: ReportData, size: number): ChartPlan {
  const variable = variableParameters(data);
  const { parameters, numbers, ok } = data.evaluations;
  const blocks = Math.floor(numbers.length / size);
  const step = Math.max(1, Math.ceil(blocks / 400));
  const ends: number[] = [];
  for (let block = 1; block <= blocks; block += step) ends.push(block * size);
  const spread = variable.map((parameter, index) => ends.map((end) => {
    const places: Maybe[] = [];
    for (let place = end - size; place < end; ++place) {
      if (ok[place] === 1) places.push(placeBetweenBounds(parameter, parameters[index]?.[place] ?? null));
    }
    const ordered = sorted(places);
    return ordered.length < 2 ? null : quantile(ordered, 0.75) - quantile(ordered, 0.25);
  }));
  const logable = spread.every((column) => finite(column).every((value) => value > 0));
  return {
    title: 'Spread of the population',
    note: `Middle half of each parameter among ${count(size)} successive evaluations (the size of the population), in percent of the range between its bounds.`,
    height: 340,
    zoom: 'x',
    switches: [{ key: 'log', label: 'Log', on: logable }],
    option: (look, is) => ({
      legend: legend(look, { data: lineEntries(variable.map(({ name }) => name)), itemWidth: 34 }),
      grid: { left: 24, right: 16, top: 36, bottom: 28 },
      xAxis: axis(look, { name: 'Evaluation', min: 'dataMin', max: 'dataMax', minInterval: 1, nameGap: 26 }),
      yAxis: axis(look, { log: is('log'), axisLabel: { formatter: (value: number) => `${number(value, 3)} %` } }),
      tooltip: tooltip(look, { trigger: 'axis', order: 'valueDesc', formatter: (points: { seriesName: string; value: number[] }[]) =>
        tip(`Up to evaluation ${count(points[0]!.value[0]!)}`, points.slice(0, 16).map((point) => [shorten(point.seriesName, 40), `${number(point.value[1], 3)} %`])) }),
      series: variable.map((parameter, index) => ({
        name: parameter.name, type: 'line', symbol: 'none', clip: true,
        lineStyle: { width: 1.8, type: (['solid', 'dashed', 'dotted'] as const)[Math.floor(index / look.many.length) % 3] },
        color: look.many[index % look.many.length],
        data: ends.map((end, block) => {
          const value = spread[index]![block] ?? null;
          const shown = value === null ? null : value * 100;
          return [numbers[end - 1], is('log') ? positive(shown) : shown];
        }),
      })),
    }),
  };
}

export function progressSection(data: ReportData): Section | null {
  if (data.evaluations.count === 0 || finite(data.evaluations.aggregate).length === 0) return null;
  const charts: Node[] = [chart(progressPlan(data))];
  const size = data.run.populationSize;
  if (size !== null && size > 1 && data.evaluations.count >= 2 * size) charts.push(chart(spreadPlan(data, size)));
  return { id: 'progress', title: isSearch(data) ? 'Progress' : 'Evaluations', content: charts };
}

export function goodSetsSection(data: ReportData): Section | null {
  const { aggregate, parameters } = data.evaluations;
  const different = ofDifferentSets(aggregate, parameters);
  const good = bestShare(different, kGoodShare);
  const name = nameOfGood(finite(different).length, good);
  if (good.length < 3 || variableParameters(data).length < 2) return null;
  return {
    id: 'good-sets',
    title: 'The best sets',
    content: [chart(goodSetsPlan(data, good, name)), chart(correlationPlan(data, good, name))],
  };
}

