// A headless browser with a report in it. Environment: MIREVO_PAGE_PACKAGES (node_modules), MIREVO_PAGE_TEMPLATE, and MIREVO_BROWSER where
// Chromium's headless shell is not /usr/bin/chromium-headless-shell.
import { mkdtempSync, readFileSync, rmSync, writeFileSync } from 'node:fs';
import { createRequire } from 'node:module';
import { tmpdir } from 'node:os';
import { join } from 'node:path';
import { pathToFileURL } from 'node:url';

const { chromium } = createRequire(join(process.env.MIREVO_PAGE_PACKAGES, 'test.js'))('playwright-core');

/** `data` in the template, as the program writes them. */
export function reportOf(data) {
  const escaped = JSON.stringify(data).replace(/[<>&\u2028\u2029]/g, (sign) => `\\u${sign.charCodeAt(0).toString(16).padStart(4, '0')}`);
  return readFileSync(process.env.MIREVO_PAGE_TEMPLATE, 'utf8').replace('@REPORT_DATA@', () => escaped).replace('@REPORT_TITLE@', 'Report');
}

export async function openBrowser() {
  const folder = mkdtempSync(join(tmpdir(), 'mirevo-report-'));
  const browser = await chromium.launch({
    executablePath: process.env.MIREVO_BROWSER ?? '/usr/bin/chromium-headless-shell',
    args: ['--no-sandbox', '--disable-gpu', '--disable-quic', '--no-first-run', '--disable-background-networking', '--disable-component-update', '--disable-sync'],
  });

  const isDrawn = () => document.documentElement.dataset.drawn || document.querySelector('.broken');

  /** Opens the file from disk, offline, and waits until it is ready: until all charts of a report are drawn. `complaints` gathers whatever the browser says. */
  async function openFile(path, { width = 1280, height = 900, isReady = isDrawn, ...more } = {}) {
    const context = await browser.newContext({ viewport: { width, height }, offline: true, ...more });
    const page = await context.newPage();
    const complaints = [];
    page.on('console', (message) => complaints.push(`${message.type()}: ${message.text()}`));
    page.on('pageerror', (error) => complaints.push(`error: ${error.message}`));
    page.on('request', (request) => { if (!request.url().startsWith('file:')) complaints.push(`request: ${request.url().slice(0, 100)}`); });
    await page.goto(pathToFileURL(path).href);
    await page.waitForFunction(isReady, null, { timeout: 30000 });
    return { page, complaints };
  }

  let opened = 0;
  async function openReport(data, more) {
    const path = join(folder, `${++opened}.html`);
    writeFileSync(path, reportOf(data));
    return openFile(path, more);
  }

  async function close() {
    await browser.close();
    rmSync(folder, { recursive: true });
  }

  return { openFile, openReport, close };
}
