#pragma once

#include <cstddef>
#include <functional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "measures/observed_series.h"

namespace mirevo {

/// How observations lie in a band, and how wide it is at them. What is NaN is so without any.
struct BandCoverage {
  std::size_t observationCount = 0;  ///< where there is a band
  double shareInside = 0.0;          ///< limits included
  double meanWidth = 0.0;            ///< in the unit of the series
  /// The mean width over the standard deviation (divisor n) of the observations: above 1 the band is wider than what
  /// the observations vary; also NaN if they do not. Abbaspour, Johnson and van Genuchten (2004,
  /// doi:10.2136/vzj2004.1340) call it the d-factor.
  double relativeWidth = 0.0;
};

/// Gathers the coverage, one observation after another.
class CoverageCount final {
 public:
  void add(double observed, double lower, double upper);
  BandCoverage found() const;

 private:
  double count_ = 0.0;
  double inside_ = 0.0;
  double width_ = 0.0;    ///< mean
  double mean_ = 0.0;     ///< of the observations
  double squares_ = 0.0;  ///< of their differences to it
};

/// The 5-95 % band of a simulated series at the times of its observations, and at others without an observed value.
struct SeriesBand {
  std::vector<double> lower;       ///< 5 % quantile (type 7), one per time; NaN without a simulated value
  std::vector<double> median;      ///< 50 % quantile
  std::vector<double> upper;       ///< 95 % quantile
  std::vector<std::size_t> runs;   ///< how many values are behind the quantiles of a time
  std::size_t timeCount = 0;       ///< times that have a band
  std::size_t fewestRuns = 0;      ///< least number of values behind the quantiles of a time that has a band
  std::size_t mostRuns = 0;        ///< largest
  std::size_t fewerRunsCount = 0;  ///< times with fewer than the largest number
  BandCoverage coverage;           ///< of the observations
};

/// The simulated values of all successful evaluations at `count` times of a series from index `first` on; those at the
/// same time side by side.
using ReadColumns = std::function<std::vector<double>(std::size_t first, std::size_t count)>;

/// The band over `evaluations` successful ones; `observed` has a value per time, NaN where there is none. Asks for the
/// values of a few times at a time. Values that are not finite are left out. `weights`: one per evaluation, with which
/// the quantiles are WeightedQuantiles; empty: quantiles of type 7.
SeriesBand seriesBand(std::span<const double> observed, std::size_t evaluations, const ReadColumns& read,
                      std::span<const double> weights = {});

/// That of other observations, at times of the band, whose times are those of `ofBand`; others are left out.
BandCoverage coverageOf(const SeriesBand& band, const ObservedSeries& ofBand, const ObservedSeries& others);

/// "a mean width of 2.31 at the observations, 0.84 of their standard deviation"; empty without an observation.
std::string bandWidthText(const BandCoverage& coverage);

/// "its quantiles are of 3 to 20 runs ..."; empty where all are of equally many.
std::string fewerRunsText(const SeriesBand& band);
/// The band as a time-series file: the columns time, observed, 5 %, 50 % and 95 %, one row per time, and `withRuns` the
/// number of runs.
std::string seriesBandText(std::string_view title, const ObservedSeries& observed, const SeriesBand& band,
                           bool withRuns = false);

}  // namespace mirevo
