// Elements made from text only: names are shown literally and never interpreted as HTML.

import { kMissing } from './format';

type Child = Node | string | null | undefined | false;
type Attributes = Record<string, string | number | boolean | null | undefined | ((event: Event) => void)>;

/** An element. Attributes that are null, undefined or false are left out; functions become listeners (`onclick`). */
export function make<Tag extends keyof HTMLElementTagNameMap>(
  tag: Tag,
  attributes: Attributes = {},
  ...children: Child[]
): HTMLElementTagNameMap[Tag] {
  const made = document.createElement(tag);
  for (const [name, value] of Object.entries(attributes)) {
    if (typeof value === 'function') made.addEventListener(name.slice(2), value);
    else if (value === true) made.setAttribute(name, '');
    else if (value !== null && value !== undefined && value !== false) made.setAttribute(name, String(value));
  }
  for (const child of children) {
    if (child !== null && child !== undefined && child !== false) made.append(child);
  }
  return made;
}

export interface Column {
  title: string;
  number?: boolean; // set flush right
  hint?: string;
  unit?: string | null;
}

/** Why there is no value in that row and column of a table. */
export type Reason = (row: number, column: number) => string | null | undefined;

const kMostReasons = 3; // below a table

/** A table in a frame that scrolls sideways where the window is narrow. A value that is missing is a dash that says why, as a line below does. */
export function table(columns: Column[], rows: Child[][], label: string, reason: Reason = () => null): HTMLElement {
  const found = new Set<string>();
  const shown = (cell: Child, row: number, column: number): Child => {
    const why = cell === '' || cell === kMissing ? reason(row, column) : null;
    if (!why) return cell;
    found.add(why);
    return make('span', { title: why }, kMissing);
  };
  const kind = (index: number) => (columns[index]?.number ? 'number' : null);
  const head = columns.map((column, index) => make('th', { scope: 'col', class: kind(index), title: column.hint }, column.title));
  const body = rows.map((row, place) =>
    make('tr', {}, ...row.map((cell, index) =>
      index === 0 ? make('th', { scope: 'row', class: kind(index) }, cell) : make('td', { class: kind(index) }, shown(cell, place, index)))));
  const reasons = [...found];
  const more = reasons.length > kMostReasons ? '; others where the pointer rests on a dash' : '';
  return make('div', { class: 'table', role: 'region', 'aria-label': label, tabindex: 0 },
    make('table', {}, make('thead', {}, make('tr', {}, ...head)), make('tbody', {}, ...body)),
    reasons.length > 0 && make('p', { class: 'note' }, `${kMissing}: ${reasons.slice(0, kMostReasons).join('; ')}${more}.`));
}

/** A list to choose from; `chosen` is called with the index. */
export function choice(label: string, names: string[], chosen: (index: number) => void): HTMLElement {
  const select = make('select', { onchange: () => chosen(select.selectedIndex) },
    ...names.map((name) => make('option', {}, shorten(name, 60))));
  return make('label', { class: 'choice' }, label, ' ', select);
}

/** At most `length` characters: the beginning, and an ellipsis in place of the rest. */
export function shorten(text: string, length: number): string {
  const characters = Array.from(text);
  return characters.length <= length ? text : `${characters.slice(0, length - 1).join('')}\u2026`;
}
