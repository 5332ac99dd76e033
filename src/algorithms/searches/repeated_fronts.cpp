#include "algorithms/searches/repeated_fronts.h"

#include <algorithm>
#include <limits>
#include <set>
#include <string>
#include <utility>

#include <fmt/core.h>

#include "algorithms/numbers/sample_summary.h"
#include "algorithms/pareto/front_scale.h"
#include "algorithms/searches/repetition_words.h"

namespace mirevo {
namespace {

std::vector<std::string> frontLines(std::span<const Repetition> repetitions, std::int32_t planned) {
  std::vector<std::string> lines{repetitionHeading(repetitions.size(), planned)};
  lines.push_back(fmt::format("   {:>3} {:>11} {:>11} {:>7} {:>7} {:>12} {:>11}  {}", "No.", "seed", "evaluations",
                              "front", "of all", "hypervolume", "compromise", "why it stopped"));
  int number = 0;
  for (const Repetition& repetition : repetitions) {
    const RepetitionFront& front = *repetition.front;
    const bool hasFront = front.size > 0;
    lines.push_back(fmt::format(
        "   {:>3} {:>11} {:>11} {:>7} {:>7} {:>12} {:>11}  {}", ++number, repetition.seed, repetition.evaluations,
        front.size, front.sharedSize, hasFront ? fmt::format("{:.6g}", front.hypervolume) : "none",
        hasFront ? fmt::format("No. {}", repetition.bestEvaluation) : "", whyItStopped(repetition)));
  }
  return lines;
}

/// A table of one value of each objective in each front.
void addObjectives(const std::string& corner, const std::vector<const Repetition*>& ended,
                   std::vector<double> RepetitionFront::*values, std::span<const std::string> objectives,
                   std::vector<std::string>& lines) {
  static const std::string kHeadings[] = {"least", "median", "greatest"};
  std::vector<std::vector<double>> rows;
  for (std::size_t i = 0; i < objectives.size(); ++i) {
    std::vector<double> column;
    column.reserve(ended.size());
    for (const Repetition* one : ended) column.push_back(((*one->front).*values)[i]);
    const Spread spread = spreadOf(std::move(column));
    rows.push_back({spread.least, spread.median, spread.greatest});
  }
  for (std::string& line : formatTable(corner, kHeadings, objectives, rows)) lines.push_back(std::move(line));
}

std::string verdictText(const FrontAgreement& agreement, std::span<const double> hypervolumes, double ofAll) {
  if (agreement.verdict == FrontAgreement::Verdict::noSearch) {
    return "No repetition had evaluations left after the sets that it began with, so that no search was made: the "
           "fronts are those of these sets, and tell nothing of it. A larger budget can";
  }
  if (agreement.verdict == FrontAgreement::Verdict::oneSet) {
    return fmt::format(
        "Whatever the seed, the search found nearly the same single set, within {:g} % of the hypervolume of all, so "
        "that there is no trade-off to compare: it is the best in every objective, or nothing better than the start "
        "was found",
        100.0 * kNearlyEqualShare);
  }
  if (agreement.verdict == FrontAgreement::Verdict::agree) {
    return fmt::format(
        "Whatever the seed, the search found nearly the same front: each hypervolume is within {:g} % of that of all",
        100.0 * kNearlyEqualShare);
  }
  const auto behind = std::ranges::count(hypervolumes, 0.0);
  return fmt::format(
      "The search has not found the same front each time: {} of {} repetitions come within {:g} % of the hypervolume "
      "of all, and {}. For a single search to come near it: a larger budget or population, or another search",
      agreement.near, hypervolumes.size(), 100.0 * kNearlyEqualShare,
      behind > 0 ? fmt::format("{} behind the reference point altogether",
                               behind == 1 ? "one lies" : fmt::format("{} lie", behind))
                 : fmt::format("the least is {:.3g} % below it",
                               100.0 * (1.0 - *std::ranges::min_element(hypervolumes) / ofAll)));
}

}  // namespace

void addToArchive(ParetoArchive& archive, const ParameterSet& set, const EvaluationResult& result) {
  if (hasObjectives(result)) {
    archive.add(result.number, set, result.objectiveValues);
  } else {
    archive.addFailed();
  }
}

void RepeatedFronts::describe(const ParetoArchive& ofAll, std::span<const double> reference,
                              const std::function<double(std::span<const double>)>& aggregate,
                              std::span<Repetition> repetitions) const {
  for (Repetition& one : repetitions) one.front.emplace();
  const std::vector<std::vector<double>> all = ofAll.front();
  if (all.empty()) return;
  const FrontScale scale(all, reference);
  const double hypervolumeOfAll = scale.hypervolumeShare(all);
  // Not by number: of equal values the front of all has the first alone, whichever repetition found it.
  const std::set<std::vector<double>> valuesOfAll(all.begin(), all.end());
  for (std::size_t i = 0; i < repetitions.size(); ++i) {
    RepetitionFront& front = *repetitions[i].front;
    front.hypervolumeOfAll = hypervolumeOfAll;
    front.sizeOfAll = all.size();
    const std::vector<FrontMember>& members = problems_[i].archive.members();
    if (members.empty()) continue;
    front.hypervolume = scale.hypervolumeShare(problems_[i].archive.front());
    front.size = members.size();
    front.least = members.front().values;
    for (const FrontMember& member : members) {
      front.sharedSize += valuesOfAll.count(member.values);
      for (std::size_t k = 0; k < front.least.size(); ++k) front.least[k] = std::min(front.least[k], member.values[k]);
    }
    const auto distance = [&scale](const FrontMember& member) { return scale.distance(member.values); };
    const FrontMember& compromise = *std::ranges::min_element(members, {}, distance);
    front.compromise = compromise.values;
    repetitions[i].bestEvaluation = compromise.number;
    repetitions[i].best = compromise.set;
    repetitions[i].aggregate = aggregate ? aggregate(compromise.values) : std::numeric_limits<double>::quiet_NaN();
  }
}

std::vector<std::string> repeatedFrontLines(std::span<const Repetition> repetitions, const SearchSpace& space,
                                            std::span<const std::string> objectives, std::int32_t planned) {
  std::vector<std::string> lines = frontLines(repetitions, planned);
  const std::string withoutText = withoutBestText(repetitions);
  if (!withoutText.empty()) lines.push_back("Warning: " + withoutText);
  std::vector<const Repetition*> ended;
  std::vector<double> hypervolumes;
  std::int64_t loops = 0;
  for (const Repetition& one : repetitions) {
    if (one.termination.empty() || one.front->size == 0) continue;
    loops += one.loops;
    ended.push_back(&one);
    hypervolumes.push_back(one.front->hypervolume);
  }
  if (ended.size() < 2) return lines;
  const double ofAll = ended.front()->front->hypervolumeOfAll;
  const Spread spread = spreadOf(hypervolumes);
  lines.push_back(fmt::format(
      "Hypervolumes, on the scale of the front of all: least {:.6g}, median {:.6g}, greatest {:.6g}; of all {:.6g}",
      spread.least, spread.median, spread.greatest, ofAll));
  addObjectives("Least values of the fronts", ended, &RepetitionFront::least, objectives, lines);
  addObjectives("Objectives of the compromises", ended, &RepetitionFront::compromise, objectives, lines);
  static const std::string kHeadings[] = {"least", "median", "greatest", "% of range"};
  for (std::string& line :
       formatTable("Parameters of the compromises", kHeadings, space.names, parameterSpreads(ended, space))) {
    lines.push_back(std::move(line));
  }
  const FrontAgreement agreement = frontAgreement(hypervolumes, ofAll, ended.front()->front->sizeOfAll, loops);
  if (agreement.verdict != FrontAgreement::Verdict::none) {
    lines.push_back(verdictText(agreement, hypervolumes, ofAll));
  }
  return lines;
}

}  // namespace mirevo
