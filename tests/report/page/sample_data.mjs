// Report data as the program writes them, made from a seed: what a run of each task, size and kind of trouble holds.

const kDay = 86400000;

/** Numbers in [0, 1), the same at every run (mulberry32). */
function random(seed) {
  let state = seed;
  return () => {
    state = (state + 0x6d2b79f5) | 0;
    let mixed = Math.imul(state ^ (state >>> 15), 1 | state);
    mixed = (mixed + Math.imul(mixed ^ (mixed >>> 7), 61 | mixed)) ^ mixed;
    return ((mixed ^ (mixed >>> 14)) >>> 0) / 4294967296;
  };
}

const round = (value) => Number(value.toPrecision(7));

/** Daily values with a spring flood, recessions and some missing days. */
function river(days, draw, factor = 1) {
  let flow = 5;
  return Array.from({ length: days }, (_, day) => {
    const season = Math.exp(-(((day % 365) - 110) ** 2) / 600);
    flow = flow * 0.93 + 0.4 + (draw() < 0.08 + 0.3 * season ? draw() * 60 * (0.3 + season) : 0);
    return round(flow * factor);
  });
}

const kParameters = [
  ['X1', 50, 2000, 350, 'logarithmic'], ['X2', -5, 5, 0, 'none'], ['X3', 10, 500, 90, 'logarithmic'],
  ['X4', 0.5, 5, 1.7, 'none'], ['CTG', 0, 1, 0.25, 'none'], ['Kf', 1, 10, 4, 'none'],
];

function baseRun(task, taskName, count, failed) {
  return {
    title: 'A river at its gauge', setup: 'river.kdx', setupName: 'river', task, taskName, started: '2026-11-21 07:00:00',
    ended: '2026-11-21 09:31:07', reportMade: '2026-11-21 09:31:08', state: 'finished',
    message: 'The maximum number of evaluations was reached', evaluations: count, planned: count, failed, aggregation: 'weighted sum',
    algorithm: null, surrogate: null, populationSize: null, period: ['1981-10-01', '1990-09-30'], seed: 1, notes: [],
  };
}

function evaluationsOf(parameters, count, draw, searching) {
  const columns = parameters.map(() => []);
  const aggregate = [];
  const ok = [];
  for (let place = 0; place < count; ++place) {
    const width = searching ? Math.max(0.03, 1 - place / (0.6 * count)) : 1;
    let distance = 0;
    parameters.forEach(({ lower, upper }, index) => {
      const target = 0.25 + 0.08 * index;
      const at = Math.min(1, Math.max(0, target + (draw() - 0.5) * 2 * width));
      distance += (at - target) ** 2 * (index + 1);
      columns[index].push(round(lower + at * (upper - lower)));
    });
    const good = draw() > 0.004;
    ok.push(good ? 1 : 0);
    aggregate.push(good ? round(11.7 + 20 * distance + draw() * 0.4) * (draw() < 0.003 ? 40 : 1) : null);
  }
  const numbers = Array.from({ length: count }, (_, place) => place + 1);
  return { count, numbers, ok, aggregate, parameters: columns, objectives: [aggregate], measures: [aggregate] };
}

function seriesOf(measure, days, draw, bestNumber) {
  const observed = river(days, draw);
  const near = (share) => observed.map((value) => round(Math.max(0, value * (1 + (draw() - 0.45) * share))));
  const [initial, best] = [near(1.2), near(0.5)];
  for (let day = 0; day < days; ++day) if (day % 97 < 3) observed[day] = null;
  const start = Date.UTC(1981, 9, 1);
  const figures = (nse) => ({ n: 3200, nse, kge: nse - 0.02, kgeR: 0.94, kgeAlpha: 0.9, kgeBeta: 1.06, pbias: 6.1, rmse: 11.68, r2: 0.88 });
  return {
    measure, unit: 'm3/s', start: '1981-10-01T00:00:00', step: kDay, count: days, observed, initial, best, bestNumber,
    period: [start, Math.min(start + (days - 1) * kDay, Date.UTC(1990, 8, 30))], figures: { initial: figures(0.57), best: figures(0.87) },
  };
}

/** A search with `count` evaluations, `days` of daily series and `measures` measures with a series. */
export function optimisation({ count = 400, days = 1500, measures = 1, algorithm = 'SCE' } = {}) {
  const draw = random(7);
  const parameters = kParameters.map(([name, lower, upper, start, transformation]) => (
    { name, lower, upper, start, best: start, kind: 'variable', transformation, integer: false, nearBound: null }));
  const evaluations = evaluationsOf(parameters, count, draw, true);
  const best = evaluations.aggregate.reduce((at, value, place) => (value !== null && value <= (evaluations.aggregate[at] ?? Infinity) ? place : at), 0);
  parameters.forEach((parameter, index) => { parameter.best = evaluations.parameters[index][best]; });
  parameters[3].nearBound = 'upper';
  parameters[0].comment = 'capacity of the production store, mm';
  parameters.push({ name: 'area', lower: null, upper: null, start: 771, best: 771, kind: 'fixed', transformation: 'none', integer: false, nearBound: null });
  const failed = evaluations.ok.filter((ok) => ok === 0).length;
  const value = evaluations.aggregate;
  const names = Array.from({ length: measures }, (_, index) => (measures === 1 ? 'Discharge RMSE' : `Discharge RMSE ${index + 1}`));
  return {
    format: 1, program: 'Mirevo 0.2.0',
    run: { ...baseRun('optimisation', 'Parameter optimisation: Shuffled Complex Evolution', count, failed), algorithm, populationSize: 26 },
    parameters,
    measures: names.map((name) => ({ name, statistic: 'root mean square error', weight: 1, objective: 'Discharge', initial: value[0], best: value[best] })),
    objectives: [{ name: 'Discharge', initial: value[0], best: value[best] }],
    best: { number: best + 1, aggregate: value[best] }, initialNumber: 1, initialLabel: 'initial parameters',
    failures: failed === 0 ? [] : [{ reason: 'the model exited with 3', count: failed, example: 'evaluation 17: the model exited with 3' }],
    evaluations, series: names.map((name) => seriesOf(name, days, draw, best + 1)), summary: ['Parameter optimisation finished', '', 'Best evaluation: 1234'],
  };
}

export function uncertainty() {
  const draw = random(11);
  const data = { ...optimisation({ count: 200 }), series: [] };
  data.run = { ...baseRun('uncertainty', 'Uncertainty analysis: Latin hypercube', 200, 2) };
  data.evaluations = evaluationsOf(data.parameters.slice(0, 6), 200, draw, false);
  const observed = river(1200, draw);
  const spread = observed.map(() => 0.2 + 0.3 * draw());
  const scaled = (sign) => observed.map((value, day) => (day > 900 && day < 950 ? null : round(value * (1 + sign * spread[day]))));
  data.band = [{ measure: 'Discharge RMSE', start: '1981-10-01T00:00:00', step: kDay, count: 1200, observed: observed.map((value) => round(value * (0.6 + 0.8 * draw()))),
    p5: scaled(-1), p50: scaled(0.1), p95: scaled(1), inside: 0.6152, n: 3287 }];
  return data;
}

export function sensitivity() {
  const data = { ...optimisation({ count: 13, days: 9 }), series: [] };
  data.run = baseRun('sensitivity', 'Local sensitivity analysis: central differences', 13, 0);
  const names = kParameters.map(([name]) => name);
  const square = (of) => names.map((_, row) => names.map((__, column) => round(of(row, column))));
  data.sensitivity = {
    parameters: names, outputs: ['Discharge RMSE', 'Low flow bias'],
    derivatives: names.map((_, row) => [round(0.3 / (row + 1)), row === 2 ? null : -0.01 * row]),
    dimensionless: names.map((_, row) => [round(0.9 / (row + 1)), row === 2 ? null : -0.2 * row]),
    composite: names.map((_, row) => round(0.9 / (row + 1))), ranking: names,
    covariance: {
      names, estimate: kParameters.map(([, , , start]) => start), standardDeviation: kParameters.map(([, , upper]) => upper / 30),
      lower95: kParameters.map(([, , upper, start]) => start - upper / 15), upper95: kParameters.map(([, , upper, start]) => start + upper / 15),
      correlation: square((row, column) => (row === column ? 1 : Math.cos(row * 3 + column * 3) * 0.8)), leftOut: ['X9'],
    },
  };
  return data;
}

export function scenarios() {
  const data = optimisation({ count: 40 });
  data.run = baseRun('scenarios', 'Scenario runs', 40, 0);
  return data;
}

/** Nothing but what every run has. */
export function empty() {
  return {
    format: 1, program: 'Mirevo 0.2.0',
    run: { ...baseRun('optimisation', 'Parameter optimisation: Dynamically Dimensioned Search', 0, 0), state: 'running', ended: null, message: null },
  };
}

export function allFailed() {
  const data = { ...optimisation({ count: 30 }), series: [], best: null };
  data.run = { ...data.run, state: 'failed', failed: 30, message: 'Too many failed evaluations' };
  data.evaluations.ok.fill(0);
  for (const column of [data.evaluations.aggregate, ...data.evaluations.objectives]) column.fill(null);
  data.parameters.forEach((parameter) => { parameter.best = null; parameter.nearBound = null; });
  for (const result of [...data.measures, ...data.objectives]) result.best = result.initial = null;
  data.failures[0] = { reason: 'no output file', count: 30, example: null };
  return data;
}

/** Texts that would do harm, or mischief, wherever they were read as anything but text. */
export const kHostile = [
  '<script>window.harm = 1</script>', '<img src=x onerror="window.harm = 1">', '"quotes\' & &amp; {a} {b|c} %s', '\u00dcberlauf Gro\u00dfe B\u00e4che \u2028 \u65e5\u672c',
  'x'.repeat(255), '</script><svg onload=window.harm=1>', '__proto__', '{"a": [1]}\u0000\u202e',
];

/** `data` with every name and every free text hostile. */
export function hostile(data) {
  const name = (index) => kHostile[index % kHostile.length] + (index < kHostile.length ? '' : ` ${index}`);
  const renamed = new Map();
  const rename = (old) => renamed.get(old) ?? (renamed.set(old, name(renamed.size)), renamed.get(old));
  for (const parameter of data.parameters) parameter.name = rename(parameter.name);
  for (const item of [...data.measures, ...data.objectives]) item.name = rename(item.name);
  for (const item of [...(data.series ?? []), ...(data.band ?? [])]) Object.assign(item, { measure: rename(item.measure), unit: kHostile[1] });
  if (data.sensitivity) {
    for (const key of ['parameters', 'outputs', 'ranking']) data.sensitivity[key] = data.sensitivity[key].map(rename);
    data.sensitivity.covariance.names = data.sensitivity.covariance.names.map(rename);
    data.sensitivity.covariance.leftOut = [kHostile[0]];
  }
  Object.assign(data.run, { title: kHostile[0] + kHostile[4], taskName: kHostile[1], message: kHostile[5], notes: [...kHostile] });
  data.failures = kHostile.map((text) => ({ reason: text, count: 1, example: text }));
  data.summary = [...kHostile];
  return data;
}
