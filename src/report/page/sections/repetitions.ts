// The same search with several seeds: how far its result depends on chance.
import { axis, chart, legend, lineEntries, tip, tooltip, type ChartPlan } from '../chart';
import { variableParameters, type Maybe, type Parameter, type Repetition, type Repetitions, type ReportData } from '../data';
import { shorten, table } from '../dom';
import { count, counted, number, percent } from '../format';
import { bestSoFar, finite, placeBetweenBounds, quantile, sorted } from '../numbers';
import { logRange } from '../ticks';
import { findingList, heading, isolated, type Finding, type Section } from './section';

const kNear = 0.01; // of the hypervolume: as good a front
const kApart = 0.1; // of the range between the bounds: another value of a parameter
const kMostNamed = 12;
const kMostRows = 60; // with a name each
const kMostLines = 40;

const nameOf = ({ seed, number: of }: Repetition) => `repetition ${of} (seed ${seed})`;
/** Those that have ended with a best set, or a front. */
const endedOf = (all: readonly Repetition[]) => all.filter(({ best, termination, aggregate, hypervolume }) => best > 0 && termination !== '' && (aggregate !== null || hypervolume != null));
/** The same search counts once; as in the log, the others are told of, but not compared. */
const compared = (all: readonly Repetition[]) => endedOf(all).filter(({ sameAs }) => !sameAs);
/** What it is judged by. */
const valueOf = ({ aggregate, sum }: Repetition) => sum ?? aggregate;
const startOf = ({ start, sum, startSum }: Repetition) => (sum != null ? startSum ?? null : start);
const least = (all: readonly Repetition[]) => finite(all.map(valueOf)).reduce((a, b) => Math.min(a, b), Infinity);
/** Of a search that judges sets by the sum of squares. */
const hasSums = (all: readonly Repetition[]) => all.some(({ sum }) => sum != null);

/** Whether its best value is as good as the least of all. */
const isNear = ({ tolerance }: Repetitions, one: Repetition, best: number) => one.termination !== '' && valueOf(one) !== null && valueOf(one)! <= best + tolerance;

/** Whether a front was searched for, and no best value. */
const findsFronts = ({ all }: Repetitions) => all.some(({ hypervolume }) => hypervolume !== undefined);

/** The range of a parameter among the best sets of `some`, and its part of the range between the bounds. */
interface Spread {
  name: string;
  low: number;
  high: number;
  share: number;
}

function spreads(data: ReportData, { parameters }: Repetitions, some: readonly Repetition[]): Spread[] {
  const variable = variableParameters(data);
  return parameters.flatMap((name, index) => {
    const values = sorted(some.map((one) => one.parameters[index] ?? null));
    const [low, high] = [values[0], values[values.length - 1]];
    const [from, to] = [low, high].map((value) => (variable[index] && value !== undefined ? placeBetweenBounds(variable[index]!, value) : null));
    return from == null || to == null ? [] : [{ name, low: low!, high: high!, share: to - from }];
  }).sort((a, b) => b.share - a.share);
}

function listed<Item>(items: readonly Item[], text: (item: Item) => string): string {
  const more = items.length - kMostNamed;
  return `${items.slice(0, kMostNamed).map(text).join(', ')}${more > 0 ? ` and ${count(more)} more` : ''}`;
}

function othersThan(all: readonly Repetition[], what: string): Finding[] {
  const unfinished = all.filter(({ termination }) => termination === '').length;
  const without = all.length - endedOf(all).length - unfinished;
  const same = all.filter(({ sameAs }) => sameAs);
  return [
    ...(same.length > 0 ? [{ kind: 'warning' as const, text: `${listed(same, ({ number: of, sameAs }) => `Repetition ${count(of)} is the same search as ${count(sameAs!)}`)}: they started from the same sets, and count once in what is said of all. A larger sample, or more of its sets to start from, gives other starts.` }] : []),
    ...(without > 0 ? [{ kind: 'warning' as const, text: `${counted(without, 'repetition')} found no ${what}.` }] : []),
    ...(unfinished > 0 ? [{ kind: 'warning' as const, text: `${counted(unfinished, 'repetition')} had not ended.` }] : []),
  ];
}

function findings(data: ReportData, repetitions: Repetitions): Finding[] {
  const ended = compared(repetitions.all);
  const values = sorted(ended.map(valueOf));
  const others = othersThan(repetitions.all, 'value');
  if (values.length === 0) return others;
  const best = values[0]!;
  const near = ended.filter((one) => isNear(repetitions, one, best));
  const stuck = ended.filter((one) => valueOf(one) !== null && startOf(one) !== null && valueOf(one)! >= startOf(one)!);
  const { atStart } = repetitions;
  const isAgreed = 2 * near.length > ended.length;
  if (ended.length > 1 && stuck.length === values.length) {
    return [{ kind: 'warning', text: `None of ${counted(ended.length, 'repetition')} found anything better than what it began with, which says nothing of a minimum: the start may be one, or the search does not get away from it.` }, ...others];
  }
  const found: Finding[] = [
    { text: `${hasSums(ended) ? 'The sums of squares' : 'The best aggregates'} of ${counted(ended.length, 'repetition')}: least ${number(best, 6)}, median ${number(quantile(values, 0.5), 6)}, greatest ${number(values[values.length - 1], 6)}.` },
    ...(ended.length < 2 ? [] : [{ ...(isAgreed && atStart > 0 ? {} : { kind: isAgreed ? 'good' as const : 'warning' as const }), text: `${count(near.length)} of ${counted(ended.length, 'repetition')} ended within ${repetitions.within} value.${
      isAgreed ? '' : ' What the search finds depends on the seed: a larger budget helps, or taking the best of several repetitions, as here.'}` }]),
  ];
  found.push(...others);
  if (stuck.length > 0) found.push({ text: `${counted(stuck.length, 'repetition')} found nothing better than what it began with.` });
  if (near.length < 2) return found;
  if (atStart > 0) {
    found.push({ kind: 'warning', text: `${count(atStart)} of ${counted(ended.length, 'repetition')} began with a value within ${repetitions.within} already, so that best values near each other say nothing of a minimum: the start may be one, or the search does not get away from it.` });
    return found;
  }
  const apart = spreads(data, repetitions, near).filter(({ share }) => share > kApart);
  const text = (spread: Spread) => `${isolated(spread.name)} (${number(spread.low)} to ${number(spread.high)}, ${percent(spread.share, 2)} of its range)`;
  found.push(apart.length > 0
    ? { kind: 'warning', text: `These ${count(near.length)} agree in the value, but not in ${listed(apart, text)}: the observations hardly tell such values apart, and the parameter, or what makes up for it, is poorly identifiable.` }
    : { kind: 'good', text: `These ${count(near.length)} agree in their parameters, too: each within ${percent(kApart)} of the range between its bounds.` });
  return found;
}

/** Of searches for a front: how near each comes to that of all of them. */
function frontFindings({ all, fronts }: Repetitions): Finding[] {
  const ended = compared(all);
  const others = othersThan(all, 'front');
  const volumes = sorted(ended.map(({ hypervolume }) => hypervolume ?? null));
  const greatest = volumes[volumes.length - 1];
  if (greatest === undefined || !fronts) return others;
  const { ofAll, near, verdict } = fronts;
  return [
    { text: `The front above is that of all ${counted(all.length, 'repetition')} together. The hypervolumes of ${ended.length === all.length ? 'their own fronts' : `the fronts of the ${count(ended.length)} that ${ended.length === 1 ? 'has' : 'have'} ended with one`}, on its scale: least ${number(volumes[0], 6)}, median ${number(quantile(volumes, 0.5), 6)}, greatest ${number(greatest, 6)}; that of all ${number(ofAll, 6)}.` },
    ...(verdict === 'none' ? [] : verdict === 'no search' ? [{ kind: 'warning' as const, text: 'No repetition had evaluations left after the sets that it began with, so that no search was made: the fronts are those of these sets, and tell nothing of it. A larger budget can.' }] : verdict === 'one set' ? [{ text: `It is a single set, and whatever the seed, the search came within ${percent(kNear)} of its hypervolume, so that there is no trade-off to compare.` }] : [verdict === 'agree'
      ? { kind: 'good' as const, text: `Whatever the seed, the search found nearly the same front: each hypervolume is within ${percent(kNear)} of that of all.` }
      : { kind: 'warning' as const, text: `${count(near)} of ${counted(ended.length, 'repetition')} come within ${percent(kNear)} of the hypervolume of all: the front that a single search finds depends on the seed. A larger budget helps, or taking the front of several repetitions, as here.` }]),
    ...others,
  ];
}

interface Course {
  one: Repetition;
  places: number[]; // in the evaluations
  best: Maybe[];
}

/** The best value so far of each repetition, over its own evaluations. */
function coursesOf(data: ReportData, { all, stretches }: Repetitions): Course[] {
  const { numbers, aggregate } = data.evaluations;
  const placesOf = new Map<number, number[]>();
  const ordered = [...stretches].sort((a, b) => a[1] - b[1]);
  let next = 0;
  numbers.forEach((evaluation, place) => {
    while (next < ordered.length && ordered[next]![2] < evaluation) ++next;
    const stretch = ordered[next];
    if (!stretch || stretch[1] > evaluation) return;
    const places = placesOf.get(stretch[0]) ?? placesOf.set(stretch[0], []).get(stretch[0])!;
    places.push(place);
  });
  return all.flatMap((one) => {
    const places = placesOf.get(one.number) ?? [];
    const best = bestSoFar(places.map((place) => aggregate[place] ?? null));
    return finite(best).length === 0 ? [] : [{ one, places, best }];
  });
}

function coursePlan(courses: Course[]): ChartPlan {
  const shown = courses.slice(0, kMostLines);
  const values = finite(shown.flatMap(({ best }) => best));
  const isLogable = values.every((value) => value > 0);
  const longest = shown.reduce((most, { best }) => Math.max(most, best.length), 0);
  const steps = ({ best }: Course) => best.flatMap((value, place) => (value !== null && (place === best.length - 1 || value !== best[place - 1]) ? [[place + 1, value]] : []));
  return {
    title: 'Best aggregate so far, by repetition',
    note: `Over the evaluations of each repetition. Lines that end at one height say that the result does not depend on the seed.${shown.length < courses.length ? ` ${shown.length} of ${courses.length} are drawn.` : ''}`,
    height: 360,
    zoom: 'xy',
    switches: isLogable ? [{ key: 'log', label: 'Log', on: true }] : [],
    option: (look, is) => ({
      legend: legend(look, { data: lineEntries(shown.map(({ one }) => nameOf(one))), itemWidth: 34 }),
      grid: { left: 24, right: 16, top: 36, bottom: 28 },
      xAxis: axis(look, { name: 'Evaluation of the repetition', min: 1, max: longest, minInterval: 1, nameGap: 26 }),
      yAxis: axis(look, is('log') ? logRange([values]) : {}),
      tooltip: tooltip(look, { trigger: 'axis', formatter: (points: { axisValue: number }[]) => {
        const at = Math.round(points[0]!.axisValue);
        return tip(`Up to evaluation ${count(at)}`, shown.slice(0, 16).map(({ one, best }) => [nameOf(one), number(best[Math.min(at, best.length) - 1], 5)]));
      } }),
      series: shown.map((course, index) => ({
        name: nameOf(course.one), type: 'line', step: 'end', symbol: 'none', clip: true, color: look.many[index % look.many.length], data: steps(course),
        lineStyle: { width: 1.8, type: (['solid', 'dashed', 'dotted'] as const)[Math.floor(index / look.many.length) % 3] },
      })),
    }),
    csv: () => {
      const rows = courses.flatMap(({ one, best }) => best.map((value, place) => [String(one.number), String(one.seed), String(place + 1), number(value)]));
      return { columns: ['Repetition', 'Seed', 'Evaluation of the repetition', 'Best aggregate so far'].map((title) => ({ title })), length: rows.length, row: (place) => rows[place]! };
    },
  };
}

function volumePlan({ all }: Repetitions): ChartPlan {
  const order = all.filter(({ best, hypervolume }) => best > 0 && hypervolume != null).sort((a, b) => b.hypervolume! - a.hypervolume!);
  const isNamed = order.length <= kMostRows;
  return {
    title: 'The hypervolume of each repetition\u2019s front',
    note: 'From the greatest to the least, on the scale of the front of all.',
    height: 56 + Math.max(6, Math.min(26, 900 / order.length)) * order.length,
    option: (look) => ({
      grid: { left: 24, right: 24, top: 4, bottom: 16 },
      xAxis: axis(look, { boundaryGap: ['3%', '3%'], axisLabel: { showMinLabel: false, showMaxLabel: false } }),
      yAxis: axis(look, { type: 'category', data: order.map(nameOf), inverse: true, axisTick: { show: false }, axisLabel: { show: isNamed, color: look.ink, interval: 0 } }),
      tooltip: tooltip(look, { formatter: (dot: { value: [number, string] }) => tip(dot.value[1], [['hypervolume', number(dot.value[0], 6)]]) }),
      series: [{ type: 'scatter', symbolSize: isNamed ? 9 : 5, itemStyle: { color: look.best }, data: order.map((one) => [one.hypervolume!, nameOf(one)]) }],
    }),
  };
}

function bestPlan(repetitions: Repetitions, best: number): ChartPlan {
  const { all, tolerance, within } = repetitions;
  const isOfSums = hasSums(all);
  const shownOf = isOfSums ? ({ sum }: Repetition) => sum ?? null : ({ aggregate }: Repetition) => aggregate;
  const order = all.filter((one) => shownOf(one) !== null).sort((a, b) => shownOf(a)! - shownOf(b)!);
  const what = isOfSums ? 'sum of squares' : 'best aggregate';
  const isNamed = order.length <= kMostRows;
  return {
    title: `The ${what} of each repetition`,
    note: `From the least to the greatest. Within the shaded part they are within ${within}.`,
    height: 56 + Math.max(6, Math.min(26, 900 / order.length)) * order.length,
    switches: best > 0 ? [{ key: 'log', label: 'Log' }] : [],
    option: (look, is) => ({
      grid: { left: 24, right: 24, top: 4, bottom: 16 },
      xAxis: axis(look, { ...(is('log') ? logRange([order.map(shownOf)]) : { boundaryGap: ['3%', '3%'] }), ...(is('log') ? {} : { axisLabel: { showMinLabel: false, showMaxLabel: false } }) }),
      yAxis: axis(look, { type: 'category', data: order.map(nameOf), inverse: true, axisTick: { show: false }, axisLabel: { show: isNamed, color: look.ink, interval: 0 } }),
      tooltip: tooltip(look, { formatter: (dot: { value: [number, string] }) => tip(dot.value[1], [[what, number(dot.value[0], 6)]]) }),
      series: [{
        type: 'scatter', symbolSize: isNamed ? 9 : 5, data: order.map((one) => ({ value: [shownOf(one), nameOf(one)], itemStyle: { color: isNear(repetitions, one, best) ? look.best : look.dots } })),
        markArea: { silent: true, itemStyle: { color: look.band, opacity: 0.15 }, data: [[{ xAxis: best }, { xAxis: best + tolerance }]] },
      }],
    }),
  };
}

/** The parameters of the best sets, between their bounds. */
function parameterPlan(variable: Parameter[], repetitions: Repetitions, best: number): ChartPlan {
  const { all, parameters, within } = repetitions;
  const names = parameters;
  const areFronts = findsFronts(repetitions);
  const isOne = (one: Repetition) => areFronts || isNear(repetitions, one, best);
  const dots = (isOfNear: boolean) => names.flatMap((name, index) => all.filter((one) => isOne(one) === isOfNear).flatMap((one) => {
    const place = variable[index] ? placeBetweenBounds(variable[index]!, one.parameters[index] ?? null) : null;
    return place === null ? [] : [[100 * place, name, one.parameters[index]!, one.number]];
  }));
  const near = areFronts ? 'compromises' : `within ${within}`;
  return {
    title: `The parameters of the ${areFronts ? 'compromises' : 'best sets'}, between their bounds`,
    note: `0 % is the lower, 100 % the upper bound, on the scale of the search. ${areFronts ? 'The compromise of a repetition is the set of its front that is nearest to the ideal point of the front of all.' : 'Dots of one colour that lie apart say that other values of the parameter are as good.'}`,
    height: 90 + Math.max(14, Math.min(30, 900 / names.length)) * names.length,
    option: (look) => ({
      legend: legend(look, { data: areFronts ? [near] : [near, 'others'] }),
      grid: { left: 24, right: 24, top: 36, bottom: 16 },
      xAxis: axis(look, { min: 0, max: 100, axisLabel: { formatter: (value: number) => `${value} %` } }),
      yAxis: axis(look, { type: 'category', data: names, inverse: true, axisTick: { show: false }, splitLine: { show: true, lineStyle: { color: look.rule } },
        axisLabel: { color: look.ink, formatter: (name: string) => shorten(name, 24), interval: names.length > 40 ? 'auto' : 0 } }),
      tooltip: tooltip(look, { formatter: (dot: { value: [number, string, number, number] }) => {
        const one = all.find(({ number: of }) => of === dot.value[3])!;
        return tip(nameOf(one), [[shorten(dot.value[1], 40), number(dot.value[2], 6)], ['best aggregate', number(one.aggregate, 6)]]);
      } }),
      series: [
        { name: 'others', type: 'scatter', symbolSize: 8, itemStyle: { color: look.dots, opacity: 0.6 }, data: dots(false) },
        { name: near, type: 'scatter', symbolSize: 9, z: 4, itemStyle: { color: look.best, opacity: 0.8 }, data: dots(true) },
      ],
    }),
    values: () => ({
      columns: [{ title: 'Repetition' }, ...['Seed', 'Best aggregate', ...names].map((title) => ({ title, number: true }))],
      length: all.length,
      row: (index) => [count(all[index]!.number), String(all[index]!.seed), number(all[index]!.aggregate, 6), ...names.map((_, place) => number(all[index]!.parameters[place], 6))],
    }),
  };
}

const kTitle = 'The search with other seeds';
const whyItEnded = ({ termination }: Repetition) => termination || 'it had not ended';

function frontRepetitions(data: ReportData, repetitions: Repetitions): Section {
  const { all, parameters } = repetitions;
  const rows = all.map((one) => [count(one.number), String(one.seed), count(one.evaluations), number(one.hypervolume, 6), one.best > 0 ? count(one.best) : '', whyItEnded(one)]);
  return {
    id: 'repetitions',
    title: kTitle,
    content: [
      findingList(frontFindings(repetitions)),
      table([{ title: 'Repetition' }, { title: 'Seed', number: true }, { title: 'Evaluations', number: true }, { title: 'Hypervolume', number: true },
        { title: 'Compromise', number: true, hint: 'The evaluation' }, { title: 'Why it stopped' }], rows, 'Repetitions'),
      ...(all.length > 1 ? [heading('Spread'), chart(volumePlan(repetitions)),
        ...(parameters.length > 0 ? [chart(parameterPlan(variableParameters(data), repetitions, least(compared(all))))] : [])] : []),
    ],
  };
}

export function repetitionSection(data: ReportData): Section | null {
  const { repetitions } = data;
  if (repetitions && findsFronts(repetitions)) return frontRepetitions(data, repetitions);
  if (!repetitions || repetitions.all.length === 0) return null;
  const { all, parameters } = repetitions;
  const best = least(compared(all));
  const courses = coursesOf(data, repetitions);
  const isOfSums = hasSums(all);
  const rows = all.map((one) => [count(one.number), String(one.seed), count(one.evaluations), ...(isOfSums ? [number(one.sum ?? null, 6)] : []), number(one.aggregate, 6), count(one.best), one.termination ? count(one.loops) : '', whyItEnded(one)]);
  return {
    id: 'repetitions',
    title: kTitle,
    content: [
      findingList(findings(data, repetitions)),
      table([{ title: 'Repetition' }, { title: 'Seed', number: true }, { title: 'Evaluations', number: true }, ...(isOfSums ? [{ title: 'Sum of squares', number: true }] : []), { title: isOfSums ? 'Aggregate' : 'Best aggregate', number: true },
        { title: 'Found by', number: true, hint: 'The evaluation' }, { title: 'Loops', number: true }, { title: 'Why it stopped' }], rows, 'Repetitions'),
      ...(courses.length > 0 ? [heading('Courses'), chart(coursePlan(courses))] : []),
      ...(Number.isFinite(best) && all.length > 1 ? [heading('Spread'), chart(bestPlan(repetitions, best)),
        ...(parameters.length > 0 ? [chart(parameterPlan(variableParameters(data), repetitions, best))] : [])] : []),
    ],
  };
}
