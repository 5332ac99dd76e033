// Which parameters the outputs depend on, and how well the observations determine them.
import { axis, chart, tip, tooltip, type ChartPlan } from '../chart';
import type { Covariance, Maybe, ReportData, Sensitivity } from '../data';
import { make, shorten, table } from '../dom';
import { number, percent } from '../format';
import { placeBetweenBounds } from '../numbers';
import { extentOf, heatmap } from './heatmap';
import { heading, kLogSays, paragraph, type Section } from './section';
import type { CustomApi } from './uncertainty';

const rowHeight = (rows: number) => 56 + Math.max(16, Math.min(30, 900 / rows)) * rows;

const names = (look: { ink: string }, labels: string[]) => ({
  type: 'category', data: labels, inverse: true, axisTick: { show: false },
  axisLabel: { color: look.ink, formatter: (name: string) => shorten(name, 24), interval: labels.length > 40 ? 'auto' : 0 },
});

function rankedPlan({ parameters, ranking, composite, isOfObservations }: Sensitivity): ChartPlan {
  const valueOf = new Map(parameters.map((name, index) => [name, composite[index] ?? null]));
  const order = ranking.length > 0 ? ranking : parameters;
  return {
    title: 'Composite sensitivity of the parameters',
    note: isOfObservations
      ? 'The longer the bar, the more the simulated values at the times of the observations change with the parameter. A parameter with hardly any can be fixed.'
      : 'The longer the bar, the more the outputs change with the parameter. At a calibrated set the change of an error is near zero for every parameter: a short bar does not mean that the parameter is negligible.',
    height: rowHeight(order.length),
    switches: [{ key: 'log', label: 'Log' }],
    option: (look, is) => ({
      grid: { left: 24, right: 70, top: 4, bottom: 16 },
      xAxis: axis(look, { log: is('log'), scale: false }),
      yAxis: axis(look, names(look, order)),
      tooltip: tooltip(look, { formatter: (bar: { name: string; value: number }) => tip(shorten(bar.name, 80), [['composite', number(bar.value)]]) }),
      series: [{
        type: 'bar', data: order.map((name) => ({ name, value: positiveOn(is('log'), valueOf.get(name) ?? null) })), itemStyle: { color: look.bars }, barMaxWidth: 18,
        label: { show: true, position: 'right', color: look.ink, formatter: (bar: { value: number }) => number(bar.value) },
      }],
    }),
    values: () => ({
      columns: [{ title: 'Parameter' }, { title: 'Composite', number: true }],
      length: order.length,
      row: (index) => [order[index]!, number(valueOf.get(order[index]!))],
      reason: () => 'it has no derivatives; the log says why',
    }),
  };
}

const positiveOn = (log: boolean, value: Maybe) => (log && value !== null && value <= 0 ? null : value);

// As positions between the lower and the upper bound, so that parameters of any magnitude can be compared.
function confidencePlan(data: ReportData, covariance: Covariance): ChartPlan {
  const rows = covariance.names.map((name, index) => {
    const parameter = data.parameters.find((candidate) => candidate.name === name);
    const place = (value: Maybe | undefined) => (parameter ? placeBetweenBounds(parameter, value ?? null) : null);
    return { index, low: place(covariance.lower95[index]), middle: place(covariance.estimate[index]), high: place(covariance.upper95[index]) };
  }).filter((row): row is { index: number; low: number; middle: number; high: number } => row.low !== null && row.middle !== null && row.high !== null);
  const clipped = rows.some(({ low, high }) => low < 0 || high > 1);
  return {
    title: 'Confidence limits (95 %) between the bounds of each parameter',
    note: `0 % is the lower, 100 % the upper bound, on the scale of the search.${clipped ? ' Limits beyond a bound end at it here; the table has their values.' : ''}`,
    height: rowHeight(covariance.names.length),
    option: (look) => ({
      grid: { left: 24, right: 24, top: 4, bottom: 16 },
      xAxis: axis(look, { min: 0, max: 100, axisLabel: { formatter: (value: number) => `${value} %` } }),
      yAxis: axis(look, names(look, covariance.names)),
      tooltip: tooltip(look, { formatter: (item: { value: number[] }) => {
        const index = item.value[0]!;
        return tip(shorten(covariance.names[index]!, 80), [['estimate', number(covariance.estimate[index])],
          ['lower', number(covariance.lower95[index])], ['upper', number(covariance.upper95[index])]]);
      } }),
      series: [{
        type: 'custom', encode: { x: [1, 2, 3], y: 0 }, data: rows.map(({ index, low, middle, high }) => [index, low * 100, middle * 100, high * 100]),
        renderItem: (_: unknown, api: CustomApi) => {
          const at = (value: number) => api.coord([Math.min(100, Math.max(0, value)), api.value(0)]);
          const [left, y] = at(api.value(1));
          const [right] = at(api.value(3));
          const [middle] = at(api.value(2));
          const stroke = { stroke: look.best, lineWidth: 2 };
          const line = (x1: number, y1: number, x2: number, y2: number) => ({ type: 'line', shape: { x1, y1, x2, y2 }, style: stroke });
          return { type: 'group', children: [line(left!, y!, right!, y!), line(left!, y! - 5, left!, y! + 5), line(right!, y! - 5, right!, y! + 5),
            { type: 'circle', shape: { cx: middle!, cy: y!, r: 4.5 }, style: { fill: look.best, stroke: look.surface, lineWidth: 1 } }] };
        },
      }],
    }),
  };
}

function correlationContent(covariance: Covariance): Node[] {
  const note = 'Values near \u00b11 say that the observations cannot tell two parameters apart.';
  const { names, correlation, largestCorrelations, correlationFile } = covariance;
  if (!largestCorrelations) return [chart(heatmap('Correlation of the estimated parameters', names, names, correlation, 1, note))];
  return [
    heading('Largest correlations of the estimated parameters'),
    paragraph(`${note} All of them are in ${correlationFile ?? ''}.`),
    table([{ title: 'Parameter' }, { title: 'Parameter' }, { title: 'Correlation', number: true }],
      largestCorrelations.map(({ first, second, value }) => [shorten(first, 80), shorten(second, 80), number(value)]), 'Largest correlations'),
  ];
}

const kAssumptions = [
  'The model is linear in the parameters, on the scale of the search, between the limits.',
  'The errors (residuals times their weights) are normally distributed with mean 0 and one variance, which is estimated from the residuals; the limits are quantiles of Student\u2019s t.',
  'The errors are independent of one another. Residuals that follow one another make the limits too narrow; the log states their lag-1 correlation and by how much.',
  'The model, its input and its equations are right, and parameters that are left out or fixed are known exactly. The limits take no account of the bounds.',
];

/** The limits with what they assume, `ofSet` first: what is assumed of the set that they are of. */
export function covarianceContent(data: ReportData, covariance: Covariance, ofSet: HTMLElement): Node[] {
  const columns = [{ title: 'Parameter' }, { title: 'Estimate', number: true }, { title: 'Standard deviation', number: true },
    { title: 'Lower limit', number: true }, { title: 'Upper limit', number: true }, { title: 'Deviation / estimate', number: true }];
  const rows = covariance.names.map((name, index) => {
    const [estimate, deviation] = [covariance.estimate[index] ?? null, covariance.standardDeviation[index] ?? null];
    const relative = estimate === null || deviation === null || estimate === 0 ? null : Math.abs(deviation / estimate);
    return [name, number(estimate, 6), number(deviation), number(covariance.lower95[index], 6), number(covariance.upper95[index], 6), percent(relative)];
  });
  return [
    heading('Confidence limits'),
    paragraph('What the limits assume:'),
    make('ul', {}, ofSet, ...kAssumptions.map((text) => make('li', {}, text))),
    ...(covariance.lagText ? [paragraph(`${covariance.lagText}.`)] : []),
    table(columns, rows, 'Confidence limits', (index, column) =>
      (column === 5 && covariance.standardDeviation[index] != null ? 'the estimate is 0' : 'there are no more observations than parameters, and the variance of the errors is not known')),
    ...(covariance.leftOut.length > 0 ? [paragraph(`Left out: ${covariance.leftOut.map(({ name, reason }) => `\u2068${shorten(name, 60)}\u2069 (\u2068${reason}\u2069)`).join('; ')}.`)] : []),
    chart(confidencePlan(data, covariance)),
    ...correlationContent(covariance),
  ];
}

export function sensitivitySection(data: ReportData): Section | null {
  const { sensitivity } = data;
  if (!sensitivity || sensitivity.parameters.length === 0) return null;
  const { parameters, outputs, derivatives, dimensionless } = sensitivity;
  const content: Node[] = [chart(rankedPlan(sensitivity))];
  const problem = (row: number, output: number) => sensitivity.problems?.[row]?.[output] || kLogSays;
  if (dimensionless?.length > 0 && outputs.length > 0) {
    content.push(chart(heatmap('Dimensionless sensitivities', parameters, outputs, dimensionless, extentOf(dimensionless),
      'Relative change of an output for a relative change of a parameter; the sign is that of the change.',
      (row, output) => (derivatives[row]?.[output] == null ? problem(row, output) : 'the output is 0'))));
  }
  if (derivatives?.length > 0 && outputs.length > 0) {
    content.push(heading('Derivatives'), table([{ title: 'Parameter' }, ...outputs.map((title) => ({ title: shorten(title, 40), hint: title, number: true }))],
      parameters.map((name, index) => [name, ...outputs.map((_, column) => number(derivatives[index]?.[column]))]), 'Derivatives', (row, column) => problem(row, column - 1)));
  }
  const ofSet = sensitivity.hasBetterFit
    ? make('li', {}, 'The set is the one that fits best. ', make('strong', {}, 'It is not: a warning at the top says which fits better, and the limits mislead.'))
    : make('li', {}, 'The set is the one that fits best: a better one elsewhere is not covered.');
  if (sensitivity.covariance) content.push(...covarianceContent(data, sensitivity.covariance, ofSet));
  return { id: 'sensitivity', title: 'Sensitivity', content };
}
