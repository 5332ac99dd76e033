#include <algorithm>
#include <cmath>
#include <limits>

#include <fmt/format.h>

#include "algorithms/analyses/glue.h"
#include "common/column_heading.h"
#include "common/run_files.h"
#include "common/text.h"

namespace mirevo {
namespace {

constexpr double kFewSets = 100.0;  ///< five are then beyond each of the quantiles at 5 and 95 %

std::vector<std::string> summaryHeadings() {
  std::vector<std::string> headings{"Mean", "Std. deviation"};
  for (const double p : kSummaryProbabilities) headings.push_back(fmt::format("{:g} %", 100.0 * p));
  return headings;
}

std::vector<double> summaryCells(const SampleSummary& summary) {
  std::vector<double> cells{summary.mean, summary.standardDeviation};
  cells.insert(cells.end(), summary.quantiles.begin(), summary.quantiles.end());
  return cells;
}

void append(std::vector<std::string>& lines, std::vector<std::string> more) {
  lines.emplace_back();
  for (std::string& line : more) lines.push_back(std::move(line));
}

void appendSummaries(std::vector<std::string>& lines, const std::string& title, std::span<const std::string> names,
                     std::span<const SampleSummary> summaries) {
  std::vector<std::vector<double>> rows;
  for (const SampleSummary& summary : summaries) rows.push_back(summaryCells(summary));
  if (!rows.empty()) append(lines, formatTable(title, summaryHeadings(), names, rows));
}

/// Which parameters the observations tell something of, the most first.
void appendDistances(std::vector<std::string>& lines, const GlueSummary& summary, std::span<const std::string> names,
                     std::string_view all) {
  std::vector<std::size_t> order(summary.parameters.size());
  for (std::size_t j = 0; j < order.size(); ++j) order[j] = j;
  const auto distance = [&](std::size_t j) { return summary.parameters[j].distance; };
  std::stable_sort(order.begin(), order.end(), [&](std::size_t a, std::size_t b) { return distance(a) > distance(b); });
  lines.emplace_back();
  lines.push_back(
      fmt::format("How far the behavioural values of a parameter are distributed otherwise than those {} (largest "
                  "distance of the distribution functions; below {:.3f} it may be chance):",
                  all, summary.distanceLimit));
  for (const std::size_t j : order) {
    lines.push_back(fmt::format(
        "   {}: {:.3f}{}", names[j], distance(j),
        distance(j) > summary.distanceLimit ? "" : fmt::format(", not told from those {} by this sample", all)));
  }
}

std::string shareText(std::size_t count, std::size_t of) {
  return fmt::format("{} of {} ({:.1f} %)", count, of, 100.0 * static_cast<double>(count) / static_cast<double>(of));
}

/// "No. 12 with 0.83"
std::string bestText(const EvaluatedSample& sample, const GlueWeights& weights, const GlueJudge& judge) {
  return fmt::format("No. {} with {}", sample.numbers[*weights.best],
                     formatReal(judge.valuesOf(sample)[*weights.best]));
}

DataTable weightTable(const EvaluatedSample& sample, const GlueWeights& weights, const GlueJudge& judge,
                      const GlueSettings& settings, const AnalysisNames& names) {
  DataTable table;
  table.file = run_files::kGlue;
  table.headLines = {
      "Successful evaluations: their value of what judges, whether they are behavioural, their weight, "
      "and the parameters on the model scale",
      behaviouralText(judge, settings), likelihoodText(settings)};
  table.columns = {"Evaluation", "Value", "Behavioural", "Weight"};
  for (const std::string& name : names.parameters) table.columns.push_back(columnHeading(name, table.columns));
  const std::vector<double> all = weights.ofAll(sample.size());
  std::vector<bool> isBehavioural(sample.size(), false);
  for (const std::size_t i : weights.behavioural) isBehavioural[i] = true;
  for (std::size_t i = 0; i < sample.size(); ++i) {
    if (!sample.ok[i]) continue;
    std::vector<DataTable::Cell>& row = table.rows.emplace_back();
    row = {std::int64_t{sample.numbers[i]}, judge.valuesOf(sample)[i], std::int64_t{isBehavioural[i] ? 1 : 0}, all[i]};
  }
  for (const std::vector<double>& column : sample.parameters) {
    std::vector<double>& written = table.realColumns.emplace_back();
    for (std::size_t i = 0; i < sample.size(); ++i) {
      if (sample.ok[i]) written.push_back(column[i]);
    }
  }
  return table;
}

DataTable quantileTable(const GlueSummary& summary, const AnalysisNames& names) {
  DataTable table;
  table.file = run_files::kQuantiles;
  table.headLines = {
      "Of the behavioural sets, weighted: parameters on the model scale, measures and objective functions. Rows of the "
      "kind drawn: the parameters of all sets, not weighted"};
  table.columns = {"Kind", "Name", "Count", "Mean", "StandardDeviation"};
  for (const double p : kSummaryProbabilities) table.columns.push_back(fmt::format("{:g} %", 100.0 * p));
  const auto add = [&table](const std::string& kind, const std::string& name, const SampleSummary& one) {
    std::vector<DataTable::Cell>& row = table.rows.emplace_back();
    row = {kind, name, static_cast<std::int64_t>(one.count), one.mean, one.standardDeviation};
    row.insert(row.end(), one.quantiles.begin(), one.quantiles.end());
  };
  const auto addAll = [&](const std::string& kind, std::span<const std::string> ofKind,
                          std::span<const SampleSummary> summaries) {
    for (std::size_t i = 0; i < summaries.size(); ++i) add(kind, ofKind[i], summaries[i]);
  };
  for (std::size_t j = 0; j < summary.parameters.size(); ++j) {
    add("parameter", names.parameters[j], summary.parameters[j].behavioural);
  }
  addAll("measure", names.measures, summary.measures);
  addAll("objective", names.objectives, summary.objectives);
  addAll("validation", names.validation, summary.validation);
  for (std::size_t j = 0; j < summary.parameters.size(); ++j) {
    add("drawn", names.parameters[j], summary.parameters[j].drawn);
  }
  return table;
}

}  // namespace

std::string behaviouralText(const GlueJudge& judge, const GlueSettings& settings) {
  if (settings.threshold) {
    return fmt::format("behavioural: {} of {}", judge.description, judge.rangeText(*settings.threshold));
  }
  return fmt::format("behavioural: the best {:g} % of the evaluations that succeed, by {}", 100.0 * *settings.share,
                     judge.description);
}

std::string likelihoodText(const GlueSettings& settings) {
  if (settings.likelihood == LikelihoodShape::equal) return "likelihood: equal, all behavioural sets weigh the same";
  return fmt::format("likelihood: {}, shape factor {}",
                     kGlueLikelihoodNames[static_cast<std::size_t>(settings.likelihood)].name,
                     formatReal(settings.shapeFactor));
}

std::vector<DataTable> glueTables(const EvaluatedSample& sample, const GlueWeights& weights, const GlueSummary& summary,
                                  const GlueJudge& judge, const GlueSettings& settings, const AnalysisNames& names) {
  std::vector<DataTable> tables{quantileTable(summary, names)};
  const std::string title = "Correlation of the parameters of the behavioural sets, weighted, model scale";
  if (!summary.correlations.empty()) {
    tables.push_back(matrixTable(run_files::kSampleCorrelation, title, names.parameters, summary.correlations));
  } else if (weights.hasWeights()) {
    tables.push_back(pairTable(run_files::kSampleCorrelation, title, names.parameters, summary.largestCorrelations));
  }
  tables.push_back(weightTable(sample, weights, judge, settings, names));
  return tables;
}

std::vector<std::string> formatGlue(const EvaluatedSample& sample, const GlueWeights& weights,
                                    const GlueSummary& summary, const GlueJudge& judge, const GlueSettings& settings,
                                    const AnalysisNames& names, std::string_view correlationFile, bool areDrawn) {
  std::vector<std::string> lines;
  lines.push_back(fmt::format("GLUE: {} evaluations, {} failed and left out", sample.size(), weights.failedCount));
  lines.push_back("   " + behaviouralText(judge, settings));
  lines.push_back("   " + likelihoodText(settings));
  if (!weights.best) return lines;
  lines.push_back(fmt::format("Behavioural: {}; the best of all is {}",
                              shareText(weights.behavioural.size(), weights.successCount),
                              bestText(sample, weights, judge)));
  if (!weights.hasWeights()) return lines;
  lines.push_back(fmt::format("Their weights tell as much as {:.4g} sets of equal weight; the largest is {:.4g}",
                              weights.effective, *std::max_element(weights.weights.begin(), weights.weights.end())));
  std::vector<SampleSummary> behavioural;
  std::vector<SampleSummary> drawn;
  for (const GlueParameter& parameter : summary.parameters) {
    behavioural.push_back(parameter.behavioural);
    drawn.push_back(parameter.drawn);
  }
  appendSummaries(lines, "Parameter, behavioural", names.parameters, behavioural);
  appendSummaries(lines, areDrawn ? "Parameter, as drawn" : "Parameter, all sets", names.parameters, drawn);
  appendSummaries(lines, "Output measure, behavioural", names.measures, summary.measures);
  appendSummaries(lines, "Objective function, behavioural", names.objectives, summary.objectives);
  if (!names.validation.empty())
    appendSummaries(lines, "Validation, behavioural", names.validation, summary.validation);
  appendDistances(lines, summary, names.parameters, areDrawn ? "drawn" : "of all sets");
  const std::string title = "Correlation, behavioural";
  if (!summary.correlations.empty()) {
    append(lines, formatCorrelation(title, names.parameters, summary.correlations, correlationFile));
  } else {
    append(lines, formatLargest(title, names.parameters, summary.largestCorrelations, correlationFile));
  }
  return lines;
}

std::vector<std::string> glueWarnings(const EvaluatedSample& sample, const GlueWeights& weights, const GlueJudge& judge,
                                      const GlueSettings& settings) {
  const std::string again =
      fmt::format("A run with Restart = 1 and another {} takes all results over and runs no model",
                  settings.threshold ? kThresholdKeyword : kShareKeyword);
  if (!weights.best) {
    return {weights.successCount == 0
                ? std::string("No set is behavioural, as no evaluation has succeeded")
                : fmt::format("No set is behavioural: no evaluation has a number for {}", judge.description)};
  }
  if (weights.behavioural.empty()) {
    return {
        fmt::format("No set is behavioural: none of {} evaluations has {} of {}; the best is {}. The results are "
                    "kept. {}; if no threshold that you can accept is met, the bounds or distributions of the "
                    "parameters, the model or the observations need another look",
                    weights.successCount, judge.description, judge.rangeText(*settings.threshold),
                    bestText(sample, weights, judge), again)};
  }
  std::vector<std::string> warnings;
  if (weights.undefinedCount > 0) {
    warnings.push_back(
        fmt::format("{} of {} {} a negative error, for which there is no likelihood '{}', and {} nothing; '{}' takes "
                    "any value",
                    weights.undefinedCount, countText(weights.behavioural.size(), "behavioural set"),
                    weights.undefinedCount == 1 ? "has" : "have",
                    kGlueLikelihoodNames[static_cast<std::size_t>(settings.likelihood)].name,
                    weights.undefinedCount == 1 ? "weighs" : "weigh",
                    kGlueLikelihoodNames[static_cast<std::size_t>(LikelihoodShape::rescaled)].name));
  }
  if (!weights.hasWeights()) {
    warnings.push_back(fmt::format(
        "The likelihood of {} is 0, and there are neither quantiles nor bands. {}, and so does one with "
        "another {}",
        weights.behavioural.size() == 1 ? "the one behavioural set"
                                        : fmt::format("all {} behavioural sets", weights.behavioural.size()),
        again, kGlueLikelihoodKeyword));
    return warnings;
  }
  const std::size_t weighing = weights.behavioural.size() - weights.unweightedCount;
  if (weights.unweightedCount > weights.undefinedCount) {
    const std::size_t without = weights.unweightedCount - weights.undefinedCount;
    warnings.push_back(fmt::format("{} of {} {} nothing, as {} likelihood is {}", without,
                                   countText(weights.behavioural.size(), "behavioural set"),
                                   without == 1 ? "weighs" : "weigh", without == 1 ? "its" : "their",
                                   weights.isInfinite ? "finite, and that of sets without any error is not" : "0"));
  }
  const auto most = static_cast<double>(weighing);
  if (most < kFewSets) {
    warnings.push_back(fmt::format(
        "Only {}{}: fewer than 5 lie beyond the 5 and the 95 % quantile each, and another seed gives "
        "others. Draw more sets (Sample_Size), or within narrower bounds where the behavioural values are; what is "
        "acceptable is no matter of their number",
        countText(weighing, "behavioural set"),
        weights.unweightedCount == 0 ? "" : (weighing == 1 ? " has a weight" : " have a weight")));
  }
  if (weights.effective < kFewSets && (most >= kFewSets || weights.effective < 0.7 * most)) {
    warnings.push_back(fmt::format(
        "The weights of {} behavioural sets tell as much as {:.1f} sets of equal weight: few sets make the quantiles. "
        "Draw more sets, or take a smaller Shape_Factor if the errors of neighbouring observations are not "
        "independent",
        weighing, weights.effective));
  }
  if (settings.threshold && weights.behavioural.size() == weights.successCount) {
    warnings.push_back(fmt::format("Every evaluation is behavioural: is {} = {} meant, by {}?", kThresholdKeyword,
                                   formatReal(*settings.threshold), judge.description));
  }
  return warnings;
}

}  // namespace mirevo
