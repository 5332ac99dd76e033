#pragma once

#include <cstddef>
#include <cstdint>

#include "measures/output_measure.h"
#include "platform/series/time_series_object.h"

namespace mirevo {

/// What tells, of a file that a model run wrote, whether something of it is missing: compared with that of another run.
struct FileForm {
  bool endsLine = true;         ///< the last line has an end; true for a format without lines
  std::size_t numberCount = 0;  ///< of an output-measure file
  std::size_t stepCount = 0;    ///< of a series: time steps in the evaluation period
  /// secondNumber() of the first and the last time step of a series; equal, and 0, if they are not known.
  std::int64_t firstStep = 0;
  std::int64_t lastStep = 0;
  /// secondNumber() of the two successive steps that are farthest apart, the first such, of those between which a part
  /// of the period lies; equal without any.
  std::int64_t gapStart = 0;
  std::int64_t gapEnd = 0;

  bool operator==(const FileForm&) const = default;
};

FileForm formOfSeries(const TimeSeriesObject& series, const EvaluationPeriod& period);

}  // namespace mirevo
