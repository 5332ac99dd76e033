#include "run/tasks/analysis_tasks.h"

#include <algorithm>
#include <cmath>
#include <limits>
#include <optional>
#include <span>
#include <utility>

#include <fmt/core.h>

#include "algorithms/analyses/covariance.h"
#include "algorithms/analyses/local_sensitivity.h"
#include "algorithms/analyses/series_band.h"
#include "algorithms/analyses/uncertainty.h"
#include "measures/period_series.h"
#include "run/tasks/band_file.h"

namespace mirevo {
namespace {

AnalysisNames analysisNames(const TaskContext& context) {
  AnalysisNames names{context.space.names, {}, {}};
  for (const OutputMeasure& measure : context.config.measures) names.measures.push_back(measure.name);
  for (const ObjectiveFunction& objective : context.config.objectives) names.objectives.push_back(objective.name);
  return names;
}

void logReport(const TaskContext& context, std::span<const std::string> report) {
  context.log.line("");
  for (const std::string& line : report) context.log.line(line);
}

/// Writes the band of each series; a line each for the report.
std::vector<std::string> reportBands(const TaskContext& context, std::span<const EvaluationResult> results) {
  std::vector<std::string> lines;
  std::size_t first = 0;
  for (const ObservedSeries& observed : context.observedSeries) {
    const SeriesBand band = seriesBand(observed.values, results, first);
    first += observed.values.size();
    const std::string& name = context.config.measures[observed.measure].name;
    const std::string path = fmt::format("{}_Band_{}.csv", context.filePrefix, observed.measure + 1);
    writeBandFile(path, name, observed, band);
    lines.push_back(band.observationCount == 0
                        ? fmt::format("Band of {}: no observation has a simulated value", name)
                        : fmt::format("Band of {}: {:.1f} % of {} observations lie between the 5 and the 95 % quantile",
                                      name, 100.0 * band.shareInside, band.observationCount));
    lines.push_back("   " + path);
  }
  return lines;
}

/// What the covariance is computed from: one entry an observation, and one row of simulated values a set.
struct ComparedValues {
  std::vector<double> observed;  ///< NaN for an observation that does not count
  std::vector<double> weights;
  std::vector<std::vector<double>> simulated;  ///< empty for a set that failed
};

/// Every pair of series that an objective function is made of, once, however many measures compare it. An observation
/// has the square of the weight that its measure gives to its difference: that is how it enters a sum of squares.
ComparedValues compareSeries(const TaskContext& context, std::span<const EvaluationResult> results) {
  const std::vector<OutputMeasure>& measures = context.config.measures;
  ComparedValues compared;
  compared.simulated.resize(results.size());
  std::vector<std::size_t> taken;
  std::size_t first = 0;
  for (const ObservedSeries& series : context.observedSeries) {
    const std::size_t begin = std::exchange(first, first + series.values.size());
    const bool counts = std::any_of(
        context.config.objectives.begin(), context.config.objectives.end(), [&](const ObjectiveFunction& objective) {
          return std::count(objective.measures.begin(), objective.measures.end(), series.measure) > 0;
        });
    const OutputMeasure& measure = measures[series.measure];
    const bool isRepeated = std::any_of(taken.begin(), taken.end(),
                                        [&](std::size_t other) { return isSamePair(measure, measures[other]); });
    if (!counts || isRepeated) continue;
    taken.push_back(series.measure);
    for (std::size_t i = 0; i < results.size(); ++i) {
      if (!results[i].ok()) continue;
      const auto from = results[i].simulatedValues.begin() + static_cast<std::ptrdiff_t>(begin);
      compared.simulated[i].insert(compared.simulated[i].end(), from,
                                   from + static_cast<std::ptrdiff_t>(series.values.size()));
    }
    for (std::size_t t = 0; t < series.values.size(); ++t) {
      const bool isAbove = results.front().ok() && results.front().simulatedValues[begin + t] > series.values[t];
      const double weight = isAbove ? measure.weightAbove : measure.weight;
      compared.observed.push_back(weight == 0.0 ? std::numeric_limits<double>::quiet_NaN() : series.values[t]);
      compared.weights.push_back(weight * weight);
    }
  }
  return compared;
}

std::vector<std::string> reportCovariance(const TaskContext& context, const LocalSensitivity& sensitivity) {
  if (!sensitivity.results.front().ok()) {
    return {"Warning: No covariance matrix: the model run with the initial values failed"};
  }
  ComparedValues compared = compareSeries(context, sensitivity.results);
  if (compared.observed.empty()) {
    return {"Warning: No covariance matrix: no objective function compares time series"};
  }
  const std::optional<LinearisedModel> model =
      linearise(sensitivity.plan, compared.simulated, compared.observed, std::move(compared.weights));
  if (!model) return {"Warning: No covariance matrix: the model run with the initial values failed"};
  return formatCovariance(parameterCovariance(*model), context.space, sensitivity.plan.sets.front());
}

}  // namespace

std::vector<std::string> runUncertainty(const TaskContext& context) {
  const UncertaintyOutcome outcome =
      uncertaintyAnalysis(context.config.uncertainty, context.config.randomSeed, context.evaluator,
                          [&context](std::string_view text) { context.log.line(text); });
  std::vector<std::string> report = formatUncertainty(summariseUncertainty(outcome), analysisNames(context));
  logReport(context, report);
  const std::vector<std::string> bands = reportBands(context, outcome.results);
  logReport(context, bands);
  report.emplace_back();
  report.insert(report.end(), bands.begin(), bands.end());
  return report;
}

std::vector<std::string> runSensitivity(const TaskContext& context) {
  const LocalSensitivity sensitivity =
      localSensitivity(context.config.sensitivity.local, context.space, context.evaluator);
  std::vector<std::string> report = formatSensitivity(sensitivity, analysisNames(context));
  if (context.config.sensitivity.calculateCovarianceMatrix) {
    report.emplace_back();
    for (std::string& line : reportCovariance(context, sensitivity)) report.push_back(std::move(line));
  }
  logReport(context, report);
  return report;
}

}  // namespace mirevo
