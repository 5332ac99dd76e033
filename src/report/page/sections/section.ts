import { make, shorten } from '../dom';

export interface Section {
  id: string;
  title: string;
  content: (Node | null)[];
}

/** Small charts side by side. */
export function grid(...charts: Node[]): HTMLElement {
  return make('div', { class: 'grid' }, ...charts);
}

export function paragraph(text: string): HTMLElement {
  return make('p', {}, text);
}

export function heading(text: string): HTMLElement {
  return make('h3', { title: text }, text);
}

/** A sentence on what was found: good, a warning, or neither. */
export interface Finding {
  text: string;
  kind?: 'good' | 'warning';
}

export function findingList(all: Finding[]): HTMLElement {
  return make('ul', { class: 'findings' }, ...all.map(({ text, kind }) => make('li', { class: kind }, text)));
}

/** Of a value that the data do not explain. */
export const kLogSays = 'the log says why';

/** A name in a sentence, isolated: one that is written from right to left does not turn the sentence around. */
export const isolated = (name: string) => `\u2068${shorten(name, 60)}\u2069`;
