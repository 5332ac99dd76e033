#include "report/report_analyses.h"

#include <algorithm>
#include <cmath>
#include <map>

#include <fmt/core.h>

#include "algorithms/analyses/local_sensitivity.h"
#include "common/calendar.h"
#include "measures/period_series.h"
#include "platform/series/time_series_object.h"

namespace mirevo {
namespace {

/// Answers with the results of evaluations that were made before; one that is not there counts as failed.
class EarlierResults final : public Evaluator {
 public:
  EarlierResults(const RunConfig& config, const SearchSpace& space, const ResultTable& results) {
    const auto parameters = static_cast<std::ptrdiff_t>(space.size());
    const auto measures = static_cast<std::ptrdiff_t>(config.measures.size());
    for (const ResultTable::Row& row : results.rows) {
      EvaluationResult& result = results_[row.number];
      result.number = row.number;
      const auto firstMeasure = row.values.begin() + parameters;
      result.measureValues.assign(firstMeasure, firstMeasure + measures);
      result.objectiveValues.assign(firstMeasure + measures, row.values.end() - 1);
      result.aggregate = row.values.back();
      if (!row.ok) result.failure.emplace();
    }
    missing_.measureValues.assign(config.measures.size(), kFailedRunValue);
    missing_.objectiveValues.assign(config.objectives.size(), kFailedRunValue);
    missing_.failure.emplace();
  }

  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets,
                                                      DispatchMode /*mode*/) override {
    std::vector<EvaluationResult> results;
    for (std::size_t i = 0; i < sets.size(); ++i) {
      const auto found = results_.find(++count_);
      results.push_back(found == results_.end() ? missing_ : found->second);
    }
    return results;
  }

 private:
  std::map<int, EvaluationResult> results_;  ///< by number
  EvaluationResult missing_;
  int count_ = 0;
};

/// Puts the outputs of one table behind those of another: p rows each.
void appendColumns(std::vector<std::vector<double>>& rows, const std::vector<std::vector<double>>& more) {
  rows.resize(std::max(rows.size(), more.size()));
  for (std::size_t i = 0; i < more.size(); ++i) rows[i].insert(rows[i].end(), more[i].begin(), more[i].end());
}

std::optional<ReportedBand> readBand(const std::string& path) {
  constexpr int kItems = 4;
  std::string reason;
  const auto file = createTimeSeriesObject(path, reason);
  if (!file || !file->open(path) || file->itemCount() != kItems || !file->startTime()) return std::nullopt;
  for (int item = 1; item <= kItems; ++item) {
    if (!file->getData(item)) return std::nullopt;
  }
  ReportedBand band;
  const std::int64_t origin = secondNumber(*file->startTime());
  constexpr double kSecondsPerDay = 86400.0;
  for (const double days : file->times()) band.seconds.push_back(origin + std::llround(days * kSecondsPerDay));
  const auto column = [&file](int item) {
    const std::span<const float> values = file->values(item);
    return std::vector<float>(values.begin(), values.end());
  };
  band.observed = column(1);
  band.lower = column(2);
  band.median = column(3);
  band.upper = column(4);
  for (std::size_t i = 0; i < band.seconds.size(); ++i) {
    if (!std::isfinite(band.observed[i]) || !std::isfinite(band.median[i])) continue;
    ++band.observationCount;
    if (band.observed[i] >= band.lower[i] && band.observed[i] <= band.upper[i]) ++band.insideCount;
  }
  return band;
}

}  // namespace

std::string pairName(std::span<const OutputMeasure> measures, std::size_t measure) {
  std::string name;
  for (const OutputMeasure& other : measures) {
    if (other.interfaceType != InterfaceType::timeSeries || !isSamePair(other, measures[measure])) continue;
    name += name.empty() ? other.name : ", " + other.name;
  }
  return name;
}

std::vector<ReportedBand> reportedBands(const RunConfig& config, const std::string& filePrefix) {
  std::vector<ReportedBand> bands;
  for (const std::size_t i : measuresOfDistinctPairs(config.measures)) {
    auto band = readBand(fmt::format("{}_Band_{}.csv", filePrefix, i + 1));
    if (!band) continue;
    band->measure = pairName(config.measures, i);
    bands.push_back(std::move(*band));
  }
  return bands;
}

std::optional<ReportedSensitivity> reportedSensitivity(const RunConfig& config, const SearchSpace& space,
                                                       const ResultTable& results) {
  const auto isBase = [](const ResultTable::Row& row) { return row.number == 1 && row.ok; };
  if (std::none_of(results.rows.begin(), results.rows.end(), isBase)) return std::nullopt;
  EarlierResults evaluator(config, space, results);
  const LocalSensitivity found = localSensitivity(config.sensitivity.local, space, evaluator);
  ReportedSensitivity reported;
  reported.parameters = space.names;
  for (const OutputMeasure& measure : config.measures) reported.outputs.push_back(measure.name);
  for (const ObjectiveFunction& objective : config.objectives) reported.outputs.push_back(objective.name);
  for (const SensitivityTable* table : {&found.measures, &found.objectives}) {
    appendColumns(reported.derivatives, table->derivatives);
    appendColumns(reported.dimensionless, table->scaled);
  }
  reported.composite = config.objectives.empty() ? found.measures.composite : found.objectives.composite;
  for (const std::size_t i : found.ranking) reported.ranking.push_back(space.names[i]);
  reported.covariance = findCovariance(results.closingLines, space.names);
  return reported;
}

}  // namespace mirevo
