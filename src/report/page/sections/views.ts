// What can be unfolded below a hydrograph. It is made when it is opened, so that a long report opens at once.
import type { Series } from '../data';
import { make } from '../dom';
import { extremesView, fitsTable, peaksTable } from './regimes';
import { residualsView } from './residuals';

function folded(title: string, content: () => Node[]): HTMLElement {
  const details = make('details', { class: 'view' }, make('summary', {}, title));
  details.addEventListener('toggle', () => {
    if (details.open && details.children.length === 1) details.append(...content());
  });
  return details;
}

/** `label`: what an axis says of the values. */
export function viewsOf({ measure, unit, views }: Series, label: string): Node[] {
  if (!views) return [];
  const { peaks } = views;
  return [
    folded('Seasons and years', () => [
      fitsTable(views, measure, unit),
      make('p', { class: 'note' }, 'Over the evaluation period. Efficiencies need 10 values.'),
    ]),
    folded('Low flows and floods', () => extremesView(views, label, unit)),
    ...(peaks && peaks.length > 0 ? [folded('Largest peaks', () => [peaksTable(views, peaks, measure, unit)])] : []),
    folded('Residuals', () => residualsView(views, unit)),
  ];
}
