#pragma once

#include <cstddef>
#include <span>
#include <vector>

#include "common/parameter_set.h"

namespace mirevo {

/// A set that no other dominates.
struct FrontMember {
  int number = 0;  ///< of its evaluation
  ParameterSet set;
  std::vector<double> values;  ///< of the objectives
};

/// All sets of a search that no other one of it dominates, the front, and how it came about. Of sets with equal values
/// of all objectives the first one stays.
class ParetoArchive final {
 public:
  /// Takes the next evaluation, a successful one. Whether it is on the front now.
  bool add(int number, const ParameterSet& set, const std::vector<double>& values);
  /// The next evaluation has failed.
  void addFailed() { ++evaluationCount_; }

  int evaluationCount() const { return evaluationCount_; }
  /// In the order of their evaluations.
  const std::vector<FrontMember>& members() const { return members_; }
  std::vector<std::vector<double>> front() const;

  /// The values of a set that was on the front when it was evaluated.
  struct Entry {
    int evaluation = 0;  ///< counted from 1
    std::vector<double> values;
  };
  /// In that order. A front of the past is what no entry up to then dominates.
  const std::vector<Entry>& entries() const { return entries_; }

 private:
  int evaluationCount_ = 0;
  std::vector<FrontMember> members_;
  std::vector<Entry> entries_;
};

/// The front after each of so many first `evaluations` (ascending).
class FrontHistory final {
 public:
  /// The entries must outlive the object.
  explicit FrontHistory(std::span<const ParetoArchive::Entry> entries) : entries_(entries) {}
  /// Evaluations never decrease from call to call.
  const std::vector<std::vector<double>>& frontAfter(int evaluations);

 private:
  std::span<const ParetoArchive::Entry> entries_;
  std::size_t next_ = 0;
  std::vector<std::vector<double>> front_;
};

}  // namespace mirevo
