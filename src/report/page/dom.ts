// Elements made from text only: names are shown literally and never interpreted as HTML.

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

/** A table in a frame that scrolls sideways where the window is narrow. */
export function table(columns: Column[], rows: Child[][], label: string): HTMLElement {
  const kind = (index: number) => (columns[index]?.number ? 'number' : null);
  const head = columns.map((column, index) => make('th', { scope: 'col', class: kind(index), title: column.hint }, column.title));
  const body = rows.map((row) =>
    make('tr', {}, ...row.map((cell, index) =>
      index === 0 ? make('th', { scope: 'row', class: kind(index) }, cell) : make('td', { class: kind(index) }, cell))));
  return make('div', { class: 'table', role: 'region', 'aria-label': label, tabindex: 0 },
    make('table', {}, make('thead', {}, make('tr', {}, ...head)), make('tbody', {}, ...body)));
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
