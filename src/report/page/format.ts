// The format of numbers and times on the page, independent of the browser's language.
import type { Maybe } from './data';

export const kMissing = '\u2013';

let isPlain = false;

/**
 * What `write` returns, with its numbers and times as programs read them: every digit, no signs but those of ASCII, times as
 * 1981-10-01T00:00:00, and no text for a missing value.
 */
export function plainly<Result>(write: () => Result): Result {
  isPlain = true;
  try {
    return write();
  } finally {
    isPlain = false;
  }
}

/** `value` with `digits` significant digits and no trailing zeros; very large and very small ones with an exponent. */
export function number(value: Maybe | undefined, digits = 4): string {
  if (value === null || value === undefined || !Number.isFinite(value)) return isPlain ? '' : kMissing;
  if (isPlain) return String(value);
  if (value === 0) return '0';
  const size = Math.abs(value);
  if (size >= 1e7 || size < 1e-4) {
    const [mantissa, exponent] = value.toExponential(digits - 1).split('e');
    return minus(`${Number(mantissa)}e${Number(exponent)}`);
  }
  return minus(String(Number(value.toPrecision(digits))));
}

/** `value` beside an axis, where there is room for few characters. */
export function tick(value: number): string {
  const size = Math.abs(value);
  if (value === 0 || (size >= 1e-3 && size < 1e6)) return number(value, 5);
  const [mantissa, exponent] = value.toExponential(4).split('e');
  return minus(`${Number(mantissa)}e${Number(exponent)}`);
}

/** A count, its thousands set apart by a narrow space. */
export function count(value: number): string {
  if (isPlain) return String(value);
  return String(Math.round(value)).replace(/\B(?=(\d{3})+$)/g, '\u202f');
}

/** `count things`, in the singular where it is one. */
export function counted(value: number, thing: string): string {
  return `${count(value)} ${thing}${value === 1 ? '' : 's'}`;
}

export function percent(share: Maybe | undefined, digits = 3): string {
  if (share === null || share === undefined || !Number.isFinite(share)) return isPlain ? '' : kMissing;
  if (isPlain) return String(share * 100);
  return `${number(share * 100, digits)} %`;
}

/** 1981-10-01, with the time of day where `step` (milliseconds) is below a day. UTC, as the series are. */
export function moment(time: number, step = 86400000): string {
  const text = new Date(time).toISOString();
  if (isPlain) return text.slice(0, 19);
  return step >= 86400000 ? text.slice(0, 10) : `${text.slice(0, 10)} ${text.slice(11, 16)}`;
}

/** How long it is from one `2026-11-21 07:00:00` to another, or null where that cannot be said. */
export function duration(from: string | null, to: string | null): string | null {
  if (!from || !to) return null;
  const seconds = (Date.parse(`${to.replace(' ', 'T')}Z`) - Date.parse(`${from.replace(' ', 'T')}Z`)) / 1000;
  if (!Number.isFinite(seconds) || seconds < 0) return null;
  if (seconds < 120) return `${seconds} s`;
  const minutes = Math.round(seconds / 60);
  if (minutes < 120) return `${minutes} min`;
  const hours = Math.floor(minutes / 60);
  if (hours < 48) return `${hours} h ${minutes % 60} min`;
  return `${Math.floor(hours / 24)} d ${hours % 24} h`;
}

function minus(text: string): string {
  return text.replace(/-/g, '\u2212');
}
