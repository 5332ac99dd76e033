#pragma once

#include <cstddef>
#include <map>
#include <span>
#include <string>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "measures/observed_series.h"
#include "run/results/record_file.h"
#include "run/results/result_row.h"

namespace mirevo {

/// What a task keeps of an evaluation beside its row.
struct KeptValues {
  std::vector<double> simulatedValues;
  std::vector<double> exactMeasures;
};

/// The simulated values at the observation times of every evaluation, and its measures in 64 bits, for a task that uses
/// them: the result file does not hold them, and a restarted run needs those of the evaluations that it does not
/// repeat. Binary, one record per evaluation: its number, the values, the measures, a checksum of all and of the
/// parameter values and measures in its row. Not meant for
/// other programs: on a machine with another number format the file counts as damaged, and the evaluations are
/// repeated.
class SimulatedValuesFile final {
 public:
  /// `valueCount`: simulated values of one evaluation.
  SimulatedValuesFile(std::string path, std::size_t valueCount, SeriesPrecision precision = SeriesPrecision::single,
                      std::size_t exactMeasureCount = 0);

  /// Creates the file, replacing an existing one. Throws FatalError.
  void create();
  /// Continues the file of an interrupted run: keeps the records of the successful evaluations among `rows`, appends to
  /// them from now on, and returns their values by number. Records that are cut off, damaged or of other evaluations,
  /// perhaps of another run, are dropped, and so are all of a file of another precision. Throws FatalError when the
  /// file cannot be written.
  std::map<int, KeptValues> takeUp(std::span<const ResultRow> rows);

  /// Writes the values of a successful evaluation; `parameterValues` as in its row. Throws FatalError when that fails.
  void add(std::span<const double> parameterValues, const EvaluationResult& result);
  /// Throws FatalError if not everything written has reached the file.
  void close() { file_.close(); }

  const std::string& path() const { return path_; }

 private:
  std::string head() const;
  std::size_t recordedCount() const { return valueCount_ + exactMeasureCount_; }

  std::string path_;
  std::size_t valueCount_;
  SeriesPrecision precision_;
  std::size_t exactMeasureCount_;
  RecordFile file_;
};

}  // namespace mirevo
