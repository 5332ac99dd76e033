// A figure as a file to take along: its drawing as SVG, or what it draws as CSV.
import type { Column, Reason } from './dom';
import { make } from './dom';
import { kMissing, moment, number, plainly } from './format';

export interface Values {
  columns: Column[];
  length: number;
  row: (index: number) => string[];
  reason?: Reason; // of a value that is missing
}

let setupName = 'report';

/** Files are named after the setup, as those of the run are. */
export function nameFilesAfter(setup: string): void {
  if (setup) setupName = setup;
}

/** At most `length` characters of a name, without those that a file name may not have everywhere. */
function inFileName(name: string, length: number): string {
  const plain = name.normalize('NFC').replace(/[^\p{L}\p{M}\p{N}.\-]+/gu, '-');
  return Array.from(plain).slice(0, length).join('').replace(/^[.\-]+|[.\-]+$/g, '');
}

/** Of setup, section, heading (the section's series, where it has several) and title. */
export function fileNameOf(figure: Element, title: string, ending: string): string {
  const section = figure.closest('section');
  let heading: Element | null = null;
  for (let part: Element | null = figure; part && part !== section && !heading; part = part.parentElement) { // out of grids and what is unfolded
    heading = part;
    while (heading && heading.tagName !== 'H3') heading = heading.previousElementSibling;
  }
  const parts = [inFileName(setupName, 60), section?.id ?? '', inFileName(heading?.textContent ?? '', 40), inFileName(title, 60)];
  return `${parts.filter((part) => part !== '').join('_')}${ending}`;
}

// Spreadsheets take a text that begins like a formula for one.
const looksLikeFormula = (cell: string) => /^[=+\-@\t\r]/.test(cell) && !Number.isFinite(Number(cell));

function cellText(cell: string): string {
  const text = cell === kMissing ? '' : looksLikeFormula(cell) ? `'${cell}` : cell;
  return /[",\r\n]/.test(text) ? `"${text.replaceAll('"', '""')}"` : text;
}

/** All rows, in full precision, under a line of names with their units. */
export function csvOf(values: () => Values): string {
  return plainly(() => {
    const { columns, length, row } = values();
    const lines = [columns.map(({ title, unit }) => cellText(unit ? `${title} (${unit})` : title)).join(',')];
    for (let index = 0; index < length; ++index) lines.push(row(index).map(cellText).join(','));
    return `${lines.join('\r\n')}\r\n`;
  });
}

type Axis = { name?: string; type?: string } | undefined;
type DrawnSeries = { name?: string; data?: unknown[] };

const first = (item: unknown) => (Array.isArray(item) ? item[0] : item) as Axis;

/** The points of a chart that draws points: the name of their series, and their two coordinates. */
export function drawnValues(option: Record<string, unknown>): Values {
  const axes = [first(option.xAxis), first(option.yAxis)];
  const points = (option.series as DrawnSeries[]).flatMap(({ name, data }) => (data ?? []).flatMap((item): [string, number[]][] => {
    const value: unknown = Array.isArray(item) ? item : (item as { value?: unknown } | null)?.value;
    return Array.isArray(value) && value.length > 1 ? [[name ?? '', value as number[]]] : [];
  }));
  return {
    columns: [{ title: 'Series' }, ...axes.map((axis, index) => ({ title: axis?.name || 'xy'[index]! }))],
    length: points.length,
    row: (place) => {
      const [name, point] = points[place]!;
      return [name, ...axes.map((axis, index) => (axis?.type === 'time' ? moment(point[index]!, 0) : number(point[index])))];
    },
  };
}

/** Characters that no XML document may have are left out: names may have any. */
export function wellFormed(svg: string, title: string): string {
  const escaped = title.replace(/[<>&]/g, (sign) => `&#${sign.charCodeAt(0)};`);
  return svg.replace('>', () => `><title>${escaped}</title>`).replace(/[\u0000-\u0008\u000b\u000c\u000e-\u001f\ufffe\uffff]/g, '');
}

/** Hands `text` to the browser as a file. Nothing is requested: the file is made in the page. */
export function download(name: string, kind: string, text: string): void {
  const address = URL.createObjectURL(new Blob([text], { type: `${kind};charset=utf-8` }));
  make('a', { href: address, download: name }).click();
  setTimeout(() => URL.revokeObjectURL(address), 60000);
}
