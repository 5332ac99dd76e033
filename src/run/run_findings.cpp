#include "run/run_findings.h"

#include <cstddef>
#include <utility>

#include <fmt/core.h>

#include "common/text.h"
#include "evaluation/evaluation_result.h"
#include "measures/statistics.h"
#include "run/setup/setup_summary.h"

namespace mirevo {

std::vector<std::string> validationFindings(const RunReporter& reporter, std::span<const OutputMeasure> measures,
                                            std::span<const ValidationPeriod> periods) {
  if (!reporter.best() || periods.empty()) return {};
  return validationLines(validationTable(measures, periods, reporter.judged(), reporter.best()->number));
}

void addFindings(const RunReporter& reporter, const ObjectiveAggregator& aggregator, ParameterModel& parameters,
                 std::span<const OutputMeasure> measures, std::span<const ValidationPeriod> periods,
                 std::vector<std::string>& lines) {
  if (reporter.best()) {
    const std::vector<std::string> scales = aggregator.scaleLines();
    lines.insert(lines.end(), scales.begin(), scales.end());
    const BestEvaluation& best = *reporter.best();
    lines.push_back(fmt::format("Best evaluation: {}", best.number));
    lines.push_back("Best aggregate: " + formatReal(best.aggregate));
    const std::vector<std::string>& names = parameters.searchSpace().names;
    for (std::size_t i = 0; i < names.size(); ++i) {
      lines.push_back(fmt::format("Best {} = {}", names[i], formatReal(best.parameterValues[i])));
    }
    for (const std::string& text : otherValueTexts(parameters, best.parameterValues)) lines.push_back("Best " + text);
    for (const OutputMeasure& measure : measures) {
      if (isCriterion(measure))
        lines.push_back(fmt::format("Statistic of {}: {}", measure.name, statisticWithBest(measure)));
    }
    for (std::string& line : validationFindings(reporter, measures, periods)) lines.push_back(std::move(line));
    for (const std::string& text : reporter.differencesOfBest()) lines.push_back("Warning: " + text);
  }
  const std::vector<std::string> compared = reporter.comparisonLines();
  lines.insert(lines.end(), compared.begin(), compared.end());
  const std::vector<std::string> differences = reporter.differenceLines();
  lines.insert(lines.end(), differences.begin(), differences.end());
}

void addFindings(const RunReporter& reporter, const ObjectiveAggregator& aggregator,
                 std::span<const ObjectiveFunction> objectives, RunRecord& record) {
  record.initialEvaluation = reporter.initial();
  if (const auto& best = reporter.best()) record.best = ShownEvaluation{best->number, best->aggregate};
  record.evaluations = reporter.evaluationCount();
  record.failed = reporter.failedCount();
  record.repeats = reporter.repeatCount();
  record.failuresByKind.clear();
  for (const auto& [kind, count] : reporter.failures().counts()) {
    record.failuresByKind.emplace_back(failureKindKey(kind), count.count);
  }
  record.lostRuns = reporter.lostRunCount();
  record.scales.clear();
  if (aggregator.scaleLines().empty()) return;  // there is no scale, or it is not known
  for (std::size_t i = 0; i < objectives.size(); ++i) {
    record.scales.push_back({objectives[i].name, aggregator.sigma()[i], aggregator.mu()[i]});
  }
}

}  // namespace mirevo
