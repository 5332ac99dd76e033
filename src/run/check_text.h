#pragma once

#include <span>
#include <string>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "evaluation/run_comparison.h"
#include "measures/period_series.h"
#include "run/setup/run_config.h"

namespace mirevo {

/// What a successful model run was judged by, and what is needed to tell of it.
struct CheckedRun {
  const RunConfig& config;
  const EvaluationResult& result;              ///< with its series
  std::span<const MeasureSource> sources;      ///< one per output measure
  std::span<const std::size_t> shown;          ///< the measures to which the series belong, 0-based
  std::span<const PeriodSeries> observations;  ///< one per such measure
  bool hasAggregate = true;                    ///< it does not depend on an initial sample
};

/// For people: of each output measure its value, the first and the last value of its two series in the period with
/// their times, and its pairs; then the objective functions and the aggregate.
std::vector<std::string> checkedRunLines(const CheckedRun& run);

}  // namespace mirevo
