// What the page derives from the data for drawing. Figures that it states are in the data.
import type { Maybe, Parameter } from './data';

export function finite(values: readonly Maybe[]): number[] {
  return values.filter((value): value is number => value !== null && Number.isFinite(value));
}

export function sorted(values: readonly Maybe[]): number[] {
  return finite(values).sort((a, b) => a - b);
}

/** Linear between the order statistics; NaN where there is none. */
export function quantile(ordered: readonly number[], probability: number): number {
  if (ordered.length === 0) return NaN;
  const place = (ordered.length - 1) * probability;
  const below = Math.floor(place);
  const low = ordered[below]!;
  const high = ordered[Math.min(below + 1, ordered.length - 1)]!;
  return low + (high - low) * (place - below);
}

/** The place of the smallest value up to each place, of equals the last; null before the first value. */
export function placesOfBest(values: readonly Maybe[]): (number | null)[] {
  let best: number | null = null;
  return values.map((value, place) => {
    if (value !== null && (best === null || value <= values[best]!)) best = place;
    return best;
  });
}

/** The smallest value up to each place; null before the first value. */
export function bestSoFar(values: readonly Maybe[]): Maybe[] {
  return placesOfBest(values).map((place) => (place === null ? null : values[place]!));
}

/** Places of the best `share` of the values (the smallest; ten at least where there are as many), best first. */
export function bestShare(values: readonly Maybe[], share: number): number[] {
  const places = values.flatMap((value, index) => (value === null ? [] : [index]));
  places.sort((a, b) => values[a]! - values[b]! || b - a);
  return places.slice(0, Math.min(places.length, Math.max(10, Math.ceil(places.length * share))));
}

/** The aggregates without those of sets that an earlier evaluation has already run, with the same result. */
export function withoutRepeats(aggregate: readonly Maybe[], parameters: readonly (readonly Maybe[])[]): Maybe[] {
  const first = new Map<number, number>(); // places, by the aggregate
  const seen = new Set<string>();
  const keyOf = (place: number) => JSON.stringify([aggregate[place], ...parameters.map((column) => column[place])]);
  return aggregate.map((value, place) => {
    if (value === null) return null;
    const other = first.get(value);
    if (other === undefined) {
      first.set(value, place);
      return value;
    }
    seen.add(keyOf(other));
    const key = keyOf(place);
    if (seen.has(key)) return null;
    seen.add(key);
    return value;
  });
}

/** Pearson's correlation of two columns over `places`; null where one of them does not vary. */
export function correlation(a: readonly Maybe[], b: readonly Maybe[], places: readonly number[]): Maybe {
  const used = places.filter((place) => a[place] != null && b[place] != null);
  if (used.length < 3) return null;
  let meanA = 0;
  let meanB = 0;
  for (const place of used) {
    meanA += a[place]! / used.length;
    meanB += b[place]! / used.length;
  }
  let ab = 0;
  let aa = 0;
  let bb = 0;
  for (const place of used) {
    const da = a[place]! - meanA;
    const db = b[place]! - meanB;
    ab += da * db;
    aa += da * da;
    bb += db * db;
  }
  // Variation due to rounding alone does not count.
  const varies = (squares: number, mean: number) => squares > used.length * (1e-12 * Math.abs(mean)) ** 2;
  return varies(aa, meanA) && varies(bb, meanB) ? ab / Math.sqrt(aa * bb) : null;
}

export interface Bin {
  from: number;
  to: number;
  count: number;
}

/**
 * Bins of equal width (`log`: of equal ratio, for positive values) after Freedman and Diaconis (1981), 5 to 50 of them; one
 * bin where all values are equal.
 */
export function histogram(values: readonly Maybe[], log = false): Bin[] {
  if (log) {
    const bins = histogram(values.map((value) => (value === null ? null : Math.log(value))));
    return bins.map(({ from, to, count }) => ({ from: Math.exp(from), to: Math.exp(to), count }));
  }
  const ordered = sorted(values);
  if (ordered.length === 0) return [];
  const low = ordered[0]!;
  const high = ordered[ordered.length - 1]!;
  if (low === high) return [{ from: low, to: high, count: ordered.length }];
  const width = (2 * (quantile(ordered, 0.75) - quantile(ordered, 0.25))) / Math.cbrt(ordered.length);
  const bins = Math.min(50, Math.max(5, width > 0 ? Math.ceil((high - low) / width) : 5));
  const counts = new Array<number>(bins).fill(0);
  for (const value of ordered) counts[Math.min(bins - 1, Math.floor(((value - low) / (high - low)) * bins))]! += 1;
  const edge = (index: number) => low + ((high - low) * index) / bins;
  return counts.map((count, index) => ({ from: edge(index), to: edge(index + 1), count }));
}

/**
 * Places of the points that are worth drawing: of all that fall into one cell of a grid over their extent, the first. A
 * cell is about a symbol wide, so that the picture stays the same.
 */
export function thin(x: readonly Maybe[], y: readonly Maybe[], columns: number, rows: number, top = Infinity): number[] {
  const usable: number[] = [];
  let [left, right, low, high] = [Infinity, -Infinity, Infinity, -Infinity];
  for (let place = 0; place < x.length; ++place) {
    const [a, b] = [x[place], y[place]];
    if (a == null || b == null || b > top) continue;
    usable.push(place);
    left = Math.min(left, a);
    right = Math.max(right, a);
    low = Math.min(low, b);
    high = Math.max(high, b);
  }
  const cell = (value: number, from: number, to: number, cells: number) =>
    to > from ? Math.round(((value - from) / (to - from)) * cells) : 0;
  const taken = new Set<number>();
  return usable.filter((place) => {
    const key = cell(x[place]!, left, right, columns) * (rows + 1) + cell(y[place]!, low, high, rows);
    if (taken.has(key)) return false;
    taken.add(key);
    return true;
  });
}

/** Evenly spaced places of `length` values, both ends among them. */
export function spaced(length: number, most: number): number[] {
  if (length <= most) return Array.from({ length }, (_, index) => index);
  return Array.from({ length: most }, (_, index) => Math.round((index * (length - 1)) / (most - 1)));
}

/** Where a few values lie far above the others, the value to end an axis at; Infinity elsewhere. */
export function axisTop(values: readonly Maybe[]): number {
  const ordered = sorted(values);
  if (ordered.length < 20) return Infinity;
  const low = ordered[0]!;
  const most = quantile(ordered, 0.95);
  if (!(most > low) || ordered[ordered.length - 1]! - low <= 3 * (most - low)) return Infinity;
  const unit = 10 ** (Math.floor(Math.log10(most - low)) - 1);
  return Number((Math.ceil((most + 0.25 * (most - low)) / (5 * unit)) * 5 * unit).toPrecision(6));
}

/** Share of the way from the lower to the upper bound, on the scale on which the parameter is searched. */
export function placeBetweenBounds(parameter: Parameter, value: Maybe): Maybe {
  const { lower, upper } = parameter;
  if (value === null || lower === null || upper === null || !(upper > lower)) return null;
  if (parameter.transformation === 'logarithmic' && lower > 0 && value > 0) {
    return Math.log(value / lower) / Math.log(upper / lower);
  }
  return (value - lower) / (upper - lower);
}

/** Values from the largest to the smallest against the share of time (percent) in which they are exceeded, (i)/(n+1). */
export function durationCurve(values: readonly Maybe[]): [number, number][] {
  const falling = sorted(values).reverse();
  return falling.map((value, index) => [(100 * (index + 1)) / (falling.length + 1), value]);
}
