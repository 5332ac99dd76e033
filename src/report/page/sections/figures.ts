// The goodness-of-fit figures of a series: key, title, hint.
import type { Figures } from '../data';

export const kFigures: [keyof Figures, string, string][] = [
  ['nse', 'NSE', 'Nash-Sutcliffe efficiency; 1 is perfect, 0 as good as the mean'],
  ['kge', 'KGE', 'Kling-Gupta efficiency (2009); 1 is perfect'],
  ['kgeR', 'KGE: r', 'linear correlation; 1 is perfect'],
  ['kgeAlpha', 'KGE: \u03b1', 'ratio of the standard deviations, simulated to observed; 1 is perfect'],
  ['kgeBeta', 'KGE: \u03b2', 'ratio of the means, simulated to observed; 1 is perfect'],
  ['pbias', 'Bias (%)', '100 \u00b7 (sum of simulated less sum of observed) / sum of observed; 0 is perfect'],
  ['rmse', 'RMSE', 'root mean square error, in the unit of the series; 0 is perfect'],
  ['r2', 'r\u00b2', 'coefficient of determination of the linear regression; 1 is perfect'],
  ['n', 'Values', 'compared values in the period'],
];
