// The report in a real browser: it shows what the data hold and complains of nothing.
import assert from 'node:assert/strict';
import { test } from 'node:test';
import { blankCharts, openReport, withReport, zoomOf } from './open_report.mjs';
import * as sample from './sample_data.mjs';

test('a chart zooms by dragging and by the wheel, is reset, and changes to a logarithmic axis', async () => {
  await withReport(sample.dataOf('optimisation'), {}, async (page) => {
    for (const section of ['#series', '#progress', '#dotty']) {
      const figure = await page.$(`${section} figure`);
      await figure.scrollIntoViewIfNeeded();
      const canvas = await figure.$('.canvas');
      const { x, y, width } = await canvas.boundingBox();
      const drag = async () => {
        await page.mouse.move(x + 0.4 * width, y + 60);
        await page.mouse.down();
        await page.mouse.move(x + 0.5 * width, y + 100, { steps: 4 });
        await page.mouse.move(x + 0.6 * width, y + 140, { steps: 4 });
        await page.mouse.up();
      };
      const zoomed = ([start, end]) => start > 0 && end < 100 && end > start;
      assert.deepEqual(await zoomOf(page, figure), [0, 100]);
      await drag();
      assert.ok(zoomed(await zoomOf(page, figure)), `${section} by dragging: ${await zoomOf(page, figure)}`);
      await figure.$eval('.reset', (button) => button.click());
      assert.deepEqual(await zoomOf(page, figure), [0, 100], section);
      await page.mouse.move(x + 0.5 * width, y + 100);
      await page.keyboard.down('Control');
      await page.mouse.wheel(0, -300);
      await page.keyboard.up('Control');
      await page.waitForFunction((element) => window.drawnOptions(element).dataZoom[0].start > 0, figure);
    }
    const figure = await page.$('#series figure');
    await (await figure.$('button[aria-pressed]')).click();
    assert.equal(await page.evaluate((element) => window.drawnOptions(element).yAxis[0].type, figure), 'log');
    assert.deepEqual(await blankCharts(page), []);
  });
});

test('the views below a hydrograph are made when they are unfolded, and a series is drawn above it', async () => {
  const data = sample.dataOf('optimisation');
  const [series] = data.series;
  series.above = { name: '<b>rain</b>', start: series.start, step: series.step, count: series.count, values: series.best, thinned: false };
  await withReport(data, {}, async (page) => {
    const before = await page.locator('#series figure').count();
    await page.$$eval('#series details.view', (all) => all.forEach((details) => { details.open = true; }));
    await page.getByText('Autocorrelation of the residuals').waitFor();
    assert.ok(await page.locator('#series figure').count() >= before + 5);
    for (const figure of await page.$$('#series figure')) await figure.scrollIntoViewIfNeeded();
    await page.waitForFunction(() => [...document.querySelectorAll('#series figure')].every((figure) => figure.dataset.drawn));
    assert.deepEqual(await blankCharts(page), []);
    assert.equal(await page.locator('#series .view tbody tr').first().locator('td').first().textContent(), String(series.views.seasons[0].n));
    const canvas = await page.$('#series figure .canvas');
    await canvas.scrollIntoViewIfNeeded();
    await canvas.hover({ position: { x: 300, y: 100 } });
    await page.locator('.tip').getByText('<b>rain</b>').waitFor();
  });
});

test('validation periods have a table, and the hydrograph a button for each', async () => {
  const data = sample.dataOf('optimisation');
  const [series] = data.series;
  const [first, last] = series.period;
  const middle = (first + last) / 2;
  const period = (name, kind, from, to) => ({ name, start: 'a', end: 'b', kind, first: from, last: to, best: { n: 7, nse: 0.25 } });
  series.periods = [period('Calibration', 'calibration', first, middle), period('<b>late', 'validation', middle, last)];
  const value = { best: 0.125, least: 0.5, median: 0.625, largest: 0.75 };
  data.validation = { best: 9, tenth: 3, count: 21, periods: series.periods, measures: [{ name: 'flow', statistic: 'NSE', values: [value, value] }] };
  await withReport(data, {}, async (page) => {
    const text = await page.locator('#validation').innerText();
    for (const part of ['<b>late', 'best evaluation, 9', '0.125', 'median of the best tenth', '0.625', '3 of 21']) assert.ok(text.includes(part), part);
    const figure = await page.$('#series figure');
    await (await figure.$('text=<b>late')).click();
    const [start, end] = await zoomOf(page, figure);
    assert.ok(start > 40 && start < 60 && end > 95, `${start} to ${end}`);
  });
});

test('the reader changes what dots are drawn against, and between light and dark', async () => {
  await withReport(sample.dataOf('optimisation'), { colorScheme: 'light' }, async (page) => {
    const ground = () => page.evaluate(() => getComputedStyle(document.body).backgroundColor);
    const light = await ground();
    await page.locator('nav button').click();
    assert.notEqual(await ground(), light);
    await page.locator('#dotty select').selectOption({ index: 2 });
    assert.deepEqual(await blankCharts(page), []);
  });
});

test('a print has every chart, in light colours, and leaves the screen as it was', async () => {
  await withReport(sample.dataOf('optimisation'), { colorScheme: 'dark' }, async (page) => {
    await page.evaluate(() => dispatchEvent(new Event('beforeprint')));
    assert.equal(await page.locator('figure canvas.picture').count(), 11);
    assert.deepEqual(await blankCharts(page), []);
    assert.equal(await page.evaluate(() => document.documentElement.dataset.theme), 'light');
    await page.evaluate(() => dispatchEvent(new Event('afterprint')));
    const pdf = await page.pdf({ preferCSSPageSize: true, printBackground: true });
    assert.ok(pdf.length > 100000);
    assert.equal(await page.locator('figure canvas.picture').count(), 0);
    assert.equal(await page.evaluate(() => document.documentElement.dataset.theme), 'dark');
    assert.deepEqual(await blankCharts(page), []);
  });
});

test('of many charts those in view are drawn, the others when they come into view, and all for a print', async () => {
  const { page } = await openReport(sample.manyParameters(60));
  const drawn = () => page.locator('figure[data-drawn]').count();
  const all = await page.locator('figure').count();
  assert.ok(all > 100 && await drawn() > 0 && await drawn() < 20, `${await drawn()} of ${all}`);
  await page.locator('#dotty figure').last().scrollIntoViewIfNeeded();
  await page.locator('#dotty figure').last().and(page.locator('[data-drawn]')).waitFor();
  await page.evaluate(() => dispatchEvent(new Event('beforeprint')));
  const blank = await page.$$eval('figure canvas.picture', (pictures) => pictures.filter((picture) =>
    new Set(new Uint32Array(picture.getContext('2d').getImageData(0, 0, picture.width, picture.height).data.buffer)).size < 10).length);
  assert.deepEqual([await page.locator('figure canvas.picture').count(), blank], [all, 0]);
  await page.context().close();
});

test('observations between the steps of a model, scenarios, axes and further measures', async () => {
  const data = sample.hourlyScenarios();
  await withReport(data, {}, async (page) => {
    const drawn = (index) => page.evaluate((at) => {
      const options = window.drawnOptions(document.querySelectorAll('#series figure')[at]);
      return { ...options, series: options.series.map(({ name, data }) => ({ name, data: [...data] })) };
    }, index);
    const scenarios = await drawn(0);
    assert.ok(scenarios.series.length > 20);
    assert.equal(scenarios.series[1].name, 'dry year (2)');
    const { series, yAxis } = await drawn(1);
    assert.equal(yAxis[0].name, 'Discharge [m3/s]');
    const [line, dots] = series.filter(({ name }) => name === 'observed');
    const values = line.data.filter((_, at) => at % 2 === 1);
    assert.deepEqual(values.map(Number.isNaN).slice(0, 5), [false, false, false, true, false], 'interrupted once');
    assert.equal(dots.data.length, values.length - 1);
    assert.match(await page.locator('.findings details').textContent(), /2 more series: .*gauge 5.*gauge 6/);
    const ranking = await page.locator('[aria-label="Best evaluations"] tbody th').allTextContents();
    assert.equal(ranking.filter((text) => [String(data.best.number), '30'].includes(text)).length, 1, `a set is listed once: ${ranking}`);
  });
});

test('20 000 evaluations and 20 years of days are drawn thinned and counted in full', async (context) => {
  const data = sample.stretched(20000, 7305);
  const [series] = data.series;
  series.breaks = { observed: [2000, 2004, 5000].map((day) => series.period[0] + day * series.step) };
  await withReport(data, {}, async (page) => {
    const [drawn, size] = await page.evaluate(() => [document.documentElement.dataset.drawn, document.documentElement.outerHTML.length]);
    context.diagnostic(`every chart drawn ${drawn} ms after the page was opened; ${(size / 1e6).toFixed(1)} million characters`);
    assert.deepEqual(await blankCharts(page), []);
    assert.match(await page.locator('.tiles').textContent(), /20\u202f000/);
    await page.locator('#progress figure summary').first().click();
    await page.getByText('200 of 20\u202f000 rows').waitFor();
    const dots = await page.evaluate(() => window.drawnOptions(document.querySelector('#dotty figure')).series[0].data.length);
    assert.ok(dots > 500 && dots < 18000, `${dots} dots`);
    const [tried, best] = await page.evaluate(() => window.drawnOptions(document.querySelector('#histories figure')).series.map(({ data }) => data));
    assert.ok(tried.length > 500 && tried.length < 18000, `${tried.length} dots`);
    assert.equal(best.at(-1)[0], 20000, 'the line of the best set reaches to the end');
    const pieces = await page.evaluate(() => [...window.drawingOf(document.querySelector('#series figure'), 390).matchAll(/ d="([^"]*)"/g)].map(([, path]) => path.split('M').length - 1));
    assert.equal(pieces.filter((count) => count === 4).length, 3, `the observed line, the residuals and their area are interrupted, however narrow the chart: ${pieces}`);
  });
});

test('data of another format are refused in words', async () => {
  const { page } = await openReport({ ...sample.empty(), format: 2 });
  assert.match(await page.locator('.broken').textContent(), /format 2; this page reads format 1/);
  await page.context().close();
});
