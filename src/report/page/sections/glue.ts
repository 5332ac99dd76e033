// What GLUE has found: which sets are acceptable, how they are weighed, and what they say of each parameter.
import { axis, chart, legend, lineEntries, tip, tooltip, type AxisPlan, type ChartPlan } from '../chart';
import { type Glue, type ReportData } from '../data';
import { count, number, percent } from '../format';
import { logRange } from '../ticks';
import { grid, heading, paragraph, type Section } from './section';
import { type CustomApi } from './uncertainty';

type GlueParameter = Glue['parameters'][number];

// Of an axis that ends where the values do: no label there, where it would not be a round one.
function withoutEnds({ logarithmic, edges }: GlueParameter): AxisPlan {
  const plan = logarithmic ? logRange([edges]) : {};
  return { ...plan, axisLabel: { ...(plan.axisLabel as object | undefined), showMinLabel: false, showMaxLabel: false } };
}

// The weight, in dots, of sets with their values of a parameter.
function dotPlan(glue: Glue, parameter: GlueParameter): ChartPlan {
  return {
    title: parameter.name,
    height: 220,
    small: true,
    zoom: 'xy',
    option: (look) => ({
      grid: { left: 16, right: 14, top: 12, bottom: 16 },
      xAxis: axis(look, { splitNumber: 4, ...withoutEnds(parameter), min: parameter.edges[0], max: parameter.edges[parameter.edges.length - 1] }),
      yAxis: axis(look, { scale: false, splitNumber: 3 }),
      tooltip: tooltip(look, { formatter: (dot: { dataIndex: number }) => tip(`Evaluation ${count(glue.numbers[dot.dataIndex]!)}`, [
        [parameter.name, number(parameter.values[dot.dataIndex], 6)], ['weight', number(glue.weights[dot.dataIndex])],
        ['judged by', number(glue.judged[dot.dataIndex], 6)]]) }),
      series: [{ type: 'scatter', symbolSize: glue.numbers.length > 500 ? 3 : 5, itemStyle: { color: look.best, opacity: 0.6 },
        data: glue.weights.map((weight, index) => [parameter.values[index], weight]) }],
    }),
    csv: () => ({
      columns: [{ title: 'Evaluation' }, { title: parameter.name, number: true }, { title: 'Weight', number: true }],
      length: glue.numbers.length,
      row: (index) => [count(glue.numbers[index]!), number(parameter.values[index]), number(glue.weights[index])],
    }),
  };
}

// How sets are distributed before and after the observations judge them.
function comparisonPlan(parameter: GlueParameter): ChartPlan {
  const { edges, drawn, weighed } = parameter;
  const bounds = (bin: number) => `${number(edges[bin])} to ${number(edges[bin + 1])}`;
  const outline = edges.flatMap((edge, index) => [[edge, drawn[index - 1] ?? 0], [edge, drawn[index] ?? 0]]);
  return {
    title: parameter.name,
    height: 220,
    small: true,
    option: (look) => ({
      legend: legend(look, { data: ['behavioural', ...lineEntries(['all sets'])], itemWidth: 22 }),
      grid: { left: 16, right: 14, top: 34, bottom: 16 },
      xAxis: axis(look, { splitNumber: 4, splitLine: { show: false }, ...withoutEnds(parameter), min: edges[0], max: edges[edges.length - 1] }),
      yAxis: axis(look, { scale: false, splitNumber: 3 }),
      tooltip: tooltip(look, { formatter: (bar: { dataIndex: number }) =>
        tip(bounds(bar.dataIndex), [['of the weight', percent(weighed[bar.dataIndex])], ['of all sets', percent(drawn[bar.dataIndex])]]) }),
      series: [{
        name: 'behavioural', type: 'custom', color: look.bars, encode: { x: [0, 1], y: 2 }, data: weighed.map((share, bin) => [edges[bin], edges[bin + 1], share]),
        renderItem: (_: unknown, api: CustomApi) => {
          const [left, top] = api.coord([api.value(0), api.value(2)]);
          const [right, bottom] = api.coord([api.value(1), 0]);
          return { type: 'rect', shape: { x: left!, y: top!, width: Math.max(1, right! - left! - 1), height: bottom! - top! }, style: { fill: look.bars } };
        },
      }, {
        name: 'all sets', type: 'line', symbol: 'none', data: outline, color: look.observed, lineStyle: { color: look.observed, width: 1.5 }, z: 4, tooltip: { show: false },
      }],
    }),
    values: () => ({
      columns: [{ title: 'From' }, { title: 'To', number: true }, { title: 'Of the weight', number: true }, { title: 'Of all sets', number: true }],
      length: weighed.length,
      row: (bin) => [number(edges[bin]), number(edges[bin + 1]), percent(weighed[bin]), percent(drawn[bin])],
    }),
  };
}

/** "the observations say something of a and b, and, as far as these sets tell, nothing of c" */
function whatIsSaid(glue: Glue): string {
  const limit = glue.distanceLimit;
  if (limit === null) return '';
  const ordered = [...glue.parameters].sort((a, b) => (b.distance ?? 0) - (a.distance ?? 0));
  const named = (isTold: boolean) => ordered.filter(({ distance }) => (distance ?? 0) > limit === isTold).map(({ name }) => name).join(', ');
  const [told, untold] = [named(true), named(false)];
  return `${told ? ` The observations tell something of ${told} (the most first).` : ''}${untold ? ` Behavioural values of ${untold} are distributed as all sets are, as far as so many sets can tell.` : ''}`;
}

export function glueSection(data: ReportData): Section | null {
  const { glue } = data;
  if (!glue) return null;
  const shown = glue.parameters.filter(({ edges }) => edges.length > 1);
  const hasWeights = glue.effective !== null && glue.effective > 0;
  return {
    id: 'glue',
    title: 'Acceptable sets (GLUE)',
    content: [
      paragraph(`${count(glue.behavioural)} of ${count(glue.succeeded)} sets are behavioural${glue.succeeded > 0 ? ` (${percent(glue.behavioural / glue.succeeded)})` : ''}; ${glue.choices.join('; ')}.${
        hasWeights ? ` Their weights tell as much as ${number(glue.effective)} sets of equal weight.${whatIsSaid(glue)}` : ' There are no weights, and so neither quantiles nor bands.'}`),
      ...(hasWeights && shown.length > 0 ? [
        heading('Parameters before and after the observations'),
        paragraph('Bars: share of the weight of behavioural sets. Line: share of all sets that were run. Where both have one shape, the observations say nothing of the parameter by itself.'),
        grid(...shown.map((parameter) => chart(comparisonPlan(parameter)))),
        heading('Weights'),
        paragraph(`Each dot is a behavioural set.${glue.numbers.length < glue.behavioural ? ` ${count(glue.numbers.length)} of them are drawn.` : ''} Good sets all over a parameter's range say that the others make up for it.`),
        grid(...shown.map((parameter) => chart(dotPlan(glue, parameter)))),
      ] : []),
    ],
  };
}
