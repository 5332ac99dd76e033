#include "run/tasks/infeasible_sets.h"

#include <algorithm>
#include <utility>

#include <fmt/format.h>

#include "common/short_list.h"
#include "evaluation/failed_run_policy.h"

namespace mirevo {
namespace {

constexpr std::size_t kMostNumbers = 20;  // in the warning

}  // namespace

InfeasibleSets infeasibleSets(const Feasibility& feasibility, std::span<const ParameterSet> sets, std::string_view what,
                              int planned, std::string_view remedy) {
  if (!feasibility.isTested()) return {};
  ShortList numbers(kMostNumbers);
  std::string first;
  for (std::size_t i = 0; i < sets.size(); ++i) {
    const std::optional<std::string> violation = feasibility.violation(sets[i]);
    if (!violation) continue;
    if (numbers.isEmpty()) first = fmt::format("No. {}: {}", i + 1, *violation);
    numbers.add(std::to_string(i + 1));
  }
  const std::size_t count = numbers.count();
  if (count == 0) return {};
  std::string text =
      fmt::format("{} of {} {} {} not run and {}, as {} a constraint or an equation has no finite value: No. {}\n   {}",
                  count, sets.size(), what, count == 1 ? "is" : "are", count == 1 ? "fails" : "fail",
                  count == 1 ? "it violates" : "they violate", numbers.text(), first);
  const int limit = FailedRunPolicy(planned).limit();
  const bool endsRun = count > static_cast<std::size_t>(limit);
  if (endsRun) {
    text += fmt::format("\n   The run will end before it is complete: at most {} may fail, a tenth of the {} planned",
                        limit, planned);
    if (count == sets.size()) {
      text += fmt::format("\n   None of the {} can be run: check the constraints, the equations and the values", what);
    } else if (!remedy.empty()) {
      text.append("\n   ").append(remedy);
    }
  }
  return {std::move(text), endsRun};
}

void warnOfInfeasibleSets(const TaskContext& context, std::span<const ParameterSet> sets, std::string_view what,
                          int planned, std::string_view remedy) {
  const InfeasibleSets found = infeasibleSets(context.feasibility, sets, what, planned, remedy);
  if (found.text.empty()) return;
  if (found.endsRun && context.warnUser) {
    context.warnUser(found.text);
  } else {
    context.log.warning(found.text);
  }
}

std::optional<ParameterSet> firstFeasible(const Feasibility& feasibility, std::span<const ParameterSet> sets) {
  const auto found = std::ranges::find_if(sets, [&](const ParameterSet& set) { return feasibility.holds(set); });
  if (found == sets.end()) return std::nullopt;
  return *found;
}

}  // namespace mirevo
