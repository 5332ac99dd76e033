#include "run/tasks/task.h"

#include <algorithm>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {

namespace {

constexpr std::int64_t kMostSets = 10'000'000;

}  // namespace

std::optional<std::string> tooManySets(std::int64_t sets) {
  if (sets <= kMostSets) return std::nullopt;
  return fmt::format("expected at most {} sets", kMostSets);
}

std::optional<std::string> tooManySets(std::int64_t sets, std::size_t n) {
  constexpr std::int64_t kMostValues = 100'000'000;  // 800 MB
  const std::int64_t most = std::min(kMostSets, kMostValues / std::max(static_cast<std::int64_t>(n), std::int64_t{1}));
  if (sets <= most) return std::nullopt;
  return fmt::format("expected at most {} sets of {}, as all are in memory", most, countText(n, "parameter"));
}

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
