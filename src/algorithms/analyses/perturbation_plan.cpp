#include "algorithms/analyses/perturbation_plan.h"

#include <algorithm>
#include <cmath>
#include <optional>
#include <utility>

#include <fmt/core.h>

#include "algorithms/analyses/written_step.h"

namespace mirevo {

namespace {

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

/// Whether there is room for a step; 0.3 - 0.1 is 0.19999999999999998, but a step of 0.2 fits.
bool fits(double step, double room) {
  constexpr double kRounding = 1.0 + 1.0e-12;
  return step <= room * kRounding;
}

/// Why a parameter of a few choices is left out; empty if it is none.
std::string problemOfChoices(const SearchSpace& space, std::size_t j) {
  if (space.transformation[j] != TransformationType::integer) return {};
  constexpr double kRounding = 1.0e-8;
  const double count = std::floor(space.upper[j] - space.lower[j] + kRounding);  // the upper bound is one above
  if (count < 2.0 || count > kMostChoices) return {};
  return fmt::format(
      "an integer of {} values, it is a choice rather than a quantity; Perturb_Choices = 1 in LOCAL_SA asks for its "
      "derivatives",
      count);
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
  const bool fitsUp = fits(step.up, step.roomUp);
  const bool fitsDown = fits(step.down, step.roomDown);
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
             .meaning = "1: also compute the covariance and correlation matrix of the parameters."}),
        setting<&Settings::perturbsChoices>(
            {.name = "Perturb_Choices",
             .defaultValue = "0",
             .meaning =
                 fmt::format("1: integer parameters of 2 to {} values have derivatives, too. 0: they are choices "
                             "and are left out.",
                             kMostChoices)})}}};
  return section;
}

PerturbationPlan planPerturbations(const SensitivitySettings& settings, const SearchSpace& space,
                                   std::span<const double> base, const ParameterFields& fields,
                                   const Feasibility& feasibility) {
  PerturbationPlan plan;
  plan.sets.emplace_back(base.begin(), base.end());
  for (std::size_t j = 0; j < space.size(); ++j) {
    const Step step = wantedStep(settings, space, base, j);
    if (std::string problem = settings.perturbsChoices ? "" : problemOfChoices(space, j); !problem.empty()) {
      ParameterDifference& difference = plan.differences.emplace_back();
      difference.extent = step.extent;
      difference.problem = std::move(problem);
      continue;
    }
    const bool isCentral = settings.differencing == Differencing::central;
    plan.differences.push_back(planDifference(step, isCentral, j, feasibility, plan.sets));
    if (!plan.differences.back().problem.empty()) continue;
    takeWidthAsWritten(fields, space, j, plan.sets, plan.differences.back());
  }
  return plan;
}

bool hasRoomForStep(const SensitivitySettings& settings, const SearchSpace& space, std::size_t j) {
  const Step step = wantedStep(settings, space, space.initial, j);
  if (!settings.perturbsChoices && !problemOfChoices(space, j).empty()) return true;  // left out by name
  // Bounds that leave a single value leave no parameter to perturb; it is left out by name.
  if (step.roomUp + step.roomDown == 0.0) return true;
  return fits(step.up, step.roomUp) || fits(step.down, step.roomDown);
}

}  // namespace mirevo
