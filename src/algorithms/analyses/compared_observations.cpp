#include "algorithms/analyses/compared_observations.h"

#include <algorithm>

#include <fmt/core.h>

#include "common/text.h"

namespace mirevo {

ComparedObservations::ComparedObservations(std::span<const EvaluationResult> results) : results_(results) {
  const auto initial = std::find_if(results.begin(), results.end(), [](const EvaluationResult& result) {
    return result.ok() && !result.pairs.empty();
  });
  if (initial != results.end()) initial_ = initial->pairs;
}

const MeasurePairs* ComparedObservations::pairsOf(std::size_t i, std::size_t measure) const {
  const std::span<const MeasurePairs> pairs = results_[i].pairs.empty() ? initial_ : results_[i].pairs;
  const auto found =
      std::find_if(pairs.begin(), pairs.end(), [&](const MeasurePairs& each) { return each.measure == measure; });
  return found == pairs.end() ? nullptr : &*found;
}

bool ComparedObservations::areSame(std::size_t a, std::size_t b, std::size_t measure) const {
  const MeasurePairs* const ofA = pairsOf(a, measure);
  const MeasurePairs* const ofB = pairsOf(b, measure);
  return ofA == nullptr || ofB == nullptr || ofA->hasObservationsOf(*ofB);
}

bool ComparedObservations::areSame(std::size_t a, std::size_t b) const {
  return std::all_of(initial_.begin(), initial_.end(),
                     [&](const MeasurePairs& each) { return areSame(a, b, each.measure); });
}

std::string ComparedObservations::differenceText(std::size_t one, std::size_t other, std::size_t measure,
                                                 const std::string& otherName) const {
  const std::size_t count = pairsOf(one, measure)->count;
  const std::size_t otherCount = pairsOf(other, measure)->count;
  return fmt::format("evaluation {} has {} of simulated and observed values, {} {}", results_[one].number,
                     countText(count, "pair"), otherName,
                     count == otherCount ? "as many, of other observations" : std::to_string(otherCount));
}

IncomparableOutputs ofObjectives(const IncomparableOutputs& ofMeasures, std::span<const ObjectiveFunction> objectives) {
  IncomparableOutputs found;
  for (const std::vector<std::string>& reasons : ofMeasures) {
    std::vector<std::string>& row = found.emplace_back(objectives.size());
    for (std::size_t i = 0; i < objectives.size() && !reasons.empty(); ++i) {
      for (const MeasureTerm& term : objectives[i].measures) {
        if (row[i].empty()) row[i] = reasons.at(term.index);
      }
    }
  }
  return found;
}

}  // namespace mirevo
