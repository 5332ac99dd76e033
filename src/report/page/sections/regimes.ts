// How well a simulation fits in each season and year, and at low flows, floods and peaks.
import { axis, chart, legend, lineEntries, tip, tooltip, type ChartPlan } from '../chart';
import { withUnit, type Unit } from '../data';
import { make, table } from '../dom';
import { moment, number } from '../format';
import type { Look } from '../look';
import { logRange } from '../ticks';
import type { Extremes, Peak, Ranked, RegimeFit, Views } from '../views';
import { grid } from './section';

const kDay = 86400000;

export function fitsTable(views: Views, measure: string, unit: Unit): HTMLElement {
  const row = (fit: RegimeFit) => [fit.name, number(fit.n, 9), number(fit.nse), number(fit.kge), number(fit.pbias), number(fit.observed), number(fit.simulated)];
  return table([
    { title: 'Season or year' }, { title: 'Values', number: true, hint: 'compared values' }, { title: 'NSE', number: true }, { title: 'KGE', number: true },
    { title: 'Bias (%)', number: true, hint: 'positive: the simulation is too large' }, { title: withUnit('Mean observed', unit), number: true }, { title: withUnit('Mean simulated', unit), number: true },
  ], [...views.seasons, ...views.years].map(row), `Seasons and years of ${measure}`);
}

export function peaksTable(views: Views, peaks: Peak[], measure: string, unit: Unit): HTMLElement {
  const isDaily = views.usualStep >= kDay;
  const later = ({ hoursLater }: Peak) => (hoursLater === null ? null : isDaily ? hoursLater / 24 : hoursLater);
  const row = (peak: Peak) => [moment(peak.time, views.usualStep), number(peak.observed), number(peak.simulated), number(peak.percent, 3), number(later(peak))];
  return make('div', {},
    table([
      { title: 'Observed peak' }, { title: withUnit('Observed', unit), number: true }, { title: withUnit('Simulated', unit), number: true, hint: 'the largest value within 3 days before and after' },
      { title: 'Difference (%)', number: true, hint: 'positive: the simulation is too large' },
      { title: isDaily ? 'Later by (days)' : 'Later by (h)', number: true, hint: 'negative: the simulation is too early' },
    ], peaks.map(row), `Peaks of ${measure}`),
    make('p', { class: 'note' }, 'The largest observed values with no larger one within 7 days and none missing beside them, and the largest simulated value of the pairs within 3 days of each.'));
}

const kNames = ['observed', 'simulated'] as const;
const colourOf = (look: Look, name: (typeof kNames)[number], views: Views) => (name === 'observed' ? look.observed : look[views.of]);

/** The annual extremes of both series, each in its own order, against their return periods. */
function rankedPlan(title: string, views: Views, ranked: Ranked, label: string, unit: Unit): ChartPlan {
  const points = (name: 'observed' | 'simulated') => ranked[name].map((value, index) => [ranked.returnPeriods[index]!, value]);
  return {
    title,
    height: 320,
    small: true,
    option: (look) => ({
      legend: legend(look, { data: [...kNames] }),
      grid: { left: 26, right: 16, top: 36, bottom: 28 },
      xAxis: axis(look, { name: 'Return period (years)', log: true, nameGap: 26, min: 1 }),
      yAxis: axis(look, { name: label, nameGap: 44 }),
      tooltip: tooltip(look, { formatter: ({ seriesName, value }: { seriesName: string; value: number[] }) =>
        tip(`${number(value[0], 3)} years`, [[seriesName, number(value[1])]]) }),
      series: kNames.map((name) => ({
        name, type: 'scatter', symbol: name === 'observed' ? 'emptyCircle' : 'diamond', symbolSize: name === 'observed' ? 9 : 8,
        itemStyle: { color: colourOf(look, name, views) }, data: points(name),
      })),
    }),
    values: () => ({
      columns: [{ title: 'Return period (years)', number: true }, ...kNames.map((title) => ({ title, number: true, unit }))],
      length: ranked.returnPeriods.length,
      row: (index) => [number(ranked.returnPeriods[index]), number(ranked.observed[index]), number(ranked.simulated[index])],
    }),
  };
}

/** Simulated against observed extremes, one point per year. */
function againstPlan(title: string, views: Views, years: string[], observed: Extremes['lowObserved'], simulated: Extremes['lowSimulated'], unit: Unit): ChartPlan {
  const points = years.flatMap((year, index) => (observed[index] == null || simulated[index] == null ? [] : [{ name: year, value: [observed[index]!, simulated[index]!] }]));
  const all = points.flatMap(({ value }) => value);
  const [low, high] = [Math.min(...all), Math.max(...all)];
  return {
    title,
    height: 320,
    small: true,
    option: (look) => ({
      grid: { left: 26, right: 16, top: 16, bottom: 28 },
      xAxis: axis(look, { name: withUnit('Observed', unit), nameGap: 26 }),
      yAxis: axis(look, { name: withUnit('Simulated', unit), nameGap: 44 }),
      tooltip: tooltip(look, { formatter: ({ name, value }: { name: string; value?: number[] }) =>
        (name ? tip(name, [['observed', number(value?.[0])], ['simulated', number(value?.[1])]]) : '') }),
      series: [
        { name: 'years', type: 'scatter', symbolSize: 8, itemStyle: { color: look[views.of] }, data: points },
        { name: '1:1', type: 'line', symbol: 'none', silent: true, data: [[low, low], [high, high]], lineStyle: { color: look.ink, width: 1.2, type: 'dashed' } },
      ],
    }),
    values: () => ({
      columns: [{ title: 'Year' }, ...kNames.map((title) => ({ title, number: true, unit }))],
      length: years.length,
      row: (index) => [years[index]!, number(observed[index]), number(simulated[index])],
    }),
  };
}

function tailPlan(views: Views, label: string, unit: Unit): ChartPlan {
  const { tail } = views.extremes;
  const isPositive = kNames.every((name) => tail[name].some((value) => value > 0));
  return {
    title: 'Dry end of the duration curve',
    height: 320,
    small: true,
    switches: isPositive ? [{ key: 'log', label: 'Log', on: true }] : [],
    option: (look, is) => ({
      legend: legend(look, { data: lineEntries([...kNames]), itemWidth: 34 }),
      grid: { left: 26, right: 16, top: 36, bottom: 28 },
      xAxis: axis(look, { name: 'Time exceeded (%)', min: 70, max: 100, nameGap: 26 }),
      yAxis: axis(look, { name: label, nameGap: 44, ...(is('log') ? logRange(kNames.map((name) => tail[name])) : {}) }),
      tooltip: tooltip(look, { trigger: 'axis', formatter: (points: { seriesName: string; value: number[] }[]) =>
        tip(`Exceeded ${number(points[0]!.value[0], 4)} % of the time`, points.map(({ seriesName, value }) => [seriesName, number(value[1])])) }),
      series: kNames.map((name) => ({
        name, type: 'line', symbol: 'none', color: colourOf(look, name, views), lineStyle: { color: colourOf(look, name, views), width: name === 'observed' ? 1.2 : 2.2 },
        data: tail.exceedance.flatMap((share, index) => (is('log') && tail[name][index]! <= 0 ? [] : [[share, tail[name][index]!]])),
      })),
    }),
    values: () => ({
      columns: [{ title: 'Time exceeded (%)', number: true }, ...kNames.map((title) => ({ title, number: true, unit }))],
      length: tail.exceedance.length,
      row: (index) => [number(tail.exceedance[index]), number(tail.observed[index]), number(tail.simulated[index])],
    }),
  };
}

export function extremesView(views: Views, label: string, unit: Unit): Node[] {
  const { extremes } = views;
  const { years } = extremes;
  const hasYears = extremes.low.observed.length > 0;
  const note = !extremes.isAtLeastDaily
    ? 'Annual extremes are not shown: the observations are usually more than a day apart.'
    : years.length === 0
      ? 'Annual extremes are not shown: no year has observed and simulated values on nine tenths of its days.'
      : 'Years with observed and simulated values on nine tenths of their days. Low flow: smallest mean of 7 days in a row; flood: largest value. Return periods by Weibull\u2019s plotting positions.';
  const charts = [
    ...(hasYears ? [
      againstPlan('Annual low flows', views, years, extremes.lowObserved, extremes.lowSimulated, unit),
      rankedPlan('Low flows by return period', views, extremes.low, label, unit),
    ] : []),
    ...(years.length > 0 ? [
      againstPlan('Annual floods', views, years, extremes.highObserved, extremes.highSimulated, unit),
      rankedPlan('Floods by return period', views, extremes.high, label, unit),
    ] : []),
    ...(extremes.tail.exceedance.length > 1 ? [tailPlan(views, label, unit)] : []),
  ];
  return [make('p', { class: 'note' }, note), ...(charts.length > 0 ? [grid(...charts.map(chart))] : [])];
}
