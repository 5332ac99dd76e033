#include "run/results/validation_table.h"

#include <algorithm>
#include <cmath>
#include <tuple>
#include <utility>

#include <fmt/core.h>

#include "algorithms/numbers/sample_summary.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr std::size_t kShare = 10;  ///< one of so many evaluations is among the best
constexpr double kMedian = 0.5;

using Evaluations = std::vector<const JudgedEvaluation*>;

/// From the best to the worst; of equal sets, such as those of the final model run, the first.
Evaluations differentSets(std::span<const JudgedEvaluation> evaluations) {
  Evaluations sorted;
  for (const JudgedEvaluation& evaluation : evaluations) {
    if (!std::isnan(evaluation.aggregate)) sorted.push_back(&evaluation);
  }
  const auto order = [](const JudgedEvaluation* evaluation) {
    return std::tie(evaluation->aggregate, evaluation->parameters, evaluation->number);
  };
  std::sort(sorted.begin(), sorted.end(), [&](auto* a, auto* b) { return order(a) < order(b); });
  const auto isSame = [](auto* a, auto* b) { return a->aggregate == b->aggregate && a->parameters == b->parameters; };
  sorted.erase(std::unique(sorted.begin(), sorted.end(), isSame), sorted.end());
  return sorted;
}

/// The best tenth, of those from the best to the worst.
std::span<const JudgedEvaluation* const> bestOf(const Evaluations& sorted) {
  const std::size_t count = (sorted.size() + kShare - 1) / kShare;
  if (count < 2 || sorted.front()->aggregate == sorted.back()->aggregate) return {};
  return std::span(sorted).first(count);
}

/// `valueOf(evaluation)`: of the measure in the period.
template <class ValueOf>
ValidationRange rangeOf(const JudgedEvaluation& best, std::span<const JudgedEvaluation* const> tenth,
                        const ValueOf& valueOf) {
  std::vector<double> values;
  for (const JudgedEvaluation* evaluation : tenth) {
    if (const double value = valueOf(*evaluation); !std::isnan(value)) values.push_back(value);
  }
  std::sort(values.begin(), values.end());
  return {valueOf(best), sortedQuantile(values, 0.0), sortedQuantile(values, kMedian), sortedQuantile(values, 1.0)};
}

/// Of how many observations the value is, unless it is of all in every evaluation of which that is known.
std::string lackOf(std::size_t value, const JudgedEvaluation& best, std::span<const JudgedEvaluation* const> tenth,
                   std::span<const JudgedEvaluation> evaluations) {
  std::size_t known = 0;
  std::size_t lacking = 0;
  for (const JudgedEvaluation& one : evaluations) {
    if (one.pairs.empty()) continue;
    ++known;
    if (one.pairs[value].missingCount > 0) ++lacking;
  }
  if (lacking == 0) return {};
  std::vector<std::size_t> counts;
  for (const JudgedEvaluation* one : tenth) {
    if (!one->pairs.empty()) counts.push_back(one->pairs[value].count);
  }
  std::sort(counts.begin(), counts.end());
  std::string text = fmt::format(
      "of a number of observations that is not known in evaluation {}, which an earlier run "
      "made",
      best.number);
  if (!best.pairs.empty()) {
    const ValidationPairs& pairs = best.pairs[value];
    text = fmt::format("of {} of {} observations in evaluation {}", pairs.count, pairs.count + pairs.missingCount,
                       best.number);
  }
  if (!counts.empty()) {
    const std::string most = counts.front() == counts.back() ? "" : fmt::format(" to {}", counts.back());
    text += fmt::format(", of {}{} in the best tenth", counts.front(), most);
  }
  return text + fmt::format("; in {} of {} evaluations some have no simulated value", lacking, known);
}

}  // namespace

ValidationTable validationTable(std::span<const OutputMeasure> measures, std::span<const ValidationPeriod> periods,
                                std::span<const JudgedEvaluation> evaluations, int bestNumber) {
  ValidationTable table;
  const auto best = std::find_if(evaluations.begin(), evaluations.end(),
                                 [bestNumber](const auto& evaluation) { return evaluation.number == bestNumber; });
  const std::vector<ValidationTarget> targets = validationTargets(measures, periods);
  if (targets.empty() || best == evaluations.end()) return table;
  const Evaluations sorted = differentSets(evaluations);
  const auto tenth = bestOf(sorted);
  table.bestNumber = bestNumber;
  table.tenth = tenth.size();
  table.count = sorted.size();
  table.periods.emplace_back("Calibration");
  for (const ValidationPeriod& period : periods) table.periods.push_back(period.name);
  for (std::size_t k = 0; k < targets.size(); ++k) {
    const std::size_t measure = targets[k].measure;
    if (targets[k].period == 0) {
      table.measures.push_back(measure);
      table.names.emplace_back(trimTrailing(measures[measure].name));
      table.values.push_back({rangeOf(*best, tenth, [measure](const auto& one) { return one.measures[measure]; })});
    }
    table.values[k % table.measures.size()].push_back(
        rangeOf(*best, tenth, [k](const auto& one) { return one.validation[k]; }));
    if (const std::string lack = lackOf(k, *best, tenth, evaluations); !lack.empty()) {
      table.lacks.push_back(
          fmt::format("{} in {}: {}", trimTrailing(measures[measure].name), periods[targets[k].period].name, lack));
    }
  }
  return table;
}

std::vector<std::string> validationLines(const ValidationTable& table) {
  if (table.measures.empty()) return {};
  std::vector<std::string> names;
  std::vector<std::vector<double>> rows;
  const auto add = [&](std::string name, const std::vector<ValidationRange>& ranges, double ValidationRange::*value) {
    names.push_back(std::move(name));
    std::vector<double>& row = rows.emplace_back();
    for (const ValidationRange& range : ranges) row.push_back(range.*value);
  };
  for (std::size_t i = 0; i < table.measures.size(); ++i) {
    add(table.names[i], table.values[i], &ValidationRange::best);
    if (table.tenth == 0) continue;
    add("  least of the best tenth", table.values[i], &ValidationRange::least);
    add("  median of the best tenth", table.values[i], &ValidationRange::median);
    add("  largest of the best tenth", table.values[i], &ValidationRange::largest);
  }
  std::vector<std::string> lines{fmt::format("Calibration and validation, evaluation {}{}:", table.bestNumber,
                                             table.tenth == 0 ? ""
                                                              : fmt::format(" and the best tenth, {} of {} different "
                                                                            "sets by their aggregates",
                                                                            table.tenth, table.count))};
  for (std::string& line : formatTable("Output measure", table.periods, names, rows)) lines.push_back(std::move(line));
  lines.insert(lines.end(), table.lacks.begin(), table.lacks.end());
  return lines;
}

}  // namespace mirevo
