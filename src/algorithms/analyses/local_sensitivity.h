#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/analyses/covariance.h"
#include "algorithms/analyses/uncertainty.h"
#include "common/settings/keyword_row.h"
#include "evaluation/evaluator.h"
#include "parameters/search_space.h"

namespace mirevo {

enum class Differencing : std::int32_t { forward = 0, central = 1 };
inline constexpr CodeName kDifferencingNames[] = {{0, "forward"}, {1, "central"}};
/// What the perturbation is a fraction of.
enum class PerturbationOption : std::int32_t { range = 0, value = 1 };
inline constexpr CodeName kPerturbationOptionNames[] = {{0, "range"}, {1, "value"}};

struct SensitivitySettings {
  Differencing differencing = Differencing::forward;
  PerturbationOption perturbationOption = PerturbationOption::range;
  double perturbationFraction = 0.01;
  bool calculatesCovariance = false;
};
/// The section LOCAL_SA.
const SettingSection<SensitivitySettings>& localSensitivitySection();

/// The two sets whose difference gives the derivatives by one parameter.
struct ParameterDifference {
  std::size_t minus = 0;  ///< 0-based among the sets; 0 is the base set
  std::size_t plus = 0;
  double width = 0.0;   ///< value of the parameter in `plus` less that in `minus`, search scale; 0: not perturbed
  double extent = 0.0;  ///< what scales the derivatives: the range or the value, search scale
  std::string problem;  ///< why there are no derivatives; empty when there are
};

/// All sets of an analysis, the base set first, and how to take differences of their results.
struct PerturbationPlan {
  std::vector<ParameterSet> sets;
  std::vector<ParameterDifference> differences;  ///< one a variable parameter
};

/// Perturbs each parameter of `base` by the fraction of its range on the search scale, or of its value on the model
/// scale (of a logarithmic parameter x to x (1 + fraction)); an integer parameter by whole steps, one at least. Where
/// one side lies outside the bounds the difference is one-sided, inwards, and shorter where neither side has room.
PerturbationPlan planPerturbations(const SensitivitySettings& settings, const SearchSpace& space,
                                   std::span<const double> base);

/// Whether parameter j has room for its whole step, one way at least, from the space's initial value.
bool hasRoomForStep(const SensitivitySettings& settings, const SearchSpace& space, std::size_t j);

/// Derivatives of m outputs by p parameters, and what follows from them.
struct SensitivityTable {
  std::vector<double> base;                      ///< the outputs of the base set, m
  std::vector<std::vector<double>> derivatives;  ///< p rows of m, search scale; NaN where unknown
  /// Dimensionless: derivative times the parameter's extent, over the size of the output; NaN where that is 0.
  std::vector<std::vector<double>> scaled;
  std::vector<double> composite;  ///< root mean square of the scaled ones that are known, one a parameter
};

struct LocalSensitivity {
  PerturbationPlan plan;  ///< with the problems that the evaluations have added
  std::vector<EvaluationResult> results;
  SensitivityTable measures;
  SensitivityTable objectives;
  /// 0-based parameters, the most sensitive first by the objective functions' composite (the output measures' where
  /// there is no objective function); equal ones in setup order, those without one last.
  std::vector<std::size_t> ranking;
};

/// Evaluates all perturbed sets in one batch, the base set (the space's initial values) first. A failed run leaves its
/// parameter's derivatives out, with the reason in the plan.
LocalSensitivity localSensitivity(const SensitivitySettings& settings, const SearchSpace& space, Evaluator& evaluator);

/// The derivatives of any output by differences, p columns of one row a value: NaN for a parameter with a problem.
/// `outputs[i]` are the values of set i; those of a failed set may be empty.
std::vector<std::vector<double>> differenceColumns(const PerturbationPlan& plan,
                                                   std::span<const std::vector<double>> outputs);

/// The linearised model for the covariance matrix, from the simulated values of every set at the observation times
/// (empty for a failed one); nothing when the base set failed.
std::optional<LinearisedModel> linearise(const PerturbationPlan& plan,
                                         std::span<const std::vector<double>> simulatedValues,
                                         std::span<const double> observedValues, std::vector<double> weights);

/// The same for programs: one row per parameter and output with derivative, scaled sensitivity, the parameter's
/// composite over all outputs of that kind, and why there is none.
std::vector<DataTable> sensitivityTables(const LocalSensitivity& sensitivity, const AnalysisNames& names);

/// The analysis as lines of text for the log.
std::vector<std::string> formatSensitivity(const LocalSensitivity& sensitivity, const AnalysisNames& names);

}  // namespace mirevo
