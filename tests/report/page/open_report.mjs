// A report in a browser of its own for the tests of one file, and what they ask of it.
import assert from 'node:assert/strict';
import { after, before } from 'node:test';
import { openBrowser } from './browser.mjs';

let browser;
before(async () => { browser = await openBrowser(); });
after(() => browser.close());

export const openReport = (data, more) => browser.openReport(data, more);

/** Opens the report of the data; the page must not have complained when `check` has ended. */
export async function withReport(data, more, check) {
  const { page, complaints } = await openReport(data, more);
  try {
    await check(page);
    assert.deepEqual(complaints, []);
  } finally {
    await page.context().close();
  }
}

/** Titles of the charts that are not drawn: without a canvas, or with one of a single colour. */
export const blankCharts = (page) => page.$$eval('figure', (figures) => figures.filter((figure) => {
  const canvas = figure.querySelector('canvas');
  if (!figure.dataset.drawn || !canvas) return true;
  const copy = new OffscreenCanvas(canvas.width, canvas.height).getContext('2d', { willReadFrequently: true });
  copy.drawImage(canvas, 0, 0);
  const pixels = new Uint32Array(copy.getImageData(0, 0, canvas.width, canvas.height).data.buffer);
  return new Set(pixels).size < 10;
}).map((figure) => figure.querySelector('figcaption').textContent));

/** From where to where a chart shows its data, in percent. */
export const zoomOf = (page, figure) => page.evaluate((element) => window.drawnOptions(element).dataZoom.map(({ start, end }) => [start, end])[0], figure);
