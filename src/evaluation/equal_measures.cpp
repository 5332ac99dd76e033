#include "evaluation/equal_measures.h"

#include <algorithm>
#include <utility>

#include <fmt/core.h>

#include "common/short_list.h"
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
  ShortList list(kMostNamed);
  for (const std::string& name : different) list.add(name);
  return list.text();
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
                                                 std::span<const EvaluationResult> results, bool isLast,
                                                 const std::set<std::size_t>& repeats) {
  if (isSettled_) return std::nullopt;
  for (std::size_t i = 0; i < results.size(); ++i) {
    if (!results[i].ok() || repeats.contains(i)) continue;
    std::vector<double> written = valuesAsWritten(fields_, space_, sets[i]);
    if (++runCount_ == 1) {
      measureValues_ = results[i].measureValues;
      hasChanged_.assign(measureValues_.size(), false);
      hasVaried_.assign(written.size(), false);
      written_ = std::move(written);
      continue;
    }
    for (std::size_t k = 0; k < measureValues_.size(); ++k) {
      if (results[i].measureValues[k] != measureValues_[k]) hasChanged_[k] = true;
    }
    for (std::size_t j = 0; j < written_.size(); ++j) {
      if (written[j] != written_[j]) hasVaried_[j] = true;
    }
    otherCount_ += written != written_ ? 1 : 0;
  }
  const auto isTrue = [](bool is) { return is; };
  const bool hasOneChanged = std::any_of(hasChanged_.begin(), hasChanged_.end(), isTrue);
  isSettled_ = runCount_ > 0;
  for (std::size_t k = 0; k < hasChanged_.size(); ++k) isSettled_ = isSettled_ && (hasChanged_[k] || isFixed(k));
  // A measure may well be the same in a few runs, such as a count; hardly all of them.
  const bool isEnough = (sets.size() > 1 && !hasOneChanged) || otherCount_ + 1 >= kEnoughRuns || isLast;
  if (isSettled_ || otherCount_ == 0 || !isEnough) return std::nullopt;
  // One measure may depend on a single parameter, and some tasks change one at a time.
  if (hasOneChanged && !isLast && !std::all_of(hasVaried_.begin(), hasVaried_.end(), isTrue)) return std::nullopt;
  isSettled_ = true;
  return warning(hasOneChanged);
}

std::string EqualMeasures::warning(bool hasOneChanged) const {
  std::vector<std::string> measures;
  std::vector<std::string> files;
  for (std::size_t i = 0; i < measures_.size(); ++i) {
    if (hasChanged_[i] || isFixed(i)) continue;
    measures.push_back(fmt::format("{} = {}", quotedForMessage(measures_[i]), formatReal(measureValues_[i])));
    files.push_back(resultFiles_[i]);
  }
  if (hasOneChanged) {
    return fmt::format(
        "All {} successful model runs so far have the same {}, though their parameters differ and other output "
        "measures change: is {} what is to be read, and does the model write it anew?",
        runCount_, listOf(measures), listOf(files));
  }
  return fmt::format(
      "All {} successful model runs so far have the same output measures, {}, though their parameters differ: does the "
      "model read {}, and does it write {} anew?",
      runCount_, listOf(measures), listOf(parameterFiles_), listOf(resultFiles_));
}

}  // namespace mirevo
