#include "algorithms/analyses/local_sensitivity.h"

#include <algorithm>
#include <cassert>
#include <cmath>
#include <limits>
#include <numeric>
#include <utility>

#include <fmt/core.h>

#include "algorithms/analyses/compared_observations.h"
#include "common/run_files.h"
#include "common/short_list.h"
#include "common/text.h"

namespace mirevo {

namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

/// `valuesOf(result)` returns the outputs of an evaluation.
template <class ValuesOf>
SensitivityTable tabulate(const PerturbationPlan& plan, std::span<const EvaluationResult> results,
                          const IncomparableOutputs& incomparable, const ValuesOf& valuesOf) {
  std::vector<std::vector<double>> outputs;
  for (const EvaluationResult& result : results) {
    outputs.push_back(result.ok() ? valuesOf(result) : std::vector<double>{});
  }
  SensitivityTable table;
  const EvaluationResult& base = results.front();
  table.base = base.ok() ? outputs.front() : std::vector<double>(valuesOf(base).size(), kNaN);
  for (std::size_t k = 0; k < outputs.size(); ++k) {
    for (std::size_t i = 0; i < std::min(outputs[k].size(), incomparable[k].size()); ++i) {
      if (!incomparable[k][i].empty()) outputs[k][i] = kNaN;
    }
  }
  table.derivatives = differenceColumns(plan, outputs);
  for (std::size_t j = 0; j < plan.differences.size(); ++j) {
    table.derivatives[j].resize(table.base.size(), kNaN);
    std::vector<std::string>& problems = table.problems.emplace_back(table.base.size(), plan.differences[j].problem);
    for (const std::size_t k : {plan.differences[j].minus, plan.differences[j].plus}) {
      for (std::size_t i = 0; i < std::min(problems.size(), incomparable[k].size()); ++i) {
        if (problems[i].empty() && std::isnan(table.derivatives[j][i])) problems[i] = incomparable[k][i];
      }
    }
    std::vector<double> scaled;
    double squares = 0.0;
    std::size_t known = 0;
    for (std::size_t i = 0; i < table.base.size(); ++i) {
      const double size = std::abs(table.base[i]);
      scaled.push_back(size > 0.0 ? table.derivatives[j][i] * plan.differences[j].extent / size : kNaN);
      if (!std::isfinite(scaled.back())) continue;
      squares += scaled.back() * scaled.back();
      ++known;
    }
    table.composite.push_back(known == 0 ? kNaN : std::sqrt(squares / static_cast<double>(known)));
    table.scaled.push_back(std::move(scaled));
  }
  return table;
}

void noteFailures(PerturbationPlan& plan, std::span<const EvaluationResult> results) {
  for (ParameterDifference& difference : plan.differences) {
    const bool hasBelow = results[difference.minus].ok();
    const bool hasAbove = results[difference.plus].ok();
    if (!difference.problem.empty() || (hasBelow && hasAbove)) continue;
    const EvaluationResult& failed = results[hasBelow ? difference.plus : difference.minus];
    const bool isMade = failed.failure->kind != EvaluationFailure::Kind::notMade;
    const std::string reason =
        fmt::format("evaluation {} {}: {}", failed.number, isMade ? "failed" : "was not made", failed.failure->reason);
    const double width = hasBelow ? difference.widthBelow : difference.widthAbove;
    if (!difference.isCentral() || hasBelow == hasAbove || !results.front().ok() || !(std::abs(width) > 0.0)) {
      difference.problem = reason;
      continue;
    }
    (hasBelow ? difference.plus : difference.minus) = 0;
    difference.width = width;
    difference.warnings.push_back(reason + ": the difference is one-sided");
  }
}

/// The measures that do not compare, where the two runs of a difference judge the model by different observations.
IncomparableOutputs incomparableMeasures(const PerturbationPlan& plan, std::span<const EvaluationResult> results) {
  const ComparedObservations observations(results);
  IncomparableOutputs found(results.size());
  const bool hasBase = results.front().ok();
  for (const ParameterDifference& difference : plan.differences) {
    const std::size_t minus = difference.minus;
    const std::size_t plus = difference.plus;
    if (!results[minus].ok() || !results[plus].ok()) continue;
    for (std::size_t i = 0; i < results[plus].measureValues.size(); ++i) {
      if (observations.areSame(minus, plus, i)) continue;
      for (const auto& [one, other] : {std::pair(minus, plus), std::pair(plus, minus)}) {
        if (one == 0 || (hasBase && observations.areSame(one, 0, i))) continue;
        found[one].resize(results[one].measureValues.size());
        found[one][i] =
            observations.differenceText(one, hasBase ? 0 : other, i,
                                        hasBase ? "the base run" : fmt::format("evaluation {}", results[other].number));
      }
    }
  }
  return found;
}

/// Says of each measure that does not compare whether its difference is one-sided or unknown.
void noteIncomparable(const IncomparableOutputs& incomparable, const SensitivityTable& measures,
                      std::span<const OutputMeasure> names, PerturbationPlan& plan) {
  constexpr std::size_t kMostNamed = 5;
  for (std::size_t j = 0; j < plan.differences.size(); ++j) {
    ParameterDifference& difference = plan.differences[j];
    for (const bool isUnknown : {false, true}) {
      ShortList list(kMostNamed);
      std::string reason;
      for (std::size_t i = 0; i < names.size() && difference.problem.empty(); ++i) {
        const auto& below = incomparable[difference.minus];
        const auto& ofRun = below.empty() || below[i].empty() ? incomparable[difference.plus] : below;
        if (ofRun.empty() || ofRun[i].empty() || isUnknown != std::isnan(measures.derivatives[j][i])) continue;
        if (reason.empty()) reason = ofRun[i];
        list.add(quotedForMessage(names[i].name));
      }
      if (list.isEmpty()) continue;
      const std::string_view pronoun = list.count() == 1 ? "it" : "them";
      difference.warnings.push_back(
          isUnknown ? fmt::format("it has no derivatives of {} and of objective functions with {}: {}", list.text(),
                                  pronoun, reason)
                    : fmt::format("its differences of {} and of objective functions with {} are one-sided: {}",
                                  list.text(), pronoun, reason));
    }
  }
}

/// Whether just one side of a central difference has no value.
bool lacksOneSide(const ParameterDifference& difference, double below, double above) {
  return difference.isCentral() && std::isnan(below) != std::isnan(above);
}

/// The difference quotient of an output, by the base value where one side of a central difference has none; NaN if the
/// parameter's values of both are written alike.
double quotient(const ParameterDifference& difference, double below, double base, double above) {
  if (!lacksOneSide(difference, below, above)) return (above - below) / difference.width;
  const double width = std::isnan(below) ? difference.widthAbove : difference.widthBelow;
  if (!(std::abs(width) > 0.0)) return kNaN;
  return (std::isnan(below) ? above - base : base - below) / width;
}

/// The output measures, in 64 bits where the result has them.
std::span<const double> measuresOf(const EvaluationResult& result) {
  return result.exactMeasures.empty() ? result.measureValues : result.exactMeasures;
}

/// Says of each parameter whose perturbed runs have the measures of the base run.
void noteWithoutEffect(std::span<const EvaluationResult> results, PerturbationPlan& plan) {
  const auto isAsInBaseRun = [&](std::size_t set) {
    return results[set].ok() && std::ranges::equal(measuresOf(results[set]), measuresOf(results.front()));
  };
  for (ParameterDifference& difference : plan.differences) {
    if (!difference.problem.empty() || measuresOf(results.front()).empty()) continue;
    if (!isAsInBaseRun(0) || !isAsInBaseRun(difference.minus) || !isAsInBaseRun(difference.plus)) continue;
    difference.warnings.emplace_back(
        "no output measure changes with its step: it has no effect, or one that is lost in the rounding of the model's "
        "output, which a larger step or more digits show");
  }
}

void appendTable(std::vector<std::string>& lines, const std::string& title, std::span<const std::string> outputs,
                 std::span<const std::string> parameters, std::span<const std::vector<double>> rows) {
  lines.emplace_back();
  for (std::string& line : formatTable(title, outputs, parameters, rows)) lines.push_back(std::move(line));
}

}  // namespace

LocalSensitivity localSensitivity(const SensitivitySettings& settings, const SearchSpace& space, Evaluator& evaluator,
                                  const ParameterFields& fields, const Feasibility& feasibility,
                                  std::span<const ObjectiveFunction> objectives,
                                  std::span<const OutputMeasure> measures) {
  LocalSensitivity sensitivity;
  sensitivity.plan = planPerturbations(settings, space, space.initial, fields, feasibility);
  sensitivity.results = evaluator.evaluateParameterSets(sensitivity.plan.sets, DispatchMode::task);
  noteFailures(sensitivity.plan, sensitivity.results);
  const IncomparableOutputs incomparable = incomparableMeasures(sensitivity.plan, sensitivity.results);
  sensitivity.measures =
      tabulate(sensitivity.plan, sensitivity.results, incomparable, [](const EvaluationResult& result) {
        const std::span<const double> values = measuresOf(result);
        return std::vector(values.begin(), values.end());
      });
  sensitivity.objectives = tabulate(sensitivity.plan, sensitivity.results, ofObjectives(incomparable, objectives),
                                    [&](const EvaluationResult& result) {
                                      return result.exactMeasures.empty()
                                                 ? result.objectiveValues
                                                 : objectiveFunctionValues(objectives, result.exactMeasures);
                                    });
  noteIncomparable(incomparable, sensitivity.measures, measures, sensitivity.plan);
  noteWithoutEffect(sensitivity.results, sensitivity.plan);
  const bool hasObjectives = !sensitivity.objectives.base.empty();
  sensitivity.ranking = ranked(hasObjectives ? sensitivity.objectives.composite : sensitivity.measures.composite);
  return sensitivity;
}

std::vector<std::vector<double>> differenceColumns(const PerturbationPlan& plan,
                                                   std::span<const std::vector<double>> outputs) {
  assert(outputs.size() == plan.sets.size());
  std::size_t count = 0;
  for (const std::vector<double>& values : outputs) count = std::max(count, values.size());
  std::vector<std::vector<double>> columns;
  for (const ParameterDifference& difference : plan.differences) {
    const std::vector<double>& minus = outputs[difference.minus];
    const std::vector<double>& plus = outputs[difference.plus];
    std::vector<double> column(count, kNaN);
    const std::vector<double>& base = outputs.front();
    if (difference.problem.empty() && minus.size() == count && plus.size() == count) {
      for (std::size_t i = 0; i < count; ++i) {
        column[i] = quotient(difference, minus[i], base.size() == count ? base[i] : kNaN, plus[i]);
      }
    }
    columns.push_back(std::move(column));
  }
  return columns;
}

std::vector<std::size_t> ranked(std::span<const double> values) {
  std::vector<std::size_t> order(values.size());
  std::iota(order.begin(), order.end(), std::size_t{0});
  std::stable_sort(order.begin(), order.end(), [&](std::size_t a, std::size_t b) {
    if (std::isnan(values[a]) || std::isnan(values[b])) return !std::isnan(values[a]) && std::isnan(values[b]);
    return values[a] > values[b];
  });
  return order;
}

void takeObservations(const LinearisedModel& model, LocalSensitivity& sensitivity) {
  sensitivity.ofObservations.clear();
  for (std::size_t j = 0; j < model.jacobian.size(); ++j) {
    const double extent = sensitivity.plan.differences[j].extent;
    double squares = 0.0;
    std::size_t count = 0;
    std::size_t oneSided = 0;
    std::size_t observations = 0;
    for (std::size_t i = 0; i < model.residuals.size(); ++i) {
      const double change = model.jacobian[j][i] * extent;
      if (!std::isfinite(model.residuals[i])) continue;
      ++observations;
      if (!std::isfinite(change)) continue;
      if (!model.oneSided.empty() && model.oneSided[j][i]) ++oneSided;
      squares += (model.weights.empty() ? 1.0 : model.weights[i]) * change * change;
      ++count;
    }
    if (oneSided > 0) {
      sensitivity.plan.differences[j].warnings.push_back(fmt::format(
          "one of its two runs has no value at {} of {} observations: the differences there are those of the other "
          "run and the base run",
          oneSided, observations));
    }
    sensitivity.ofObservations.push_back(count == 0 ? kNaN : std::sqrt(squares / static_cast<double>(count)));
  }
  sensitivity.ranking = ranked(sensitivity.ofObservations);
}

std::optional<LinearisedModel> linearise(const PerturbationPlan& plan,
                                         std::span<const std::vector<double>> simulatedValues,
                                         std::span<const double> observedValues, std::vector<double> weights) {
  const std::vector<double>& base = simulatedValues.front();
  if (base.size() != observedValues.size()) return std::nullopt;
  LinearisedModel model;
  for (std::size_t i = 0; i < base.size(); ++i) model.residuals.push_back(base[i] - observedValues[i]);
  model.weights = std::move(weights);
  model.jacobian = differenceColumns(plan, simulatedValues);
  for (const ParameterDifference& difference : plan.differences) {
    model.widths.push_back(difference.width);
    model.problems.push_back(difference.problem);
    const std::vector<double>& minus = simulatedValues[difference.minus];
    const std::vector<double>& plus = simulatedValues[difference.plus];
    std::vector<bool>& oneSided = model.oneSided.emplace_back(base.size());
    if (minus.size() != base.size() || plus.size() != base.size()) continue;
    for (std::size_t i = 0; i < base.size(); ++i) oneSided[i] = lacksOneSide(difference, minus[i], plus[i]);
  }
  return model;
}

std::vector<DataTable> sensitivityTables(const LocalSensitivity& sensitivity, const AnalysisNames& names) {
  DataTable table;
  table.file = run_files::kSensitivities;
  table.headLines = {
      "Derivatives on the search scale, and dimensionless: times the extent of the parameter, over the "
      "size of the output; the composite is their root mean square over all outputs of a kind, or, of the "
      "derivatives times the extent, over all weighted observations"};
  table.columns = {"Parameter", "Kind", "Output", "Derivative", "Scaled", "Composite", "Problem"};
  for (std::size_t j = 0; j < names.parameters.size(); ++j) {
    const auto add = [&](const std::string& kind, const SensitivityTable& found, std::span<const std::string> outputs) {
      for (std::size_t i = 0; i < outputs.size(); ++i) {
        table.rows.push_back({names.parameters[j], kind, outputs[i], found.derivatives[j][i], found.scaled[j][i],
                              found.composite[j], found.problems[j][i]});
      }
    };
    add("measure", sensitivity.measures, names.measures);
    add("objective", sensitivity.objectives, names.objectives);
    if (sensitivity.ofObservations.empty()) continue;
    table.rows.push_back({names.parameters[j], std::string("observations"), std::string("all"), kNaN, kNaN,
                          sensitivity.ofObservations[j], sensitivity.plan.differences[j].problem});
  }
  return {std::move(table)};
}

std::string betterFitText(std::span<const EvaluationResult> results) {
  constexpr double kRounding = 1.0 - 1.0e-6;  // of the values that the model writes
  const EvaluationResult& base = results.front();
  const EvaluationResult* best = nullptr;
  std::size_t count = 0;
  const ComparedObservations observations(results);
  for (std::size_t i = 1; i < results.size(); ++i) {
    const EvaluationResult& result = results[i];
    // A negative aggregate is no measure of a misfit.
    if (!base.ok() || !result.ok() || !(result.aggregate >= 0.0 && result.aggregate < base.aggregate * kRounding) ||
        !observations.areSame(i, 0)) {
      continue;
    }
    ++count;
    if (best == nullptr || result.aggregate < best->aggregate) best = &result;
  }
  if (best == nullptr) return {};
  const std::string which =
      count == 1
          ? fmt::format("evaluation {} fits better than the base set: its", best->number)
          : fmt::format("{} evaluations fit better than the base set, evaluation {} best: its", count, best->number);
  return fmt::format(
      "{} aggregate is {}, not {}; the base set is not the best, and its derivatives and deviations mislead", which,
      formatReal(best->aggregate), formatReal(base.aggregate));
}

std::vector<std::string> formatSensitivity(const LocalSensitivity& sensitivity, const AnalysisNames& names) {
  std::vector<std::string> lines{"Local sensitivity analysis"};
  for (std::size_t j = 0; j < names.parameters.size(); ++j) {
    const std::string& problem = sensitivity.plan.differences[j].problem;
    if (!problem.empty()) {
      lines.push_back(fmt::format("Warning: Parameter {} has no derivatives: {}", names.parameters[j], problem));
      continue;
    }
    for (const std::string& warning : sensitivity.plan.differences[j].warnings) {
      lines.push_back(fmt::format("Warning: Parameter {}: {}", names.parameters[j], warning));
    }
  }
  const auto appendBoth = [&](const std::string& what, const SensitivityTable& table,
                              std::span<const std::string> outputs) {
    if (outputs.empty()) return;
    appendTable(lines, "Derivatives of " + what, outputs, names.parameters, table.derivatives);
    appendTable(lines, "Scaled sensitivities of " + what, outputs, names.parameters, table.scaled);
  };
  if (const std::string text = betterFitText(sensitivity.results); !text.empty()) lines.push_back("Warning: " + text);
  appendBoth("output measures", sensitivity.measures, names.measures);
  appendBoth("objective functions", sensitivity.objectives, names.objectives);

  const bool hasObjectives = !names.objectives.empty();
  const bool hasObservations = !sensitivity.ofObservations.empty();
  const std::vector<double>& composite = hasObservations ? sensitivity.ofObservations
                                         : hasObjectives ? sensitivity.objectives.composite
                                                         : sensitivity.measures.composite;
  std::vector<std::string> labels;
  std::vector<std::vector<double>> rows;
  for (const std::size_t j : sensitivity.ranking) {
    labels.push_back(fmt::format("{:>3}. {}", labels.size() + 1, names.parameters[j]));
    rows.push_back({composite[j]});
  }
  const std::string headings[] = {hasObservations ? "Composite scaled sensitivity of the observations"
                                                  : "Composite scaled sensitivity"};
  appendTable(lines, "Ranking", headings, labels, rows);
  return lines;
}

}  // namespace mirevo
