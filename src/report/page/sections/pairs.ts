// States of the posterior, one parameter against another: a matrix of charts.
import { axis, chart, drawnName, kFileWidth, tip, tooltip, type ChartPlan } from '../chart';
import type { Maybe, PosteriorDimension } from '../data';
import { make, shorten } from '../dom';
import { number } from '../format';
import { finite } from '../numbers';
import { logRange } from '../ticks';
import type { CustomApi } from './uncertainty';

const kMostPaired = 8;
const kRoom = { left: 74, right: 10, top: 8, bottom: 50 }; // around the matrix
const kGap = 6;
const kLabelRoom = 76; // pixels of a cell, from which its axes have numbers

/** A name that fits beside a cell. */
const nameWithin = (name: string, pixels: number) => drawnName(shorten(name, Math.max(3, Math.floor(pixels / 7))));

/** Of a cell, in pixels. */
const heightOf = (most: number) => (most < 4 ? 170 : most < 6 ? 140 : 105);

/** Between the colours from -1 to 1. */
function colour(diverging: string[], value: number): string {
  const place = ((value + 1) / 2) * (diverging.length - 1);
  const below = Math.min(Math.floor(place), diverging.length - 2);
  const part = (text: string, at: number) => parseInt(text.slice(1 + 2 * at, 3 + 2 * at), 16);
  const mixed = [0, 1, 2].map((at) => Math.round(part(diverging[below]!, at) * (below + 1 - place) + part(diverging[below + 1]!, at) * (place - below)));
  return `rgb(${mixed.join(', ')})`;
}

function pairPlan(dimensions: PosteriorDimension[], correlations: Maybe[][], chosen: () => number[]): ChartPlan {
  const most = Math.min(kMostPaired, dimensions.length);
  return {
    title: 'Parameters against one another',
    note: `Below the diagonal: states of the posterior. On it: their distribution.${correlations.length > 0 ? ' Above it: correlations. A narrow slanted cloud is a trade-off; a bent one shows little as a correlation.' : ''}`,
    height: kRoom.top + kRoom.bottom + most * heightOf(most),
    fitsWidth: true,
    option: (look, _, width = kFileWidth) => {
      const shown = chosen().map((place) => ({ place, of: dimensions[place]! }));
      const size = shown.length;
      const height = kRoom.top + kRoom.bottom + most * heightOf(most);
      const across = (width - kRoom.left - kRoom.right - (size - 1) * kGap) / size;
      const down = (height - kRoom.top - kRoom.bottom - (size - 1) * kGap) / size;
      const hasLabels = across >= kLabelRoom && down >= 50;
      const [grids, xAxes, yAxes, series]: object[][] = [[], [], [], []];
      const scale = ({ logarithmic, draws }: PosteriorDimension) => (logarithmic && finite(draws).every((value) => value > 0) ? logRange([draws]) : {});
      shown.forEach((below, row) => shown.forEach((beside, column) => {
        const index = grids!.length;
        const [isLeft, isBottom] = [column === 0, row === size - 1];
        const isDiagonal = row === column;
        const plain = isDiagonal || column > row;
        grids!.push({ left: kRoom.left + column * (across + kGap), top: kRoom.top + row * (down + kGap), width: across, height: down, containLabel: false, show: !plain, borderColor: look.rule });
        const quiet = { splitLine: { show: false }, axisTick: { show: false }, gridIndex: index, splitNumber: 2 };
        const labels = (on: boolean, of: PosteriorDimension) => ({ ...(scale(of) as { axisLabel?: object }).axisLabel, show: on && hasLabels, fontSize: 10, showMinLabel: false, showMaxLabel: false, hideOverlap: true });
        xAxes!.push(axis(look, column > row ? { ...quiet, show: false, min: 0, max: 1 } : { ...quiet, ...scale(beside.of), axisTick: { show: false },
          axisLabel: labels(isBottom, beside.of), axisLine: { show: false }, ...(isBottom ? { name: nameWithin(beside.of.name, across), nameGap: hasLabels ? 26 : 10, nameTextStyle: { color: look.ink } } : {}) }));
        yAxes!.push(axis(look, plain ? { ...quiet, scale: false, show: isDiagonal && isLeft, min: 0, axisLabel: { show: false }, axisLine: { show: false },
          ...(isDiagonal && isLeft ? { name: nameWithin(below.of.name, down), nameGap: hasLabels ? 52 : 10, nameTextStyle: { color: look.ink } } : {}), ...(column > row ? { max: 1 } : {}) }
          : { ...quiet, ...scale(below.of), axisTick: { show: false }, axisLabel: labels(isLeft, below.of), axisLine: { show: false },
            ...(isLeft ? { name: nameWithin(below.of.name, down), nameGap: hasLabels ? 52 : 10, nameTextStyle: { color: look.ink } } : {}) }));
        const own = { xAxisIndex: index, yAxisIndex: index };
        if (column < row) {
          series!.push({ ...own, type: 'scatter', symbolSize: size > 5 ? 2.5 : 3.5, itemStyle: { color: look.best, opacity: 0.45 }, progressive: 0,
            data: below.of.draws.map((value, draw) => [beside.of.draws[draw], value]),
            tooltip: { formatter: (dot: { value: number[] }) => tip('A state of the posterior', [[shorten(beside.of.name, 40), number(dot.value[0])], [shorten(below.of.name, 40), number(dot.value[1])]]) } });
        } else if (isDiagonal) {
          const { edges, posterior } = below.of;
          series!.push({ ...own, type: 'line', symbol: 'none', silent: true, lineStyle: { color: look.bars, width: 1 }, areaStyle: { color: look.bars, opacity: 0.35 },
            data: edges.flatMap((edge, bin) => [[edge, posterior[bin - 1] ?? 0], [edge, posterior[bin] ?? 0]]) });
        } else {
          const value = correlations[below.place]?.[beside.place] ?? null;
          series!.push({ ...own, type: 'custom', data: value === null ? [] : [[0.5, 0.5, value]],
            tooltip: { formatter: () => tip(number(value, 3), [[shorten(below.of.name, 80), ''], [shorten(beside.of.name, 80), '']]) },
            renderItem: (_info: unknown, api: CustomApi) => {
              const [left, bottom] = api.coord([0, 0]);
              const [right, top] = api.coord([1, 1]);
              const isStrong = Math.abs(value!) > 0.74;
              return { type: 'group', children: [
                { type: 'rect', shape: { x: left!, y: top!, width: right! - left!, height: bottom! - top! }, style: { fill: colour(look.diverging, value!) } },
                { type: 'text', style: { x: (left! + right!) / 2, y: (top! + bottom!) / 2, align: 'center', verticalAlign: 'middle', text: value!.toFixed(2).replace('-', '\u2212'), fontSize: across < 44 ? 9 : 12, fill: isStrong ? look.inkOnStrong : look.ink } }] };
            } });
        }
      }));
      return { grid: grids, xAxis: xAxes, yAxis: yAxes, series, tooltip: tooltip(look, { trigger: 'item' }) };
    },
    csv: () => ({
      columns: dimensions.map(({ name }, index) => ({ title: name, number: index > 0 })),
      length: dimensions[0]!.draws.length,
      row: (draw) => dimensions.map(({ draws }) => number(draws[draw], 7)),
    }),
  };
}

/** The dimensions with the strongest correlations, as many as are shown at a time, in their order. */
function strongest(count: number, correlations: Maybe[][]): number[] {
  const strength = Array.from({ length: count }, (_, place) =>
    Math.max(0, ...(correlations[place] ?? []).map((value, other) => (other === place ? 0 : Math.abs(value ?? 0)))));
  const order = strength.map((_, place) => place).sort((a, b) => strength[b]! - strength[a]! || a - b);
  return order.slice(0, kMostPaired).sort((a, b) => a - b);
}

/** The matrix of charts with, where there are more parameters than it can show, a button for each. Nothing without two that vary. */
export function pairPlots(all: PosteriorDimension[], matrix: Maybe[][]): HTMLElement[] {
  const varying = all.map((_, place) => place).filter((place) => new Set(finite(all[place]!.draws)).size > 1);
  if (varying.length < 2) return [];
  const dimensions = varying.map((place) => all[place]!);
  const correlations = matrix.length > 0 ? varying.map((row) => varying.map((column) => matrix[row]?.[column] ?? null)) : [];
  const chosen = strongest(dimensions.length, correlations); // the one chosen first is the first to go
  const drawn = chart(pairPlan(dimensions, correlations, () => [...chosen].sort((a, b) => a - b)));
  if (dimensions.length <= kMostPaired) return [drawn];
  const buttons = dimensions.map(({ name }, place) => make('button', {
    type: 'button', title: name, 'aria-pressed': String(chosen.includes(place)),
    onclick: () => {
      const at = chosen.indexOf(place);
      if (at >= 0 && chosen.length > 2) chosen.splice(at, 1);
      else if (at < 0) chosen.push(place);
      if (chosen.length > kMostPaired) chosen.shift();
      buttons.forEach((button, index) => button.setAttribute('aria-pressed', String(chosen.includes(index))));
      drawn.redraw();
    },
  }, shorten(name, 24)));
  return [make('p', { class: 'note' }, `Those with the strongest correlations. Choose others, up to ${kMostPaired} at a time:`), make('div', { class: 'picks' }, ...buttons), drawn];
}
