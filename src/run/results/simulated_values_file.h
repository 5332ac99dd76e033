#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <map>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "measures/observed_series.h"
#include "run/results/record_file.h"
#include "run/results/result_rows.h"

namespace mirevo {

/// What a task keeps of an evaluation beside its row.
struct KeptValues {
  std::vector<double> simulatedValues;
  std::vector<double> exactMeasures;
};

/// The simulated values at the observation times of every evaluation, and its measures in 64 bits, for a task that uses
/// them: the result file does not hold them, and a restarted run needs those of the evaluations that it does not
/// repeat. Binary, one record per evaluation: its number, the values, the measures, a checksum of all and of the
/// parameter values and measures in its row. Not meant for other programs: on a machine with another number format the
/// file counts as damaged, and the evaluations are repeated. Of several records of an evaluation the last counts.
class SimulatedValuesFile final {
 public:
  /// `valueCount`: simulated values of one evaluation. `isReadBack`: the task reads them with valuesOf() and columns(),
  /// so that no one keeps them in memory. `timesChecksum`, where the times depend on more than observations: a file of
  /// other times is none of this run's.
  SimulatedValuesFile(std::string path, std::size_t valueCount, SeriesPrecision precision = SeriesPrecision::single,
                      std::size_t exactMeasureCount = 0, bool isReadBack = false,
                      std::optional<std::uint64_t> timesChecksum = {});

  /// Whether there is a file with values at other times.
  bool hasOtherTimes() const;
  /// Creates the file, replacing an existing one. Throws FatalError.
  void create();
  /// Continues the file of an interrupted run: appends to its records from now on, and returns what it has of the
  /// successful evaluations among `rows`; the simulated values are left out if they are read back. Records that are
  /// damaged or of other evaluations, perhaps of another run, are passed over, one that is cut off is removed, and so
  /// are all of a file of another precision or of other times. Throws FatalError when the file cannot be read or
  /// written.
  std::map<int, KeptValues> takeUp(const ResultRows& rows);

  /// Opens the file of another run, which is left as it is, to read what it has of the successful evaluations among
  /// `rows`; returns of how many. Empty where there is no such file, or one of another precision or of other times.
  std::optional<std::size_t> openToRead(const ResultRows& rows);

  /// Writes the values of a successful evaluation; `parameterValues` as in its row. Throws FatalError when that fails.
  void add(std::span<const double> parameterValues, const EvaluationResult& result);

  bool isReadBack() const { return isReadBack_; }
  /// The simulated values of an evaluation that was added or taken up. Throws FatalError if they cannot be read.
  std::vector<double> valuesOf(int number) const;
  /// Its measures in 64 bits.
  std::vector<double> exactMeasuresOf(int number) const;
  /// Of such evaluations the simulated values from index `first` on, `count` of each; those with the same index side
  /// by side, in the order of `numbers`. Throws FatalError if they cannot be read.
  std::vector<double> columns(std::span<const int> numbers, std::size_t first, std::size_t count) const;
  /// Throws FatalError if not everything written has reached the file.
  void close() { file_.close(); }

  const std::string& path() const { return path_; }

 private:
  std::string head() const;
  std::size_t recordedCount() const { return valueCount_ + exactMeasureCount_; }
  std::size_t contentLength() const { return sizeof(std::int64_t) + recordedCount() * sizeof(double); }
  std::size_t recordLength() const { return contentLength() + sizeof(std::uint64_t); }
  /// Notes where the records of the successful evaluations among `rows` are, and passes them on. Returns where the last
  /// whole record ends.
  std::int64_t walkRecords(const ResultRows& rows, const std::function<void(int number, const char* values)>& take);
  void addRowsToChecksums(const ResultRows& rows) const;
  void read(std::int64_t offset, char* bytes, std::size_t size) const;
  void noteOffset(int number, std::int64_t offset);
  std::int64_t offsetOf(int number) const;

  std::string path_;
  std::size_t valueCount_;
  SeriesPrecision precision_;
  std::size_t exactMeasureCount_;
  bool isReadBack_;
  std::optional<std::uint64_t> timesChecksum_;
  RecordFile file_;
  std::vector<std::int64_t> offsets_;  ///< of the record of each evaluation, from No. 1 on; 0: none
};

}  // namespace mirevo
