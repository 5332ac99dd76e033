// What the report says of the analyses and of fronts, in a real browser.
import assert from 'node:assert/strict';
import { test } from 'node:test';
import { blankCharts, withReport, zoomOf } from './open_report.mjs';
import * as sample from './sample_data.mjs';

test('what can be fixed is not said to be surer than the sample can show', async () => {
  const screening = sample.dataOf('screening');
  const template = screening.morris[0].parameters[0];
  const fixed = (name, more) => ({ ...template, name, verdict: 'fix', share: [0.01, 0.01, 0.02], muStar: [1, 1, 1], effects: 30, ...more });
  for (const one of screening.morris) {
    one.parameters = [fixed('inert', { muStar: [0, 0, 0], certainty: null }), fixed('weak', { certainty: 1 }), fixed('some', { certainty: 0.98 })];
  }
  await withReport(screening, {}, async (page) => {
    const text = await page.locator('#morris').textContent();
    assert.match(text, /Without any effect in 30 or more steps: what acts in less than 9\.5 % of the space may have gone unseen/);
    assert.match(text, /weak\u2069 \(at most 2 % of the largest \u03bc\*, in all bootstrap samples\)/);
    assert.match(text, /some\u2069 \(at most 2 % of the largest \u03bc\*, sure to 98 %\)/);
  });
  const sobol = sample.dataOf('sobol');
  const [first, second] = sobol.sobol.outputs = [sobol.sobol.outputs.at(-1), structuredClone(sobol.sobol.outputs.at(-1))];
  first.total = first.total.map((index, place) => (place === 0 ? [0, 0, 0, 64] : index));
  second.name = 'another';
  for (const key of ['first', 'total', 'interactions', 'sumOfFirst']) second[key] = second[key].map(([value, , , blocks]) => [value, null, null, blocks]);
  await withReport(sobol, {}, async (page) => {
    const text = await page.locator('#sobol').textContent();
    assert.match(text, /Can be fixed, .*\(no effect in any block\)\. What acts in less than 4\.57 % of the space may have gone unseen in 64 blocks/);
    assert.match(text, /anotherWhich parameters can be fixed is not said, as the indices have no limits/);
  });
});

test('what cannot be computed is a dash that says why, in the tables of all analyses', async () => {
  /** The dashes of a figure's values, or of the table of that name, and the line below. */
  const missing = async (page, section, name) => {
    const figure = page.locator(`${section} figure`, { has: page.locator('figcaption', { hasText: name }) }).first();
    const isFigure = await figure.count() > 0;
    if (isFigure) await figure.locator('details summary').click();
    const table = isFigure ? figure.locator('.table') : page.locator(`${section} .table[aria-label="${name}"]`);
    await table.waitFor();
    return [await table.locator('td span[title]').evaluateAll((spans) => spans.map((span) => `${span.textContent} ${span.title}`)), await table.locator('.note').allTextContents()];
  };
  const screening = sample.dataOf('screening');
  const [one] = screening.morris;
  screening.morris = [one];
  const unknown = { muStar: [null, null, null], mu: [null, null, null], sigma: [null, null, null], share: [null, null, null], effects: 0, rank: 0, rankStability: null, verdict: null };
  one.parameters.push({ ...one.parameters[0], ...unknown, name: 'stuck' });
  await withReport(screening, {}, async (page) => {
    const [dashes, notes] = await missing(page, '#morris', 'Parameters by');
    assert.equal(dashes.length, 10, dashes);
    assert.match(notes.join(), /^\u2013: no effect is known: its steps cannot be run or change no value, or their runs failed\.$/);
  });

  const sobol = sample.dataOf('sobol');
  const objective = sobol.sobol.outputs.find(({ kind }) => kind === 'objective');
  const measure = sobol.sobol.outputs.find(({ kind }) => kind === 'measure');
  objective.total[0] = [...objective.total[0].slice(0, 1), null, null, 3, 'no limits, too few blocks'];
  measure.total = measure.total.map(() => [null, null, null, 64, 'no parameter has an influence, all runs have the same value']);
  sobol.sobol.outputs.push({ ...measure, kind: 'objective', name: 'flat' });
  await withReport(sobol, {}, async (page) => {
    assert.deepEqual(await missing(page, '#sobol', 'First-order and total indices'), [['\u2013 no limits, too few blocks'], ['\u2013: no limits, too few blocks.']]);
    const [dashes] = await missing(page, '#sobol', 'Total indices of the output measures');
    assert.ok(dashes.includes(`\u2013 ${measure.total[0][4]}`), dashes);
    assert.match(await page.locator('#sobol').textContent(), /flatNo parameter has an influence, all runs have the same value\./);
  });

  const dream = sample.dataOf('dream');
  dream.posterior.state = 'apart';
  Object.assign(dream.posterior.dimensions[1], { rHat: null, effectiveSize: null });
  await withReport(dream, {}, async (page) => {
    const why = 'chains that have not moved, or have too few states, have none';
    assert.deepEqual(await missing(page, '#posterior', 'Parameters before and after the observations'), [[`\u2013 ${why}`, `\u2013 ${why}`], [`\u2013: ${why}.`]]);
  });

  const local = sample.dataOf('sensitivity');
  local.sensitivity.derivatives[1][0] = null;
  local.sensitivity.problems = local.sensitivity.derivatives.map((row) => row.map((value) => (value === null ? 'its runs failed' : '')));
  await withReport(local, {}, async (page) => assert.deepEqual(await missing(page, '#sensitivity', 'Derivatives'), [['\u2013 its runs failed'], ['\u2013: its runs failed.']]));

  const sampled = sample.dataOf('uncertainty');
  const found = sampled.sampleSensitivity;
  for (const name of ['firstOrder', 'lower', 'upper']) found[name] = found[name].map((row) => row.map(() => null));
  found.problems = found.outputs.map((_, place) => `reason ${place}`);
  await withReport(sampled, {}, async (page) => assert.match(await page.locator('#sample-sensitivity').textContent(), /There are no first-order indices of [^(]*\(reason \d\)/));
});

test('a band breaks at its gaps, shows every observed value and says of how many runs it is, without words of a search', async () => {
  const data = sample.dataOf('uncertainty');
  const [band] = data.band;
  Object.assign(band, { gaps: [100], observedGaps: [200, 201], fewestRuns: 7, mostRuns: 9, runs: band.p5.map(() => 9) });
  band.p95[0] = 8e5;
  band.start = band.start.replace(/00:00$/, '07:00');
  await withReport(data, {}, async (page) => {
    const [, median, line, dots] = await page.evaluate(() => window.drawnOptions(document.querySelector('#band figure')).series.map(({ data }) => data));
    assert.deepEqual(median.flatMap(([, value], place) => (value === null ? [place] : [])), [100]);
    assert.equal(line.filter(([, value]) => value === null).length, 2);
    assert.deepEqual(dots, [line[201]], 'the value between two gaps');
    const drawn = () => page.evaluate(() => [/>800000</, /fill-opacity="0.45"/, /, \d\d:\d\d</].map((part) => part.test(window.drawingOf(document.querySelector('#band figure')))));
    assert.deepEqual(await drawn(), [true, true, false]);
    await page.locator('#band .canvas').focus();
    await page.keyboard.press('+');
    assert.deepEqual(await drawn(), [false, true, false], 'the axis follows what is zoomed in to, and begins with a date');
    const shown = await page.locator('#report').textContent();
    assert.ok(shown.includes('The quantiles are of 7 to 9 runs.'));
    assert.ok(!/best so far|Progress|A wider bound/.test(shown));
  });
});

test('GLUE says which parameters the observations tell something of, and how much of them lies in how wide a band', async () => {
  const data = sample.dataOf('glue');
  data.glue.distanceLimit = 0.1;
  data.glue.parameters[0].distance = 0.5;
  data.glue.parameters[1].distance = 0.01;
  Object.assign(data.band[0], { inside: 0.75, n: 365, width: 2.5, relativeWidth: 0.8, unit: 'm3/s' });
  await withReport(data, {}, async (page) => {
    const shown = await page.locator('#glue').textContent();
    assert.ok(shown.includes('The observations tell something of a (the most first). Behavioural values of b are distributed as all sets are'), shown);
    assert.ok((await page.locator('#band').textContent()).includes('It is 2.5 m3/s wide on average at them, 0.8 of their standard deviation.'));
  });
  Object.assign(data.glue, { effective: 0, behavioural: 0, distanceLimit: null });
  await withReport(data, {}, async (page) => {
    assert.equal(await page.locator('#glue figure').count(), 0);
    assert.ok((await page.locator('#glue').textContent()).includes('neither quantiles nor bands'));
  });
});

test('a point of a front is picked in the chart, by keyboard and in the table, and its parameters and hydrograph are shown', async () => {
  const data = sample.withTables(2);
  const { front } = data;
  Object.assign(data.estimate, { lower95: [3.9, -20], upper95: [4.1, 20], correlation: [[1, -0.97], [-0.97, 1]] });
  data.parameters[1].nearBound = 'lower';
  await withReport(data, {}, async (page) => {
    const shown = await page.locator('#front').innerText();
    for (const text of ['The best gauge 1 is 0.5 (evaluation 1). gauge 2 is 2.5 there, 400 % above its best, 0.5.', 'A suggestion for a compromise is evaluation 11: gauge 1 0.777, 55.4 % above its best; gauge 2',
      'nearest to the ideal one', 'no more than a suggestion', 'The front still grew: its hypervolume by 10 %']) assert.ok(shown.replace(/[\u2068\u2069]/g, '').includes(text), `${text}: ${shown}`);
    const figure = page.locator('#front figure').first();
    const hydrograph = page.locator('#front figure', { hasText: 'Simulated and observed: flow' });
    const picked = async () => [await page.locator('#front h3', { hasText: 'picked' }).textContent(),
      await figure.evaluate((element) => window.drawnOptions(element).series.find(({ id }) => id === 'picked0').data[0][2]),
      await hydrograph.evaluate((element) => { const { data: points } = window.drawnOptions(element).series.find(({ id }) => id === 'picked'); return points.length > 0 ? Number(points[1].toPrecision(6)) : null; })];
    const expected = (set) => [`The point that is picked: evaluation ${front.numbers[set]}`, set, front.series.find(({ number }) => number === front.numbers[set])?.values[0] ?? null];
    const isPicked = async (set, how) => {
      const [title, place, value] = await picked();
      const [wantedTitle, wantedPlace, wanted] = expected(set);
      assert.deepEqual([title, place, value], [wantedTitle, wantedPlace, wanted === null ? null : Number(wanted.toPrecision(6))], how);
    };
    await isPicked(10, 'at first the suggestion');
    await figure.locator('.canvas').focus();
    await page.keyboard.press('+');
    await page.keyboard.press('ArrowRight');
    await isPicked(11, 'by keyboard');
    assert.deepEqual(await zoomOf(page, await figure.elementHandle()), [25, 75], 'the chart stays zoomed in');
    assert.match(await page.locator('#front').textContent(), /The series of evaluation 12 is not kept: those of 10 of the 20 points of the front are/);
    await page.keyboard.press('Escape');
    const lastDot = () => figure.evaluate((element) => {
      const { left, top } = element.querySelector('.canvas').getBoundingClientRect();
      const drawing = new DOMParser().parseFromString(window.drawingOf(element, element.querySelector('.canvas').clientWidth), 'image/svg+xml');
      const dot = drawing.querySelector('path[ecmeta_series_index="1"][ecmeta_data_index="19"][transform^="matrix"]');
      const [, , , , across, down] = dot.getAttribute('transform').match(/-?[\d.]+/g).map(Number);
      return [left + across, top + down];
    });
    // A busy machine may not have drawn the whole front yet, and another dot is where that one will be.
    for (let tries = 0; tries < 20 && (await picked())[1] !== 19; ++tries) {
      await page.mouse.click(...await lastDot());
      await page.waitForTimeout(100);
    }
    await isPicked(19, 'by a click on the last dot');
    await page.locator('#front details.view summary').click();
    await page.locator('#front details.view button', { hasText: /^4$/ }).press('Enter');
    await isPicked(3, 'in the table');
    assert.equal(await page.locator('#front details.view [aria-pressed="true"]').textContent(), '4');
    const parameters = page.locator('[aria-label="Parameters of the point that is picked"] td').first();
    assert.equal(Number(await parameters.textContent()), Number(front.parameterValues[0][3].toPrecision(8)));
    assert.deepEqual(await blankCharts(page), []);

    const words = (await page.locator('#repetitions .findings').innerText()).replace(/[\u2068\u2069]/g, '');
    for (const text of ['2 of 3 repetitions ended within 1 % of the least value', 'These 2 agree in the value, but not in b (1 to 4, 60 % of its range)']) assert.ok(words.includes(text), words);
    const courses = await page.locator('#repetitions figure').first().evaluate((element) => window.drawnOptions(element).series.map(({ data: steps }) => steps.at(-1)));
    const bestOf = (number) => data.repetitions.stretches.filter(([of]) => of === number).flatMap(([, first, last]) => data.evaluations.aggregate.slice(first - 1, last)).filter((value) => value !== null).reduce((a, b) => Math.min(a, b));
    assert.deepEqual(courses.map(([, value]) => value), [1, 2, 3].map(bestOf), 'each course is that of its own stretches');
    const limits = (await page.locator('#estimate .findings').innerText()).replace(/[\u2068\u2069]/g, '');
    for (const text of ['Well determined, their limits less than 10 % of the range between the bounds apart: a (2 %)', 'Hardly determined, their limits at least 50 % of the range apart: b (800 %)', 'a and b (correlation \u22120.97)', 'At a bound, where the limits say little: b (lower)']) assert.ok(limits.includes(text), limits);
  });
});

test('repetitions of a search for a front are compared by its hypervolume', async () => {
  await withReport(sample.withTables(4), {}, async (page) => {
    const words = (await page.locator('#repetitions').innerText()).replace(/[\u2068\u2069]/g, '');
    for (const text of ['least 1.2, median 1.5, greatest 1.99; that of all 2', '1 of 3 repetitions come within 1 % of the hypervolume of all']) assert.ok(words.includes(text), words);
    assert.ok(!words.includes('aggregate'), words);
    const drawn = await page.locator('#repetitions figure').first().evaluate((element) => window.drawnOptions(element).series[0].data);
    assert.deepEqual(drawn.map(([volume]) => volume), [1.99, 1.5, 1.2]);
  });
});

test('repetitions that agree in a single set, or in what they began with, are no sign of a minimum', async () => {
  const fronts = (near, verdict) => {
    const data = sample.withTables(4);
    data.front.ranks = data.front.ranks.map((_, place) => (place === 0 ? 1 : 2));
    data.repetitions.fronts = { ofAll: 2, near, verdict };
    return data;
  };
  const atStart = sample.withTables(2);
  atStart.repetitions.atStart = 2;
  for (const [data, text, kind, absent] of [
    [fronts(1, 'differ'), '1 of 3 repetitions come within 1 % of the hypervolume of all', 'warning', 'single set, and'],
    [fronts(3, 'no search'), 'No repetition had evaluations left', 'warning', 'hatever the seed'],
    [fronts(3, 'one set'), 'It is a single set, and whatever the seed', '', 'depends on the seed'],
    [atStart, '2 of 3 repetitions began with a value within 1 % of the least already', 'warning', 'agree in']]) {
    await withReport(data, {}, async (page) => {
      const plain = (words) => words.replace(/[\u2068\u2069]/g, '');
      const found = page.locator('#repetitions .findings li', { hasText: text.slice(0, 30) });
      assert.ok(plain(await found.innerText()).startsWith(text), await found.innerText());
      assert.equal(await found.getAttribute('class') ?? '', kind);
      assert.ok(!plain(await page.locator('#repetitions .findings').innerText()).includes(absent));
      assert.ok(!(await page.locator('#front .findings').innerText()).includes('its hypervolume') || data === atStart, 'the growth of a single set says nothing');
    });
  }
});

test('repetitions that have not ended, or have no result, are told of and not compared', async () => {
  const cut = (data) => {
    Object.assign(data.repetitions.all[0], { termination: '', aggregate: data.best.aggregate / 2 });
    Object.assign(data.repetitions.all[2], { best: 0, aggregate: null, ...(data.repetitions.all[2].hypervolume ? { hypervolume: 0 } : {}) });
    return data;
  };
  const withSame = (data) => {
    data.repetitions.all[1].sameAs = 1;
    return data;
  };
  // They began with a smaller aggregate, and with a greater sum of squares, by which they are judged.
  const ofSums = (data) => {
    data.repetitions.tolerance = 0.1;
    for (const one of data.repetitions.all) Object.assign(one, { start: one.aggregate / 2, sum: 10 * one.number, startSum: 25 });
    return data;
  };
  for (const [data, texts] of [
    [ofSums(sample.withTables(2)), ['The sums of squares of 3 repetitions: least 10, median 20, greatest 30', '1 of 3 repetitions ended within', '1 repetition found nothing better']],
    [withSame(sample.withTables(2)), ['The best aggregates of 2 repetitions', '1 of 2 repetitions ended within', 'Repetition 2 is the same search as 1: they started from the same sets, and count once']],
    [cut(sample.withTables(2)), ['The best aggregates of 1 repetition', '1 repetition found no value.', '1 repetition had not ended.']],
    [cut(sample.withTables(4)), ['the fronts of the 1 that has ended with one, on its scale: least 1.5, median 1.5, greatest 1.5', '1 repetition found no front.', '1 repetition had not ended.']]]) {
    await withReport(data, {}, async (page) => {
      const words = (await page.locator('#repetitions .findings').innerText()).replace(/[\u2068\u2069]/g, '');
      for (const text of texts) assert.ok(words.includes(text), words);
      assert.deepEqual(await blankCharts(page), []);
    });
  }
});

/** A posterior of so many dimensions, those of a short run again and again. */
function ofDimensions(count) {
  const { posterior } = sample.dataOf('dream');
  const own = posterior.dimensions;
  posterior.dimensions = Array.from({ length: count }, (_, place) => ({ ...own[place % own.length], name: `p${place}` }));
  posterior.correlations = posterior.dimensions.map((_, row) => posterior.dimensions.map((__, column) => (row === column ? 1 : row + column === count - 1 ? -0.9 : 0.1)));
  return posterior;
}

test('chains say whether they have converged, what to do, which parameters trade off, and how much lies in the bands', async () => {
  const data = sample.dataOf('dream');
  data.posterior.tradeOffs = ['sigma0 of flow and phi of flow trade off: a correlation of -0.86'];
  Object.assign(data.band[1], { inside: 1 });
  const { burnIn } = data.posterior;
  await withReport(data, {}, async (page) => {
    const shown = await page.locator('#posterior').textContent();
    assert.equal(await page.locator('#posterior .findings .warning').count(), 1);
    assert.match(shown, /The chains have not converged: R-hat is above 1\.05 for .*\bb \(\d\.\d/);
    for (const text of ['sigma0 of flow and phi of flow trade off: a correlation of -0.86',
      'holds 100 % of 365 observed values; it should hold about 90 %. It is wider', 'what follows is not the posterior yet', `4 chains of 121 generations; the first ${burnIn} are burn-in`]) assert.ok(shown.includes(text), text);
    const shaded = await page.$$eval('#posterior figure', (figures) => figures.map((figure) => window.drawnOptions(figure)?.series[0].markArea?.data?.[0]?.[1]?.xAxis).filter((end) => end));
    assert.deepEqual(shaded, Array(5).fill(burnIn), 'the burn-in of each trace');
    const limits = await page.$$eval('#posterior figure', (figures) => figures.map((figure) => window.drawnOptions(figure)?.series[0].markLine?.data?.[0]?.yAxis).filter((limit) => limit));
    assert.deepEqual(limits, [1.05, 400]);
    assert.ok(!shown.includes('The data have narrowed'), 'what chains that are apart have not found');
  });
  Object.assign(data.posterior, { state: 'reached', findings: ['The chains have converged'], advice: [], tradeOffs: [] });
  Object.assign(data.band[1], { inside: 0.91 });
  data.posterior.dimensions.forEach((dimension, place) => Object.assign(dimension, { narrowing: [0.3, 0.95, 0.05, 0.2][place], isHardlyNarrower: place === 1 }));
  await withReport(data, {}, async (page) => {
    const shown = await page.locator('#posterior').textContent();
    assert.equal(await page.locator('#posterior .findings .good').count(), 1);
    for (const text of ['about the 90 % that it should', 'No two parameters trade off', 'The data have narrowed \u2068a\u2069 most: its 5 to 95 % range is 30 %', 'They say little of \u2068b\u2069']) assert.ok(shown.includes(text), text);
    assert.ok(!shown.includes('not the posterior yet'));
  });
  data.band.push({ ...data.band[1], inside: 0.8, n: 1000 });
  Object.assign(data.band[1], { inside: 0.8, n: 10 });
  await withReport(data, {}, async (page) => {
    const shown = await page.locator('#posterior').textContent();
    for (const text of ['holds 80 % of 10 observed values; it should hold about 90 %, but of so few values this may be chance', 'holds 80 % of 1\u202f000 observed values; it should hold about 90 %. It is too narrow']) assert.ok(shown.includes(text), text);
  });
});

test('chains that ended in burn-in, and those whose other tables cannot be read, are shown alone', async () => {
  const data = sample.dataOf('dream');
  const { posterior } = data;
  const known = ['mean', 'standardDeviation', 'mostProbable', 'rHat', 'effectiveSize', 'narrowing'];
  for (const dimension of posterior.dimensions) {
    for (const name of known) dimension[name] = null;
    for (const name of ['quantiles', 'priorQuantiles', 'edges', 'posterior', 'prior', 'rHats', 'effectiveSizes', 'draws']) dimension[name] = [];
  }
  Object.assign(posterior, { state: undefined, findings: undefined, tradeOffs: undefined, correlations: [], checkedRuns: [], burnIn: 129, states: 0, acceptance: null, chainAcceptance: [null, null, null, null] });
  data.band = [];
  await withReport(data, {}, async (page) => {
    assert.equal(await page.locator('#posterior figure').count(), 5);
    assert.deepEqual(await blankCharts(page), []);
    assert.match(await page.locator('#posterior').textContent(), /There is no posterior: the chains have not come far enough/);
  });
});

test('of many parameters the pairs with the strongest correlations are drawn, and others can be chosen', async () => {
  const data = sample.dataOf('dream');
  data.posterior = ofDimensions(30);
  await withReport(data, {}, async (page) => {
    const pressed = () => page.$$eval('#posterior .picks [aria-pressed="true"]', (buttons) => buttons.map((button) => button.textContent));
    const grids = () => page.locator('#posterior figure', { hasText: 'Parameters against one another' }).evaluate((figure) => window.drawnOptions(figure).grid.length);
    assert.deepEqual(await pressed(), ['p0', 'p1', 'p2', 'p3', 'p4', 'p5', 'p6', 'p7']);
    const figure = page.locator('#posterior figure', { hasText: 'Parameters against one another' });
    await figure.scrollIntoViewIfNeeded();
    await page.locator('#posterior .picks button', { hasText: /^p29$/ }).click();
    assert.deepEqual((await pressed()).at(-1), 'p29');
    assert.equal((await pressed()).length, 8);
    await page.locator('#posterior .picks button', { hasText: /^p29$/ }).click();
    assert.equal(await grids(), 49);
    assert.deepEqual(await blankCharts(page), []);
  });
});
