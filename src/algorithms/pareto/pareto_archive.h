#pragma once

#include <cstddef>
#include <limits>
#include <span>
#include <vector>

#include "algorithms/pareto/point_table.h"
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
  /// The values of the members, in their order.
  const PointTable& points() const { return points_; }
  std::vector<std::vector<double>> front() const;

  /// The values of a set that was on the front when it was evaluated.
  struct Entry {
    int evaluation = 0;  ///< counted from 1
    std::vector<double> values;
    int dominatedBy = std::numeric_limits<int>::max();  ///< the first evaluation that dominates it, if there is one
  };
  /// In that order.
  const std::vector<Entry>& entries() const { return entries_; }
  /// The front after so many evaluations, in their order.
  std::vector<std::vector<double>> frontAfter(int evaluations) const;

 private:
  int evaluationCount_ = 0;
  std::vector<FrontMember> members_;
  PointTable points_;
  std::vector<std::size_t> places_;  ///< of the members, among the entries
  std::vector<Entry> entries_;
};

}  // namespace mirevo
