// The residuals of a simulation: when and where they are large, and whether they depend on each other.
import { BoxplotChart } from 'echarts/charts';
import { use } from 'echarts/core';
import { axis, chart, tip, tooltip, type ChartPlan } from '../chart';
import { withUnit, type Unit } from '../data';
import { make } from '../dom';
import { count, counted, number } from '../format';
import type { Views } from '../views';
import { grid } from './section';

use([BoxplotChart]);

const kMonths = ['Jan', 'Feb', 'Mar', 'Apr', 'May', 'Jun', 'Jul', 'Aug', 'Sep', 'Oct', 'Nov', 'Dec'];
const kQuantiles = ['5 %', '25 %', 'median', '75 %', '95 %'];
const kGrid = { left: 26, right: 16, top: 16, bottom: 28 };

const monthName = (time: number) => new Date(time).toISOString().slice(0, 7);

function monthsPlan({ of, residuals }: Views, unit: Unit): ChartPlan {
  return {
    title: 'Mean residual of each month',
    height: 240,
    zoom: 'x',
    option: (look) => ({
      grid: { ...kGrid, left: 64, outerBoundsMode: 'none' },
      xAxis: axis(look, { type: 'time' }),
      yAxis: axis(look, { name: withUnit('Mean residual', unit), nameGap: 48, scale: false }),
      tooltip: tooltip(look, { formatter: ({ value }: { value: number[] }) => tip(monthName(value[0]!), [['mean residual', number(value[1])]]) }),
      series: [{ name: 'mean residual', type: 'bar', barMaxWidth: 12, itemStyle: { color: look[of] }, data: residuals.months.map((time, index) => [time, residuals.monthMeans[index]!]) }],
    }),
    values: () => ({
      columns: [{ title: 'Month' }, { title: 'mean residual', number: true, unit }],
      length: residuals.months.length,
      row: (index) => [monthName(residuals.months[index]!), number(residuals.monthMeans[index])],
    }),
  };
}

function seasonalPlan({ of, residuals: { byMonth } }: Views, unit: Unit): ChartPlan {
  return {
    title: 'Residuals by month of the year',
    note: 'Box: 25 to 75 %, with the median; whiskers: 5 and 95 %.',
    height: 320,
    small: true,
    option: (look) => ({
      grid: kGrid,
      xAxis: axis(look, { type: 'category', data: kMonths }),
      yAxis: axis(look, { name: withUnit('Residual', unit), nameGap: 44 }),
      tooltip: tooltip(look, { formatter: ({ dataIndex }: { dataIndex: number }) =>
        tip(kMonths[dataIndex]!, kQuantiles.map((name, index) => [name, number(byMonth[dataIndex]![index])])) }),
      series: [{ name: 'residuals', type: 'boxplot', data: byMonth.map((quantiles) => (quantiles[0] == null ? [] : quantiles)), itemStyle: { color: look.surface, borderColor: look[of], borderWidth: 1.5 } }],
    }),
    values: () => ({
      columns: [{ title: 'Month' }, ...kQuantiles.map((title) => ({ title, number: true, unit }))],
      length: 12,
      row: (index) => [kMonths[index]!, ...kQuantiles.map((_, at) => number(byMonth[index]![at]))],
    }),
  };
}

function flowsPlan({ of, residuals: { flows, ofFlows, n } }: Views, unit: Unit): ChartPlan {
  const isPositive = flows.every((flow) => flow > 0);
  return {
    title: 'Residuals against the simulated value',
    note: flows.length < n ? `${count(flows.length)} of ${count(n)} points are drawn: of those that nearly coincide, one.` : '',
    thinned: flows.length < n,
    height: 320,
    small: true,
    zoom: 'xy',
    switches: isPositive ? [{ key: 'log', label: 'Log' }] : [],
    option: (look, is) => ({
      grid: kGrid,
      xAxis: axis(look, { name: withUnit('Simulated', unit), log: is('log'), nameGap: 26 }),
      yAxis: axis(look, { name: withUnit('Residual', unit), nameGap: 44 }),
      tooltip: tooltip(look, { formatter: ({ value }: { value: number[] }) => tip('', [['simulated', number(value[0])], ['residual', number(value[1])]]) }),
      series: [{ name: 'residuals', type: 'scatter', symbolSize: 4, itemStyle: { color: look[of], opacity: 0.5 }, data: flows.map((flow, index) => [flow, ofFlows[index]!]) }],
    }),
    values: () => ({
      columns: [{ title: 'simulated', number: true, unit }, { title: 'residual', number: true, unit }],
      length: flows.length,
      row: (index) => [number(flows[index]), number(ofFlows[index])],
    }),
  };
}

/** A step in words: "7 days", "6 h". */
function stepName(milliseconds: number): string {
  const minutes = milliseconds / 60000;
  if (minutes % 1440 === 0) return counted(minutes / 1440, 'day');
  return minutes % 60 === 0 ? `${minutes / 60} h` : `${number(minutes)} min`;
}

function autocorrelationPlan({ of, usualStep, residuals: { autocorrelation, autocorrelationLimit } }: Views): ChartPlan {
  const lags = autocorrelation.map((_, index) => String(index + 1));
  return {
    title: 'Autocorrelation of the residuals',
    note: `Dashed: 95 % limits of uncorrelated residuals, \u00b1${number(autocorrelationLimit, 3)}.`,
    height: 320,
    small: true,
    option: (look) => ({
      grid: kGrid,
      xAxis: axis(look, { type: 'category', data: lags, name: `Lag (steps of ${stepName(usualStep)})`, nameGap: 26 }),
      yAxis: axis(look, { name: 'Autocorrelation', nameGap: 44, scale: false, max: 1 }),
      tooltip: tooltip(look, { formatter: ({ name, value }: { name: string; value: number }) => tip(`Lag ${name}`, [['autocorrelation', number(value, 3)]]) }),
      series: [{
        name: 'autocorrelation', type: 'bar', itemStyle: { color: look[of] }, data: autocorrelation,
        markLine: { silent: true, symbol: 'none', animation: false, label: { show: false }, lineStyle: { color: look.ink, type: 'dashed', width: 1.2 },
          data: [{ yAxis: autocorrelationLimit }, { yAxis: -autocorrelationLimit }] },
      }],
    }),
    values: () => ({
      columns: [{ title: 'Lag (steps)', number: true }, { title: 'autocorrelation', number: true }],
      length: lags.length,
      row: (index) => [lags[index]!, number(autocorrelation[index])],
    }),
  };
}

function normalPlan({ of, residuals: { normalQuantiles, standardised } }: Views): ChartPlan {
  const end = normalQuantiles[normalQuantiles.length - 1] ?? 0;
  return {
    title: 'Normal plot of the residuals',
    note: 'Residuals less their mean, over their standard deviation. Normally distributed ones lie on the dashed line.',
    height: 320,
    small: true,
    option: (look) => ({
      grid: kGrid,
      xAxis: axis(look, { name: 'Normal quantile', nameGap: 26 }),
      yAxis: axis(look, { name: 'Standardised residual', nameGap: 44 }),
      tooltip: tooltip(look, { formatter: ({ value }: { value: number[] }) => tip('', [['normal quantile', number(value[0], 3)], ['standardised residual', number(value[1], 3)]]) }),
      series: [
        { name: 'residuals', type: 'scatter', symbolSize: 4, itemStyle: { color: look[of] }, data: normalQuantiles.map((quantile, index) => [quantile, standardised[index]!]) },
        { name: 'normal', type: 'line', symbol: 'none', silent: true, data: [[-end, -end], [end, end]], lineStyle: { color: look.ink, width: 1.2, type: 'dashed' } },
      ],
    }),
    values: () => ({
      columns: [{ title: 'normal quantile', number: true }, { title: 'standardised residual', number: true }],
      length: normalQuantiles.length,
      row: (index) => [number(normalQuantiles[index]), number(standardised[index])],
    }),
  };
}

export function residualsView(views: Views, unit: Unit): Node[] {
  const { residuals } = views;
  const hasAutocorrelation = residuals.autocorrelation.some((value) => value !== null);
  const ofUnit = unit ? ` ${unit}` : '';
  const facts = `${count(residuals.n)} residuals, simulated less observed: mean ${number(residuals.mean)}${ofUnit}, standard deviation ${number(residuals.standardDeviation)}${ofUnit}.`;
  return [
    make('p', { class: 'note' }, hasAutocorrelation ? facts : `${facts} Their autocorrelation is not shown: too few, or not equally spaced.`),
    chart(monthsPlan(views, unit)),
    grid(...[
      seasonalPlan(views, unit),
      flowsPlan(views, unit),
      ...(hasAutocorrelation ? [autocorrelationPlan(views)] : []),
      ...(residuals.normalQuantiles.length > 0 ? [normalPlan(views)] : []),
    ].map(chart)),
  ];
}
