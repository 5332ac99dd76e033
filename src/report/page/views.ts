// What the program writes of a pair of series beside its hydrograph.
import type { Maybe, Times } from './data';

export interface RegimeFit {
  name: string;
  n: number;
  nse: Maybe;
  kge: Maybe;
  pbias: Maybe;
  observed: Maybe; // means
  simulated: Maybe;
}

/** Annual extremes, the most extreme one first. */
export interface Ranked {
  returnPeriods: number[]; // years
  observed: number[];
  simulated: number[];
}

export interface Extremes {
  isAtLeastDaily: boolean;
  years: string[];
  lowObserved: Maybe[];
  lowSimulated: Maybe[];
  highObserved: Maybe[];
  highSimulated: Maybe[];
  low: Ranked;
  high: Ranked;
  tail: { exceedance: number[]; observed: number[]; simulated: number[] };
}

export interface Peak {
  time: number;
  observed: Maybe;
  simulated: Maybe;
  percent: Maybe;
  hoursLater: Maybe;
}

export interface Residuals {
  n: number;
  mean: Maybe;
  standardDeviation: Maybe;
  months: number[]; // their beginnings
  monthMeans: number[];
  byMonth: Maybe[][]; // January first: the quantiles 5, 25, 50, 75 and 95 %
  flows: number[];
  ofFlows: number[];
  autocorrelation: Maybe[]; // of the lags 1, 2, ... steps
  autocorrelationLimit: number;
  normalQuantiles: number[];
  standardised: number[];
}

export interface Views {
  of: 'best' | 'initial';
  usualStep: number; // milliseconds, between two pairs
  seasons: RegimeFit[];
  years: RegimeFit[];
  extremes: Extremes;
  peaks?: Peak[];
  residuals: Residuals;
}

/** A series that is shown above the hydrograph. */
export interface SeriesAbove extends Times {
  name: string;
  values: Maybe[];
  thinned: boolean; // to the largest values of short spans
}
