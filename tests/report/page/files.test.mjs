// Every figure as a file, taken as a reader takes it.
import assert from 'node:assert/strict';
import { readFileSync } from 'node:fs';
import { test } from 'node:test';
import { openReport } from './open_report.mjs';
import * as sample from './sample_data.mjs';

/** The file that the browser saves when Enter is pressed on a button. */
async function saved(page, button) {
  const [file] = await Promise.all([page.waitForEvent('download'), button.press('Enter')]);
  return { name: file.suggestedFilename(), text: readFileSync(await file.path(), 'utf8') };
}

// Browsers save only so many files in a row.
const keepFiles = (page) => page.evaluate(() => {
  URL.createObjectURL = (blob) => { window.kept = { blob }; return '#'; };
  HTMLAnchorElement.prototype.click = function click() { window.kept.name = this.download; };
});
const kept = (button) => button.evaluate((element) => { element.click(); return window.kept.blob.text().then((text) => ({ name: window.kept.name, text })); });

/** Cells of a file whose lines end with CR and LF, quotes as in RFC 4180. */
const cellsOf = (text) => text.trimEnd().split('\r\n').map((line) => line.match(/("([^"]|"")*"|[^,"]*)(,|$)/g).slice(0, line.endsWith(',') ? undefined : -1));

for (const name of ['optimisation', 'uncertainty', 'dream', 'sensitivity', 'screening', 'sobol']) {
  test(`${name}: every figure is taken as a drawing and as a table, whatever the names`, async () => {
    const data = name === 'optimisation' ? sample.withTables(4) : sample.dataOf(name);
    const { page, complaints } = await openReport(sample.hostile(data), { colorScheme: 'dark' });
    const names = new Set();
    await keepFiles(page);
    for (const figure of await page.$$('figure')) {
      const [svg, csv] = [await kept(await figure.$('.take >> nth=0')), await kept(await figure.$('.take >> nth=1'))];
      assert.match(`${svg.name} ${csv.name}`, /^basin_[a-z-]+_[^ ]+\.svg basin_[a-z-]+_[^ ]+\.csv$/);
      names.add(svg.name);
      const drawn = await page.evaluate((text) => {
        const root = new DOMParser().parseFromString(text, 'image/svg+xml').documentElement;
        return [root.tagName, root.querySelector('rect').getAttribute('fill'), root.querySelectorAll('path, polyline, rect').length, root.querySelectorAll('script, img, [onload]').length];
      }, svg.text);
      assert.deepEqual([drawn[0], drawn[1], drawn[2] > 4, drawn[3]], ['svg', '#ffffff', true, 0], svg.name);
      const [head, ...rows] = cellsOf(csv.text);
      assert.ok(rows.length > 0 && head.length > 1, csv.name);
      for (const row of rows) assert.equal(row.length, head.length, `${csv.name}: ${row}`);
    }
    assert.ok(names.size > 5);
    assert.deepEqual(complaints, []);
    await page.context().close();
  });
}

test('a table is saved by keyboard, with every value in full, times as ISO, and its units', async () => {
  const data = sample.dataOf('optimisation');
  Object.assign(data.series[0], { unit: 'm\u00b3/s', thinned: true });
  data.series[0].observed[1] = 1234567.125;
  data.series[0].best[2] = -0.00001234;
  const { page } = await openReport(data);
  const { name, text } = await saved(page, await page.$('#series figure .take >> nth=1'));
  assert.match(name, /^basin_series_.*_thinned\.csv$/);
  const rows = cellsOf(text);
  assert.deepEqual([rows[0][0], rows[0][1]], ['Time,', 'observed (m\u00b3/s),']);
  assert.match(rows[1][0], /^\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d,$/);
  assert.deepEqual([rows.length, rows[2][1], rows[3][3]], [1 + data.series[0].observed.length, '1234567.125,', '-0.00001234,']);
  await keepFiles(page);
  const pairs = await kept(await page.$('#series .grid .take >> nth=1'));
  assert.equal(cellsOf(pairs.text).length, 1 + data.series[0].observed.length, 'every pair, though one is drawn of those that nearly coincide');
  await page.locator('#series details.view').last().evaluate((details) => { details.open = true; });
  const below = await kept(await page.waitForSelector('#series details.view .grid .take >> nth=1'));
  assert.ok(below.name.startsWith(`basin_series_${data.series[0].measure.replaceAll(' ', '-')}_`), below.name);
  const sets = cellsOf((await kept(await page.$('#good-sets .take >> nth=1'))).text);
  assert.deepEqual([sets[0].join(''), Number(sets[1].at(-1)).toPrecision(6)], ['Evaluation,a,b,Aggregate', data.best.aggregate.toPrecision(6)], 'the best set comes first');
  await page.context().close();
});
