#pragma once

#include <cstdint>
#include <optional>
#include <span>

#include "common/date_record.h"
#include "measures/observed_series.h"
#include "measures/output_measure.h"

namespace mirevo {

/// Simulated values are kept at every simulated step, too, and not at the times of the observations alone.
struct KeptSteps {
  std::optional<DateRecord> end;  ///< of the steps; empty: that of the evaluation period, which it is not before
};

/// Adds to each series the times of the simulated steps in the period, with NaN in place of an observed value. The
/// steps are those of the simulated files as they are in the base folder, so that they are the same for all
/// evaluations, for all processes of a job and after a restart. Throws FatalError if one has none.
void addSimulatedSteps(const KeptSteps& kept, std::span<const OutputMeasure> measures, const EvaluationPeriod& period,
                       std::span<ObservedSeries> observed);

/// Of all times of the series: others have another one.
std::uint64_t checksumOfTimes(std::span<const ObservedSeries> observed);

}  // namespace mirevo
