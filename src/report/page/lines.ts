// A column of a series as a line that is interrupted where the program says so, and the values that need a dot.
import type { Maybe } from './data';

/** A value without a neighbour on its piece of the line would not be seen. */
export interface Line {
  times: number[];
  values: Maybe[]; // null: the line is interrupted
  dots: [number, number][];
}

const kFewDots = 200; // that many values are shown one by one on their line

/** `breaks`: times of the values behind which the line is interrupted, ascending. */
export function lineOf(times: readonly number[], values: readonly Maybe[], breaks: readonly number[] = [], isPoints = false, showsFew = false): Line {
  const line: Line = { times: [], values: [], dots: [] };
  let next = 0;
  let last: number | null = null; // time of the last value
  const pieces: number[] = []; // where each piece of the line begins
  for (let place = 0; place < times.length; ++place) {
    const [time, value] = [times[place]!, values[place]];
    if (value == null) continue;
    while (last !== null && next < breaks.length && breaks[next]! < last) ++next;
    if (last !== null && next < breaks.length && breaks[next]! < time) {
      line.times.push((last + time) / 2);
      line.values.push(null);
      pieces.push(line.times.length);
    }
    if (last === null) pieces.push(0);
    line.times.push(time);
    line.values.push(value);
    last = time;
  }
  const count = line.times.length - Math.max(0, pieces.length - 1);
  const showsAll = isPoints || (showsFew && count <= kFewDots);
  pieces.forEach((begin, index) => {
    const end = index + 1 < pieces.length ? pieces[index + 1]! - 1 : line.times.length;
    if (!showsAll && end - begin > 1) return;
    for (let at = begin; at < end; ++at) line.dots.push([line.times[at]!, line.values[at]!]);
  });
  return line;
}

/** `make` when it is first asked for: most charts of a long report are not drawn at once. */
export function later<T>(make: () => T): () => T {
  let made: { value: T } | null = null;
  return () => (made ??= { value: make() }).value;
}

/** Time and value in turn, as the charting library takes least memory for; NaN where the line is interrupted. */
export function pointsOf({ times, values }: Line, log: boolean): Float64Array {
  const points = new Float64Array(2 * times.length);
  times.forEach((time, at) => {
    const value = values[at];
    points[2 * at] = time;
    points[2 * at + 1] = value == null || (log && value <= 0) ? NaN : value;
  });
  return points;
}

/** The place of the time that is nearest to `time`. */
export function nearest(times: readonly number[], time: number): number {
  let [low, high] = [0, times.length - 1];
  while (low < high) {
    const middle = (low + high) >> 1;
    if (times[middle]! < time) low = middle + 1;
    else high = middle;
  }
  return low > 0 && time - times[low - 1]! < times[low]! - time ? low - 1 : low;
}
