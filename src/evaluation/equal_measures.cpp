#include "evaluation/equal_measures.h"

#include <algorithm>
#include <utility>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {
namespace {

constexpr int kEnoughRuns = 20;
constexpr std::size_t kMostNamed = 5;

/// "a, b and 3 more"; repeated names once.
std::string listOf(std::span<const std::string> names) {
  std::vector<std::string> different;
  for (const std::string& name : names) {
    if (std::find(different.begin(), different.end(), name) == different.end()) different.push_back(name);
  }
  const std::size_t shown = std::min(different.size(), kMostNamed);
  std::string list;
  for (std::size_t i = 0; i < shown; ++i) list += (i == 0 ? "" : ", ") + different[i];
  if (shown < different.size()) list += fmt::format(" and {} more", different.size() - shown);
  return list;
}

}  // namespace

EqualMeasures::EqualMeasures(SearchSpace space, ParameterFields fields, std::vector<std::string> measures,
                             std::vector<std::string> parameterFiles, std::vector<std::string> resultFiles)
    : space_(std::move(space)),
      fields_(std::move(fields)),
      measures_(std::move(measures)),
      parameterFiles_(std::move(parameterFiles)),
      resultFiles_(std::move(resultFiles)),
      isSettled_(false) {}

std::optional<std::string> EqualMeasures::findIn(std::span<const ParameterSet> sets,
                                                 std::span<const EvaluationResult> results, bool isLast) {
  if (isSettled_) return std::nullopt;
  for (std::size_t i = 0; i < results.size(); ++i) {
    if (!results[i].ok()) continue;
    std::vector<double> written = valuesAsWritten(fields_, space_, sets[i]);
    if (++runCount_ == 1) {
      measureValues_ = results[i].measureValues;
      written_ = std::move(written);
      continue;
    }
    isSettled_ = results[i].measureValues != measureValues_;
    if (isSettled_) return std::nullopt;
    otherCount_ += written != written_ ? 1 : 0;
  }
  const bool isEnough = sets.size() > 1 || otherCount_ + 1 >= kEnoughRuns || isLast;
  if (otherCount_ == 0 || !isEnough) return std::nullopt;
  isSettled_ = true;
  return warning();
}

std::string EqualMeasures::warning() const {
  std::vector<std::string> measures;
  for (std::size_t i = 0; i < measures_.size(); ++i) {
    measures.push_back(fmt::format("{} = {}", quotedForMessage(measures_[i]), formatReal(measureValues_[i])));
  }
  return fmt::format(
      "All {} successful model runs so far have the same output measures, {}, though their parameters differ: does the "
      "model read {}, and does it write {} anew?",
      runCount_, listOf(measures), listOf(parameterFiles_), listOf(resultFiles_));
}

}  // namespace mirevo
