// A Morris screening: which parameters can be fixed and how sure that is, mu* with its limits, mu* against sigma.
import { axis, chart, tip, tooltip, type ChartPlan } from '../chart';
import type { EffectsOfParameter, Limited, Maybe, ReportData, Screening } from '../data';
import { make, shorten } from '../dom';
import { count, counted, kMissing, number, percent } from '../format';
import { heading, paragraph, type Section } from './section';
import type { CustomApi } from './uncertainty';

const kMostBars = 60; // parameters that a chart shows with their names
const kMostNamed = 20; // in a sentence
const kStable = 0.95;

const limits = ([, lower, upper]: Limited) => (lower === null || upper === null ? '' : `${number(lower)} to ${number(upper)}`);

const ranked = ({ parameters }: Screening) => [...parameters].sort((a, b) => (a.rank || Infinity) - (b.rank || Infinity));

const muStarName = 'mean absolute effect, \u03bc*';

/** Never 100 % for what a number of samples cannot show. */
const sure = (certainty: Maybe) => (certainty === null ? 'nothing said of how sure that is'
  : certainty === 1 ? 'in all bootstrap samples' : `sure to ${certainty > 0.999 ? 'more than 99.9 %' : percent(certainty)}`);

function listed(parameters: EffectsOfParameter[], text: (parameter: EffectsOfParameter) => string): string {
  const shown = parameters.slice(0, kMostNamed).map(text).join(', ');
  return parameters.length > kMostNamed ? `${shown} and ${count(parameters.length - kMostNamed)} more` : shown;
}

// Names in isolates, so that those written from right to left do not turn the sentence around.
const nameOf = ({ name }: EffectsOfParameter) => `\u2068${shorten(name, 40)}\u2069`;

function statements(screening: Screening): Node[] {
  const order = ranked(screening);
  const of = (verdict: string) => order.filter((parameter) => parameter.verdict === verdict);
  const [fixed, kept, undecided] = [of('fix').reverse(), of('keep'), of('undecided')];
  const acting = fixed.filter(({ muStar }) => muStar[0] !== 0);
  const inert = fixed.filter(({ muStar }) => muStar[0] === 0);
  const fewest = Math.min(...inert.map(({ effects }) => effects));
  const limit = percent(screening.negligible);
  if (fixed.length + kept.length + undecided.length === 0) {
    return [paragraph('Which parameters can be fixed is not said: no parameter changes this output, or there are too few effects.')];
  }
  const lines = [fixed.length === 0
    ? make('li', {}, make('strong', {}, 'Can be fixed: '), `none is known to have less than ${limit} of the largest \u03bc*.`)
    : make('li', {}, make('strong', {}, 'Can be fixed: '),
      `${listed(fixed, (p) => `${nameOf(p)} (${p.muStar[0] === 0 ? 'no effect in any trajectory' : `at most ${percent(p.share[2])} of the largest \u03bc*, ${sure(p.certainty)}`})`)}.`
      + (acting.length > 1 ? ` All ${count(acting.length)}${acting.length < fixed.length ? ' that have an effect' : ''} together: ${sure(screening.fixedTogether)}.` : '')
      + (inert.length > 0 ? ` Without any effect in ${count(fewest)} or more steps: what acts in less than ${percent(1 - 0.05 ** (1 / fewest))} of the space may have gone unseen (95 %).` : ''))];
  if (kept.length > 0) lines.push(make('li', {}, make('strong', {}, 'Must be kept: '), `${listed(kept, nameOf)}.`));
  if (undecided.length > 0) {
    lines.push(make('li', {}, make('strong', {}, 'Undecided: '),
      `${listed(undecided, (p) => `${nameOf(p)} (${percent(p.share[1])} to ${percent(p.share[2])})`)}: ${limit} of the largest \u03bc* lies within the limits. More trajectories narrow them; the log says about how many.`));
  }
  if (screening.topCount > 0 && screening.topCount < order.length && screening.topStability !== null) {
    const unstable = screening.topStability < kStable ? ' Who is in front is not certain with so few trajectories.' : '';
    lines.push(make('li', {}, `The ${count(screening.topCount)} in front are the same in ${percent(screening.topStability)} of the bootstrap samples.${unstable}`));
  }
  return [make('ul', {}, ...lines)];
}

/** Why a figure of a parameter is not known. */
function missing({ effects }: EffectsOfParameter, largest: number): string {
  if (effects === 0) return 'no effect is known: its steps cannot be run or change no value, or their runs failed';
  return largest === 0 ? 'no parameter changes the output' : `too few effects (${counted(effects, 'effect')}) for limits`;
}

function rankedPlan(screening: Screening): ChartPlan {
  const listed = ranked(screening);
  const all = listed.filter(({ muStar }) => muStar[0] !== null);
  const order = all.slice(0, kMostBars);
  const largest = order[0]?.muStar[0] ?? 0;
  const threshold = screening.negligible * largest;
  return {
    title: 'Parameters by \u03bc*, with limits (95 %)',
    note: `The change of the output for the whole range of a parameter. The dashed line is ${percent(screening.negligible)} of the largest; the verdicts above count how uncertain the largest is, too.${all.length > order.length ? ` The first ${count(order.length)} of ${count(all.length)} parameters.` : ''}`,
    height: 56 + Math.max(16, Math.min(30, 900 / order.length)) * order.length,
    option: (look) => ({
      grid: { left: 24, right: 24, top: 4, bottom: 16 },
      xAxis: axis(look, { scale: false, min: 0 }),
      yAxis: axis(look, { type: 'category', data: order.map(({ name }) => name), inverse: true, axisTick: { show: false },
        axisLabel: { color: look.ink, formatter: (name: string) => shorten(name, 24), interval: order.length > 40 ? 'auto' : 0 } }),
      tooltip: tooltip(look, { formatter: (item: { value: number[] }) => {
        const p = order[item.value[0]!]!;
        return tip(shorten(p.name, 80), [['\u03bc*', number(p.muStar[0])], ['limits', limits(p.muStar)], ['\u03bc', number(p.mu[0])],
          ['\u03c3', number(p.sigma[0])], ['rank', `${p.rank} (${p.rankLower} to ${p.rankUpper})`]]);
      } }),
      series: [{
        type: 'custom', encode: { x: [1, 2, 3], y: 0 },
        data: order.map(({ muStar: [value, lower, upper] }, index) => [index, lower ?? value, value, upper ?? value]),
        markLine: { symbol: 'none', silent: true, label: { show: false }, lineStyle: { color: look.muted, type: 'dashed' }, data: [{ xAxis: threshold }] },
        renderItem: (_: unknown, api: CustomApi) => {
          const at = (dimension: number) => api.coord([api.value(dimension), api.value(0)]);
          const [left, y] = at(1);
          const [right] = at(3);
          const [middle] = at(2);
          const color = order[api.value(0)]?.verdict === 'fix' ? look.dots : look.best;
          const line = (x1: number, y1: number, x2: number, y2: number) => ({ type: 'line', shape: { x1, y1, x2, y2 }, style: { stroke: color, lineWidth: 2 } });
          return { type: 'group', children: [line(left!, y!, right!, y!), line(left!, y! - 5, left!, y! + 5), line(right!, y! - 5, right!, y! + 5),
            { type: 'circle', shape: { cx: middle!, cy: y!, r: 4.5 }, style: { fill: color, stroke: look.surface, lineWidth: 1 } }] };
        },
      }],
    }),
    values: () => ({
      columns: [{ title: 'Parameter' }, { title: 'Rank', number: true }, { title: '\u03bc*', number: true }, { title: 'Limits', number: true },
        { title: '\u03bc', number: true }, { title: 'Limits', number: true }, { title: '\u03c3', number: true }, { title: 'Limits', number: true },
        { title: 'Of the largest \u03bc*', number: true }, { title: 'At most', number: true }, { title: 'Effects', number: true }, { title: 'Rank holds', number: true }],
      length: listed.length,
      row: (index) => {
        const p = listed[index]!;
        return [p.name, p.rank > 0 ? `${p.rank}` : kMissing, number(p.muStar[0]), limits(p.muStar), number(p.mu[0]), limits(p.mu), number(p.sigma[0]), limits(p.sigma),
          percent(p.share[0]), percent(p.share[2]), count(p.effects), percent(p.rankStability)];
      },
      reason: (index) => missing(listed[index]!, largest),
    }),
  };
}

function scatterPlan(screening: Screening): ChartPlan {
  const shown = ranked(screening).filter(({ muStar, sigma }) => muStar[0] !== null && sigma[0] !== null);
  const largest = shown[0]?.muStar[0] ?? 1;
  return {
    title: '\u03c3 against \u03bc*',
    note: 'To the right: the output depends on the parameter. High up: the effect is not the same everywhere, as the output is not linear in the parameter or the parameter interacts with others. Above the dashed line \u03c3 is larger than \u03bc*; below the dotted one, a tenth of it, the output is nearly linear. Bars: limits (95 %).',
    height: 420,
    zoom: 'xy',
    option: (look) => ({
      grid: { left: 64, right: 24, top: 16, bottom: 44 },
      xAxis: axis(look, { name: muStarName, scale: false, nameGap: 28, min: 0 }),
      yAxis: axis(look, { name: 'standard deviation of the effects, \u03c3', scale: false, nameGap: 48, min: 0 }),
      tooltip: tooltip(look, { formatter: (item: { dataIndex: number }) => {
        const p = shown[item.dataIndex];
        return p ? tip(shorten(p.name, 80), [['\u03bc*', `${number(p.muStar[0])} (${limits(p.muStar)})`], ['\u03c3', `${number(p.sigma[0])} (${limits(p.sigma)})`]]) : '';
      } }),
      series: [
        {
          type: 'custom', clip: true, encode: { x: [0, 2, 3], y: [1, 4, 5] },
          data: shown.map(({ muStar, sigma }) => [muStar[0], sigma[0], muStar[1] ?? muStar[0], muStar[2] ?? muStar[0], sigma[1] ?? sigma[0], sigma[2] ?? sigma[0]]),
          renderItem: (info: { dataIndex: number }, api: CustomApi) => {
            const color = shown[info.dataIndex]?.verdict === 'fix' ? look.dots : look.best;
            const [x, y] = api.coord([api.value(0), api.value(1)]);
            const [left] = api.coord([api.value(2), 0]);
            const [right] = api.coord([api.value(3), 0]);
            const low = api.coord([0, api.value(4)])[1];
            const high = api.coord([0, api.value(5)])[1];
            const line = (x1: number, y1: number, x2: number, y2: number) => ({ type: 'line', shape: { x1, y1, x2, y2 }, style: { stroke: color, lineWidth: 1, opacity: 0.45 } });
            const name = info.dataIndex < kMostNamed
              ? [{ type: 'text', style: { x: x! + 7, y: y! - 12, text: shorten(shown[info.dataIndex]!.name, 16), fill: look.ink, fontSize: 11 } }] : [];
            return { type: 'group', children: [line(left!, y!, right!, y!), line(x!, low!, x!, high!),
              { type: 'circle', shape: { cx: x!, cy: y!, r: 4.5 }, style: { fill: color, stroke: look.surface, lineWidth: 1 } }, ...name] };
          },
        },
        { type: 'line', symbol: 'none', silent: true, tooltip: { show: false }, data: [[0, 0], [largest, largest]], lineStyle: { color: look.muted, type: 'dashed', width: 1 } },
        { type: 'line', symbol: 'none', silent: true, tooltip: { show: false }, data: [[0, 0], [largest, 0.1 * largest]], lineStyle: { color: look.muted, type: 'dotted', width: 1 } },
      ],
    }),
  };
}

const kindOf = { objective: 'Objective function', measure: 'Output measure', validation: 'Validation' };

export function morrisSection(data: ReportData): Section | null {
  const order = ['objective', 'measure', 'validation'];
  const shown = [...data.morris].sort((a, b) => order.indexOf(a.kind) - order.indexOf(b.kind));
  if (shown.length === 0) return null;
  const content = shown.flatMap((screening) => {
    const title = heading(`${kindOf[screening.kind]} ${screening.name}`);
    if (!screening.parameters.some(({ muStar }) => muStar[0] !== null)) return [title, paragraph('No effect is known: no step could be made, or the runs of all of them failed. The log says which.')];
    return [title, ...statements(screening), chart(rankedPlan(screening)), chart(scatterPlan(screening))];
  });
  return { id: 'morris', title: 'Which parameters matter', content };
}
