#include "algorithms/analyses/series_band.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include <fmt/format.h>

#include "algorithms/numbers/sample_summary.h"
#include "algorithms/numbers/weighted_sample.h"
#include "common/calendar.h"
#include "common/text.h"
#include "measures/dates.h"

namespace mirevo {
namespace {

/// With the digits of the 32-bit values of a series.
std::string cell(double value) {
  return std::isfinite(value) ? fmt::format("{}", static_cast<float>(value)) : "NaN";
}

/// What makes the quantiles of one time after another.
class TimeQuantiles final {
 public:
  explicit TimeQuantiles(std::span<const double> weights) : weights_(weights) {}

  void take(std::span<const double> values) {
    if (!weights_.empty()) {
      weighted_.take(values, weights_);
      return;
    }
    values_.clear();
    for (const double value : values) {
      if (std::isfinite(value)) values_.push_back(value);
    }
    std::sort(values_.begin(), values_.end());
  }
  std::size_t count() const { return weights_.empty() ? values_.size() : weighted_.count(); }
  double at(double probability) const {
    return weights_.empty() ? sortedQuantile(values_, probability) : weighted_.at(probability);
  }

 private:
  std::span<const double> weights_;
  WeightedQuantiles weighted_;
  std::vector<double> values_;
};

}  // namespace

void CoverageCount::add(double observed, double lower, double upper) {
  count_ += 1.0;
  if (observed >= lower && observed <= upper) inside_ += 1.0;
  width_ += (upper - lower - width_) / count_;
  const double difference = observed - mean_;
  mean_ += difference / count_;
  squares_ += difference * (observed - mean_);
}

BandCoverage CoverageCount::found() const {
  constexpr double kNone = std::numeric_limits<double>::quiet_NaN();
  if (count_ == 0.0) return {0, kNone, kNone, kNone};
  const double deviation = std::sqrt(squares_ / count_);
  return {static_cast<std::size_t>(count_), inside_ / count_, width_, deviation > 0.0 ? width_ / deviation : kNone};
}

SeriesBand seriesBand(std::span<const double> observed, std::size_t evaluations, const ReadColumns& read,
                      std::span<const double> weights) {
  // A MB at a time; of many evaluations or times up to 64, as every time costs a walk through all evaluations.
  constexpr std::size_t kValuesAtOnce = std::size_t{1} << 17;
  constexpr std::size_t kMostWalks = 32;
  constexpr std::size_t kMostValuesAtOnce = std::size_t{1} << 23;
  const std::size_t runCount = std::max<std::size_t>(evaluations, 1);
  const std::size_t ofWalk = std::min(observed.size() / kMostWalks, kMostValuesAtOnce / runCount);
  const std::size_t atOnce = std::max(kValuesAtOnce / runCount, ofWalk + 1);
  SeriesBand band;
  CoverageCount coverage;
  std::vector<double> columns;
  TimeQuantiles quantiles(weights);
  for (std::size_t t = 0; t < observed.size(); ++t) {
    if (t % atOnce == 0) columns = read(t, std::min(atOnce, observed.size() - t));
    quantiles.take(std::span(columns).subspan(t % atOnce * evaluations, evaluations));
    band.lower.push_back(quantiles.at(0.05));
    band.median.push_back(quantiles.at(0.50));
    band.upper.push_back(quantiles.at(0.95));
    band.runs.push_back(quantiles.count());
    if (quantiles.count() == 0) continue;
    ++band.timeCount;
    if (!std::isnan(observed[t])) coverage.add(observed[t], band.lower[t], band.upper[t]);
  }
  for (const std::size_t count : band.runs) band.mostRuns = std::max(band.mostRuns, count);
  band.fewestRuns = band.mostRuns;
  for (const std::size_t count : band.runs) {
    if (count == 0 || count == band.mostRuns) continue;
    band.fewestRuns = std::min(band.fewestRuns, count);
    ++band.fewerRunsCount;
  }
  band.coverage = coverage.found();
  return band;
}

BandCoverage coverageOf(const SeriesBand& band, const ObservedSeries& ofBand, const ObservedSeries& others) {
  const std::int64_t bandOrigin = secondNumber(ofBand.start);
  const std::int64_t origin = secondNumber(others.start);
  CoverageCount coverage;
  std::size_t t = 0;
  for (std::size_t i = 0; i < others.days.size(); ++i) {
    const std::int64_t second = secondAfter(origin, others.days[i]);
    while (t < ofBand.days.size() && secondAfter(bandOrigin, ofBand.days[t]) < second) ++t;
    if (t == ofBand.days.size()) break;
    if (secondAfter(bandOrigin, ofBand.days[t]) != second || band.runs[t] == 0 || std::isnan(others.values[i]))
      continue;
    coverage.add(others.values[i], band.lower[t], band.upper[t]);
  }
  return coverage.found();
}

namespace {

/// With two decimals, unless it is far too large for them to matter.
std::string relativeText(double width) {
  constexpr double kLarge = 1000.0;
  return width < kLarge ? fmt::format("{:.2f}", width) : fmt::format("{:.3g}", width);
}

}  // namespace

std::string bandWidthText(const BandCoverage& coverage) {
  if (coverage.observationCount == 0) return "";
  std::string text = fmt::format("a mean width of {:.4g} at the observations", coverage.meanWidth);
  if (std::isfinite(coverage.relativeWidth)) {
    text += fmt::format(", {} of their standard deviation", relativeText(coverage.relativeWidth));
  }
  return text;
}

std::string fewerRunsText(const SeriesBand& band) {
  if (band.fewerRunsCount == 0) return "";
  return fmt::format(
      "at {} of {} {} the quantiles are of fewer runs than at the others, of {} to {}: runs have no value there",
      band.fewerRunsCount, band.timeCount, band.timeCount == band.coverage.observationCount ? "observations" : "times",
      band.fewestRuns, band.mostRuns);
}

std::string seriesBandText(std::string_view title, const ObservedSeries& observed, const SeriesBand& band,
                           bool withRuns) {
  std::string text = fmt::format("# Band of {}\n", columnName(title));
  if (const std::string fewer = fewerRunsText(band); !fewer.empty()) text += fmt::format("# {}\n", fewer);
  text += fmt::format("time,observed,5 %,50 %,95 %{}\n", withRuns ? ",runs" : "");
  const std::int64_t origin = secondNumber(observed.start);
  for (std::size_t t = 0; t < observed.days.size(); ++t) {
    const DateRecord time = dateOfSecond(secondAfter(origin, observed.days[t]));
    const std::string value = std::isnan(observed.values[t]) ? std::string() : cell(observed.values[t]);
    text += fmt::format("{},{},{},{},{}", formatDate(time), value, cell(band.lower[t]), cell(band.median[t]),
                        cell(band.upper[t]));
    text += withRuns ? fmt::format(",{}\n", band.runs[t]) : "\n";
  }
  return text;
}

}  // namespace mirevo
