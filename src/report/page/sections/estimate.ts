// How well the observations determine the parameters that a search by residuals has found.
import type { Covariance, Maybe, Parameter, ReportData } from '../data';
import { make } from '../dom';
import { number, percent } from '../format';
import { placeBetweenBounds } from '../numbers';
import { findingList, isolated, type Finding, type Section } from './section';
import { covarianceContent } from './sensitivity';

const kWell = 0.1; // limits that are so much of the range between the bounds apart
const kHardly = 0.5;
const kTied = 0.95; // a correlation
const kMostNamed = 12;

interface Width {
  name: string;
  share: Maybe; // of the limits, in the range between the bounds on the scale of the search
}

function widthsOf(parameters: Parameter[], { names, lower95, upper95 }: Covariance): Width[] {
  return names.map((name, index) => {
    const parameter = parameters.find((candidate) => candidate.name === name);
    const [low, high] = [lower95, upper95].map((limits) => (parameter ? placeBetweenBounds(parameter, limits[index] ?? null) : null)) as [Maybe, Maybe];
    return { name, share: low === null || high === null ? null : high - low };
  }).sort((a, b) => (a.share ?? Infinity) - (b.share ?? Infinity));
}

function listed<Item>(items: Item[], text: (item: Item) => string): string {
  const more = items.length - kMostNamed;
  return `${items.slice(0, kMostNamed).map(text).join(', ')}${more > 0 ? ` and ${more} more` : ''}`;
}

function tiedPairs({ names, correlation, largestCorrelations }: Covariance): { first: string; second: string; value: number }[] {
  const pairs = largestCorrelations ?? correlation.flatMap((row, i) => row.slice(0, i).map((value, j) => ({ first: names[j]!, second: names[i]!, value })));
  return pairs.flatMap(({ first, second, value }) => (value !== null && Math.abs(value) > kTied ? [{ first, second, value }] : []))
    .sort((a, b) => Math.abs(b.value) - Math.abs(a.value));
}

function findings(data: ReportData, covariance: Covariance): Finding[] {
  const widths = widthsOf(data.parameters, covariance);
  const within = (from: number, to: number) => widths.filter(({ share }) => share !== null && share >= from && share < to);
  const named = (some: Width[]) => listed(some, ({ name, share }) => `${isolated(name)} (${percent(share, 2)})`);
  const [well, hardly] = [within(0, kWell), within(kHardly, Infinity)];
  const atBound = data.parameters.filter(({ nearBound, name }) => nearBound && covariance.names.includes(name));
  const tied = tiedPairs(covariance);
  const found: Finding[] = [];
  if (well.length > 0) found.push({ kind: 'good', text: `Well determined, their limits less than ${percent(kWell)} of the range between the bounds apart: ${named(well)}.` });
  if (hardly.length > 0) {
    found.push({ kind: 'warning', text: `Hardly determined, their limits at least ${percent(kHardly)} of the range apart: ${named(hardly)}. Such a parameter can be fixed, or needs other observations.` });
  }
  if (tied.length > 0) {
    found.push({ kind: 'warning', text: `The observations hardly tell apart: ${listed(tied, ({ first, second, value }) => `${isolated(first)} and ${isolated(second)} (correlation ${number(value, 3)})`)}. One of each two can be fixed.` });
  }
  if (atBound.length > 0) {
    found.push({ kind: 'warning', text: `At a bound, where the limits say little: ${listed(atBound, ({ name, nearBound }) => `${isolated(name)} (${nearBound})`)}.` });
  }
  return found;
}

export function estimateSection(data: ReportData): Section | null {
  const { estimate } = data;
  if (!estimate || estimate.names.length + estimate.leftOut.length === 0) return null;
  return {
    id: 'estimate',
    title: 'How well the parameters are determined',
    content: [
      findingList(findings(data, estimate)),
      ...covarianceContent(data, estimate, make('li', {}, 'The set is the one of the least sum of squares: a better one elsewhere is not covered.')),
    ],
  };
}
