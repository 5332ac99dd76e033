// Reports of the small test model, made by the program (samples.cpp): what a run of each task and kind of trouble holds. Environment:
// MIREVO_PAGE_SAMPLES. What would take days of model runs is stretched from a short one.
import { execFileSync } from 'node:child_process';
import { mkdtempSync, readdirSync, readFileSync, rmSync } from 'node:fs';
import { tmpdir } from 'node:os';
import { join } from 'node:path';

const folder = mkdtempSync(join(tmpdir(), 'mirevo-samples-'));
execFileSync(process.env.MIREVO_PAGE_SAMPLES, [folder]);
const reports = Object.fromEntries(readdirSync(folder).map((name) => [name, readFileSync(join(folder, name), 'utf8')]));
rmSync(folder, { recursive: true });

/** The data in the report of that name, each time anew. */
export const dataOf = (name) => JSON.parse(/id="report-data">(.*?)<\/script>/s.exec(reports[name])[1]);

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
