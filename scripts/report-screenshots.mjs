// node report-screenshots.mjs <report.html> <folder>: pictures of a report's parts, those that it has.
import { join } from 'node:path';
import { openBrowser } from '../tests/report/page/browser.mjs';

const [report, folder] = process.argv.slice(2);
const kPictures = [
  ['report-series', 'light', '#series'],
  ['report-dotty', 'dark', '#dotty'],
];

const browser = await openBrowser();
try {
  for (const colorScheme of ['light', 'dark']) {
    const { page, complaints } = await browser.openFile(report, { width: 1200, height: 1000, colorScheme });
    if (complaints.length > 0) throw new Error(complaints.join('\n'));
    for (const [name, scheme, part] of kPictures) {
      const element = await page.$(part);
      if (scheme === colorScheme && element) await element.screenshot({ path: join(folder, `${name}.png`) });
    }
    await page.context().close();
  }
} finally {
  await browser.close();
}
