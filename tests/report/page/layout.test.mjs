// Whether texts fit, on a wide and on a narrow screen: in the page, and in its charts as they are drawn at that width.
import assert from 'node:assert/strict';
import { test } from 'node:test';
import { openReport } from './open_report.mjs';
import * as sample from './sample_data.mjs';

/** Runs in the page: texts that overlap, are cut off or reach out of the window or their chart. */
function misfits() {
  const found = [];
  document.head.append(Object.assign(document.createElement('style'), { textContent: '.table, pre { max-height: none !important }' })); // what scrolls
  const label = (text) => text.trim().slice(0, 40);
  const overlap = (a, b) => Math.min(a.right, b.right) - Math.max(a.left, b.left) > 2 && Math.min(a.bottom, b.bottom) - Math.max(a.top, b.top) > 2;
  const compare = (texts, where) => texts.forEach(([text, a], index) => texts.slice(index + 1).forEach(([other, b]) => {
    if (overlap(a, b)) found.push(`${where}: ${label(text)} | ${label(other)}`);
  }));

  for (const block of document.querySelectorAll('.head, section, footer')) {
    const texts = [];
    const walker = document.createTreeWalker(block, NodeFilter.SHOW_TEXT);
    for (let node = walker.nextNode(); node; node = walker.nextNode()) {
      const parent = node.parentElement;
      if (node.data.trim() === '' || parent.closest('.canvas, select') || !parent.checkVisibility()) continue;
      const range = document.createRange();
      range.selectNodeContents(node);
      for (const box of range.getClientRects()) texts.push([node.data, box]);
      if (range.getBoundingClientRect().right > innerWidth + 1 && !parent.closest('.table, pre')) found.push(`out of the window: ${label(node.data)}`);
    }
    compare(texts, block.id || block.tagName);
    for (const element of block.querySelectorAll('.tile dd, button, .state, h1, h2, .flag')) {
      if (element.scrollWidth > element.clientWidth + 1 && element.clientWidth > 0) found.push(`cut off: ${label(element.textContent)}`);
    }
  }
  const paper = document.body.appendChild(document.createElement('div'));
  for (const figure of document.querySelectorAll('figure')) {
    const title = `${figure.closest('section').id}/${figure.querySelector('figcaption').textContent}`;
    paper.innerHTML = window.drawingOf(figure, figure.querySelector('.canvas').clientWidth);
    const edge = paper.firstChild.getBoundingClientRect();
    const texts = [...paper.querySelectorAll('text:not([clip-path] text)')].map((element) => [element.textContent, element.getBoundingClientRect(), /matrix/.test(element.getAttribute('transform'))]);
    for (const [text, box] of texts) {
      const beyond = Math.max(edge.left - box.left, box.right - edge.right, edge.top - box.top, box.bottom - edge.bottom);
      if (beyond > 4) found.push(`${title}, ${Math.round(beyond)} pixels out of the chart: ${text}`);
    }
    compare(texts.filter(([, , turned]) => !turned), title);
  }
  paper.remove();
  return found;
}

const cases = {
  'search by three objectives': sample.withTables(3), 'search with two series': sample.twoSeries(), 'search of 14 parameters': sample.manyParameters(14),
  uncertainty: sample.dataOf('uncertainty'), sensitivity: sample.dataOf('sensitivity'), screening: sample.dataOf('screening'), scenarios: sample.dataOf('scenarios'),
};

for (const [name, data] of Object.entries(cases)) {
  test(`${name}: texts fit at 1400 and at 390 pixels`, async () => {
    const found = [];
    for (const width of [1400, 390]) {
      const { page, complaints } = await openReport(data, { width, height: 844 });
      found.push(...(await page.evaluate(misfits)).map((misfit) => `${width}: ${misfit}`), ...complaints);
      assert.equal(await page.evaluate(() => document.documentElement.scrollWidth), width);
      await page.context().close();
    }
    assert.deepEqual(found, []);
  });
}

test('a short time axis says which year it is', async () => {
  const data = sample.dataOf('optimisation');
  for (const [start, hours, values] of [['1981-10-05T06:00:00', 1, 14], ['1981-10-03T00:00:00', 24, 20], ['1981-03-12T00:00:00', 24, 200]]) {
    for (const name of ['observed', 'initial', 'best']) data.series[0][name] = Array.from({ length: values }, (_, index) => 5 + index % 7);
    Object.assign(data.series[0], { start, step: hours * 3600000, count: values, period: null });
    const { page } = await openReport(data, { width: 390 });
    for (const width of [330, 1000]) {
      assert.match(await page.evaluate((wide) => window.drawingOf(document.querySelector('#series figure'), wide), width), />[^<]*\b1981\b/, `${start}, ${width}`);
    }
    await page.context().close();
  }
});

/** Runs in the page: what has the focus, and what is wrong with how it shows. */
function focused() {
  const element = document.activeElement;
  const { outlineStyle, outlineWidth } = getComputedStyle(element);
  const { left, right, top, bottom } = element.getBoundingClientRect();
  const all = [...document.querySelectorAll('a, button, select, summary, [tabindex="0"]')].filter((one) => one.checkVisibility());
  const faults = [outlineStyle === 'none' || outlineWidth === '0px' ? 'no outline' : '', left < 0 || right > innerWidth + 1 ? 'beside the window' : '',
    bottom < 0 || top > innerHeight ? 'out of view' : ''].filter(Boolean);
  return { index: all.indexOf(element), count: all.length, faults: faults.map((fault) => `${fault}: ${element.outerHTML.slice(0, 80)}`) };
}

for (const [width, colorScheme] of [[1400, 'light'], [390, 'dark']]) {
  test(`${width} pixels, ${colorScheme}: everything is reached by the Tab key in order, and is seen to have the focus`, async () => {
    const { page } = await openReport(sample.dataOf('optimisation'), { width, colorScheme });
    for (let step = 0, last = 1; step < last; ++step) {
      await page.keyboard.press('Tab');
      const { index, count, faults } = await page.evaluate(focused);
      assert.deepEqual([index, ...faults], [step]);
      last = count;
    }
    const zoom = () => page.evaluate(() => window.drawnOptions(document.querySelector('#series figure')).dataZoom.slice(0, 2).map(({ start, end }) => [start, end]));
    await page.locator('#series .canvas').first().focus();
    for (const [key, span] of [['+', [25, 75]], ['ArrowRight', [37.5, 87.5]], ['-', [0, 100]], ['+', [25, 75]], ['Escape', [0, 100]]]) {
      await page.keyboard.press(key);
      assert.deepEqual(await zoom(), [span, span], key);
    }
    await page.locator('#series button[aria-pressed]').first().press('Space');
    assert.equal(await page.locator('#series button[aria-pressed]').first().getAttribute('aria-pressed'), 'true');
    await page.locator('#series summary').first().press('Enter');
    await page.locator('#series details[open] table').waitFor();
    await page.context().close();
  });
}
