// The point of a front that the reader has picked: its objectives, its parameters and its hydrographs.
import { axis, chart, legend, lineEntries, timeZoom, tip, tooltip, type Chart, type ChartPlan } from '../chart';
import { timesOf, variableParameters, type Front, type Maybe, type Parameter, type ReportData, type Series } from '../data';
import { make, table } from '../dom';
import { count, kMissing, moment, number, percent } from '../format';
import { lineOf, nearest, pointsOf } from '../lines';
import type { Look } from '../look';
import { finite, placeBetweenBounds } from '../numbers';
import { logRange } from '../ticks';
import type { Picking } from './front_picking';
import { heading, isolated, paragraph } from './section';
import { drawnLine, labelOf, observedEntry, reachesZero } from './series';
import { kShadedNote, shadedPeriods, spansOf } from './validation';

const kNames = { picked: 'picked', suggested: 'suggested compromise' };

/** How far a value is above the least of the front, in per cent of that: "12 %"; empty where it is the least. */
export function above(value: Maybe | undefined, least: number): string {
  if (value == null || !Number.isFinite(least)) return kMissing;
  if (value === least) return '';
  return least > 0 ? percent((value - least) / least, 3) : number(value - least, 3);
}

export const leastOf = (front: Front, places: number[], objective: number): number =>
  finite(places.map((place) => front.values[objective]?.[place] ?? null)).reduce((least, value) => Math.min(least, value), Infinity);

function placesBar(parameter: Parameter, picked: Maybe, suggested: Maybe): Node | string {
  const [there, other] = [picked, suggested].map((value) => placeBetweenBounds(parameter, value)) as [Maybe, Maybe];
  if (there === null) return '';
  const mark = (kind: string, place: Maybe) => (place === null ? null : make('i', { class: kind, style: `left: ${Math.min(100, Math.max(0, place * 100)).toFixed(2)}%` }));
  const label = `${percent(there, 2)} of the way from the lower to the upper bound${other === null ? '' : `, the suggested compromise ${percent(other, 2)}`}`;
  return make('span', { class: 'range', role: 'img', 'aria-label': label, title: label }, mark('start', other), mark('best', there));
}

function tables(data: ReportData, front: Front, picking: Picking): Node[] {
  const { picked } = picking;
  const { suggested } = front;
  const variable = variableParameters(data);
  const objectives = front.objectives.map((name, objective) => {
    const least = leastOf(front, picking.places, objective);
    const value = front.values[objective]?.[picked];
    return [name, number(value, 6), above(value, least) || 'the least', suggested === null ? kMissing : number(front.values[objective]?.[suggested], 6), number(least, 6)];
  });
  const parameters = front.parameters.map((name, index) => {
    const [value, other] = [front.parameterValues[index]?.[picked] ?? null, suggested === null ? null : front.parameterValues[index]?.[suggested] ?? null];
    const parameter = variable[index];
    return [name, number(value, 8), suggested === null ? kMissing : number(other, 8), parameter ? placesBar(parameter, value, other) : ''];
  });
  return [
    table([{ title: 'Objective' }, { title: 'Here', number: true }, { title: 'Above the least', number: true }, { title: 'Suggested', number: true }, { title: 'Least of the front', number: true }], objectives, 'Objectives of the point that is picked'),
    table([{ title: 'Parameter' }, { title: 'Here', number: true }, { title: 'Suggested', number: true }, { title: 'Between the bounds', hint: 'filled: here, hollow: the suggested compromise' }], parameters, 'Parameters of the point that is picked'),
  ];
}

type Simulated = Front['series'][number];

/** The line of a set, empty where its series is not there. */
function lineOfSet(one: Simulated | undefined, isLog: boolean): Float64Array {
  return one ? pointsOf(lineOf(timesOf(one, one.values.length), one.values, one.breaks), isLog) : new Float64Array(0);
}

function hydrographPlan(front: Front, picking: Picking, measure: string, observedOf: Series | undefined): ChartPlan {
  const own = new Map(front.series.filter((one) => one.measure === measure).map((one) => [one.number, one]));
  const some = [...own.values()];
  const first = some[0]!;
  const seriesOf = (place: number | null) => (place === null ? undefined : own.get(front.numbers[place]!));
  const observedTimes = observedOf ? timesOf(observedOf, observedOf.observed.length) : [];
  const isPoints = observedOf?.observedAsPoints ?? false;
  const observed = observedOf ? lineOf(observedTimes, observedOf.observed, observedOf.breaks?.observed, isPoints, true) : { times: [], values: [], dots: [] };
  const all = [observedOf?.observed ?? [], ...some.map(({ values }) => values)];
  const firstTimes = timesOf(first, first.values.length);
  const step = firstTimes.slice(1, 1000).reduce((least, time, at) => Math.min(least, time - firstTimes[at]!), 86400000);
  let isLog = false;
  const pickedLine = (look: Look) => ({
    id: 'picked', name: kNames.picked, type: 'line', symbol: 'none', connectNulls: false, color: look.best, z: 3,
    lineStyle: { color: look.best, width: 2 }, data: lineOfSet(seriesOf(picking.picked), isLog),
  });
  const at = (one: Simulated | undefined, time: number) => (one ? one.values[nearest(timesOf(one, one.values.length), time)] : null);
  return {
    title: `Simulated and observed: ${measure}`,
    note: () => `${seriesOf(picking.picked) ? '' : `The series of evaluation ${count(front.numbers[picking.picked]!)} is not kept: those of ${count(some.length)} of the ${count(picking.places.length)} points of the front are. `}${
      observedOf?.periods ? `${kShadedNote.trim()} ` : ''}${some.some(({ thinned }) => thinned) ? 'Of so many times the extremes of short spans are drawn. ' : ''}Drag across the chart to zoom in.`,
    height: 400,
    zoom: 'x',
    spans: observedOf ? spansOf(observedOf) : [],
    thinned: some.some(({ thinned }) => thinned),
    switches: [{ key: 'log', label: 'Log' }],
    option: (look, is) => {
      isLog = is('log');
      const suggested = seriesOf(front.suggested);
      return {
        legend: legend(look, { itemWidth: 34, data: [...lineEntries([kNames.picked, ...(suggested ? [kNames.suggested] : [])]), ...(observedOf ? observedEntry(isPoints) : [])] }),
        grid: { left: 72, right: 16, top: 36, bottom: 72 },
        xAxis: [axis(look, { type: 'time' })],
        yAxis: axis(look, { name: observedOf ? labelOf(observedOf) : 'Value', nameGap: 48, ...(isLog ? logRange(all) : { scale: !reachesZero(all) }) }),
        dataZoom: timeZoom(look, [0], 'filter', (time) => moment(time, step)),
        tooltip: tooltip(look, { trigger: 'axis', formatter: (points: { axisValue: number }[]) => {
          const time = points[0]!.axisValue;
          return tip(moment(time, step), [
            ...(observedOf ? [['observed', number(observedOf.observed[nearest(observedTimes, time)])] as [string, string]] : []),
            [kNames.picked, number(at(seriesOf(picking.picked), time))],
            ...(suggested ? [[kNames.suggested, number(at(suggested, time))] as [string, string]] : []),
          ]);
        } }),
        series: [
          ...(suggested ? [{ name: kNames.suggested, type: 'line', symbol: 'none', connectNulls: false, color: look.initial, lineStyle: { color: look.initial, width: 1.3, type: 'dashed' }, data: lineOfSet(suggested, isLog) }] : []),
          pickedLine(look),
          ...drawnLine('observed', isPoints ? { ...observed, times: [], values: [] } : observed, isLog, look.observed,
            { lineStyle: { color: look.observed, width: 1 }, z: 4, ...(observedOf?.periods ? shadedPeriods(look, observedOf) : {}) }),
        ],
      };
    },
    csv: () => {
      const shown = seriesOf(picking.picked) ?? seriesOf(front.suggested) ?? first;
      const times = timesOf(shown, shown.values.length);
      return {
        columns: [{ title: 'Time' }, { title: `evaluation ${shown.number}`, unit: observedOf?.unit }, ...(observedOf ? [{ title: 'observed', unit: observedOf.unit }] : [])],
        length: times.length,
        row: (place) => {
          const there = nearest(observedTimes, times[place]!);
          const isSame = observedTimes[there] === times[place];
          return [moment(times[place]!, step), number(shown.values[place]), ...(observedOf ? [number(isSame ? observedOf.observed[there] : null)] : [])];
        },
      };
    },
    pick: { at: () => undefined, step: (by) => picking.step(by), marks: (look) => [pickedLine(look)] },
  };
}

/** What is shown of the point that is picked; it follows the reader. */
export function pickedPoint(data: ReportData, front: Front, picking: Picking): Node[] {
  const title = heading('');
  const words = make('p', { 'aria-live': 'polite' });
  const parts = make('div', {});
  const measures = [...new Set(front.series.map(({ measure }) => measure))];
  const charts: Chart[] = measures.map((measure) => chart(hydrographPlan(front, picking, measure, data.series.find((series) => series.measure === measure))));
  const show = () => {
    const { picked, places } = picking;
    title.textContent = `The point that is picked: evaluation ${count(front.numbers[picked]!)}`;
    title.title = title.textContent;
    words.textContent = `${picked === front.suggested ? 'The suggested compromise. ' : ''}Point ${count(places.indexOf(picked) + 1)} of ${count(places.length)} along ${isolated(front.objectives[0] ?? '')}.${
      measures.length > 0 && !front.series.some(({ number }) => number === front.numbers[picked]) ? ' Its hydrographs are not kept.' : ''}`;
    parts.replaceChildren(...tables(data, front, picking));
    charts.forEach((one) => one.mark());
  };
  picking.onPick(show);
  show();
  const buttons = ([['Previous', -1], ['Next', 1]] as const).map(([label, by]) => make('button', { type: 'button', onclick: () => picking.step(by) }, label));
  const back = front.suggested === null ? null : make('button', { type: 'button', onclick: () => picking.pick(front.suggested!) }, 'Suggested compromise');
  return [title, make('div', { class: 'picks' }, ...buttons, back), words, parts, ...charts,
    ...(measures.length === 0 && data.series.length > 0 ? [paragraph('The hydrographs of the points are not kept.')] : [])];
}
