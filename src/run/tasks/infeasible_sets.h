#pragma once

#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "common/parameter_set.h"
#include "run/tasks/task.h"

namespace mirevo {

/// What is said of sets that will be evaluated although they cannot be run.
struct InfeasibleSets {
  std::string text;      ///< empty: there are none
  bool endsRun = false;  ///< more of them than may fail

  /// As Task::setDoubts() returns it.
  std::vector<SetDoubt> doubts() const {
    return text.empty() ? std::vector<SetDoubt>() : std::vector{SetDoubt{text, endsRun}};
  }
};
/// As the following; for the user where the run will end early.
InfeasibleSets infeasibleSets(const Feasibility& feasibility, std::span<const ParameterSet> sets, std::string_view what,
                              int planned, std::string_view remedy = {});

/// Warns, before the first model run, of sets that will be evaluated although they cannot be run, with their numbers.
/// If more of them than may fail are among `planned` evaluations, the user is told, too. `sets` are the first
/// evaluations of the run, `what` they are called: "scenarios". `remedy` is one more sentence for the user
/// where some of the sets can be run, or empty.
void warnOfInfeasibleSets(const TaskContext& context, std::span<const ParameterSet> sets, std::string_view what,
                          int planned, std::string_view remedy = {});

/// The first of the sets that can be run; empty: none.
std::optional<ParameterSet> firstFeasible(const Feasibility& feasibility, std::span<const ParameterSet> sets);

}  // namespace mirevo
