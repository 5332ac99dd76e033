#include "run/tasks/task.h"

namespace mirevo {

std::vector<std::string> Task::summaryLines(const SearchSpace& /*space*/) const {
  return {};
}

std::vector<std::string> Task::neededSections(const SetupSection& /*target*/) const {
  return {std::string(sections().front()->path)};
}

std::vector<double> Task::givenValues(std::size_t /*parameter*/) const {
  return {};
}

std::optional<RaisedBudget> Task::raisedBudget(const SearchHistory& /*history*/) const {
  return std::nullopt;
}

void Task::continueFrom(const std::vector<EarlierSearch>& /*searches*/) {}

}  // namespace mirevo
