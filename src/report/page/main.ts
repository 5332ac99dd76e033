// Builds the page from the data that the program wrote into it.
import { drawingOf, drawInTime, drawnOptions } from './chart';
import { readReportData, type ReportData } from './data';
import { make } from './dom';
import { nameFilesAfter } from './figure_files';
import { switchTheme } from './look';
import { comparisonSection } from './sections/comparisons';
import { estimateSection } from './sections/estimate';
import { frontSection } from './sections/front';
import { glueSection } from './sections/glue';
import { historySection } from './sections/histories';
import { morrisSection } from './sections/morris';
import { failureSection, head, parameterSection, resultSection, runSection, summarySection } from './sections/overview';
import { posteriorSection } from './sections/posterior';
import { repetitionSection } from './sections/repetitions';
import { dottySection, goodSetsSection, progressSection } from './sections/search';
import { sampleSection } from './sections/sample';
import type { Section } from './sections/section';
import { sensitivitySection } from './sections/sensitivity';
import { seriesSection } from './sections/series';
import { sobolSection } from './sections/sobol';
import { bandSection, distributionSection } from './sections/uncertainty';
import { validationSection } from './sections/validation';

function sections(data: ReportData): Section[] {
  const { task } = data.run;
  const sampled = task !== 'sensitivity' || data.sobol; // a local analysis varies one parameter at a time
  const all = [
    bandSection(data),
    glueSection(data),
    posteriorSection(data),
    frontSection(data),
    repetitionSection(data),
    estimateSection(data),
    sensitivitySection(data),
    morrisSection(data),
    sobolSection(data),
    sampleSection(data),
    validationSection(data),
    seriesSection(data),
    parameterSection(data),
    resultSection(data),
    comparisonSection(data),
    sampled ? progressSection(data) : null,
    task === 'optimisation' ? historySection(data) : null,
    task === 'uncertainty' || data.distributions?.length ? distributionSection(data) : null,
    sampled ? dottySection(data, task === 'uncertainty' ? 'Parameters against objectives' : 'Dotty plots') : null,
    task === 'optimisation' ? goodSetsSection(data) : null,
    failureSection(data),
    runSection(data),
    summarySection(data),
  ];
  return all.filter((section): section is Section => section !== null);
}

function contents(shown: Section[]): HTMLElement {
  const links = new Map(shown.map(({ id, title }) => [id, make('a', { href: `#${id}` }, title)]));
  const current = new IntersectionObserver((entries) => {
    for (const entry of entries) links.get(entry.target.id)?.classList.toggle('current', entry.isIntersecting);
  }, { rootMargin: '-20% 0px -70% 0px' });
  queueMicrotask(() => shown.forEach(({ id }) => current.observe(document.getElementById(id)!)));
  return make('nav', { 'aria-label': 'Contents' }, make('ol', {}, ...[...links.values()].map((link) => make('li', {}, link))),
    make('button', { type: 'button', onclick: switchTheme }, 'Light / dark'));
}

function build(place: HTMLElement): void {
  const data = readReportData(document.getElementById('report-data')!.textContent!);
  nameFilesAfter(data.run.setupName);
  const shown = sections(data);
  place.append(
    contents(shown),
    make('main', {}, head(data),
      ...shown.map(({ id, title, content }) => make('section', { id, 'aria-label': title }, make('h2', {}, title), ...content)),
      make('footer', {}, `${data.program}, ${data.run.reportMade}. Charts drawn with Apache ECharts (Apache License 2.0; its text and those of what it uses stand in the source of this page).`)));
}

const place = document.getElementById('report')!;
try {
  build(place);
  drawInTime(() => {
    document.documentElement.dataset.drawn = String(Math.round(performance.now()));
  });
  Object.assign(window, { drawingOf, drawnOptions });
} catch (error) {
  place.append(make('p', { class: 'broken', role: 'alert' }, `This report cannot be shown: ${error instanceof Error ? error.message : String(error)}`));
  throw error;
}
