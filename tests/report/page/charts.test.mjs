// Every kind of report in a real browser: all charts are drawn, and no name is read as HTML.
import assert from 'node:assert/strict';
import { test } from 'node:test';
import { blankCharts, withReport } from './open_report.mjs';
import * as sample from './sample_data.mjs';

const sectionsOf = (page) => page.$$eval('main > section', (found) => found.map(({ id }) => id));

const kOptimisation = ['series', 'parameters', 'results', 'compared', 'progress', 'histories', 'dotty', 'good-sets', 'failures', 'run', 'summary'];
/** Names are text wherever they stand, tables that open later and tooltips included. */
async function checkHostile(page) {
  const shown = await page.evaluate(() => document.getElementById('report').textContent);
  for (const text of sample.kHostile) assert.ok(shown.includes(text), text);
  for (const figure of (await page.$$('figure')).slice(-4)) {
    await figure.scrollIntoViewIfNeeded();
    await (await figure.$('.canvas')).hover({ position: { x: 180, y: 60 } });
  }
  await page.$$eval('details', (all) => all.forEach((details) => { details.open = true; }));
  assert.equal(await page.locator('#report :is(script, img, svg, iframe)').count(), 0);
  assert.equal(await page.evaluate(() => window.harm), undefined);
}

const cases = {
  'a search': [sample.dataOf('optimisation'), 3 + 2 + 2 + 2 + 2, kOptimisation],
  'a search by few evaluations with two series': [sample.twoSeries(), 6 + 1 + 2 + 2 + 2,
    kOptimisation.filter((id) => id !== 'failures')],
  'an uncertainty analysis': [sample.dataOf('uncertainty'), 1 + 2 + 3 + 1 + 5 + 2, ['band', 'sample-sensitivity', 'series', 'parameters', 'results', 'compared', 'progress', 'distributions', 'dotty', 'failures', 'run', 'summary']],
  'GLUE': [sample.dataOf('glue'), 1 + 4 + 3 + 1 + 5 + 2 + 2, ['band', 'glue', 'sample-sensitivity', 'series', 'parameters', 'results', 'compared', 'progress', 'distributions', 'dotty', 'failures', 'run', 'summary']],
  'DREAM': [sample.dataOf('dream'), 2 + 12 + 4 + 3 + 2, ['band', 'posterior', 'series', 'parameters', 'results', 'compared', 'progress', 'distributions', 'dotty', 'failures', 'run', 'summary']],
  'DREAM with hostile names': [sample.hostile(sample.dataOf('dream')), 23, null, true],
  'a sensitivity analysis': [sample.dataOf('sensitivity'), 4 + 3, ['sensitivity', 'series', 'parameters', 'results', 'compared', 'run', 'summary']],
  'Sobol indices': [sample.dataOf('sobol'), 4 + 5 + 6 + 2, ['sobol', 'series', 'parameters', 'results', 'compared', 'progress', 'distributions', 'dotty', 'run', 'summary']],
  'Sobol indices with hostile names': [sample.hostile(sample.dataOf('sobol')), 17, null, true],
  'a Morris screening': [sample.dataOf('screening'), 4 + 3, ['morris', 'series', 'parameters', 'results', 'compared', 'run', 'summary']],
  'scenario runs': [sample.dataOf('scenarios'), 4 + 1 + 2, ['series', 'parameters', 'results', 'compared', 'progress', 'dotty', 'run', 'summary']],
  'a run without an evaluation': [sample.empty(), 0, ['run']],
  'a run whose evaluations all failed': [sample.dataOf('allFailed'), 0, ['parameters', 'results', 'failures', 'run', 'summary']],
  'a search by four objectives with hostile names': [sample.hostile(sample.withTables(4)), 5 + 2 + 2 + 11, ['front', 'repetitions', 'estimate', ...kOptimisation], true],
  'an uncertainty analysis with hostile names': [sample.hostile(sample.dataOf('uncertainty')), 14, null, true],
  'a Morris screening with hostile names': [sample.hostile(sample.dataOf('screening')), 7, null, true],
  'a sensitivity analysis with hostile names': [sample.hostile(sample.dataOf('sensitivity')), 7, null, true],
};

for (const [name, [data, charts, expected, text]] of Object.entries(cases)) {
  test(`${name}: every chart drawn, wide and narrow, light and dark`, async () => {
    await withReport(data, { colorScheme: 'light' }, async (page) => {
      assert.equal(await page.locator('.broken').count(), 0);
      assert.equal(await page.locator('figure').count(), charts);
      if (expected) assert.deepEqual(await sectionsOf(page), expected);
      for (const width of [1280, 400]) {
        await page.setViewportSize({ width, height: 900 });
        await page.evaluate(() => new Promise((painted) => { requestAnimationFrame(() => requestAnimationFrame(painted)); }));
        assert.deepEqual(await blankCharts(page), []);
        assert.equal(await page.evaluate(() => document.documentElement.scrollWidth), width, 'nothing reaches out of the window');
        await page.emulateMedia({ colorScheme: 'dark' });
      }
      if (text) await checkHostile(page);
    });
  });
}
