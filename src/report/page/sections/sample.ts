// What a sample tells of its parameters without a further model run: rank correlations and first-order indices.
import { axis, chart, tip, tooltip, type ChartPlan } from '../chart';
import type { Maybe, ReportData, SampleSensitivity } from '../data';
import { shorten } from '../dom';
import { number } from '../format';
import { finite } from '../numbers';
import { heatmap } from './heatmap';
import { heading, isolated, kLogSays, paragraph, type Section } from './section';
import type { CustomApi } from './uncertainty';

const kMostShown = 40; // parameters with a row of their own
const kMostOutputs = 6; // with a chart of their own

const column = (matrix: Maybe[][], output: number): Maybe[] => matrix.map((row) => row[output] ?? null);

/** Places of the parameters, the one with the largest value first. */
function byValue(values: Maybe[]): number[] {
  return values.map((_, place) => place).sort((a, b) => (values[b] ?? -Infinity) - (values[a] ?? -Infinity));
}

const kSameValues = 'the values of the parameter are all the same';

function indexPlan(found: SampleSensitivity, output: number): ChartPlan {
  const [value, lower, upper, rank] = [found.firstOrder, found.lower, found.upper, found.rankCorrelations].map((matrix) => column(matrix, output)) as [Maybe[], Maybe[], Maybe[], Maybe[]];
  const order = byValue(value);
  const shown = order.slice(0, kMostShown);
  const extent = finite([...lower, ...upper]);
  return {
    title: `First-order indices of ${found.outputs[output]}`,
    note: `${order.length > shown.length ? `The ${shown.length} largest of ${order.length}. ` : ''}The dot is the share of the variance that a parameter explains by itself, the line its 95 % limits. An estimate below 0 is one of about 0.`,
    height: 70 + 26 * shown.length,
    option: (look) => ({
      grid: { left: 24, right: 24, top: 4, bottom: 16 },
      xAxis: axis(look, { min: Math.min(0, ...extent), max: Math.max(0.1, ...extent), axisLabel: { showMinLabel: false, showMaxLabel: false } }),
      yAxis: axis(look, { type: 'category', data: shown.map((place) => found.parameters[place]!), inverse: true, axisTick: { show: false },
        axisLabel: { color: look.ink, formatter: (name: string) => shorten(name, 24), interval: 0 } }),
      tooltip: tooltip(look, { formatter: (item: { value: number[] }) => {
        const place = shown[item.value[0]!]!;
        return tip(shorten(found.parameters[place]!, 80), [['first order', number(value[place], 3)], ['lower', number(lower[place], 3)],
          ['upper', number(upper[place], 3)], ['rank correlation', number(rank[place], 3)]]);
      } }),
      series: [{
        type: 'custom', encode: { x: [1, 2, 3], y: 0 }, data: shown.map((place, row) => [row, lower[place], value[place], upper[place]]),
        renderItem: (_: unknown, api: CustomApi) => {
          const at = (dimension: number) => api.coord([api.value(dimension), api.value(0)]);
          const [[left, y], [middle], [right]] = [at(1), at(2), at(3)];
          const stroke = { stroke: look.best, lineWidth: 2 };
          return { type: 'group', children: [{ type: 'line', shape: { x1: left!, y1: y!, x2: right!, y2: y! }, style: stroke },
            { type: 'circle', shape: { cx: middle!, cy: y!, r: 4.5 }, style: { fill: look.best, stroke: look.surface, lineWidth: 1 } }] };
        },
      }],
    }),
    values: () => ({
      columns: [{ title: 'Parameter' }, ...['First order', 'Lower', 'Upper', 'Rank correlation'].map((title) => ({ title, number: true }))],
      length: order.length,
      row: (index) => [found.parameters[order[index]!]!, ...[value, lower, upper, rank].map((values) => number(values[order[index]!], 3))],
      reason: (index) => (rank[order[index]!] == null ? kSameValues : kLogSays),
    }),
  };
}

export function sampleSection(data: ReportData): Section | null {
  const found = data.sampleSensitivity;
  if (!found || found.parameters.length === 0 || found.outputs.length === 0) return null;
  const places = found.outputs.map((_, place) => place);
  const objectives = places.filter((place) => found.kinds[place] === 'objective');
  const judged = objectives.length > 0 ? objectives : places;
  const problem = (place: number) => found.problems?.[place] || kLogSays;
  const without = judged.filter((place) => finite(column(found.firstOrder, place)).length === 0);
  const charted = judged.filter((place) => finite(column(found.firstOrder, place)).length > 0);
  const order = byValue(found.rankCorrelations.map((row) => Math.max(0, ...finite(row).map(Math.abs)))).slice(0, kMostShown);
  return {
    id: 'sample-sensitivity',
    title: 'What the outputs depend on',
    content: [
      paragraph(`Of the runs of the sample, without further ones. ${found.areCorrelated ? 'The parameters were drawn with correlations: an index has what the parameter shares with others.' : 'What parameters do together with others does not show in their own indices.'}`),
      ...charted.slice(0, kMostOutputs).map((place) => chart(indexPlan(found, place))),
      ...(without.length > 0 ? [paragraph(`There are no first-order indices of ${without.slice(0, kMostOutputs).map((place) => `${isolated(found.outputs[place]!)} (${problem(place)})`).join(', ')}${
        without.length > kMostOutputs ? ` and ${without.length - kMostOutputs} more` : ''}.`)] : []),
      ...(finite(found.rankCorrelations.flat()).length === 0 ? [] : [heading('Rank correlations'), chart(heatmap('Rank correlation of outputs and parameters', order.map((place) => found.parameters[place]!), found.outputs,
        order.map((place) => found.rankCorrelations[place]!), 1, 'Spearman: 1 where the output always rises with the parameter, \u22121 where it always falls.',
        (_, output) => (finite(column(found.rankCorrelations, output)).length > 0 ? kSameValues : problem(output))))]),
    ],
  };
}
