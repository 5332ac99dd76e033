// The data that the program writes into the page. Missing, NaN and infinite numbers are null. What a run does not have
// is absent or empty: the page shows sections only for what exists.

import { shorten } from './dom';
import type { SeriesAbove, Views } from './views';

export type Maybe = number | null;

export interface Run {
  title: string;
  setup: string; // file name without the folder
  setupName: string;
  task: 'scenarios' | 'sensitivity' | 'optimisation' | 'uncertainty';
  taskName: string;
  started: string | null; // 2026-11-21 07:00:00, local time
  ended: string | null;
  reportMade: string;
  state: 'finished' | 'running' | 'cut off' | 'cancelled' | 'failed';
  message: string | null; // why it stopped
  evaluations: number;
  planned: number | null;
  failed: number;
  repeats?: number; // evaluations that have the result of an earlier one, without a model run
  aggregation: string | null;
  algorithm: string | null;
  surrogate: string | null;
  populationSize: number | null;
  period: [string, string] | null;
  seed: number | null;
  runNames?: string[]; // of the evaluations, from the first on; empty where one has none
  closingWarnings?: string[]; // of the run, which the summary has, too
  notes: string[];
}

export interface Parameter {
  name: string;
  comment?: string | null;
  equation?: string | null; // for a dependent parameter
  lower: Maybe;
  upper: Maybe;
  start: Maybe;
  best: Maybe;
  kind: 'variable' | 'fixed' | 'dependent';
  transformation: 'none' | 'logarithmic';
  integer: boolean;
  nearBound: 'lower' | 'upper' | null;
}

export interface Measure {
  name: string;
  statistic: string;
  weight: Maybe;
  objective: string | null;
  isCriterion?: boolean; // its differences are no shares: an efficiency, a bias in per cent
  initial: Maybe;
  best: Maybe;
}

export interface Objective {
  name: string;
  initial: Maybe;
  best: Maybe;
}

/** What a measure compares; least, mean and largest value of its pairs. */
export interface Comparison {
  measure: string;
  evaluation: number; // whose pairs these are
  simulatedItem: string;
  observedItem: string;
  counted?: string | null; // which observations count and how; null: all, alike
  pairs: number;
  missing: number; // observations without a simulated value
  span: [number, number];
  observed: Maybe[];
  simulated: Maybe[];
  simulatedFirst?: Maybe[]; // of the first successful run, if the others are of the best
}

export interface Failure {
  reason: string;
  count: number;
  example: string | null;
}

/** Every evaluation in order of its number; each inner array is a column of `count` values. */
export interface Evaluations {
  count: number;
  numbers: number[];
  ok: number[]; // 1: model values obtained, 0: failed
  aggregate: Maybe[];
  parameters: Maybe[][]; // one column per variable parameter
  objectives: Maybe[][];
  measures: Maybe[][];
}

/** Times as they are given: either each of them or a start and a constant step in milliseconds. */
export interface Times {
  start?: string; // 1981-10-01T00:00:00, UTC
  step?: number;
  count?: number;
  times?: number[]; // milliseconds since 1970, UTC
}

export interface Figures {
  n: Maybe;
  nse: Maybe;
  kge: Maybe;
  kgeR: Maybe;
  kgeAlpha: Maybe;
  kgeBeta: Maybe;
  pbias: Maybe; // percent
  rmse: Maybe;
  r2: Maybe;
}

/** Values against the percentage of the time in which they are exceeded. */
export interface FlowDuration {
  exceedance: number[];
  observed?: Maybe[];
  initial?: Maybe[];
  best?: Maybe[];
}

/** The simulated series of a scenario at its own times. */
export interface Scenario extends Times {
  number: number;
  values: Maybe[];
  breaks?: number[];
  thinned?: boolean;
}

/** The evaluation period or a validation period. */
export interface Period {
  name: string;
  start: string; // as in the log
  end: string;
  kind: 'calibration' | 'validation';
}

/** Calibration and validation side by side; `values` has one entry per period. */
export interface Validation {
  best: number; // evaluation
  tenth: number; // evaluations in the best tenth; 0: none is told apart
  count: number; // of which it is the tenth
  periods: Period[];
  measures: { name: string; statistic: string; values: { best: Maybe; least: Maybe; median: Maybe; largest: Maybe }[] }[];
}

/** A simulated and an observed series. */
export interface Series extends Times {
  measure: string; // names of all measures that compare the two
  quantity?: string | null; // what the values are
  unit: string | null;
  scenarios?: Scenario[];
  observed: Maybe[];
  initial?: Maybe[];
  best?: Maybe[];
  bestNumber?: number | null;
  observedAsPoints?: boolean; // too few or too uneven for a line
  breaks?: { [column: string]: number[] }; // milliseconds of the values behind which a line is interrupted, per column
  period?: [number, number] | null;
  periods?: (Period & { first: number; last: number; best?: Figures | null })[]; // in a run with validation periods
  thinned?: boolean; // reduced to the extremes of short spans; figures and `flowDuration` are computed from all values
  flowDuration?: FlowDuration;
  figures?: { initial?: Figures | null; best?: Figures | null };
  views?: Views;
  above?: SeriesAbove;
}

export interface Band extends Times {
  measure: string;
  quantity?: string | null;
  unit?: string | null;
  isTotal?: boolean; // of what would be observed: with the errors
  observed: Maybe[];
  p5: Maybe[];
  p50: Maybe[];
  p95: Maybe[];
  inside: Maybe; // share of the observed values within p5 to p95
  n: Maybe;
  width?: Maybe; // mean at the observed values
  relativeWidth?: Maybe; // over the standard deviation of the observed values
  gaps?: number[]; // places before which there is a gap, over which no line is drawn
  observedGaps?: number[];
  runs?: Maybe[]; // how many are behind the quantiles of each time
  fewestRuns?: number;
  mostRuns?: number; // without `runs`: the runs that succeeded
  thinned?: boolean; // reduced to the extremes of short spans; `inside` and `n` are of all values
}

/** Weights of acceptable sets. Those with a dot are thinned, shares are of all. */
export interface Glue {
  choices: string[]; // what is behavioural, and the likelihood
  succeeded: number;
  behavioural: number;
  effective: Maybe; // sets of equal weight that tell as much
  distanceLimit: Maybe;
  numbers: number[]; // evaluations with a dot
  weights: Maybe[];
  judged: Maybe[];
  parameters: {
    name: string;
    logarithmic: boolean;
    distance: Maybe; // of the behavioural distribution from that of all sets
    values: Maybe[]; // of the sets with a dot
    edges: number[]; // of the bins
    drawn: number[]; // share of the sets that succeeded, per bin
    weighed: number[]; // share of the weight
  }[];
}

/** A parameter of the model or of its errors that Markov chains sample. */
export interface PosteriorDimension {
  name: string;
  isOfErrors: boolean;
  mean: Maybe;
  standardDeviation: Maybe;
  mostProbable: Maybe;
  rHat: Maybe;
  effectiveSize: Maybe;
  narrowing: Maybe; // its 5 to 95 % range as a part of that of the prior
  isHardlyNarrower: boolean;
  logarithmic: boolean;
  quantiles: Maybe[]; // at 5, 25, 50, 75 and 95 %; empty where they are not known
  priorQuantiles: Maybe[];
  edges: number[]; // of the bins
  posterior: number[]; // shares in the bins
  prior: number[];
  rHats: Maybe[]; // at `checkedRuns`
  effectiveSizes: Maybe[];
  traces: Maybe[][]; // one row per drawn chain, at `generations`
  draws: Maybe[]; // some states behind burn-in, the same for all
}

/** What Markov chains have found. Traces and draws are thinned, figures are of all states. */
export interface Posterior {
  state?: 'reached' | 'fewDraws' | 'apart'; // absent where there is no posterior
  findings?: string[]; // on convergence; where no state has a likelihood, that
  tradeOffs?: string[];
  advice: string[];
  rHatLimit: number;
  effectiveLimit: number;
  chains: number;
  generationCount: number;
  burnIn: number; // generations
  states: number; // behind burn-in, with a likelihood
  acceptance: Maybe;
  chainAcceptance: Maybe[];
  dimensions: PosteriorDimension[];
  generations: number[]; // that the traces show
  logLikelihoods: Maybe[][];
  checkedRuns: number[];
  correlations: Maybe[][]; // empty where they are not known
}

export interface Covariance {
  names: string[];
  estimate: Maybe[];
  standardDeviation: Maybe[];
  lower95: Maybe[];
  upper95: Maybe[];
  correlation: Maybe[][]; // empty where there are too many parameters to show it
  largestCorrelations?: { first: string; second: string; value: Maybe }[]; // then these
  correlationFile?: string; // which has all of them
  leftOut: { name: string; reason: string }[];
  lagText?: string | null; // what the correlation of successive residuals makes of the limits
}

/** The sets that a search by several objectives ends with, by rank and then by the first objective; columns have one value per set. */
export interface Front {
  objectives: string[];
  parameters: string[];
  numbers: number[]; // of the evaluations
  ranks: number[]; // 1: on the front
  violations: Maybe[]; // of the internal constraints; 0: feasible
  distances: Maybe[]; // from the ideal point, objectives scaled over the front
  suggested: number | null; // place of the compromise
  values: Maybe[][]; // one column per objective function
  parameterValues: Maybe[][];
  course?: { evaluations: Maybe[]; sizes: Maybe[]; hypervolumes: Maybe[] };
  series: (Scenario & { measure: string })[]; // of some sets
}

/** A search with one of the seeds. */
export interface Repetition {
  number: number;
  seed: number;
  evaluations: number;
  best: number; // evaluation
  aggregate: Maybe;
  loops: number;
  start: Maybe; // the least aggregate with which it began
  sum?: Maybe; // of squares, of its best set, where the search judges sets by it and not by the aggregate
  startSum?: Maybe; // likewise the least with which it began
  hypervolume?: Maybe; // of its front, on the scale of that of all
  sameAs?: number; // an earlier one that started from the same sets and is the same search
  parameters: Maybe[]; // of its best set; of a front, of its compromise
  termination: string;
}

export interface Repetitions {
  parameters: string[];
  all: Repetition[];
  tolerance: number; // above the least aggregate, or sum: as good as it
  within: string; // that tolerance in words, "1 % of the least"
  atStart: number; // began as near to the least as that, where these are half of them or more; else 0
  fronts?: { ofAll: number; near: number; verdict: 'none' | 'differ' | 'agree' | 'one set' | 'no search' }; // how near their fronts come to that of all
  stretches: [number, number, number][]; // repetition, first and last of successive evaluations of it
}

export interface Sensitivity {
  parameters: string[];
  outputs: string[];
  derivatives: Maybe[][]; // one row per parameter, one column per output
  dimensionless: Maybe[][];
  problems?: string[][]; // why there is no derivative
  composite: Maybe[];
  hasBetterFit?: boolean; // another set fits better than that of the analysis
  isOfObservations?: boolean; // the composite, rather than of the objective functions or output measures
  ranking: string[];
  covariance: Covariance | null;
}

/** A statistic with its limits (95 %): value, lower, upper. */
export type Limited = [Maybe, Maybe, Maybe];

export interface EffectsOfParameter {
  name: string;
  mu: Limited;
  muStar: Limited;
  sigma: Limited;
  share: Limited; // of the largest mu*
  effects: number;
  rank: number; // 0: none
  rankLower: number;
  rankUpper: number;
  rankStability: Maybe; // share of the bootstrap samples with this rank
  certainty: Maybe; // that the share is negligible
  verdict: 'fix' | 'keep' | 'undecided' | null;
}

/** A Morris screening for one output. */
export interface Screening {
  kind: 'objective' | 'measure' | 'validation';
  name: string;
  negligible: number; // share of the largest mu*
  topCount: number; // parameters that are not negligible by their values
  topStability: Maybe;
  fixedTogether: Maybe;
  parameters: EffectsOfParameter[];
}

/** An index, the limits that hold it with 95 %, the blocks of the design that it is of, and why it or its limits are not known. */
export type SobolIndex = [Maybe, Maybe, Maybe, number, string?];

export interface SobolOutput {
  kind: 'measure' | 'objective';
  name: string;
  first: SobolIndex[]; // one per factor
  total: SobolIndex[];
  interactions: SobolIndex[];
  sumOfFirst: SobolIndex[]; // one
  second: Maybe[][]; // of each two factors; empty where it was not asked for
  rows: number[]; // sizes of the sample
  stages: { total: SobolIndex[] }[]; // one per size
}

export interface SobolSeries {
  measure: string;
  quantity?: string | null;
  unit?: string | null;
  stride: number; // every so many-th time is here
  times: number[];
  observed: Maybe[];
  mean: Maybe[];
  deviation: Maybe[];
  first: Maybe[][]; // one row per factor
  total: Maybe[][];
}

export interface Sobol {
  factors: string[];
  negligible: number;
  outputs: SobolOutput[];
  series: SobolSeries[];
}

/** From which the values of a variable parameter were drawn. */
export interface Distribution {
  text: string;
  quantiles: Maybe[]; // at equal steps of the probability from half a step on
}

export interface SampleSensitivity {
  parameters: string[];
  outputs: string[];
  kinds: string[]; // of the outputs, 'measure' or 'objective'
  rankCorrelations: Maybe[][]; // one row per parameter, one column per output
  firstOrder: Maybe[][];
  lower: Maybe[][]; // 95 % limits
  upper: Maybe[][];
  problems?: string[]; // of the outputs: why there are no first-order indices; empty where there are
  areCorrelated: boolean; // the parameters
}

export interface ReportData {
  format: number;
  program: string;
  run: Run;
  parameters: Parameter[];
  measures: Measure[];
  objectives: Objective[];
  comparisons: Comparison[];
  best: { number: number; aggregate: Maybe } | null;
  initialNumber: number | null;
  initialLabel?: string | null;
  failures: Failure[];
  evaluations: Evaluations;
  series: Series[];
  validation?: Validation | null;
  band: Band[];
  sensitivity: Sensitivity | null;
  estimate?: Covariance | null; // of the parameters that a search by residuals has found
  front?: Front | null;
  repetitions?: Repetitions | null;
  morris: Screening[];
  sobol?: Sobol | null;
  glue?: Glue | null;
  posterior?: Posterior | null;
  distributions?: Distribution[]; // one per variable parameter, or none
  sampleSensitivity?: SampleSensitivity | null;
  summary: string[];
}

const kNoEvaluations: Evaluations = {
  count: 0, numbers: [], ok: [], aggregate: [], parameters: [], objectives: [], measures: [],
};

/** The data with an empty value for every member that is absent. Throws where the text is not what this page reads. */
export function readReportData(text: string): ReportData {
  const data = JSON.parse(text) as ReportData;
  if (data.format !== 1) throw new Error(`The data of this report have format ${data.format}; this page reads format 1.`);
  const list = <T>(value: T[] | null | undefined): T[] => value ?? [];
  return {
    ...data,
    run: { ...data.run, notes: list(data.run.notes) },
    parameters: list(data.parameters),
    measures: list(data.measures),
    objectives: list(data.objectives),
    comparisons: list(data.comparisons),
    best: data.best ?? null,
    initialNumber: data.initialNumber ?? null,
    failures: list(data.failures),
    evaluations: { ...kNoEvaluations, ...data.evaluations },
    series: list(data.series),
    band: list(data.band),
    sensitivity: data.sensitivity ?? null,
    morris: list(data.morris),
    summary: list(data.summary),
  };
}

/** The parameters that have a column in the evaluations. */
export function variableParameters(data: ReportData): Parameter[] {
  return data.parameters.filter((parameter) => parameter.kind === 'variable');
}

export type Unit = string | null | undefined;

/** "Residual [m3/s]". */
export const withUnit = (text: string, unit: Unit): string => (unit ? `${text} [${shorten(unit, 20)}]` : text);

/** Milliseconds since 1970 of `length` values. */
export function timesOf(times: Times, length: number): number[] {
  if (times.times) return times.times;
  const start = Date.parse(`${times.start ?? '1970-01-01T00:00:00'}Z`);
  const step = times.step ?? 86400000;
  return Array.from({ length }, (_, index) => start + index * step);
}
