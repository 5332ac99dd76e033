// What each measure compares, so that a wrong item or unit is seen at a glance.
import type { Maybe, ReportData } from '../data';
import { make, table } from '../dom';
import { count, moment, number } from '../format';
import type { Section } from './section';

const range = ([least, mean, largest]: Maybe[]): string => `${number(least)} to ${number(largest)}, mean ${number(mean)}`;

export function comparisonSection(data: ReportData): Section | null {
  const { comparisons } = data;
  if (comparisons.length === 0) return null;
  const hasFirst = comparisons.some(({ simulatedFirst }) => simulatedFirst);
  const columns = [{ title: 'Output measure' }, { title: 'Simulated' }, { title: 'Observed' }, { title: 'Pairs', number: true },
    { title: 'Missing', number: true, hint: 'observations in the period without a simulated value' }, { title: 'From, to' },
    { title: 'Observed values' }, ...(hasFirst ? [{ title: 'Simulated first' }] : []), { title: hasFirst ? 'Simulated best' : 'Simulated values' }];
  const rows = comparisons.map((one) => [make('span', {}, one.measure, one.counted ? make('small', {}, one.counted) : null), one.simulatedItem, one.observedItem, count(one.pairs), count(one.missing),
    one.span.map((time) => moment(time, time % 86400000 === 0 ? undefined : 1)).join(' to '), range(one.observed),
    ...(hasFirst ? [one.simulatedFirst ? range(one.simulatedFirst) : ''] : []), range(one.simulated)]);
  const { evaluation } = comparisons[0]!;
  const ofEvaluation = data.best && evaluation !== data.best.number && hasFirst
    ? `of the best set, ${count(data.best.number)} (run once more as evaluation ${count(evaluation)})` : `in evaluation ${count(evaluation)}`;
  return {
    id: 'compared',
    title: 'What is compared',
    content: [table(columns, rows, 'What is compared'),
      make('p', { class: 'note' }, `Pairs of simulated and observed values ${ofEvaluation}. Missing: observations in the period without a simulated value.`)],
  };
}
