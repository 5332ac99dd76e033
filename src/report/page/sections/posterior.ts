// What Markov chains have found: whether they have converged, what is known of each parameter before and after the
// observations, the chains themselves, and which parameters trade off.
import { axis, chart, legend, lineEntries, tip, tooltip, type ChartPlan } from '../chart';
import type { Band, Maybe, Posterior, PosteriorDimension, ReportData } from '../data';
import { make, shorten, table } from '../dom';
import { count, counted, number, percent } from '../format';
import { finite } from '../numbers';
import { logRange } from '../ticks';
import { heatmap } from './heatmap';
import { pairPlots } from './pairs';
import { grid, heading, isolated, paragraph, type Section } from './section';
import type { CustomApi } from './uncertainty';

const kMostLines = 8; // dimensions with a line of their own
const kMostGrown = 60; // dimensions with charts of their own
const kWanted = 0.9; // share of what is observed that a band of everything should hold
const kAround = 0.05;
const kChance = 0.025; // a share farther from it than would come by chance so often, on either side, is told

const sentence = (text: string) => (/[.!?]$/.test(text) ? text : `${text}.`);

function finding(text: string, kind: string): HTMLElement {
  return make('li', { class: kind }, sentence(text));
}

function verdict(posterior: Posterior): Node[] {
  const good = posterior.state === 'reached';
  const findings = posterior.findings
    ? posterior.findings.map((text) => finding(text, good ? 'good' : 'warning'))
    : [finding(posterior.generationCount > posterior.burnIn + 3 ? 'The table of the posterior cannot be read: whether the chains have converged is not known'
      : 'There is no posterior: the chains have not come far enough beyond burn-in', 'warning')];
  const rates = finite(posterior.chainAcceptance);
  const spread = rates.length > 1 ? `; ${percent(Math.min(...rates))} to ${percent(Math.max(...rates))} by chain` : '';
  return [
    make('ul', { class: 'findings' }, ...findings, ...posterior.advice.map((text) => finding(text, ''))),
    paragraph(`${counted(posterior.chains, 'chain')} of ${counted(posterior.generationCount, 'generation')}; the first ${count(posterior.burnIn)} are burn-in and left out, which leaves ${counted(posterior.states, 'state')}.${
      posterior.acceptance === null ? '' : ` ${percent(posterior.acceptance)} of the proposals behind burn-in were accepted${spread}.`}`),
  ];
}

type Check = 'rHats' | 'effectiveSizes';

const kNotMoved = 'chains that have not moved, or have too few states, have none';

/** How R-hat or the effective sample sizes of the worst dimensions went on, and where they are to be. */
function checkPlan(posterior: Posterior, of: Check, limit: number, title: string, note: string): ChartPlan {
  const { checkedRuns, dimensions } = posterior;
  const isRHat = of === 'rHats';
  const last = (dimension: PosteriorDimension) => dimension[of][checkedRuns.length - 1] ?? (isRHat ? Infinity : 0);
  const known = dimensions.filter((dimension) => finite(dimension[of]).length > 0);
  const shown = known.sort((a, b) => (isRHat ? last(b) - last(a) : last(a) - last(b))).slice(0, kMostLines);
  const all = finite(shown.flatMap((dimension) => dimension[of]));
  const log = isRHat && Math.max(...all, 1) > 3;
  return {
    title,
    note: `${note} Dashed: ${isRHat ? 'at most' : 'at least'} ${number(limit)} is wanted.${shown.length < known.length ? ` The worst ${count(shown.length)} of ${count(known.length)} are drawn.` : ''}`,
    height: 300,
    small: true,
    option: (look) => ({
      legend: legend(look, { data: lineEntries(shown.map(({ name }) => name)), itemWidth: 22, textStyle: { color: look.ink, width: 110, overflow: 'truncate' } }),
      grid: { left: 44, right: 18, top: 36, bottom: 34 },
      xAxis: axis(look, { name: 'model runs', nameGap: 22, integer: true, splitNumber: 4, min: checkedRuns.length > 1 ? 'dataMin' : undefined, max: checkedRuns.length > 1 ? 'dataMax' : undefined }),
      yAxis: axis(look, { splitNumber: 4, ...(log ? logRange([[1, limit], all])
        : isRHat ? { min: Math.min(0.99, ...all), max: Math.max(limit, ...all) * 1.01, axisLabel: { showMinLabel: false, showMaxLabel: false } }
          : { scale: false, max: Math.ceil(1.1 * Math.max(limit, ...all)), axisLabel: { showMaxLabel: false } }) }),
      tooltip: tooltip(look, { trigger: 'axis', formatter: (found: { dataIndex: number }[]) => {
        const place = found[0]!.dataIndex;
        return tip(`${count(checkedRuns[place]!)} model runs`, shown.map((dimension) => [shorten(dimension.name, 40), number(dimension[of][place], isRHat ? 4 : 3)] as [string, string]));
      } }),
      series: shown.map((dimension, line) => ({
        name: dimension.name, type: 'line', symbolSize: checkedRuns.length > 40 ? 0 : 5, color: look.many[line % look.many.length], lineStyle: { width: 1.5 },
        data: checkedRuns.map((runs, place) => [runs, dimension[of][place] ?? null]),
        markLine: line === 0 ? { silent: true, symbol: 'none', label: { show: false }, lineStyle: { color: look.ink, type: 'dashed', width: 1.5 }, data: [{ yAxis: limit }] } : undefined,
      })),
    }),
    values: () => ({
      columns: [{ title: 'Model runs', number: true }, ...dimensions.map(({ name }) => ({ title: name, number: true }))],
      length: checkedRuns.length,
      row: (place) => [count(checkedRuns[place]!), ...dimensions.map((dimension) => number(dimension[of][place], 4))],
      reason: () => kNotMoved,
    }),
  };
}

/** In words, how much narrower the observations have made what is known of a parameter. */
function narrowed({ narrowing, isHardlyNarrower }: PosteriorDimension): string {
  if (narrowing === null) return '';
  if (isHardlyNarrower) return 'the data say little of it';
  if (narrowing < 0.1) return 'the data know it well';
  return narrowing < 0.5 ? 'narrowed much' : 'narrowed somewhat';
}

function knownTable({ dimensions }: Posterior): Node {
  const columns = [{ title: 'Parameter' }, ...['5 %', 'Median', '95 %'].map((title) => ({ title, number: true })),
    { title: 'Prior 5 %', number: true }, { title: 'Prior 95 %', number: true },
    { title: 'Width', number: true, hint: 'From 5 to 95 %, as a part of that of the prior; of logarithms where the prior is one of orders of magnitude' }, { title: '' },
    { title: 'Most probable', number: true, hint: 'The state of the largest posterior density' }, { title: 'R\u2011hat', number: true }, { title: 'Eff. size', number: true, hint: 'Independent draws that would tell as much' }];
  const rows = dimensions.map((of) => [of.name, number(of.quantiles[0]), number(of.quantiles[2]), number(of.quantiles[4]), number(of.priorQuantiles[0]), number(of.priorQuantiles[4]),
    percent(of.narrowing, 2), narrowed(of), number(of.mostProbable), number(of.rHat, 3), of.effectiveSize === null ? '' : count(of.effectiveSize)]);
  return table(columns, rows, 'Parameters before and after the observations', (_, column) =>
    (column >= 9 ? kNotMoved : column === 6 || column === 7 ? 'the prior has one value alone' : 'not in the table of the posterior'));
}

// Nothing while chains are at different places.
function whatIsTold({ dimensions, state }: Posterior): string {
  if (state === 'apart') return '';
  const known = dimensions.filter(({ narrowing, isOfErrors }) => narrowing !== null && !isOfErrors).sort((a, b) => a.narrowing! - b.narrowing!);
  if (known.length === 0) return '';
  const [best] = known;
  const little = known.filter(({ isHardlyNarrower }) => isHardlyNarrower).map(({ name }) => isolated(name));
  return `The data have narrowed ${isolated(best!.name)} most: its 5 to 95 % range is ${percent(best!.narrowing, 2)} of that of its prior.${
    little.length > 0 ? ` They say little of ${little.join(', ')}, whose posterior is hardly narrower than its prior: these observations do not tell ${little.length > 1 ? 'their values' : 'its value'}. Where such a parameter trades off with another, a combination of both may still be known well, and fixing it makes the other look surer than it is; one that trades off with none can be fixed.` : ''}`;
}

function marginalPlan(of: PosteriorDimension): ChartPlan {
  const { edges, posterior, prior } = of;
  const outline = edges.flatMap((edge, index) => [[edge, prior[index - 1] ?? 0], [edge, prior[index] ?? 0]]);
  const bounds = (bin: number) => `${number(edges[bin])} to ${number(edges[bin + 1])}`;
  const [left, right] = [edges[0]!, edges[edges.length - 1]!];
  return {
    title: of.name,
    ...(of.narrowing === null ? {} : { note: `5 to 95 %: ${number(of.quantiles[0])} to ${number(of.quantiles[4])}, ${percent(of.narrowing, 2)} of the prior\u2019s range; most probable ${number(of.mostProbable)}.` }),
    height: 220,
    small: true,
    option: (look) => ({
      legend: legend(look, { data: ['posterior', ...lineEntries(['prior', 'most probable'])], itemWidth: 22 }),
      grid: { left: 16, right: 18, top: 34, bottom: 16 },
      xAxis: axis(look, { splitNumber: 4, splitLine: { show: false }, axisLabel: { showMinLabel: false, showMaxLabel: false }, ...(of.logarithmic ? logRange([edges]) : {}), min: left, max: right }),
      yAxis: axis(look, { scale: false, splitNumber: 3 }),
      tooltip: tooltip(look, { formatter: (bar: { dataIndex: number }) =>
        tip(bounds(bar.dataIndex), [['of the posterior', percent(posterior[bar.dataIndex])], ['of the prior', percent(prior[bar.dataIndex])]]) }),
      series: [{
        name: 'posterior', type: 'custom', color: look.bars, encode: { x: [0, 1], y: 2 }, data: posterior.map((share, bin) => [edges[bin], edges[bin + 1], share]),
        renderItem: (_: unknown, api: CustomApi) => {
          const [from, top] = api.coord([api.value(0), api.value(2)]);
          const [to, bottom] = api.coord([api.value(1), 0]);
          return { type: 'rect', shape: { x: from!, y: top!, width: Math.max(1, to! - from! - 1), height: bottom! - top! }, style: { fill: look.bars } };
        },
      }, {
        name: 'prior', type: 'line', symbol: 'none', data: outline, color: look.initial, lineStyle: { color: look.initial, width: 2 }, z: 4, tooltip: { show: false },
      }, {
        name: 'most probable', type: 'line', symbol: 'none', data: [[of.mostProbable, 0], [of.mostProbable, Math.max(...finite([...posterior, ...prior]))]], color: look.observed,
        lineStyle: { color: look.observed, width: 1.5, type: 'dashed' }, z: 5, tooltip: { show: false },
      }],
    }),
    values: () => ({
      columns: [{ title: 'From' }, ...['To', 'Of the posterior', 'Of the prior'].map((title) => ({ title, number: true }))],
      length: posterior.length,
      row: (bin) => [number(edges[bin]), number(edges[bin + 1]), percent(posterior[bin]), percent(prior[bin])],
    }),
  };
}

/** The values of each chain over the generations, burn-in shaded. `isLikelihood`: burn-in may be far below what matters. */
function tracePlan(posterior: Posterior, name: string, traces: Maybe[][], log: boolean, isLikelihood = false): ChartPlan {
  const { generations, burnIn, generationCount } = posterior;
  const behind = finite(traces.flatMap((trace) => trace.filter((_, place) => generations[place]! > burnIn)));
  const every = finite(traces.flat());
  const [low, high] = behind.length > 0 ? [Math.min(...behind), Math.max(...behind)] : [Math.min(...every), Math.max(...every)];
  const floor = low - Math.max(0.5 * (high - low), 1);
  const hasFloor = isLikelihood && behind.length > 0 && Math.min(...every) < floor;
  const names = traces.map((_, chain) => `chain ${chain + 1}`);
  return {
    title: name,
    height: isLikelihood ? 300 : 210,
    small: !isLikelihood,
    zoom: 'xy',
    ...(isLikelihood ? { switches: hasFloor ? [{ key: 'all', label: 'All values', hint: 'Those of burn-in far below, too' }] : [],
      note: 'Natural logarithm of the likelihood. Where it still rises behind burn-in, the chains have not yet found the posterior; chains on different levels have found different sets.' } : {}),
    option: (look, is) => ({
      ...(isLikelihood ? { legend: legend(look, { data: lineEntries(names) }) } : {}),
      grid: { left: isLikelihood ? 24 : 16, right: 18, top: isLikelihood ? 36 : 12, bottom: isLikelihood ? 34 : 16 },
      xAxis: axis(look, { min: 1, max: generationCount, integer: true, splitNumber: 4, axisLabel: { showMaxLabel: false }, ...(isLikelihood ? { name: 'generation', nameGap: 22 } : {}) }),
      yAxis: axis(look, { splitNumber: 4, ...(log ? logRange([every]) : {}), ...(hasFloor && !is('all') ? { min: floor, axisLabel: { showMinLabel: false } } : {}) }),
      tooltip: tooltip(look, { trigger: 'axis', formatter: (found: { dataIndex: number }[]) => {
        const place = found[0]!.dataIndex;
        return tip(`Generation ${count(generations[place]!)}${generations[place]! <= burnIn ? ', burn-in' : ''}`, names.map((chain, index) => [chain, number(traces[index]![place], 6)] as [string, string]));
      } }),
      series: traces.map((trace, chain) => ({
        name: names[chain], type: 'line', symbol: 'none', clip: true, connectNulls: false, color: look.many[chain % look.many.length], lineStyle: { width: 1, opacity: 0.85 },
        data: generations.map((generation, place) => [generation, trace[place] ?? null]),
        markArea: chain === 0 && burnIn > 0 ? { silent: true, itemStyle: { color: look.muted, opacity: 0.16 }, label: { show: isLikelihood, color: look.muted, position: 'insideTop' },
          data: [[{ name: 'burn-in', xAxis: 1 }, { xAxis: burnIn }]] } : undefined,
      })),
    }),
    csv: () => ({
      columns: [{ title: 'Generation' }, ...names.map((chain) => ({ title: chain, number: true }))],
      length: generations.length,
      row: (place) => [count(generations[place]!), ...traces.map((trace) => number(trace[place], 7))],
    }),
  };
}

function chainContent(posterior: Posterior): Node[] {
  const { dimensions, generations, generationCount, chains, logLikelihoods } = posterior;
  if (generations.length === 0) return [];
  const thinned = generations.length < generationCount || logLikelihoods.length < chains;
  const isDrawn = ({ traces }: PosteriorDimension) => finite(traces.flat()).length > 0;
  const shown = dimensions.filter(isDrawn).slice(0, kMostGrown);
  return [
    heading('Chains'),
    paragraph(`Each line is a chain; burn-in is shaded. Chains that have converged look like one thick band of noise: they overlap, stay level and jump often. Lines that drift, stay apart or are flat for long have not.${
      thinned ? ` ${count(generations.length)} of ${count(generationCount)} generations${logLikelihoods.length < chains ? ` of the first ${count(logLikelihoods.length)} of ${count(chains)} chains` : ''} are drawn.` : ''}`),
    ...(finite(logLikelihoods.flat()).length > 0 ? [chart(tracePlan(posterior, 'Log-likelihood', logLikelihoods, false, true))] : []),
    grid(...shown.map((of) => chart(tracePlan(posterior, of.name, of.traces, of.logarithmic && finite(of.traces.flat()).every((value) => value > 0))))),
  ];
}

function pairContent(posterior: Posterior): Node[] {
  const { dimensions, tradeOffs, correlations } = posterior;
  const plots = pairPlots(dimensions, correlations);
  if (plots.length === 0) return [];
  const names = dimensions.map(({ name }) => name);
  const told = tradeOffs && (correlations.length > 0 || tradeOffs.length > 0)
    ? tradeOffs.length > 0 ? make('ul', { class: 'findings' }, ...tradeOffs.map((text) => finding(text, ''))) : paragraph('No two parameters trade off: no correlation of the posterior is as large as 0.7.')
    : null;
  return [
    heading('Which parameters trade off'),
    ...(told ? [told] : []),
    ...plots,
    ...(correlations.length > 8 ? [chart(heatmap('Correlations of the posterior', names, names, correlations, 1, 'Of all states behind burn-in.'))] : []),
  ];
}

/** The probability of at most `most` of `n` observed values within a band that holds each with the probability kWanted. */
function atMost(most: number, n: number): number {
  let logarithm = n * Math.log(1 - kWanted);
  let sum = 0;
  for (let k = 0; k <= most; k++) {
    sum += Math.exp(logarithm);
    logarithm += Math.log(((n - k) / (k + 1)) * (kWanted / (1 - kWanted)));
  }
  return sum;
}

/** How many of the observed values a band of everything holds, against how many it should. */
function coverageText(band: Band, isConverged: boolean): string {
  const inside = band.inside;
  if (inside === null) return '';
  const name = isolated(band.measure);
  const held = `The band of what would be observed of ${name} holds ${percent(inside)} of ${band.n === null ? 'the' : count(band.n)} observed values`;
  const hint = isConverged ? '' : ' The chains have not converged, which may be the reason.';
  const far = Math.abs(inside - kWanted) > kAround;
  const least = band.n === null ? 0 : inside < kWanted ? atMost(Math.round(inside * band.n), band.n) : 1 - atMost(Math.round(inside * band.n) - 1, band.n);
  if (far && least > kChance) return `${held}; it should hold about 90 %, but of so few values this may be chance.`;
  if (inside < kWanted - kAround) return `${held}; it should hold about 90 %. It is too narrow: errors are larger, or have heavier tails, than the likelihood has them.${hint}`;
  if (inside > kWanted + kAround) return `${held}; it should hold about 90 %. It is wider than it need be: the likelihood has larger errors than there are, and another form of it may fit better.${hint}`;
  return `${held}, about the 90 % that it should.`;
}

function coverageContent(data: ReportData): Node[] {
  const shown = data.band.filter(({ n }) => n !== 0);
  if (shown.length === 0) return [];
  const texts = shown.filter(({ isTotal }) => isTotal).map((band) => coverageText(band, data.posterior!.state === 'reached')).filter((text) => text !== '');
  const columns = [{ title: 'Series' }, { title: '5 to 95 % band' }, { title: 'Observed within', number: true }, { title: 'Observed', number: true },
    { title: 'Mean width', number: true }, { title: 'Of their deviation', number: true, hint: 'Mean width over the standard deviation of the observed values' }];
  return [
    heading('How much of the observed lies in the bands'),
    ...texts.map(paragraph),
    table(columns, shown.map((band) => [band.measure, band.isTotal ? 'what would be observed, with the errors' : 'what the model simulates: uncertainty of the parameters alone', percent(band.inside), band.n === null ? '' : count(band.n),
      `${number(band.width)}${band.unit && band.width != null ? ` ${shorten(band.unit, 20)}` : ''}`, number(band.relativeWidth, 3)]), 'Observed values within the bands',
    (_, column) => (column === 5 ? 'the observed values do not vary' : 'the file of the band does not tell it')),
  ];
}

export function posteriorSection(data: ReportData): Section | null {
  const { posterior } = data;
  if (!posterior) return null;
  const { dimensions, checkedRuns } = posterior;
  const drawn = dimensions.filter(({ edges, posterior: shares }) => edges.length > 1 && finite(shares).length > 0).slice(0, kMostGrown);
  const isNot = posterior.state === 'apart' ? ' The chains have not converged: what follows is not the posterior yet.' : '';
  return {
    id: 'posterior',
    title: 'The posterior distribution',
    content: [
      heading('Have the chains converged?'),
      ...verdict(posterior),
      ...(checkedRuns.length > 0 ? [grid(
        chart(checkPlan(posterior, 'rHats', posterior.rHatLimit, 'R-hat as the chains grew', 'Near 1 where all halves of the chains look alike.')),
        chart(checkPlan(posterior, 'effectiveSizes', posterior.effectiveLimit, 'Effective sample size as the chains grew', 'The number of independent draws that would tell as much.')),
      )] : []),
      ...coverageContent(data),
      ...(posterior.state ? [heading('Parameters before and after the observations'), paragraph(`${whatIsTold(posterior)}${isNot}`), knownTable(posterior)] : []),
      ...(drawn.length > 0 ? [paragraph('Bars: the posterior. Line: the prior, over the same values. Where both have one shape, the data say nothing of the parameter by itself.'),
        grid(...drawn.map((of) => chart(marginalPlan(of))))] : []),
      ...pairContent(posterior),
      ...chainContent(posterior),
    ],
  };
}
