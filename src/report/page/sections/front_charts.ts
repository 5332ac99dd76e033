// The front in charts: objective against objective, and as lines over parallel axes.
import { axis, kFileWidth, legend, tip, tooltip, type ChartPlan, type Pick } from '../chart';
import { variableParameters, type Front, type Maybe, type ReportData } from '../data';
import { shorten } from '../dom';
import { count, number } from '../format';
import type { Look } from '../look';
import type { Values } from '../figure_files';
import { finite, spaced } from '../numbers';
import type { Picking } from './front_picking';
import { parallelPlan, parameterAxis, thickLines, type ParallelAxis, type ParallelLines } from './parallel';

const kMostPaired = 6; // objectives in a matrix
const kLinesDrawn = 300;
const kDotsDrawn = 3000;
const kRoom = { left: 84, right: 14, top: 40, bottom: 56 };
const kGap = 8;
const kRoomForDots = { boundaryGap: ['3%', '3%'], axisLabel: { showMinLabel: false, showMaxLabel: false } };
const kLabelRoom = 76; // pixels of a cell, from which its axes have numbers

interface Cell {
  x: number; // objectives
  y: number;
}

/** A row for each set of the table: its evaluation, rank, objectives and parameters. */
export function setsAsValues(front: Front): Values {
  return {
    columns: [{ title: 'Evaluation' }, { title: 'Rank', number: true }, ...[...front.objectives, ...front.parameters].map((title) => ({ title, number: true }))],
    length: front.numbers.length,
    row: (place) => [count(front.numbers[place]!), String(front.ranks[place]), ...[...front.values, ...front.parameterValues].map((column) => number(column[place], 6))],
  };
}

const dotOf = (front: Front, { x, y }: Cell, place: number): (Maybe | undefined)[] => [front.values[x]?.[place], front.values[y]?.[place], place];

function setTip(front: Front, place: number): HTMLElement {
  const role = front.ranks[place] === 1 ? place === front.suggested ? ', suggested compromise' : '' : `, rank ${front.ranks[place]}`;
  return tip(`Evaluation ${count(front.numbers[place]!)}${role}`,
    front.objectives.slice(0, 12).map((name, objective): [string, string] => [shorten(name, 40), number(front.values[objective]?.[place], 5)]));
}

/** Dots of the sets in one cell; `index`: of its axes. */
function dots(front: Front, picking: Picking, cell: Cell, index: number, look: Look, showsOthers: boolean): object[] {
  const own = { type: 'scatter', xAxisIndex: index, yAxisIndex: index, clip: true };
  const others = front.ranks.flatMap((rank, place) => (rank === 1 || front.values[cell.x]?.[place] == null || front.values[cell.y]?.[place] == null ? [] : [place]));
  const some = (places: number[]) => spaced(places.length, kDotsDrawn).map((at) => dotOf(front, cell, places[at]!));
  return [
    ...(showsOthers && others.length > 0 ? [{ ...own, name: 'other sets', data: some(others), symbolSize: 4, itemStyle: { color: look.dots, opacity: 0.4 } }] : []),
    { ...own, name: 'front', data: some(picking.places), symbolSize: picking.places.length > 300 ? 4 : 7, itemStyle: { color: look.best } },
    ...(front.suggested === null ? [] : [{ ...own, name: 'suggested compromise', data: [dotOf(front, cell, front.suggested)], symbol: 'diamond', symbolSize: 15, z: 4,
      itemStyle: { color: look.initial, borderColor: look.surface, borderWidth: 1 } }]),
  ];
}

const markOf = (front: Front, picking: Picking, cell: Cell, index: number, look: Look): object => ({
  id: `picked${index}`, name: 'picked', type: 'scatter', xAxisIndex: index, yAxisIndex: index, z: 5, silent: true, symbol: 'circle', symbolSize: 17, clip: true,
  itemStyle: { color: 'transparent', borderColor: look.ink, borderWidth: 2.5 }, data: [dotOf(front, cell, picking.picked)],
});

function picks(picking: Picking, marks: Pick['marks']): Pick {
  return {
    at: ({ value }) => picking.pick(Array.isArray(value) ? value[2] as number : undefined),
    step: (by) => picking.step(by),
    marks,
  };
}

const legendOf = (front: Front, look: Look) => legend(look, {
  data: ['front', ...(front.suggested === null ? [] : ['suggested compromise']), { name: 'picked', itemStyle: { color: 'transparent', borderColor: look.ink, borderWidth: 2 } },
    ...(front.ranks.some((rank) => rank > 1) ? ['other sets'] : [])],
});

const kHowToPick = 'Click a point of the front, or press the left and right arrow keys in the chart, to see its parameters and hydrographs below.';
const kFarOff = 3; // times the extent of the front

/** Whether the other sets can be drawn without pressing the front together. */
const areNear = (front: Front, picking: Picking) => front.values.every((column) => {
  const extent = (values: Maybe[]) => finite(values).reduce(([low, high], value) => [Math.min(low, value), Math.max(high, value)] as [number, number], [Infinity, -Infinity] as [number, number]);
  const [[low, high], [least, most]] = [extent(picking.places.map((place) => column[place] ?? null)), extent(column)];
  return most - least <= kFarOff * (high - low);
});

const othersSwitch = (front: Front, picking: Picking) => (front.ranks.some((rank) => rank > 1)
  ? [{ key: 'others', label: 'Other sets', on: areNear(front, picking), hint: 'The rest of the last population, which sets of the front dominate' }] : []);

/** Two objectives, one against the other. */
export function frontPlan(front: Front, picking: Picking): ChartPlan {
  const cell = { x: 0, y: 1 };
  return {
    title: `The front: ${front.objectives[1]} against ${front.objectives[0]}`,
    note: `Of no point of the front is there a set that is better in one objective and not worse in the other. ${kHowToPick}`,
    height: 420,
    zoom: 'xy',
    switches: othersSwitch(front, picking),
    option: (look, is) => ({
      legend: legendOf(front, look),
      grid: { left: 26, right: 24, top: 40, bottom: 30 },
      xAxis: [axis(look, { name: front.objectives[0], nameGap: 28, ...kRoomForDots })],
      yAxis: [axis(look, { name: front.objectives[1], nameGap: 52, ...kRoomForDots })],
      tooltip: tooltip(look, { formatter: (dot: { value: number[] }) => setTip(front, dot.value[2]!) }),
      series: [...dots(front, picking, cell, 0, look, is('others')), markOf(front, picking, cell, 0, look)],
    }),
    csv: () => setsAsValues(front),
    pick: picks(picking, (look) => [markOf(front, picking, cell, 0, look)]),
  };
}

/** Three objectives and more: each against each other, below the diagonal of a matrix. */
export function frontMatrixPlan(front: Front, picking: Picking): ChartPlan {
  const shown = Math.min(kMostPaired, front.objectives.length);
  const size = shown - 1;
  const cells: Cell[] = Array.from({ length: size }, (_, row) => Array.from({ length: row + 1 }, (__, column) => ({ x: column, y: row + 1 }))).flat();
  const height = kRoom.top + kRoom.bottom + size * (size < 3 ? 230 : size < 4 ? 180 : 130);
  return {
    title: 'The front, objective against objective',
    note: `${shown < front.objectives.length ? `The first ${shown} of ${front.objectives.length} objectives. ` : ''}Of no point of the front is there a set that is better in one objective and worse in none. ${kHowToPick}`,
    height,
    fitsWidth: true,
    switches: othersSwitch(front, picking),
    option: (look, is, width = kFileWidth) => {
      const across = (width - kRoom.left - kRoom.right - (size - 1) * kGap) / size;
      const down = (height - kRoom.top - kRoom.bottom - (size - 1) * kGap) / size;
      const hasLabels = across >= kLabelRoom;
      const within = (name: string, pixels: number) => shorten(name, Math.max(3, Math.floor(pixels / 8)));
      const labels = (on: boolean) => ({ show: on && hasLabels, fontSize: 10, showMinLabel: false, showMaxLabel: false, hideOverlap: true });
      const quiet = { splitNumber: 2, boundaryGap: ['4%', '4%'], axisTick: { show: false }, axisLine: { show: false } };
      return {
        legend: legendOf(front, look),
        grid: cells.map(({ x, y }) => ({ left: kRoom.left + x * (across + kGap), top: kRoom.top + (y - 1) * (down + kGap), width: across, height: down, show: true, borderColor: look.rule, containLabel: false, outerBoundsMode: 'none' })),
        xAxis: cells.map(({ x, y }, gridIndex) => axis(look, { ...quiet, gridIndex, axisLabel: labels(y === size),
          ...(y === size ? { name: within(front.objectives[x]!, across), nameGap: hasLabels ? 28 : 10, nameTextStyle: { color: look.ink } } : {}) })),
        yAxis: cells.map(({ x, y }, gridIndex) => axis(look, { ...quiet, gridIndex, axisLabel: labels(x === 0),
          ...(x === 0 ? { name: within(front.objectives[y]!, down), nameGap: hasLabels ? 56 : 10, nameTextStyle: { color: look.ink } } : {}) })),
        tooltip: tooltip(look, { formatter: (dot: { value: number[] }) => setTip(front, dot.value[2]!) }),
        series: cells.flatMap((cell, index) => [...dots(front, picking, cell, index, look, is('others')), markOf(front, picking, cell, index, look)]),
      };
    },
    csv: () => setsAsValues(front),
    pick: picks(picking, (look) => cells.map((cell, index) => markOf(front, picking, cell, index, look))),
  };
}

function frontLinesPlan(front: Front, picking: Picking, title: string, note: string, axes: ParallelAxis[], colouredBy: number): ChartPlan {
  const places = spaced(picking.places.length, kLinesDrawn).map((at) => picking.places[at]!);
  const lines: ParallelLines = {
    axes, places, colouredBy,
    headline: (place) => `Evaluation ${count(front.numbers[place]!)}`,
    thick: () => [picking.picked],
  };
  return parallelPlan({
    title,
    note: `${note} The thick line is the point that is picked. Drag along an axis to see the lines that pass there.${places.length < picking.places.length ? ` ${count(places.length)} of ${count(picking.places.length)} lines are drawn.` : ''}`,
    lines,
    csv: () => setsAsValues(front),
    pick: {
      at: ({ seriesId, dataIndex }) => picking.pick(seriesId === 'lines' ? places[dataIndex] : undefined),
      step: (by) => picking.step(by),
      marks: (look) => [thickLines(look, lines)],
    },
  });
}

/** The objectives of each point of the front. */
export function objectiveLinesPlan(front: Front, picking: Picking): ChartPlan {
  return frontLinesPlan(front, picking, 'The objectives along the front', `Each line is a point of the front, coloured by ${front.objectives[0]}. Lines that cross between two axes say that one of the two objectives costs the other.`,
    front.objectives.map((name, objective) => ({ name, values: front.values[objective] ?? [] })), 0);
}

/** The parameters of each point of the front, coloured by the first objective. */
export function parameterLinesPlan(data: ReportData, front: Front, picking: Picking): ChartPlan {
  const variable = variableParameters(data);
  const axes = front.parameters.map((name, index) => {
    const values = front.parameterValues[index] ?? [];
    const parameter = variable[index];
    return parameter ? { ...parameterAxis(parameter, values), name } : { name, values };
  });
  return frontLinesPlan(front, picking, 'The parameters along the front', `Each line is a point of the front, coloured by the last axis, ${front.objectives[0]}. A parameter whose axis is sorted by colour is what moves along the front; where all lines meet, the objectives agree on it.`,
    [...axes, { name: front.objectives[0]!, values: front.values[0] ?? [] }], front.parameters.length);
}

/** How the front grew. */
export function hypervolumePlan(course: NonNullable<Front['course']>): ChartPlan {
  const { evaluations, sizes, hypervolumes } = course;
  return {
    title: 'Hypervolume of the front over the evaluations',
    note: 'The share of the space between the ideal point and a reference point behind the front that the front dominates. It grows as the front comes nearer to the best values and spreads; where it stays level, more evaluations bring little.',
    height: 280,
    zoom: 'xy',
    option: (look) => ({
      grid: { left: 26, right: 24, top: 12, bottom: 28 },
      xAxis: axis(look, { name: 'Evaluation', nameGap: 26, integer: true, min: 'dataMin', max: 'dataMax' }),
      yAxis: axis(look, { name: 'Hypervolume', nameGap: 52 }),
      tooltip: tooltip(look, { trigger: 'axis', formatter: (points: { dataIndex: number }[]) => {
        const place = points[0]!.dataIndex;
        return tip(`After ${count(evaluations[place] ?? 0)} evaluations`, [['hypervolume', number(hypervolumes[place], 6)], ['sets on the front', count(sizes[place] ?? 0)]]);
      } }),
      series: [{ name: 'hypervolume', type: 'line', step: 'end', symbolSize: evaluations.length > 60 ? 0 : 5, clip: true, color: look.best, lineStyle: { width: 2 },
        data: evaluations.map((evaluation, place) => [evaluation, hypervolumes[place] ?? null]) }],
    }),
    values: () => ({
      columns: ['Evaluations', 'Sets on the front', 'Hypervolume'].map((title) => ({ title, number: true })),
      length: evaluations.length,
      row: (place) => [count(evaluations[place] ?? 0), count(sizes[place] ?? 0), number(hypervolumes[place], 6)],
    }),
  };
}
