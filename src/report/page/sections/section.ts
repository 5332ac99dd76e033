import { make } from '../dom';

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
