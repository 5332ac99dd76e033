import { axis, kFileWidth, tip, tooltip, type ChartPlan } from '../chart';
import type { Maybe } from '../data';
import { shorten, type Reason } from '../dom';
import { kMissing, number } from '../format';
import { finite } from '../numbers';

const kLabelled = 14; // rows and columns up to which every cell shows its number, if it has room for it
const kNumberRoom = 34; // pixels
const kNameRoom = 96; // of a column; narrower ones have their names at a slant
const kBeside = 190; // names of the rows and the scale of colours

/** A matrix, one row of it from top to bottom, coloured from -`extent` over 0 to +`extent`. `reason`: of the matrix's cells without a value. */
export function heatmap(title: string, rows: string[], columns: string[], matrix: Maybe[][], extent: number, note: string, reason?: Reason): ChartPlan {
  const cells = matrix.flatMap((row, y) => row.map((value, x) => ({ value: [x, y, value ?? NaN], strong: Math.abs(value ?? 0) > 0.7 * extent })));
  const missing = ([x, y, value]: [number, number, number]): [string, string][] => {
    const why = Number.isFinite(value) ? null : reason?.(y, x);
    return why ? [[why, '']] : [];
  };
  const labelled = rows.length <= kLabelled && columns.length <= kLabelled;
  return {
    title,
    note,
    height: Math.min(900, 110 + Math.max(28, Math.min(40, 420 / rows.length)) * rows.length),
    fitsWidth: true,
    option: (look, _, width = kFileWidth) => {
      const cell = (width - kBeside) / columns.length;
      const few = labelled && cell >= 16;
      return {
        grid: { left: 24, right: width < 500 ? 64 : 90, top: 8, bottom: 26 },
        xAxis: axis(look, { type: 'category', data: columns, axisTick: { show: false }, axisLine: { show: false },
          axisLabel: { color: look.ink, formatter: (name: string) => shorten(name, 14), interval: few ? 0 : 'auto', rotate: cell < 20 ? 90 : cell < kNameRoom ? 45 : 0, fontSize: cell < 20 ? 10 : 12 } }),
        yAxis: axis(look, { type: 'category', data: rows, inverse: true, axisTick: { show: false }, axisLine: { show: false },
          axisLabel: { color: look.ink, formatter: (name: string) => shorten(name, width < 500 ? 14 : 18), interval: labelled ? 0 : 'auto' } }),
        visualMap: {
          min: -extent, max: extent, calculable: false, right: 0, top: 'middle', precision: 2, itemHeight: 130, itemWidth: 12,
          inRange: { color: look.diverging }, outOfRange: { color: look.rule }, textStyle: { color: look.muted },
          formatter: (value: number) => number(value, 2), text: [number(extent, 2), number(-extent, 2)],
        },
        tooltip: tooltip(look, { formatter: (cell: { value: [number, number, number] }) =>
          tip(number(cell.value[2]), [...missing(cell.value), [shorten(rows[cell.value[1]]!, 80), ''], [shorten(columns[cell.value[0]]!, 80), '']]) }),
        series: [{
          type: 'heatmap', progressive: 0,
          data: cells.map(({ value, strong }) => (strong ? { value, label: { color: look.inkOnStrong } } : { value })),
          itemStyle: { borderColor: look.surface, borderWidth: 2 },
          label: {
            show: labelled && cell >= kNumberRoom, color: look.ink, fontSize: 11,
            formatter: (cell: { value: [number, number, number] }) => (Number.isFinite(cell.value[2]) ? cell.value[2].toFixed(2).replace('-', '\u2212') : kMissing),
          },
          emphasis: { itemStyle: { borderColor: look.ink, borderWidth: 1 } },
        }],
      };
    },
    values: () => ({
      columns: [{ title: '' }, ...columns.map((name) => ({ title: name, number: true }))],
      length: rows.length,
      row: (index) => [rows[index]!, ...matrix[index]!.map((value) => number(value, 3))],
      reason: (row, column) => reason?.(row, column - 1),
    }),
  };
}

/** The largest size of a matrix's values, 1 where there is none. */
export function extentOf(matrix: Maybe[][]): number {
  return finite(matrix.flat()).reduce((most, value) => Math.max(most, Math.abs(value)), 0) || 1;
}
