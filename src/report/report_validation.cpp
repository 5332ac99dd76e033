#include "report/report_validation.h"

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <type_traits>
#include <utility>

#include "common/calendar.h"
#include "measures/observation_selection.h"
#include "measures/period_series.h"

namespace mirevo {
namespace {

ReportedPeriod reportedPeriod(std::string name, const DateRecord& start, const DateRecord& end, bool isValidation) {
  return {std::move(name), formatDate(start), formatDate(end), secondNumber(start), secondNumber(end), isValidation};
}

/// Observations outside the period may count in one of validation.
void leaveCounted(const EvaluationPeriod& period, ShownSeries& series) {
  const std::int64_t first = secondNumber(period.start);
  const std::int64_t last = secondNumber(period.end);
  for (std::size_t i = 0; i < series.seconds.size() && i < series.observed.size(); ++i) {
    const bool isInside = series.seconds[i] >= first && series.seconds[i] <= last;
    if (!isInside) series.observed[i] = std::numeric_limits<float>::quiet_NaN();
  }
}

}  // namespace

ShownSeries partOf(const ShownSeries& series, std::int64_t first, std::int64_t last) {
  const auto begin = std::lower_bound(series.seconds.begin(), series.seconds.end(), first) - series.seconds.begin();
  const auto end = std::upper_bound(series.seconds.begin(), series.seconds.end(), last) - series.seconds.begin();
  const auto cut = [begin, end](const auto& values) {
    using Values = std::decay_t<decltype(values)>;
    return end > begin ? Values(values.begin() + begin, values.begin() + end) : Values{};
  };
  return {series.measure, cut(series.seconds), cut(series.observed), cut(series.initial), cut(series.best)};
}

void addValidation(const RunConfig& config, std::span<const ResultRow> rows, const ResultRow* best, ReportData& data) {
  if (config.validationPeriods.empty()) return;
  data.periods.push_back(reportedPeriod("Calibration", config.period.start, config.period.end, false));
  for (const ValidationPeriod& period : config.validationPeriods) {
    data.periods.push_back(reportedPeriod(period.name, period.start, period.end, true));
  }
  if (best != nullptr) {
    std::vector<JudgedEvaluation> evaluations;
    for (const ResultRow& row : rows) {
      if (row.ok) evaluations.push_back({row.number, row.aggregate, row.parameters, row.measures, row.validation});
    }
    data.validation = validationTable(config.measures, config.validationPeriods, evaluations, best->number);
  }
  for (const std::string& line : data.series.headLines) {
    if (!line.starts_with("The series of the best evaluation") ||
        line.find(kInEvaluationPeriodAlone) == std::string::npos)
      continue;
    data.bestLacksValidation = true;
    data.run.notes.push_back(line + ". The figures of the validation periods that are made from them are left out.");
  }
  data.wholeSeries = data.series.series;
  for (std::size_t i = 0; i < data.series.series.size(); ++i) {
    ShownSeries& series = data.series.series[i];
    series = partOf(series, data.periodFirst, data.periodLast);
    leaveCounted(countedPeriod(config.measures[data.seriesMeasures[i]], config.period), series);
  }
}

}  // namespace mirevo
