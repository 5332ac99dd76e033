// Opens a report in a headless Chromium and prints how long it takes, three times, and how smoothly it scrolls: the time
// between two frames while the wheel turns from top to bottom. From the root of the project:
//   build/release/large_report large.html
//   MIREVO_PAGE_PACKAGES=build/npm/node_modules node bench/report/measure.mjs large.html
import { statSync } from 'node:fs';
import { resolve } from 'node:path';

process.env.MIREVO_PAGE_PACKAGES = resolve(process.env.MIREVO_PAGE_PACKAGES);
const { openBrowser } = await import('../../tests/report/page/browser.mjs');

const path = resolve(process.argv[2]);
console.log(`${(statSync(path).size / 1e6).toFixed(1)} MB`);
const browser = await openBrowser();
for (let time = 1; time <= 3; ++time) {
  const { page } = await browser.openFile(path, { width: 1400 });
  const [opened, shown, height] = await page.evaluate(() => [document.documentElement.dataset.drawn,
    document.querySelectorAll('figure').length, document.documentElement.scrollHeight]);
  console.log(`opened, with what is in view drawn: ${opened} ms (${shown} charts, ${height} pixels high)`);
  if (time === 3) {
    await page.evaluate(() => {
      window.frames = [];
      let last = performance.now();
      const next = (now) => { window.frames.push(now - last); last = now; requestAnimationFrame(next); };
      requestAnimationFrame(next);
    });
    await page.mouse.move(700, 450);
    const from = Date.now();
    for (let top = 0; top < height; top += 120) {
      await page.mouse.wheel(0, 120);
      await page.waitForTimeout(16);
    }
    const frames = (await page.evaluate(() => window.frames)).sort((a, b) => a - b);
    const at = (share) => Math.round(frames[Math.floor(share * (frames.length - 1))]);
    console.log(`scrolled through in ${Date.now() - from} ms: ${frames.length} frames, half of them within ${at(0.5)} ms, 95 % within ${at(0.95)} ms, the longest ${at(1)} ms`);
    const printed = Date.now();
    await page.evaluate(() => dispatchEvent(new Event('beforeprint')));
    const pictures = await page.locator('canvas.picture').count();
    await page.evaluate(() => dispatchEvent(new Event('afterprint')));
    console.log(`${pictures} charts ready for print in ${Date.now() - printed} ms`);
  }
  await page.context().close();
}
await browser.close();
