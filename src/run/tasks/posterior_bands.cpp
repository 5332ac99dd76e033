#include "run/tasks/posterior_bands.h"

#include <algorithm>
#include <cmath>
#include <limits>

#include <fmt/format.h>

#include "algorithms/analyses/series_band.h"
#include "common/run_files.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::size_t kMostStates = 2000;

/// A state of the posterior that the bands are of.
struct BandState {
  std::span<const double> point;
  std::size_t run = 0;  ///< index of its model run among the different ones
};

struct BandStates {
  std::vector<BandState> states;
  std::vector<int> runs;  ///< numbers of the different model runs, ascending
};

/// States of all chains at equal distances behind burn-in.
BandStates bandStates(const DreamSampler& sampler) {
  const ChainHistory& history = sampler.history();
  BandStates found;
  std::vector<int> numbers;
  for (const ChainHistory::State& state :
       history.spread(sampler.burnIn().value_or(history.generations()), kMostStates)) {
    if (!(state.logLikelihood > -std::numeric_limits<double>::infinity())) continue;
    found.states.push_back({state.point, 0});
    numbers.push_back(state.evaluation);
  }
  found.runs = numbers;
  std::ranges::sort(found.runs);
  found.runs.erase(std::unique(found.runs.begin(), found.runs.end()), found.runs.end());
  for (std::size_t i = 0; i < numbers.size(); ++i) {
    const auto place = std::ranges::lower_bound(found.runs, numbers[i]);
    found.states[i].run = static_cast<std::size_t>(place - found.runs.begin());
  }
  return found;
}

std::string coverageText(const std::string& title, const BandCoverage& coverage) {
  if (coverage.observationCount == 0) return title + ": no observation has a simulated value";
  return fmt::format("{}: {:.1f} % of {} observations lie between the 5 and the 95 % quantile, {}", title,
                     100.0 * coverage.shareInside, coverage.observationCount, bandWidthText(coverage));
}

class BandReport {
 public:
  BandReport(const TaskContext& context, bool hasSteps, std::vector<TaskFile>& files)
      : context_(context), hasSteps_(hasSteps), files_(files) {}

  void add(const ObservedSeries& observed, const RunFile& file, const std::string& what, const SeriesBand& band) {
    const std::string& name = context_.measures[observed.measure].name;
    files_.push_back({runFilePath(context_.filePrefix, file, static_cast<int>(observed.measure) + 1),
                      seriesBandText(name, observed, band, hasSteps_)});
    const std::string title = fmt::format("{} of {}", what, name);
    lines.push_back(coverageText(title, band.coverage));
    addUnused(observed, title, band);
    lines.push_back("   " + files_.back().path);
    if (const std::string fewer = fewerRunsText(band); !fewer.empty()) {
      lines.push_back("   " + fewer);
      context_.log.warning(fmt::format("{}: {}", title, fewer));
    }
  }

  /// Says at how many times of a series states have a value without errors.
  void addTimesWithoutErrors(const std::string& name, std::size_t count) {
    if (count == 0) return;
    const std::string text = fmt::format(
        "at {} model runs have values that the Box-Cox transformation gives no errors, zeros with a lambda of at most "
        "0 or negative ones: the band has the zeros as they are, and lacks the others. A larger Box_Cox_Shift gives "
        "them errors",
        countText(count, "time"));
    lines.push_back(fmt::format("   {}", text));
    context_.log.warning(fmt::format("Band of total uncertainty of {}: {}", name, text));
  }

  /// Says which errors a series has between its observations, if they have weights that differ.
  void addUsualWeight(const ObservedSeries& observed, double weight) {
    bool hasTimesBetween = false;
    bool differs = false;
    for (std::size_t t = 0; t < observed.weights.size(); ++t) {
      const bool isBetween = std::isnan(observed.values[t]);
      hasTimesBetween = hasTimesBetween || isBetween;
      differs = differs || (!isBetween && observed.weights[t] != weight);
    }
    if (!hasTimesBetween || !differs) return;
    lines.push_back(
        fmt::format("   where nothing is observed, its errors are those of the median weight, {:.6g}", weight));
  }

  std::vector<std::string> lines;

 private:
  /// Of the validation periods over which the band reaches.
  void addUnused(const ObservedSeries& observed, const std::string& title, const SeriesBand& band) {
    for (const ValidationObservations& validation : context_.validationObservations) {
      if (validation.observed.measure != observed.measure) continue;
      const BandCoverage unused = coverageOf(band, observed, validation.observed);
      if (unused.observationCount == 0) continue;
      const std::string& period = context_.validationPeriods[validation.period].name;
      lines.push_back(coverageText(fmt::format("{} in {} (validation)", title, period), unused));
    }
  }

  const TaskContext& context_;
  bool hasSteps_;
  std::vector<TaskFile>& files_;
};

}  // namespace

std::vector<std::string> reportPosteriorBands(const TaskContext& context, const DreamTarget& target,
                                              const DreamSampler& sampler, bool hasSteps, std::int32_t seed,
                                              std::vector<TaskFile>& files) {
  const BandStates found = bandStates(sampler);
  BandReport report(context, hasSteps, files);
  if (found.states.empty()) return {};
  const std::size_t stateCount = found.states.size();
  std::size_t first = 0;
  for (std::size_t k = 0; k < context.observedSeries.size(); ++k) {
    const ObservedSeries& observed = context.observedSeries[k];
    /// The values of all states at some times, those of a time side by side.
    const auto simulated = [&](std::size_t index, std::size_t count) {
      const std::vector<double> ofRuns = context.simulatedColumns(found.runs, first + index, count);
      std::vector<double> values;
      values.reserve(count * stateCount);
      for (std::size_t t = 0; t < count; ++t) {
        for (const BandState& state : found.states) values.push_back(ofRuns[t * found.runs.size() + state.run]);
      }
      return values;
    };
    report.add(observed, run_files::kBand, "Band of parameter uncertainty",
               seriesBand(observed.values, stateCount, simulated));
    const auto series = std::ranges::find(target.series(), k, &DreamTarget::Series::observed);
    if (series != target.series().end()) {
      std::vector<SeriesErrors::Path> paths;
      for (const BandState& state : found.states) {
        paths.emplace_back(series->errors, target.errorsOf(*series, state.point));
      }
      ChainRandom random(seed, k + 1);
      std::size_t withoutErrors = 0;  // times
      const auto observable = [&](std::size_t index, std::size_t count) {
        std::vector<double> values = simulated(index, count);
        bool hasErrors = true;
        for (std::size_t i = 0; i < values.size(); ++i) {
          SeriesErrors::Path& path = paths[i % stateCount];
          hasErrors = (i % stateCount == 0 || hasErrors) && path.hasErrors(values[i]);
          values[i] = path.next(index + i / stateCount, values[i], random);
          if (i % stateCount == stateCount - 1 && !hasErrors) ++withoutErrors;
        }
        return values;
      };
      report.add(observed, run_files::kTotalBand, "Band of total uncertainty",
                 seriesBand(observed.values, stateCount, observable));
      report.addUsualWeight(observed, series->errors.usualWeight());
      report.addTimesWithoutErrors(context.measures[observed.measure].name, withoutErrors);
    }
    first += 2 * observed.values.size();
  }
  if (report.lines.empty()) return {};
  report.lines.push_back(fmt::format("The bands are of {} states of the posterior and their {} model runs", stateCount,
                                     found.runs.size()));
  return std::move(report.lines);
}

}  // namespace mirevo
