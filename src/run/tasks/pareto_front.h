#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "algorithms/searches/pareto_search.h"
#include "algorithms/searches/search_algorithm.h"
#include "run/tasks/task.h"

namespace mirevo {

/// Whether the model has series that can be kept of the front.
bool hasSeriesOfFront(std::span<const OutputMeasure> measures);

/// Refuses a search for a front where there is no trade-off, and a reference point that does not fit.
void requireObjectives(const SetupSection& section, std::string_view keyword, const SetupSection& control,
                       std::span<const ObjectiveFunction> objectives, std::string_view search,
                       const ParetoSettings& settings);

/// What a search for a front works on, and what is said of the front: its sets and their series, how it came about, and
/// which of its sets is suggested.
class FrontFinding final {
 public:
  explicit FrontFinding(const ParetoSettings& settings) : settings_(settings) {}

  ParetoProblem& problem() { return problem_; }
  int evaluationCount() const { return problem_.archive.evaluationCount(); }
  bool hasFront() const { return !problem_.archive.members().empty(); }
  /// The set of the front that is suggested; nullptr without a front.
  const FrontMember* suggested() const;

  /// Adds lines, tables and the series to the outcome. Without a front it adds that alone. `best`: the number of the
  /// best evaluation, 0 if it is not known.
  void addFront(const TaskContext& context, int best, TaskOutcome& outcome) const;
  std::vector<std::string> courseLines(bool isBudgetUsed) const;

 private:
  DataTable frontTable(const TaskContext& context) const;
  DataTable courseTable() const;
  void addSeries(const TaskContext& context, TaskOutcome& outcome) const;

  const ParetoSettings& settings_;
  ParetoProblem problem_;
};

}  // namespace mirevo
