// Reports of the small test model, made by the program (samples.cpp): what a run of each task and kind of trouble holds. Environment:
// MIREVO_PAGE_SAMPLES, their folder. What would take days of model runs is stretched from a short one.
import { readFileSync } from 'node:fs';
import { join } from 'node:path';

/** The data in the report of that name, each time anew. */
export const dataOf = (name) => JSON.parse(/id="report-data">(.*?)<\/script>/s.exec(readFileSync(join(process.env.MIREVO_PAGE_SAMPLES, name), 'utf8'))[1]);

/** A search by few evaluations without failures, whose second measure compares a series of 40 days with a gap, and a parameter of another kind. */
export function twoSeries() {
  const data = dataOf('short');
  const second = { ...data.series[0], measure: 'level', count: 40 };
  for (const name of ['observed', 'initial', 'best']) second[name] = second[name].slice(0, 40);
  second.observed.fill(null, 3, 6);
  data.series.push(second);
  data.measures.push({ ...data.measures[0], name: 'level' });
  data.evaluations.measures.push(data.evaluations.measures[0]);
  Object.assign(data.parameters[0], { lower: 0.1, transformation: 'logarithmic', nearBound: 'upper', comment: 'mm' });
  return data;
}

/** A search of so many parameters, some of them with large and small values. */
export function manyParameters(count) {
  const data = dataOf('optimisation');
  const { evaluations, parameters } = data;
  for (let index = parameters.length; index < count; ++index) {
    const scale = [1, 1e5, 1e-3][index % 3];
    const { lower, upper, start, best } = parameters[0];
    parameters.push({ ...parameters[0], name: `parameter ${index}`, lower: lower * scale, upper: upper * scale, start: start * scale, best: best * scale, integer: index % 4 === 1 });
    evaluations.parameters.push(evaluations.parameters[index % 2].map((value) => value * scale));
  }
  return data;
}

/** Scenarios, the second with a name, of a model of hourly steps, with observations of some days and a gap. */
export function hourlyScenarios() {
  const data = dataOf('scenarios');
  const [series] = data.series;
  const times = series.observed.map((_, place) => Date.UTC(2001, 2, 30) + place * 3600000);
  const daily = series.observed.map((value, place) => (place % 24 === 0 && place !== 72 ? value ?? 1 : null));
  Object.assign(series, { times, observed: daily, observedAsPoints: false, breaks: { observed: [times[48]] }, quantity: 'Discharge', unit: 'm3/s', period: [times[0], times.at(-1)] });
  series.flowDuration = undefined;
  series.scenarios.forEach((one) => Object.assign(one, { times: times.slice(0, one.values.length) }));
  data.run.runNames = ['', 'dry year'];
  const best = data.best.number - 1; // and again as the last one, as after a search
  for (const column of [data.evaluations.aggregate, ...data.evaluations.parameters]) column[29] = column[best];
  for (let more = 1; more < 7; ++more) data.series.push({ ...series, measure: `gauge ${more}`, scenarios: [] });
  return data;
}

/** A search as if it had made `count` evaluations, each time round a little further on, against `days` of daily series. */
export function stretched(count, days) {
  const data = dataOf('optimisation');
  const again = (values, length) => Array.from({ length }, (_, place) => {
    const value = values[place % values.length];
    return value === null ? null : value * (1 + 4e-3 * Math.floor(place / values.length));
  });
  const { evaluations, series: [series] } = data;
  for (const name of ['parameters', 'measures', 'objectives']) evaluations[name] = evaluations[name].map((column) => again(column, count));
  evaluations.aggregate = again(evaluations.aggregate, count);
  evaluations.ok = again(evaluations.ok, count).map(Math.trunc);
  evaluations.numbers = Array.from({ length: count }, (_, place) => place + 1);
  evaluations.count = data.run.evaluations = data.run.planned = count;
  for (const name of ['observed', 'initial', 'best']) series[name] = again(series[name], days);
  series.count = days;
  series.period[1] = series.period[0] + (days - 1) * series.step;
  return data;
}

/** A front of so many objectives with other sets of its population, a compromise, and the series of every second set. */
function frontOf(data, count) {
  const { evaluations, series: [series] } = data;
  const sets = Array.from({ length: 24 }, (_, set) => set);
  const share = (set) => (set % 20) / 19; // along the front; the last four lie behind it
  const values = Array.from({ length: count }, (_, objective) => sets.map((set) => (set < 20 ? 1 : 1.3) * (1 + objective) * (objective % 2 === 0 ? share(set) ** 2 : (1 - share(set)) ** 2) + 0.5));
  const kept = sets.filter((set) => set < 20 && set % 2 === 0);
  return {
    objectives: values.map((_, objective) => `gauge ${objective + 1}`), parameters: data.parameters.filter(({ kind }) => kind === 'variable').map(({ name }) => name),
    numbers: sets.map((set) => evaluations.numbers[set]), ranks: sets.map((set) => (set < 20 ? 1 : 2)), violations: sets.map(() => 0), distances: sets.map((set) => Math.abs(share(set) - 0.5)),
    suggested: 10, values, parameterValues: evaluations.parameters.map((column) => sets.map((set) => column[set])),
    course: { evaluations: [30, 60, 90, 120], sizes: [4, 9, 15, 20], hypervolumes: [1, 1.8, 1.98, 2] },
    series: kept.map((set) => ({ measure: series.measure, number: evaluations.numbers[set], start: series.start, step: series.step, count: series.count, thinned: false, values: series.best.map((value) => value * (1 + 0.02 * set)) })),
  };
}

/** Three repetitions that took turns: two end at the same value with other values of the second parameter, one elsewhere. The front of the first is nearly that of all. */
function repetitionsOf(data, haveFronts) {
  const { evaluations, best } = data;
  const parameters = data.parameters.filter(({ kind }) => kind === 'variable');
  const one = (number, aggregate, second) => ({ number, seed: 4 + number, evaluations: evaluations.count / 3, best: best.number, aggregate, loops: 7, start: best.aggregate * 8, termination: 'the budget is used up',
    parameters: [parameters[0].best, second], ...(haveFronts ? { hypervolume: [1.99, 1.5, 1.2][number - 1] } : {}) });
  const stretches = Array.from({ length: 6 }, (_, turn) => [1 + turn % 3, 1 + turn * evaluations.count / 6, (turn + 1) * evaluations.count / 6]);
  return { parameters: parameters.map(({ name }) => name), stretches, atStart: 0, ...(haveFronts ? { fronts: { ofAll: 2, near: 1, verdict: 'differ' } } : {}), tolerance: best.aggregate * 0.01, within: '1 % of the least', all: [one(1, best.aggregate, 1), one(2, best.aggregate * 1.005, 4), one(3, best.aggregate * 2 + 1, 2.5)] };
}

/** A search with all that one can leave beside its results: limits of its parameters, a front of so many objectives, repetitions. */
export function withTables(objectives) {
  const data = dataOf('optimisation');
  const { covariance } = dataOf('sensitivity').sensitivity;
  return Object.assign(data, { front: frontOf(data, objectives), repetitions: repetitionsOf(data, objectives > 2), estimate: { ...covariance, lagText: 'Lag-1 correlation of the residuals: 0.600' } });
}

/** Nothing but what every run has. */
export function empty() {
  const { format, program, run } = dataOf('optimisation');
  return { format, program, run: { ...run, evaluations: 0, failed: 0, state: 'running', ended: null, message: null } };
}

/** Texts that would do harm, or mischief, wherever they were read as anything but text. */
export const kHostile = [
  '<script>window.harm = 1</script>', '<img src=x onerror="window.harm = 1">', '"quotes\' & &amp; {a} {b|c} %s', '\u00dcberlauf Gro\u00dfe B\u00e4che \u2028 \u65e5\u672c',
  'x'.repeat(255), '</script><svg onload=window.harm=1>', '__proto__', '{"a": [1]}\u0000\u202e',
];

/** `data` with every name and every free text hostile, and with gaps. */
export function hostile(data) {
  const name = (index) => kHostile[index % kHostile.length] + (index < kHostile.length ? '' : ` ${index}`);
  const renamed = new Map();
  const rename = (old) => renamed.get(old) ?? (renamed.set(old, name(renamed.size)), renamed.get(old));
  for (const parameter of data.parameters) parameter.name = rename(parameter.name);
  for (const item of [...data.measures, ...data.objectives]) item.name = rename(item.name);
  for (const item of [...(data.series ?? []), ...(data.band ?? [])]) Object.assign(item, { measure: rename(item.measure), unit: kHostile[1] });
  for (const band of data.band ?? []) ['p5', 'p50', 'p95'].forEach((name) => band[name].fill(null, 90, 95));
  if (data.sensitivity) {
    data.sensitivity.derivatives[0][0] = data.sensitivity.dimensionless[0][0] = null;
    for (const key of ['parameters', 'outputs', 'ranking']) data.sensitivity[key] = data.sensitivity[key].map(rename);
    data.sensitivity.covariance.names = data.sensitivity.covariance.names.map(rename);
    data.sensitivity.covariance.leftOut = [{ name: kHostile[0], reason: kHostile[1] }];
  }
  if (data.front) {
    for (const key of ['objectives', 'parameters']) data.front[key] = data.front[key].map(rename);
    data.front.series.forEach((one) => { one.measure = rename(one.measure); });
    data.front.course.hypervolumes[1] = data.front.distances[3] = null;
  }
  if (data.repetitions) {
    data.repetitions.parameters = data.repetitions.parameters.map(rename);
    data.repetitions.all.forEach((one, place) => { one.termination = kHostile[place]; });
    Object.assign(data.repetitions.all[2], { aggregate: null, parameters: [null, null] });
  }
  if (data.estimate) Object.assign(data.estimate, { names: data.estimate.names.map(rename), lagText: kHostile[0], leftOut: [{ name: kHostile[1], reason: kHostile[2] }] });
  for (const screening of data.morris ?? []) {
    screening.name = rename(screening.name);
    for (const parameter of screening.parameters) parameter.name = rename(parameter.name);
    Object.assign(screening.parameters[0], { sigma: [1, null, null], verdict: 'fix' });
  }
  if (data.posterior) {
    for (const dimension of data.posterior.dimensions) dimension.name = rename(dimension.name);
    Object.assign(data.posterior, { findings: [...kHostile], tradeOffs: [...kHostile], advice: [...kHostile] });
    const [first] = data.posterior.dimensions;
    Object.assign(first, { mostProbable: null, narrowing: null, effectiveSize: null });
    first.rHats.fill(null);
    first.traces[0].fill(null, 5, 9);
    data.posterior.logLikelihoods[0][0] = null;
    data.posterior.correlations[0][1] = null;
  }
  if (data.sobol) {
    data.sobol.factors = data.sobol.factors.map(rename);
    for (const output of data.sobol.outputs) output.name = rename(output.name);
    for (const series of data.sobol.series) {
      Object.assign(series, { measure: rename(series.measure), unit: kHostile[1] });
      series.total[0].fill(null, 90, 95);
    }
    data.sobol.outputs.at(-1).first[0] = [null, null, null, 0];
  }
  Object.assign(data.run, { title: kHostile[0] + kHostile[4], taskName: kHostile[1], message: kHostile[5], notes: [...kHostile] });
  data.failures = kHostile.map((text) => ({ reason: text, count: 1, example: text }));
  data.summary = [...kHostile];
  return data;
}
