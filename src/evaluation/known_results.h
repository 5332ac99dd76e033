#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <unordered_map>
#include <vector>

#include "evaluation/evaluation_result.h"
#include "measures/objective_functions.h"
#include "parameters/search_space.h"

namespace mirevo {

/// Which sets of a run have succeeded or are being run, so that none is run twice. Two sets are the same if all values
/// that the model gets are, bit for bit: those of the variable parameters on the model scale, from which all others
/// follow. Of an evaluation only its number and a hash are kept, about 40 bytes; its result is read back from the
/// files of the run.
class KnownResults final {
 public:
  /// Knows nothing: every set is run.
  KnownResults() = default;
  /// The aggregator must outlive the object.
  KnownResults(SearchSpace space, const ObjectiveAggregator& aggregator)
      : space_(std::move(space)), aggregator_(&aggregator) {}

  struct Step {
    enum class Kind { run, wait, repeat };
    Kind kind = Kind::run;
    int original = 0;  ///< of a repeat: the number of the earlier evaluation of what is probably the same set
  };
  /// What is to be done about a set whose turn it is. One that is to be run counts as running until ended() or
  /// putBack(); one that waits does so for an equal set that is running, until ended() names it.
  Step next(int number, std::span<const double> set);
  /// The set is run, whatever is known.
  void run(int number, std::span<const double> set);
  /// A set that was to be run has not been, and its turn will come again.
  void putBack(int number, std::span<const double> set);
  /// An evaluation has its result. Returns the numbers of those that waited for it, whose turn it is again.
  std::vector<int> ended(int number, std::span<const double> set, bool hasSucceeded);
  /// No set is running or waiting any more.
  void closeBatch();

  /// The aggregate of the objective functions at this point of the run.
  double aggregateOf(const EvaluationResult& result) const { return aggregator_->aggregate(result.objectiveValues); }

  /// False: every set is run.
  bool isKnowing() const { return aggregator_ != nullptr; }
  /// The same for sets that are the same, and rarely for others.
  std::uint64_t hashOf(std::span<const double> set) const;

 private:
  SearchSpace space_;
  const ObjectiveAggregator* aggregator_ = nullptr;  ///< null: nothing is known
  // By hash. Of two sets with the same hash one is run without need to wait, or waits without need; both are rare.
  std::unordered_map<std::uint64_t, int> succeeded_;  ///< of each set the first
  std::unordered_map<std::uint64_t, int> running_;
  std::unordered_map<std::uint64_t, std::vector<int>> waiting_;
};

}  // namespace mirevo
