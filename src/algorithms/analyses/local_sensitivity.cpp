#include "algorithms/analyses/local_sensitivity.h"

#include <algorithm>
#include <cassert>
#include <cmath>
#include <limits>
#include <numeric>
#include <utility>

#include <fmt/core.h>

#include "common/run_files.h"
#include "common/text.h"
#include "parameters/value_format.h"

namespace mirevo {

namespace {

constexpr double kNaN = std::numeric_limits<double>::quiet_NaN();

/// How far a parameter may and should move, on the search scale.
struct Step {
  double up = 0.0;
  double down = 0.0;
  double roomUp = 0.0;
  double roomDown = 0.0;
  double extent = 0.0;
  bool isInteger = false;
};

Step wantedStep(const SensitivitySettings& settings, const SearchSpace& space, std::span<const double> base,
                std::size_t j) {
  const TransformationType type = space.transformation[j];
  // The upper bound of an integer parameter in the search space is one above its largest value.
  const double upper = type == TransformationType::integer ? space.upper[j] - 1.0 : space.upper[j];
  const double fraction = settings.perturbationFraction;
  Step step;
  step.isInteger = type == TransformationType::integer;
  step.roomUp = std::max(upper - base[j], 0.0);
  step.roomDown = std::max(base[j] - space.lower[j], 0.0);
  if (settings.perturbationOption == PerturbationOption::range) {
    step.extent = upper - space.lower[j];
    step.up = step.down = fraction * step.extent;
  } else if (type == TransformationType::logarithmic) {
    // x (1 + f) and x / (1 + f): the same step in both directions. dy/d ln x already equals x dy/dx.
    step.extent = 1.0;
    step.up = step.down = std::log1p(fraction);
  } else {
    step.extent = std::abs(base[j]);
    step.up = step.down = fraction * step.extent;
  }
  if (type == TransformationType::integer && step.extent > 0.0) {
    step.up = step.down = std::max(1.0, std::round(step.up));
    // 3.3 - 1.3 is 1.9999999999999998, but two steps.
    constexpr double kRounding = 1.0e-8;
    step.roomUp = std::floor(step.roomUp + kRounding);
    step.roomDown = std::floor(step.roomDown + kRounding);
  }
  return step;
}

/// Why the base set with this value of parameter j cannot be run; empty if it can.
std::optional<std::string> violationAt(double value, std::size_t j, ParameterSet base, const Feasibility& feasibility) {
  if (!feasibility.isTested()) return std::nullopt;
  base[j] = value;
  return feasibility.violation(base);
}

/// Adds the sets that are needed for the difference with respect to parameter j.
ParameterDifference planDifference(const Step& step, bool central, std::size_t j, const Feasibility& feasibility,
                                   std::vector<ParameterSet>& sets) {
  const auto addSet = [&](double value) {
    sets.push_back(sets.front());
    sets.back()[j] = value;
    return sets.size() - 1;
  };
  const double x = sets.front()[j];
  ParameterDifference difference;
  difference.extent = step.extent;
  if (step.up == 0.0 || step.roomUp + step.roomDown == 0.0) {
    if (step.roomUp + step.roomDown == 0.0) {
      // Those of an integer parameter may be 3 and 3.5.
      difference.problem = step.isInteger ? "its bounds leave a single value" : "its bounds are equal";
    } else {
      difference.problem = "its value is 0, and the perturbation is a fraction of it";
    }
    return difference;
  }
  const bool fitsUp = step.up <= step.roomUp;
  const bool fitsDown = step.down <= step.roomDown;
  const double above = x + std::min(step.up, step.roomUp);
  const double below = x - std::min(step.down, step.roomDown);
  const auto violationAbove = violationAt(above, j, sets.front(), feasibility);
  const auto violationBelow = violationAt(below, j, sets.front(), feasibility);
  const bool canChooseSide = step.roomUp > 0.0 && step.roomDown > 0.0;
  const bool oneSideIsViolated = canChooseSide && violationAbove.has_value() != violationBelow.has_value();
  const bool wantsBoth = central && fitsUp && fitsDown;
  const bool wantsUp = fitsUp || (!fitsDown && step.roomUp >= step.roomDown && step.roomUp > 0.0);
  const bool goesUp = oneSideIsViolated ? !violationAbove : wantsUp;
  if (wantsBoth && !oneSideIsViolated) {
    difference.minus = addSet(below);
    difference.plus = addSet(above);
  } else if (goesUp) {
    difference.plus = addSet(above);
  } else {
    difference.minus = addSet(below);
  }
  if (oneSideIsViolated && (wantsBoth || goesUp != wantsUp)) {
    difference.warnings.push_back(fmt::format(
        "the step {} cannot be run: the difference is {} ({})", violationAbove ? "up" : "down",
        central ? "one-sided" : "that of the other side", violationAbove ? *violationAbove : *violationBelow));
  } else if (central && !difference.isCentral()) {
    difference.warnings.push_back(fmt::format("its {} bound leaves no room for the step: the difference is one-sided",
                                              difference.minus == 0 ? "lower" : "upper"));
  }
  // The width after rounding, which is that of the sets that are run.
  difference.width = sets[difference.plus][j] - sets[difference.minus][j];
  difference.widthBelow = x - sets[difference.minus][j];
  difference.widthAbove = sets[difference.plus][j] - x;
  if (!(difference.width > 0.0)) difference.problem = "the perturbation is too small to change its value";
  return difference;
}

/// The search-scale value of what the model reads for a value of parameter j; empty if the field holds no number.
std::optional<double> searchValueAsWritten(const SearchSpace& space, std::size_t j, double value, int fieldWidth) {
  const double modelValue = toModelScale(space, j, value);
  const std::optional<double> written = valueAsWritten(modelValue, fieldWidth);
  if (!written || *written == modelValue) return written ? std::optional(value) : std::nullopt;
  if (space.transformation[j] != TransformationType::logarithmic) return written;
  return *written > 0.0 ? std::optional(std::log(*written)) : std::nullopt;
}

/// Takes the width of a difference as the model gets it from a field of this many characters.
void takeWidthAsWritten(const SearchSpace& space, std::size_t j, int fieldWidth, std::span<const ParameterSet> sets,
                        ParameterDifference& difference) {
  constexpr double kWorthAWarning = 0.01;
  constexpr double kExact = 1.0e-9;  // a field that holds 15 digits: what it cuts is no more than a rounding error
  const double minusValue = sets[difference.minus][j];
  const double plusValue = sets[difference.plus][j];
  const std::optional<double> minus = searchValueAsWritten(space, j, minusValue, fieldWidth);
  const std::optional<double> plus = searchValueAsWritten(space, j, plusValue, fieldWidth);
  const double wanted = difference.width;
  difference.width = minus && plus ? *plus - *minus : 0.0;
  if (std::abs(difference.width - wanted) <= kExact * wanted) {
    difference.width = wanted;
    return;
  }
  if (difference.isCentral()) {
    const double base = searchValueAsWritten(space, j, sets.front()[j], fieldWidth).value_or(kNaN);
    difference.widthBelow = minus ? base - *minus : kNaN;
    difference.widthAbove = plus ? *plus - base : kNaN;
  }
  const std::string fields =
      fmt::format("in its field of {} characters {} is written as \"{}\" and {} as \"{}\"", fieldWidth,
                  formatReal(toModelScale(space, j, minusValue)),
                  trim(FormatValueForPlaceholder(toModelScale(space, j, minusValue), fieldWidth)),
                  formatReal(toModelScale(space, j, plusValue)),
                  trim(FormatValueForPlaceholder(toModelScale(space, j, plusValue), fieldWidth)));
  if (difference.width == 0.0) {
    difference.problem = fields;
  } else if (std::abs(difference.width - wanted) > kWorthAWarning * wanted) {
    difference.warnings.push_back(fields + "; the difference is that of the values as written");
  }
}

SensitivityTable tabulate(const PerturbationPlan& plan, std::span<const EvaluationResult> results,
                          std::vector<double> EvaluationResult::*values) {
  std::vector<std::vector<double>> outputs;
  for (const EvaluationResult& result : results) {
    outputs.push_back(result.ok() ? result.*values : std::vector<double>{});
  }
  SensitivityTable table;
  const EvaluationResult& base = results.front();
  table.base = base.ok() ? base.*values : std::vector<double>((base.*values).size(), kNaN);
  table.derivatives = differenceColumns(plan, outputs);
  for (std::size_t j = 0; j < plan.differences.size(); ++j) {
    table.derivatives[j].resize(table.base.size(), kNaN);
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
    const std::string reason = fmt::format("evaluation {} failed: {}", failed.number, failed.failure->reason);
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

/// Whether a run has no value for an observation that the base run has one for: their measures do not compare.
bool comparesFewerValues(const EvaluationResult& result, const EvaluationResult& base) {
  for (const UnusedObservations& unused : result.unusedObservations) {
    const auto ofBase = std::find_if(base.unusedObservations.begin(), base.unusedObservations.end(),
                                     [&](const UnusedObservations& other) { return other.measure == unused.measure; });
    if (ofBase == base.unusedObservations.end() || unused.usedCount < ofBase->usedCount) return true;
  }
  // After a restart, where a task keeps the values.
  for (std::size_t i = 0; i < std::min(result.simulatedValues.size(), base.simulatedValues.size()); ++i) {
    if (std::isnan(result.simulatedValues[i]) && !std::isnan(base.simulatedValues[i])) return true;
  }
  return false;
}

/// The warning of perturbed runs that fit better than the base set; empty where there is none.
std::string betterFitText(std::span<const EvaluationResult> results) {
  constexpr double kRounding = 1.0 - 1.0e-6;  // of the statistics, in 32 bits
  const EvaluationResult& base = results.front();
  const EvaluationResult* best = nullptr;
  std::size_t count = 0;
  for (const EvaluationResult& result : results) {
    // A negative aggregate is no measure of a misfit.
    if (!base.ok() || !result.ok() || !(result.aggregate >= 0.0 && result.aggregate < base.aggregate * kRounding) ||
        comparesFewerValues(result, base)) {
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
      "Warning: {} aggregate is {}, not {}; the base set is not the best, and its derivatives and deviations mislead",
      which, formatReal(best->aggregate), formatReal(base.aggregate));
}

void appendTable(std::vector<std::string>& lines, const std::string& title, std::span<const std::string> outputs,
                 std::span<const std::string> parameters, std::span<const std::vector<double>> rows) {
  lines.emplace_back();
  for (std::string& line : formatTable(title, outputs, parameters, rows)) lines.push_back(std::move(line));
}

}  // namespace

const SettingSection<SensitivitySettings>& localSensitivitySection() {
  using Settings = SensitivitySettings;
  static const SettingSection<SensitivitySettings> section{
      {"SENSITIVITY_ANALYSIS/LOCAL_SA",
       "when `Sensitivity_Type` is 0",
       "Local sensitivity analysis by differences around the initial values.",
       {setting<&Settings::differencing>({.name = "Differencing",
                                          .defaultValue = "0",
                                          .range = between(0, 1),
                                          .codes = kDifferencingNames,
                                          .refusal = "Error: Differencing option in local sensitivity analysis invalid",
                                          .meaning = "Kind of differences."}),
        setting<&Settings::perturbationOption>(
            {.name = "Perturbation_Option",
             .defaultValue = "0",
             .range = between(0, 1),
             .codes = kPerturbationOptionNames,
             .refusal = "Error: Perturbation option in local sensitivity analysis invalid",
             .meaning = "The perturbation is a fraction of the parameter's range, or of its value."}),
        setting<&Settings::perturbationFraction>(
            {.name = "Perturbation_Fraction",
             .defaultValue = "0.01",
             .range = {.lowest = 0, .highest = 1, .lowestExcluded = true},
             .refusal = "Error: Perturbation fraction in local sensitivity analysis invalid",
             .meaning = "That fraction."}),
        setting<&Settings::calculatesCovariance>(
            {.name = "Calculate_Covmatrix",
             .defaultValue = "0",
             .meaning = "1: also compute the covariance and correlation matrix of the parameters."})}}};
  return section;
}

PerturbationPlan planPerturbations(const SensitivitySettings& settings, const SearchSpace& space,
                                   std::span<const double> base, std::span<const int> fieldWidths,
                                   const Feasibility& feasibility) {
  PerturbationPlan plan;
  plan.sets.emplace_back(base.begin(), base.end());
  for (std::size_t j = 0; j < space.size(); ++j) {
    const Step step = wantedStep(settings, space, base, j);
    const bool isCentral = settings.differencing == Differencing::central;
    plan.differences.push_back(planDifference(step, isCentral, j, feasibility, plan.sets));
    const int fieldWidth = j < fieldWidths.size() ? fieldWidths[j] : 0;
    if (fieldWidth == 0 || !plan.differences.back().problem.empty()) continue;
    takeWidthAsWritten(space, j, fieldWidth, plan.sets, plan.differences.back());
  }
  return plan;
}

std::vector<int> ofVariableParameters(std::span<const int> fieldWidths, std::span<const ModelParameter> parameters) {
  std::vector<int> widths;
  for (std::size_t i = 0; i < fieldWidths.size(); ++i) {
    if (parameters[i].parameterType == ParameterType::variable) widths.push_back(fieldWidths[i]);
  }
  return widths;
}

bool hasRoomForStep(const SensitivitySettings& settings, const SearchSpace& space, std::size_t j) {
  constexpr double kRounding = 1.0 + 1.0e-12;
  const Step step = wantedStep(settings, space, space.initial, j);
  // Bounds that leave a single value leave no parameter to perturb; it is left out by name.
  if (step.roomUp + step.roomDown == 0.0) return true;
  return step.up <= step.roomUp * kRounding || step.down <= step.roomDown * kRounding;
}

LocalSensitivity localSensitivity(const SensitivitySettings& settings, const SearchSpace& space, Evaluator& evaluator,
                                  std::span<const int> fieldWidths, const Feasibility& feasibility) {
  LocalSensitivity sensitivity;
  sensitivity.plan = planPerturbations(settings, space, space.initial, fieldWidths, feasibility);
  sensitivity.results = evaluator.evaluateParameterSets(sensitivity.plan.sets, DispatchMode::task);
  noteFailures(sensitivity.plan, sensitivity.results);
  sensitivity.measures = tabulate(sensitivity.plan, sensitivity.results, &EvaluationResult::measureValues);
  sensitivity.objectives = tabulate(sensitivity.plan, sensitivity.results, &EvaluationResult::objectiveValues);
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
                              found.composite[j], sensitivity.plan.differences[j].problem});
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
  if (std::string text = betterFitText(sensitivity.results); !text.empty()) lines.push_back(std::move(text));
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
