// The trade-off between several objectives: what one costs the other, and what every point of the front is.
import { chart, type Chart, type ChartPlan } from '../chart';
import type { Front, ReportData } from '../data';
import { make, shorten, table } from '../dom';
import { count, counted, number, percent } from '../format';
import { finite, spaced } from '../numbers';
import { frontMatrixPlan, frontPlan, hypervolumePlan, objectiveLinesPlan, parameterLinesPlan } from './front_charts';
import { Picking } from './front_picking';
import { above, leastOf, pickedPoint } from './front_point';
import { findingList, heading, isolated, paragraph, type Finding, type Section } from './section';

const kSame = 0.01; // of the best value: no cost
const kRowsShown = 200;
const kStillGrows = 0.01; // of the hypervolume, in the last third of the evaluations

const value = (front: Front, objective: number, place: number): number => front.values[objective]?.[place] ?? NaN;

/** For each objective the place on the front where it is best; of equal ones where the others, one by one, are. */
function endsOf(front: Front, places: number[]): number[] {
  return front.objectives.map((_, objective) => places.reduce((best, place) => {
    const difference = value(front, objective, place) - value(front, objective, best);
    if (difference !== 0) return difference < 0 ? place : best;
    const total = (of: number) => front.objectives.reduce((sum, __, other) => sum + value(front, other, of), 0);
    return total(place) < total(best) ? place : best;
  }, places[0]!));
}

const isNear = (front: Front, places: number[], place: number) => front.objectives.every((_, objective) => {
  const least = leastOf(front, places, objective);
  return value(front, objective, place) - least <= kSame * Math.abs(least);
});

/** "0.5 (+12 %)": how far above the best. */
function withAbove(front: Front, places: number[], objective: number, place: number): string {
  const own = value(front, objective, place);
  const more = above(own, leastOf(front, places, objective));
  return `${number(own)} (${more ? `+${more}` : 'best'})`;
}

function costs(front: Front, places: number[], ends: number[]): Finding[] {
  const { objectives, numbers, suggested } = front;
  if (places.length === 1) return [{ kind: 'good', text: `Evaluation ${count(numbers[places[0]!]!)} is the best in every objective at once: none costs another anything.` }];
  const found: Finding[] = [{ text: `${counted(places.length, 'set')} on the front: of none of them is there a set that is better in one objective and worse in no other.` }];
  const near = [...(suggested === null ? [] : [suggested]), ...places].find((place) => isNear(front, places, place));
  if (near !== undefined) {
    found.push({ kind: 'good', text: `The objectives hardly conflict: evaluation ${count(numbers[near]!)} is within ${percent(kSame)} of the best of each.` });
  }
  if (objectives.length === 2) {
    for (const [own, other] of [[0, 1], [1, 0]] as const) {
      const place = ends[own]!;
      const least = leastOf(front, places, other);
      const there = value(front, other, place);
      found.push({ text: `The best ${isolated(objectives[own]!)} is ${number(value(front, own, place))} (evaluation ${count(numbers[place]!)}). ${isolated(objectives[other]!)} is ${number(there)} there${there === least ? ', its best' : `, ${above(there, least)} above its best, ${number(least)}`}.` });
    }
  }
  if (suggested !== null) {
    const values = objectives.map((name, objective) => `${isolated(name)} ${number(value(front, objective, suggested))}, ${above(value(front, objective, suggested), leastOf(front, places, objective)) || '0 %'} above its best`);
    found.push({ text: `A suggestion for a compromise is evaluation ${count(numbers[suggested]!)}: ${values.slice(0, 8).join('; ')}. It is the point that is nearest to the ideal one, which has the best value of every objective and which no set reaches, with each objective scaled to 0 to 1 over the front. It is no more than a suggestion: what the objectives are worth is yours to say.` });
  }
  return found;
}

/** Of one set there is no growth: it is there, or it is not. */
function growth({ course }: Front, onFront: number[]): Finding[] {
  if (onFront.length < 2) return [];
  const places = course?.hypervolumes.flatMap((volume, place) => (volume === null || course.evaluations[place] === null ? [] : [place])) ?? [];
  const last = places[places.length - 1];
  if (!course || last === undefined || places.length < 3) return [];
  const [end, final] = [course.evaluations[last]!, course.hypervolumes[last]!];
  const before = [...places].reverse().find((place) => course.evaluations[place]! <= (2 / 3) * end);
  if (before === undefined || !(final > 0)) return [];
  const share = (final - course.hypervolumes[before]!) / final;
  return share > kStillGrows
    ? [{ kind: 'warning', text: `The front still grew: its hypervolume by ${percent(share, 2)} in the last third of the evaluations. More evaluations, or another seed, may find a better one.` }]
    : [{ kind: 'good', text: `The front has settled: its hypervolume grew by ${percent(Math.max(0, share), 2)} in the last third of the evaluations.` }];
}

function violated(front: Front, places: number[]): Finding[] {
  const isViolated = places.some((place) => (front.violations[place] ?? 0) > 0);
  return isViolated ? [{ kind: 'warning', text: 'No set that was found meets the internal constraints: those shown violate them least.' }] : [];
}

/** The ends of the front and the suggestion, one row each. */
function endsTable(front: Front, picking: Picking, ends: number[]): HTMLElement {
  const rows: [string, number][] = ends.map((place, objective) => [`Best ${front.objectives[objective]!}`, place]);
  if (front.suggested !== null) rows.push(['Suggested compromise', front.suggested]);
  return table([{ title: 'Point' }, { title: 'Evaluation', number: true }, ...front.objectives.map((title) => ({ title: shorten(title, 40), hint: title, number: true }))],
    rows.map(([name, place]) => [shorten(name, 60), pickButton(front, picking, place), ...front.objectives.map((_, objective) =>
      withAbove(front, picking.places, objective, place))]), 'The ends of the front');
}

/** Its number picks the set. */
function pickButton(front: Front, picking: Picking, place: number): HTMLElement {
  const button = make('button', { type: 'button', title: 'Show this point', onclick: () => picking.pick(place) }, count(front.numbers[place]!));
  const show = () => button.setAttribute('aria-pressed', String(picking.picked === place));
  picking.onPick(show);
  show();
  return button;
}

/** All points of the front, or as many as a table can show; the suggestion is one of them. */
function pointTable(front: Front, picking: Picking): HTMLElement {
  const { places } = picking;
  const shown = spaced(places.length, kRowsShown).map((at) => places[at]!);
  if (front.suggested !== null && !shown.includes(front.suggested)) shown.push(front.suggested);
  shown.sort((a, b) => a - b);
  const details = make('details', { class: 'view' }, make('summary', {}, `The ${counted(places.length, 'point')} of the front as a table`));
  details.addEventListener('toggle', () => { // its rows are many, and mostly not wanted
    if (!details.open || details.children.length > 1) return;
    details.append(table([{ title: 'Evaluation', number: true }, ...front.objectives.map((title) => ({ title: shorten(title, 40), hint: title, number: true })),
      { title: 'Distance', number: true, hint: 'From the ideal point, with each objective scaled to 0 to 1 over the front' }, { title: '' }],
    shown.map((place) => [pickButton(front, picking, place), ...front.objectives.map((_, objective) => number(value(front, objective, place), 6)),
      number(front.distances[place]), place === front.suggested ? 'suggested' : '']), 'The points of the front'));
    if (shown.length < places.length) details.append(make('p', { class: 'note' }, `${count(shown.length)} of ${count(places.length)} points, evenly spaced.`));
  });
  return details;
}

export function frontSection(data: ReportData): Section | null {
  const { front } = data;
  if (!front) return null;
  const picking = new Picking(front);
  const { places } = picking;
  if (places.length === 0) return null;
  const ends = endsOf(front, places);
  const drawn = (plan: ChartPlan): Chart => {
    const made = chart(plan);
    picking.onPick(() => made.mark());
    return made;
  };
  const several = front.objectives.length > 1 && places.length > 1;
  const content: Node[] = [findingList([...violated(front, places), ...costs(front, places, ends), ...growth(front, places)])];
  if (several) {
    content.push(heading('What one objective costs the other'), paragraph('In brackets: how far above the best value of the front. The number of an evaluation shows its point below.'), endsTable(front, picking, ends),
      drawn(front.objectives.length === 2 ? frontPlan(front, picking) : frontMatrixPlan(front, picking)), pointTable(front, picking));
  }
  content.push(...pickedPoint(data, front, picking));
  if (several) {
    content.push(heading('Along the front'), ...(front.objectives.length > 3 ? [drawn(objectiveLinesPlan(front, picking))] : []), drawn(parameterLinesPlan(data, front, picking)));
  }
  if (front.course && finite(front.course.hypervolumes).length > 1) content.push(heading('How the front grew'), chart(hypervolumePlan(front.course)));
  if (front.objectives.length < 2) content.unshift(paragraph('There is one objective alone: a front needs two.'));
  return { id: 'front', title: 'The trade-off between the objectives', content };
}
