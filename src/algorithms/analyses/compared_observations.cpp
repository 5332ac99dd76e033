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

std::vector<std::string> mixedObservations(std::span<const EvaluationResult> results,
                                           std::span<const std::string> measures) {
  const auto isOk = [](const EvaluationResult& result) { return result.ok(); };
  const auto first = static_cast<std::size_t>(std::ranges::find_if(results, isOk) - results.begin());
  const ComparedObservations compared(results);
  std::vector<std::string> texts;
  for (std::size_t measure = 0; first < results.size() && measure < measures.size(); ++measure) {
    std::size_t count = 0;
    std::string difference;
    for (std::size_t i = first + 1; i < results.size(); ++i) {
      if (!results[i].ok() || compared.areSame(i, first, measure)) continue;
      if (count++ == 0) difference = compared.differenceText(i, first, measure, "the first successful run");
    }
    if (count == 0) continue;
    texts.push_back(fmt::format(
        "{}: {} of {} {} judged by other observations than the first successful run ({}), and what depends on the "
        "parameters may be which observations are used. A model that stops early should count as failed",
        measures[measure], count, countText(static_cast<std::size_t>(std::ranges::count_if(results, isOk)), "run"),
        count == 1 ? "is" : "are", difference));
  }
  return texts;
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
