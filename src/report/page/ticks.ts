// Where an axis has its labels, and what they say, where the library alone would leave the reader without.
import type { AxisPlan } from './chart';
import type { Maybe } from './data';

/** Round numbers over a logarithmic range: powers of ten where there are many, more between them the fewer there are. */
export function logTicks(low: number, high: number): number[] {
  if (!(low > 0) || !(high > low)) return [];
  const decades = Math.log10(high / low);
  const ticks: number[] = [];
  if (decades < 0.7) {
    const rough = (high - low) / 7;
    const power = 10 ** Math.floor(Math.log10(rough));
    const step = [1, 2, 5, 10].map((factor) => factor * power).find((size) => size >= rough)!;
    for (let count = Math.ceil(low / step - 1e-9); count * step <= high * (1 + 1e-9); ++count) ticks.push(Number((count * step).toPrecision(12)));
    return ticks;
  }
  const apart = Math.max(1, Math.ceil(decades / 8));
  const factors = decades > 3 ? [1] : decades > 1.5 ? [1, 3] : [1, 2, 5];
  for (let power = Math.floor(Math.log10(low)); power <= Math.ceil(Math.log10(high)); ++power) {
    if (power % apart !== 0) continue;
    for (const factor of factors) {
      const value = Number((factor * 10 ** power).toPrecision(12));
      if (value >= low * (1 - 1e-9) && value <= high * (1 + 1e-9)) ticks.push(value);
    }
  }
  return ticks;
}

/** A logarithmic axis over the values themselves; whole decades would press values of 4 to 9 together. */
export function logRange(columns: readonly (readonly Maybe[])[]): AxisPlan {
  let [low, high] = [Infinity, 0];
  for (const column of columns) {
    for (const value of column) {
      if (value == null || !(value > 0)) continue;
      low = Math.min(low, value);
      high = Math.max(high, value);
    }
  }
  if (!(high > low)) return { log: true };
  const margin = (high / low) ** 0.04;
  const [min, max] = [low / margin, high * margin];
  const at = { customValues: logTicks(min, max) };
  return { log: true, min, max, axisTick: { show: true, ...at }, axisLabel: at };
}
