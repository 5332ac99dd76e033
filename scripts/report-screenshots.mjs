// node report-screenshots.mjs <report.html> <folder> <name>: pictures of a report's parts, those that it has.
import { join } from 'node:path';
import { openBrowser } from '../tests/report/page/browser.mjs';

const [report, folder, prefix] = process.argv.slice(2);
const kPictures = [
  ['series', 'light', '#series'],
  ['dotty', 'dark', '#dotty'],
];

const browser = await openBrowser();
try {
  for (const colorScheme of ['light', 'dark']) {
    const { page, complaints } = await browser.openFile(report, { width: 1200, height: 1000, colorScheme });
    if (complaints.length > 0) throw new Error(complaints.join('\n'));
    for (const [name, scheme, part] of kPictures) {
      const element = await page.$(part);
      if (scheme === colorScheme && element) await element.screenshot({ path: join(folder, `${prefix}-${name}.png`) });
    }
    await page.context().close();
  }
} finally {
  await browser.close();
}
