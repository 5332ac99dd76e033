#pragma once

#include <cstddef>
#include <map>
#include <set>
#include <string>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "run/results/record_file.h"

namespace mirevo {

/// The simulated values at the observation times of every evaluation, for a task that works with them: the result file
/// does not hold them, and a restarted run needs those of the evaluations that it does not make again. Binary, a record
/// an evaluation: its number, the values, a checksum of both. It is no file for other programs: a run on a machine that
/// stores numbers in another way takes it for damaged and makes the evaluations again.
class SimulatedValuesFile final {
 public:
  /// `valueCount`: values of one evaluation.
  SimulatedValuesFile(std::string path, std::size_t valueCount);

  /// Makes the file anew. Throws FatalError.
  void create();
  /// Takes up the file of an interrupted run: keeps the records of the evaluations with those numbers, goes on behind
  /// them and returns their values by number. A record that is cut off or damaged, or of other evaluations, is left
  /// out. Throws FatalError when the file cannot be written.
  std::map<int, std::vector<double>> takeUp(const std::set<int>& numbers);

  /// The values of an evaluation that succeeded. Throws FatalError when they cannot be written.
  void add(const EvaluationResult& result);
  /// Throws FatalError when what was added did not all arrive.
  void close() { file_.close(); }

  const std::string& path() const { return path_; }

 private:
  std::string encode(int number, const std::vector<double>& values) const;

  std::string path_;
  std::size_t valueCount_;
  RecordFile file_;
};

}  // namespace mirevo
