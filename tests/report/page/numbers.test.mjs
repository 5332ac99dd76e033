// What the page derives for drawing, against values computed by hand.
import assert from 'node:assert/strict';
import { createRequire } from 'node:module';
import { join } from 'node:path';
import { test } from 'node:test';
import { fileURLToPath } from 'node:url';

const { buildSync } = createRequire(join(process.env.MIREVO_PAGE_PACKAGES, 'test.js'))('esbuild');
const page = fileURLToPath(new URL('../../../src/report/page/', import.meta.url));
async function load(file) {
  const { outputFiles } = buildSync({ entryPoints: [join(page, file)], bundle: true, format: 'esm', write: false });
  return import(`data:text/javascript;base64,${Buffer.from(outputFiles[0].text).toString('base64')}`);
}
const numbers = await load('numbers.ts');
const lines = await load('lines.ts');
const ticks = await load('ticks.ts');
const format = await load('format.ts');

test('numbers derived from evaluations', () => {
  const values = [5, null, 3, 4, 3, 9];
  assert.deepEqual(numbers.withoutRepeats([2, 1, null, 1, 1], [[5, 6, 6, 7, 6]]), [2, 1, null, 1, null]);
  assert.deepEqual(numbers.bestSoFar([null, ...values]), [null, 5, 5, 3, 3, 3, 3]);
  assert.deepEqual(numbers.placesOfBest([null, ...values]), [null, 1, 1, 3, 3, 5, 5], 'of equals the last');
  assert.deepEqual(numbers.bestShare(values, 0.1), [4, 2, 3, 0, 5], 'of equals the last is the best; ten are taken where there are ten');
  assert.equal(numbers.bestShare(Array.from({ length: 500 }, (_, i) => i), 0.1).length, 50);
  assert.equal(numbers.quantile([1, 2, 3, 4], 0.5), 2.5);
  assert.deepEqual(numbers.durationCurve([1, null, 7, 4]), [[25, 7], [50, 4], [75, 1]]);
  const places = [0, 1, 2, 3];
  assert.equal(Math.round(numbers.correlation([1, 2, 3, 4], [-2, -4, -6, -8], places) * 1e9), -1e9);
  assert.equal(numbers.correlation([1, 1, 1, 1], [1, 2, 3, 4], places), null);
  assert.equal(numbers.correlation([0.1, 0.1, 0.1, 0.1], [1, 2, 3, 4], places), null, 'rounding is no variation');
  const parameter = { lower: 1, upper: 100, transformation: 'logarithmic' };
  assert.equal(numbers.placeBetweenBounds(parameter, 10), 0.5);
  assert.equal(numbers.placeBetweenBounds({ ...parameter, transformation: 'none' }, 50.5), 0.5);
  assert.equal(numbers.placeBetweenBounds({ ...parameter, lower: 100 }, 10), null);
});

test('histograms count every value once, on either scale', () => {
  for (const [values, log] of [[[1, 2, 3, 4, 5, 6, 7, 8, 9, null, 10], false], [[1, 10, 100, 1000], true], [[2, 2, 2], false], [[], false]]) {
    const total = numbers.histogram(values, log).reduce((sum, bin) => sum + bin.count, 0);
    assert.equal(total, numbers.finite(values).length, String(values));
  }
});

test('thinning keeps the reach of the points and no more than its cells', () => {
  const x = Array.from({ length: 50000 }, (_, index) => Math.sin(index) * 100);
  const y = x.map((value, index) => value * Math.cos(index * 7));
  const kept = numbers.thin(x, y, 50, 40);
  assert.ok(kept.length <= 51 * 41);
  const reach = (column, places) => [Math.min, Math.max].map((pick) => places.reduce((far, place) => pick(far, column[place]), column[places[0]]));
  const all = x.map((_, index) => index);
  reach(x, kept).forEach((edge, side) => assert.ok(Math.abs(edge - reach(x, all)[side]) < 4));
  assert.deepEqual(numbers.thin([1, 1, 2, null], [1, 1, 900, 1], 10, 10, 100), [0], 'above the top nothing is drawn');
  assert.equal(numbers.axisTop(Array.from({ length: 100 }, (_, index) => index)), Infinity);
  assert.ok(numbers.axisTop([...Array.from({ length: 100 }, (_, index) => index), 1e6]) < 200);
});

test('lines and ticks that a reader can tell', () => {
  const { times, values, dots } = lines.lineOf([0, 1, 2, 3, 10, 20, 21], [1, null, 2, 3, 4, 5, 6], [3, 10]);
  assert.deepEqual([times, values], [[0, 2, 3, 6.5, 10, 15, 20, 21], [1, 2, 3, null, 4, null, 5, 6]]);
  assert.deepEqual(dots, [[10, 4]], 'a value alone');
  assert.deepEqual([0, 6, 14].map((time) => lines.nearest([0, 5, 9], time)), [0, 1, 2]);
  assert.deepEqual(ticks.logTicks(4, 9), [4, 5, 6, 7, 8, 9]);
  assert.deepEqual(ticks.logTicks(0.9, 2000), [1, 10, 100, 1000]);
  assert.deepEqual(ticks.logTicks(0, 1), []);
});

test('numbers as they are written', () => {
  const written = [[null, '\u2013'], [0, '0'], [-1.5, '\u22121.5'], [123456, '123500'], [1e9, '1e9'], [0.00001234, '1.234e\u22125'], [0.1 + 0.2, '0.3']];
  for (const [value, text] of written) assert.equal(format.number(value), text);
  assert.equal(format.count(1234567), '1\u202f234\u202f567');
  const took = [['2026-11-21 07:00:00', '2026-11-21 07:01:30', '90 s'], ['2026-11-20 07:00:00', '2026-11-23 08:00:00', '3 d 1 h'], [null, 'x', null]];
  for (const [from, to, text] of took) assert.equal(format.duration(from, to), text);
});
