// The manual for the browser, opened from disk as a reader does. Environment: that of tests/report/page/browser.mjs, and MIREVO_SITE_FOLDER.
import assert from 'node:assert/strict';
import { readdirSync } from 'node:fs';
import { join } from 'node:path';
import { after, before, test } from 'node:test';
import { pathToFileURL } from 'node:url';
import { openBrowser } from '../report/page/browser.mjs';

const kSite = process.env.MIREVO_SITE_FOLDER;
let browser;
before(async () => { browser = await openBrowser(); });
after(async () => { await browser.close(); });

async function open(page, more) {
  return browser.openFile(join(kSite, page), { isReady: () => document.readyState === 'complete', ...more });
}

test('a keyword is found from disk, and leads to its row of the reference', async () => {
  const { page, complaints } = await open('index.html');
  await page.fill('.sidebar-search', 'Max_No_Evaluations');
  await page.press('.sidebar-search', 'Enter');
  await page.waitForSelector('text=Search finished');
  const hits = await page.$$eval('#search-results li a', (links) => links.map((link) => link.textContent));
  assert.equal(hits[0], 'Max_No_Evaluations');
  assert.match(await page.getAttribute('#search-results li a', 'href'), /setup-reference\.html#keyword-.*-Max_No_Evaluations$/);
  assert.equal(hits.at(-1), 'Changelog');
  assert.ok(hits.includes('Setup reference') && hits.includes('When a search stops'), hits.join());

  await page.click('#search-results li a >> text=When a search stops');
  await page.waitForURL(/stopping\.html/);
  await page.click('a.keyword >> text=Max_No_Evaluations');
  await page.waitForURL(/setup-reference\.html/);
  const row = await page.waitForSelector('tr:has(:target)', { state: 'attached' });
  assert.match(await row.textContent(), /Budget of the search/);
  assert.deepEqual(complaints, []);
  await page.context().close();
});

test('no page is wider than a phone or a window, or needs the network', async () => {
  for (const width of [390, 1280]) {
    const { page, complaints } = await open('index.html', { width });
    for (const name of readdirSync(kSite, { recursive: true }).filter((file) => file.endsWith('.html'))) {
      await page.goto(pathToFileURL(join(kSite, name)).href);
      assert.deepEqual(complaints, [], name);
      assert.equal(await page.evaluate(() => document.documentElement.scrollWidth), width, name);
    }
    await page.context().close();
  }
});

test('the colours are those that the reader prefers, and print is black on white', async () => {
  const colour = () => getComputedStyle(document.body).backgroundColor;
  const { page } = await open('docs/tutorial.html', { colorScheme: 'dark' });
  assert.equal(await page.evaluate(colour), 'rgb(19, 20, 22)');
  await page.emulateMedia({ media: 'print', colorScheme: 'dark' });
  assert.equal(await page.evaluate(() => getComputedStyle(document.querySelector('article p')).color), 'rgb(0, 0, 0)');
  await page.context().close();
});
