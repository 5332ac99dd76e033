// node bundle.mjs <node_modules> <output>: bundles main.ts and report.css with the packages that they import, and puts
// both into report.html. The program later fills in title and data of a run.
import { mkdirSync, readFileSync, writeFileSync } from 'node:fs';
import { createRequire } from 'node:module';
import { dirname, join, resolve } from 'node:path';
import { fileURLToPath } from 'node:url';

const [packages, output] = process.argv.slice(2).map((path) => resolve(path));
const here = dirname(fileURLToPath(import.meta.url));
const { build } = createRequire(join(packages, 'bundle.js'))('esbuild');

async function bundle(entry) {
  const result = await build({
    absWorkingDir: here,
    entryPoints: [entry],
    bundle: true,
    minify: true,
    write: false,
    format: 'iife',
    target: 'es2020',
    charset: 'ascii',
    legalComments: 'inline',
    nodePaths: [packages],
    logLevel: 'warning',
  });
  return result.outputFiles[0].text.trim();
}

// Escapes what would end the enclosing element; in scripts it can only occur in strings and comments.
const inScript = (text) => text.replaceAll('</script', '<\\/script').replaceAll('<!--', '<\\!--');

// The licence texts that must accompany every copy of the bundled packages.
const kLicences = ['echarts/LICENSE', 'echarts/NOTICE', 'zrender/LICENSE', 'tslib/LICENSE.txt'];
const licences = kLicences.map((file) => `${file}\n\n${readFileSync(join(packages, file), 'utf8')}`).join('\n\n');

const parts = {
  '@REPORT_LICENCES@': inScript(licences),
  '@REPORT_STYLES@': await bundle('report.css'),
  '@REPORT_SCRIPT@': inScript(await bundle('main.ts')),
};
let page = readFileSync(join(here, 'report.html'), 'utf8');
for (const [place, text] of Object.entries(parts)) {
  if (page.split(place).length !== 2) throw new Error(`report.html must hold ${place} once`);
  page = page.replace(place, () => text);
}
for (const place of ['@REPORT_TITLE@', '@REPORT_DATA@']) {
  if (page.split(place).length !== 2) throw new Error(`the page must hold ${place} once`);
}
mkdirSync(dirname(output), { recursive: true });
writeFileSync(output, page);
