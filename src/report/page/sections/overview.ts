// The head of the report and its tables: what was run, with which settings, and the results.
import { variableParameters, type Parameter, type ReportData } from '../data';
import { make, shorten, table } from '../dom';
import { count, counted, duration, kMissing, number, percent } from '../format';
import { bestShare, placeBetweenBounds } from '../numbers';
import { heading, isolated, paragraph, type Section } from './section';

interface Finding {
  kind: 'good' | 'plain' | 'warning';
  text: string;
  more?: string[]; // of the same kind, behind a fold
}

const kFindingsShown = 5;
const kScenariosShown = 200;

/** The first few, and the others behind a fold that names them. */
function folded(all: { name: string; text: string }[], others: string): Finding[] {
  const found = all.slice(0, kFindingsShown).map(({ text }): Finding => ({ kind: 'plain', text }));
  const more = all.slice(kFindingsShown);
  if (more.length === 0) return found;
  const names = more.slice(0, 10).map(({ name }) => isolated(name)).join(', ');
  return [...found, { kind: 'plain', text: `${count(more.length)} more ${others}: ${names}${more.length > 10 ? ', \u2026' : ''}`, more: more.map(({ text }) => text) }];
}

const kStates = {
  finished: { mark: '\u2713', text: 'Finished', kind: 'good' },
  running: { mark: '\u2026', text: 'Running', kind: 'warning' },
  'cut off': { mark: '\u2026', text: 'Cut off', kind: 'warning' },
  cancelled: { mark: '\u25a0', text: 'Cancelled', kind: 'warning' },
  failed: { mark: '\u2715', text: 'Failed', kind: 'bad' },
} as const;

function improvement(data: ReportData): Finding | null {
  const { best, run, evaluations } = data;
  if (run.task !== 'optimisation' || !best || best.aggregate === null) return null;
  const place = data.initialNumber === null ? -1 : evaluations.numbers.indexOf(data.initialNumber);
  const initial = place < 0 ? null : evaluations.aggregate[place] ?? null;
  const found = `evaluation ${count(best.number)} of ${count(run.evaluations)}`;
  if (initial === null) return { kind: 'good', text: `Best aggregate ${number(best.aggregate)}, found by ${found}.` };
  const from = `The aggregate fell from ${number(initial)} (${data.initialLabel ?? 'initial parameters'}) to ${number(best.aggregate)}`;
  const share = initial !== 0 ? ` (${percent((best.aggregate - initial) / Math.abs(initial))})` : '';
  return best.aggregate < initial
    ? { kind: 'good', text: `${from}${share}, found by ${found}.` }
    : { kind: 'warning', text: `No evaluation was better than the ${data.initialLabel ?? 'initial parameters'} (aggregate ${number(initial)}).` };
}

function findings(data: ReportData): Finding[] {
  const { run } = data;
  const found: (Finding | null)[] = [];
  if (run.message) found.push({ kind: run.state === 'finished' ? 'plain' : 'warning', text: run.message });
  found.push(improvement(data));
  found.push(...folded(data.series.flatMap((series) => {
    const figures = series.figures?.best;
    if (!figures) return [];
    const of = series.bestNumber != null && series.bestNumber !== data.best?.number ? `, evaluation ${count(series.bestNumber)}` : '';
    const text = `${isolated(series.measure)} in the evaluation period${of}: NSE ${number(figures.nse, 3)}, KGE ${number(figures.kge, 3)}, bias ${number(figures.pbias, 3)} %.`;
    return [{ name: series.measure, text }];
  }), 'series'));
  found.push(...folded(data.band.map((band) => ({
    name: band.measure, text: `${percent(band.inside)} of the observed values of ${isolated(band.measure)} lie within the 5 to 95 % band.`,
  })), 'bands'));
  if (data.sensitivity && data.sensitivity.ranking.length > 0) {
    const first = data.sensitivity.ranking.slice(0, 3).map(isolated).join(', ');
    found.push({ kind: 'plain', text: `Most sensitive: ${first}.` });
  }
  // Only a search would have gone on behind a bound.
  const near = run.task === 'optimisation' ? data.parameters.filter((parameter) => parameter.nearBound) : [];
  if (near.length > 0) {
    const names = near.slice(0, 6).map((parameter) => `${isolated(parameter.name)} (${parameter.nearBound})`).join(', ');
    const rest = near.length > 6 ? ` and ${near.length - 6} more` : '';
    found.push({ kind: 'warning', text: `Best value near a bound: ${names}${rest}. A wider bound may fit better.` });
  }
  if (run.repeats) {
    found.push({ kind: 'plain', text: `${counted(run.repeats, 'evaluation')} (${percent(run.repeats / run.evaluations)}) repeated an earlier parameter set and took its result, without a model run.` });
  }
  if (run.evaluations === 0) found.push({ kind: 'warning', text: 'No evaluation has been recorded.' });
  else if (run.failed === run.evaluations) found.push({ kind: 'warning', text: 'Every evaluation failed.' });
  else if (run.failed > 0) {
    found.push({ kind: 'warning', text: `${counted(run.failed, 'evaluation')} failed (${percent(run.failed / run.evaluations, 2)}).` });
  }
  return [...found.filter((finding): finding is Finding => finding !== null),
    ...[...run.closingWarnings ?? [], ...run.notes].map((text): Finding => ({ kind: 'warning', text }))];
}

function tile(label: string, value: string, more?: string | null): HTMLElement {
  return make('div', { class: 'tile' }, make('dt', {}, label), make('dd', {}, value, more ? make('small', {}, more) : null));
}

export function head(data: ReportData): HTMLElement {
  const { run, best } = data;
  const state = kStates[run.state] ?? kStates.failed;
  const took = duration(run.started, run.ended);
  const shown = data.series[0];
  const figures = shown?.figures?.best;
  const isOlder = shown?.bestNumber != null && best !== null && shown.bestNumber !== best.number;
  const of = shown && (isOlder ? `evaluation ${count(shown.bestNumber!)}` : shorten(shown.measure, 28));
  return make('div', { class: 'head', id: 'top' },
    make('p', { class: 'kicker' }, run.taskName),
    make('h1', {}, run.title || run.setupName || run.setup),
    make('p', { class: `state ${state.kind}` }, make('span', { 'aria-hidden': 'true' }, `${state.mark} `), state.text),
    make('dl', { class: 'tiles' },
      tile('Evaluations', count(run.evaluations), run.planned === null ? null : `of ${count(run.planned)} planned`),
      tile('Failed', count(run.failed), run.evaluations > 0 && run.failed > 0 ? percent(run.failed / run.evaluations, 2) : null),
      best ? tile('Best aggregate', number(best.aggregate), `evaluation ${count(best.number)}`) : '',
      figures ? tile('NSE', number(figures.nse, 3), of) : '',
      figures ? tile('KGE', number(figures.kge, 3), of) : '',
      took ? tile('Took', took) : ''),
    make('ul', { class: 'findings' }, ...findings(data).map((finding) => make('li', { class: finding.kind }, ...(finding.more
      ? [make('details', {}, make('summary', {}, finding.text), make('ul', {}, ...finding.more.map((text) => make('li', {}, text))))]
      : [finding.text])))));
}

export function runSection(data: ReportData): Section {
  const { run } = data;
  const rows: [string, string | null][] = [
    ['Task', run.taskName],
    ['Setup file', run.setup],
    ['Started', run.started],
    ['Ended', run.ended],
    ['Evaluation period', run.period ? run.period.join(' to ') : null],
    ['Aggregation', run.aggregation],
    ['Population', run.populationSize === null ? null : counted(run.populationSize, 'set')],
    ['Surrogate model', run.surrogate],
    ['Random seed', run.seed === null ? null : String(run.seed)],
    ['Report made', run.reportMade],
    ['Program', data.program],
  ];
  const facts = make('dl', { class: 'facts' });
  for (const [name, value] of rows) if (value) facts.append(make('dt', {}, name), make('dd', {}, value));
  return { id: 'run', title: 'Run', content: [facts] };
}

// The positions of the start and the best value between the bounds, on the search scale.
function rangeBar(parameter: Parameter, [startName, bestName]: string[]): Node | string {
  const best = placeBetweenBounds(parameter, parameter.best);
  const start = placeBetweenBounds(parameter, parameter.start);
  if (best === null && start === null) return '';
  const label = `${startName!.toLowerCase()} at ${percent(start, 2)}, ${bestName!.toLowerCase()} at ${percent(best, 2)} of the way from the lower to the upper bound`;
  const mark = (kind: string, place: number | null) =>
    place === null ? null : make('i', { class: kind, style: `left: ${Math.min(100, Math.max(0, place * 100)).toFixed(2)}%` });
  return make('span', { class: 'range', role: 'img', 'aria-label': label, title: label }, mark('start', start), mark('best', best));
}

function parameterRow(parameter: Parameter, names: string[]): (Node | string | null)[] {
  const traits = [parameter.kind === 'variable' ? null : parameter.kind, parameter.transformation === 'logarithmic' ? 'logarithmic' : null,
    parameter.integer ? 'integer' : null, parameter.equation ? `= ${parameter.equation}` : null].filter(Boolean).join(', ');
  return [
    make('span', {}, parameter.name, parameter.comment ? make('small', {}, parameter.comment) : null),
    number(parameter.lower, 10), number(parameter.upper, 10), number(parameter.start, 6), number(parameter.best, 10),
    rangeBar(parameter, names),
    parameter.nearBound ? make('span', { class: 'flag' }, `near ${parameter.nearBound} bound`) : traits,
  ];
}

export function parameterSection(data: ReportData): Section | null {
  if (data.parameters.length === 0) return null;
  const isSearch = data.run.task === 'optimisation';
  const [start, best] = (isSearch ? ['Start', 'Best'] : ['In the setup', 'Smallest aggregate']) as [string, string];
  const scale = isSearch ? 'on the scale of the search' : 'a logarithmic parameter on a logarithmic scale';
  const columns = [{ title: 'Parameter' }, { title: 'Lower', number: true }, { title: 'Upper', number: true },
    { title: start, number: true }, { title: best, number: true },
    { title: 'Between the bounds', hint: `hollow: ${start}, filled: ${best}, ${scale}` }, { title: '' }];
  return {
    id: 'parameters',
    title: 'Parameters',
    content: [table(columns, data.parameters.map((parameter) => parameterRow(parameter, [start, best])), 'Parameters'),
      make('p', { class: 'note' }, `Between the bounds: hollow mark ${start.toLowerCase()}, filled mark ${best.toLowerCase()}, ${scale}.`)],
  };
}

function change(initial: number | null, best: number | null): string {
  return initial === null || best === null || initial === 0 ? kMissing : percent((best - initial) / Math.abs(initial));
}

export function resultSection(data: ReportData): Section | null {
  const content: Node[] = [];
  const isSearch = data.run.task === 'optimisation';
  const values = [{ title: data.initialLabel === 'first evaluation' ? 'First' : 'Initial', number: true },
    { title: isSearch ? 'Best' : 'Smallest aggregate', number: true }, ...(isSearch ? [{ title: 'Change', number: true }] : [])];
  const ofValues = (initial: number | null, best: number | null, isShare: boolean) =>
    [number(initial, 6), number(best, 6), ...(isSearch ? [isShare ? change(initial, best) : kMissing] : [])];
  if (data.objectives.length > 0) {
    content.push(heading('Objective functions'), table([{ title: 'Objective function' }, ...values],
      data.objectives.map(({ name, initial, best }) => [name, ...ofValues(initial, best, true)]), 'Objective functions'));
  }
  if (data.measures.length > 0) {
    content.push(heading('Output measures'), table(
      [{ title: 'Output measure' }, { title: 'Statistic' }, { title: 'Objective function' }, { title: 'Weight', number: true }, ...values],
      data.measures.map(({ name, statistic, objective, weight, isCriterion, initial, best }) =>
        [name, statistic, objective ?? kMissing, number(weight), ...ofValues(initial, best, !isCriterion)]),
      'Output measures'));
  }
  const scenarios = scenarioTable(data);
  if (scenarios) content.push(heading('Scenarios'), scenarios);
  const ranking = rankingTable(data);
  if (ranking) content.push(heading('Best evaluations'), ranking);
  return content.length > 0 ? { id: 'results', title: 'Objectives and measures', content } : null;
}

/** "2 (dry)" where the evaluation has a name. */
function nameOfRun(data: ReportData, evaluation: number): string {
  const name = data.run.runNames?.[evaluation - 1];
  return name ? `${count(evaluation)} (${shorten(name, 40)})` : count(evaluation);
}

/** What each scenario has for each measure and objective function. */
function scenarioTable(data: ReportData): HTMLElement | null {
  const { evaluations, measures, objectives, run } = data;
  if (run.task !== 'scenarios' || evaluations.count < 2) return null;
  const rows = evaluations.numbers.slice(0, kScenariosShown).map((evaluation, place) =>
    [count(evaluation), run.runNames?.[evaluation - 1] ?? '', evaluations.ok[place] ? '' : 'failed',
      ...[...evaluations.measures, ...evaluations.objectives].map((column) => number(column[place], 6))]);
  const more = evaluations.numbers.length - kScenariosShown;
  return make('div', {},
    table([{ title: 'Scenario' }, { title: 'Name' }, { title: '' }, ...[...measures, ...objectives].map(({ name }) => ({ title: shorten(name, 40), hint: name, number: true }))], rows, 'Scenarios'),
    more > 0 ? make('p', { class: 'note' }, `The first ${count(kScenariosShown)} scenarios; the result file has ${count(more)} more.`) : null);
}

function rankingTable(data: ReportData): HTMLElement | null {
  const { evaluations } = data;
  const seen = new Set<string>();
  // A final model run repeats the best set: it is listed once, under the number by which the report knows it.
  const isRepeated = (place: number) => {
    const key = JSON.stringify([evaluations.aggregate[place], ...evaluations.parameters.map((column) => column[place])]);
    return seen.has(key) || !seen.add(key);
  };
  const ranked = bestShare(evaluations.aggregate, 1);
  const known = ranked.findIndex((place) => evaluations.numbers[place] === data.best?.number);
  if (known > 0 && evaluations.aggregate[ranked[known]!] === evaluations.aggregate[ranked[0]!]) ranked.unshift(...ranked.splice(known, 1));
  const first: number[] = [];
  for (const place of ranked) {
    if (first.length < 10 && !isRepeated(place)) first.push(place);
  }
  if (first.length < 2 || data.run.task === 'sensitivity') return null;
  const variable = variableParameters(data);
  return table([{ title: 'Evaluation' }, { title: 'Aggregate', number: true },
    ...variable.map((parameter) => ({ title: shorten(parameter.name, 24), hint: parameter.name, number: true }))],
  first.map((place) => [nameOfRun(data, evaluations.numbers[place]!), number(evaluations.aggregate[place], 6),
    ...variable.map((_, index) => number(evaluations.parameters[index]?.[place], 5))]), 'Best evaluations');
}

export function failureSection(data: ReportData): Section | null {
  if (data.failures.length === 0) return null;
  return {
    id: 'failures',
    title: 'Failures',
    content: [
      paragraph(`${counted(data.run.failed, 'evaluation')} failed, for ${counted(data.failures.length, 'reason')}.`),
      table([{ title: 'Reason' }, { title: 'Evaluations', number: true }, { title: 'Example' }],
        data.failures.map(({ reason, count: times, example }) => [reason, count(times), example ?? '']), 'Failures'),
    ],
  };
}

export function summarySection(data: ReportData): Section | null {
  if (data.summary.length === 0) return null;
  return { id: 'summary', title: 'Closing report', content: [make('pre', { tabindex: 0 }, data.summary.join('\n'))] };
}
