// How a search went on in each parameter: the values that it tried, and that of the best set so far.
import { axis, chart, tip, tooltip, type ChartPlan } from '../chart';
import { variableParameters, type Maybe, type Parameter, type ReportData } from '../data';
import { shorten } from '../dom';
import { count, number } from '../format';
import { finite, placesOfBest, thin } from '../numbers';
import { grid, paragraph, type Section } from './section';

const kDots = [220, 80]; // cells across and down of which one dot each is drawn

function historyPlan(data: ReportData, parameter: Parameter, column: Maybe[], best: (number | null)[]): ChartPlan {
  const { numbers } = data.evaluations;
  const log = parameter.transformation === 'logarithmic' && finite(column).every((value) => value > 0);
  const places = thin(numbers, log ? column.map((value) => (value === null ? null : Math.log(value))) : column, kDots[0]!, kDots[1]!);
  const valueOfBest = (place: number) => (best[place] == null ? null : column[best[place]!] ?? null);
  const steps = best.flatMap((of, place) => (of !== null && (place === best.length - 1 || of !== best[place - 1]) ? [[numbers[place], column[of]]] : []));
  return {
    title: parameter.name,
    height: 230,
    small: true,
    zoom: 'xy',
    option: (look) => ({
      grid: { left: 16, right: 14, top: 12, bottom: 16 },
      xAxis: axis(look, { integer: true, min: 'dataMin', max: 'dataMax', splitNumber: 4 }),
      yAxis: axis(look, { log, integer: parameter.integer && !log, min: parameter.lower ?? undefined, max: parameter.upper ?? undefined, splitNumber: 4 }),
      tooltip: tooltip(look, { formatter: (point: { seriesName: string; value: number[] }) =>
        tip(`Evaluation ${count(point.value[0]!)}`, [[shorten(point.seriesName, 40), number(point.value[1], 6)]]) }),
      series: [
        { name: parameter.name, type: 'scatter', symbolSize: places.length < 500 ? 5 : 3, itemStyle: { color: look.dots, opacity: 0.7 },
          data: places.map((place) => [numbers[place], column[place]]) },
        { name: 'best so far', type: 'line', step: 'end', symbol: 'none', z: 5, clip: true, data: steps, lineStyle: { color: look.best, width: 2 }, itemStyle: { color: look.best } },
      ],
    }),
    csv: () => ({
      columns: ['Evaluation', parameter.name, 'Best so far'].map((title) => ({ title })),
      length: column.length,
      row: (place) => [count(numbers[place]!), number(column[place]), number(valueOfBest(place))],
    }),
  };
}

export function historySection(data: ReportData): Section | null {
  const { evaluations } = data;
  const variable = variableParameters(data);
  if (evaluations.count < 2 || finite(evaluations.aggregate).length === 0 || variable.length === 0) return null;
  const best = placesOfBest(evaluations.aggregate);
  return {
    id: 'histories',
    title: 'Parameter histories',
    content: [
      paragraph('Each dot is the value in an evaluated set, against the number of the evaluation; the line is the value in the best set so far. Dots that draw together around the line say that the search has settled; dots that spread to the end say that it has not, or that the parameter matters little.'),
      grid(...variable.map((parameter, index) => chart(historyPlan(data, parameter, evaluations.parameters[index] ?? [], best)))),
    ],
  };
}
