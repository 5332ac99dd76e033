// Calibration and validation side by side, and where the periods are in a hydrograph.
import type { ReportData, Series } from '../data';
import { table } from '../dom';
import { count, number } from '../format';
import type { Look } from '../look';
import { kFigures } from './figures';
import { heading, paragraph, type Section } from './section';

export const kShadedNote = ' Shaded: the evaluation period (grey) and the validation periods (blue); a button zooms to each.';

/** The periods of a hydrograph as areas. */
export function shadedPeriods(look: Look, series: Series): object {
  const data = (series.periods ?? []).map(({ kind, first, last }) => [
    { xAxis: first, itemStyle: kind === 'calibration' ? { color: look.rule, opacity: 0.7 } : { color: look.band, opacity: 0.15 } },
    { xAxis: last },
  ]);
  return { markArea: { silent: true, data } };
}

/** For a button that zooms to each. */
export function spansOf(series: Series): { label: string; first: number; last: number }[] {
  return (series.periods ?? []).map(({ name, first, last }) => ({ label: name, first, last }));
}

const kRows = [['least', 'least of the best tenth'], ['median', 'median of the best tenth'], ['largest', 'largest of the best tenth']] as const;

function measuresTable(data: ReportData): Node[] {
  const { validation } = data;
  if (!validation) return [];
  const { best, tenth, measures, periods } = validation;
  const rows = measures.flatMap(({ name, statistic, values }) => [
    [name, statistic, `best evaluation, ${count(best)}`, ...values.map((value) => number(value.best))],
    ...(tenth > 0 ? kRows.map(([key, label]) => ['', '', label, ...values.map((value) => number(value[key]))]) : []),
  ]);
  return [
    paragraph(`The objective functions are of the evaluation period alone (${periods[0]!.start} to ${periods[0]!.end}). In the validation periods the same model runs are judged by the same measures.${tenth > 0 ? ` The best tenth are ${count(tenth)} of ${count(validation.count)} different parameter sets, those with the smallest aggregates.` : ''}`),
    table([{ title: 'Measure' }, { title: 'Statistic' }, { title: 'Of' },
      ...periods.map(({ name, start, end }) => ({ title: name, hint: `${start} to ${end}`, number: true }))], rows, 'Calibration and validation'),
  ];
}

/** Without the parts of KGE. */
const kColumns = kFigures.filter(([key]) => !key.startsWith('kge') || key === 'kge');

function figuresTable(series: Series): Node[] {
  const rows = (series.periods ?? []).filter(({ best }) => best).map(({ name, best }) =>
    [name, ...kColumns.map(([key]) => number(best![key], key === 'n' ? 9 : 4))]);
  if (rows.length === 0) return [];
  return [
    heading(series.measure),
    table([{ title: `Best evaluation${series.bestNumber == null ? '' : `, ${count(series.bestNumber)}`}` }, ...kColumns.map(([, title, hint]) => ({ title, hint, number: true }))],
      rows, `Figures of ${series.measure} in each period`),
  ];
}

export function validationSection(data: ReportData): Section | null {
  const content = [...measuresTable(data), ...data.series.flatMap(figuresTable)];
  return content.length === 0 ? null : { id: 'validation', title: 'Calibration and validation', content };
}
