#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/analyses/covariance.h"
#include "algorithms/analyses/uncertainty.h"
#include "common/settings/keyword_row.h"
#include "evaluation/evaluator.h"
#include "measures/objective_functions.h"
#include "measures/output_measure.h"
#include "parameters/feasibility.h"
#include "parameters/parameter_fields.h"
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
  bool perturbsChoices = false;  ///< also integer parameters of kMostChoices values or fewer
};
/// Up to so many values of an integer parameter are choices rather than a quantity: a step from one to the next is a
/// quarter of the range or more, and no derivative.
inline constexpr int kMostChoices = 5;

/// The section LOCAL_SA.
const SettingSection<SensitivitySettings>& localSensitivitySection();

/// The two parameter sets whose difference gives the derivatives with respect to one parameter.
struct ParameterDifference {
  std::size_t minus = 0;  ///< 0-based among the sets; 0 is the base set
  std::size_t plus = 0;
  double width = 0.0;   ///< value of the parameter in `plus` minus that in `minus`, as written; search scale; 0: none
  double extent = 0.0;  ///< what scales the derivatives: the range or the value, search scale
  std::string problem;  ///< why there are no derivatives; empty when there are some
  /// The two parts of the width of a central difference, below and above the base value.
  double widthBelow = 0.0;
  double widthAbove = 0.0;
  std::vector<std::string> warnings;  ///< what makes them less certain

  bool isCentral() const { return minus != 0 && plus != 0; }
};

/// All parameter sets of an analysis, the base set first, and which differences of their results to take.
struct PerturbationPlan {
  std::vector<ParameterSet> sets;
  std::vector<ParameterDifference> differences;  ///< one per variable parameter
};

/// Perturbs each parameter of `base` by the fraction of its range on the search scale, or of its value on the model
/// scale (a logarithmic parameter x becomes x (1 + fraction)); an integer parameter moves by whole steps, at least one.
/// Where a step would leave the bounds the difference is one-sided, inwards; where neither side has room the step is
/// shortened. The width of a difference is that of the values that a model reads from `fields`; without a field, any
/// value as it is. A side that cannot be run is left out where the other one can. Of a parameter of a few choices there
/// is no set unless the settings ask for it.
PerturbationPlan planPerturbations(const SensitivitySettings& settings, const SearchSpace& space,
                                   std::span<const double> base, const ParameterFields& fields = {},
                                   const Feasibility& feasibility = {});

/// Whether parameter j has room for its whole step from the initial value of the space in at least one direction.
bool hasRoomForStep(const SensitivitySettings& settings, const SearchSpace& space, std::size_t j);

/// Derivatives of m outputs with respect to p parameters, and what follows from them.
struct SensitivityTable {
  std::vector<double> base;                      ///< the outputs of the base set, m
  std::vector<std::vector<double>> derivatives;  ///< p rows of m, search scale; NaN where unknown
  /// Dimensionless: derivative times the parameter's extent, divided by the absolute value of the output; NaN where
  /// that is 0.
  std::vector<std::vector<double>> scaled;
  std::vector<std::vector<std::string>> problems;  ///< p rows of m: why there is no derivative
  std::vector<double> composite;  ///< root mean square of the known scaled derivatives, one per parameter
};

struct LocalSensitivity {
  PerturbationPlan plan;  ///< with the problems that the evaluations have added
  std::vector<EvaluationResult> results;
  SensitivityTable measures;
  SensitivityTable objectives;
  /// The composite scaled sensitivities over the observations, one per parameter; empty unless takeObservations() was
  /// called.
  std::vector<double> ofObservations;
  /// 0-based parameters, the most sensitive first, by the composite of the observations; without that, of the objective
  /// functions, or of the output measures where there is no objective function.
  std::vector<std::size_t> ranking;
};

/// Indices of the values, the largest first; ties in their order, NaN last.
std::vector<std::size_t> ranked(std::span<const double> values);

/// Evaluates all perturbed sets in one batch, the base set (the space's initial values) first. Where one of the two
/// runs of a central difference failed, the other and the base set give a one-sided one; else a failed run leaves its
/// parameter's derivatives out. Where one judges the model by other observations than the base set, by a measure of
/// `measures`, the same is done for this measure and the objective functions that contain it. The plan says so.
/// Measures are those in 64 bits where the results have them, and so are the values of `objectives`, which may be left
/// out otherwise.
LocalSensitivity localSensitivity(const SensitivitySettings& settings, const SearchSpace& space, Evaluator& evaluator,
                                  const ParameterFields& fields = {}, const Feasibility& feasibility = {},
                                  std::span<const ObjectiveFunction> objectives = {},
                                  std::span<const OutputMeasure> measures = {});

/// The derivatives of any outputs by differences: p columns, one row per value; NaN for a parameter with a problem.
/// `outputs[i]` are the values of set i; those of a failed set may be empty. A value that one side of a central
/// difference lacks is replaced by that of the base set, unless the parameter's values of both are written alike.
std::vector<std::vector<double>> differenceColumns(const PerturbationPlan& plan,
                                                   std::span<const std::vector<double>> outputs);

/// The linearised model for the covariance matrix, from the simulated values of every set at the observation times
/// (empty for a failed one); nothing when the base set failed.
std::optional<LinearisedModel> linearise(const PerturbationPlan& plan,
                                         std::span<const std::vector<double>> simulatedValues,
                                         std::span<const double> observedValues, std::vector<double> weights);

/// Computes the composite scaled sensitivities over the observations and ranks by them: the root mean square of the
/// derivatives of all simulated values times the extent of the parameter and the root of the weight (Hill and
/// Tiedeman). Unlike the derivatives of a measure of the error, they do not vanish at an optimum. The plan says how
/// many derivatives are one-sided for want of a value.
void takeObservations(const LinearisedModel& model, LocalSensitivity& sensitivity);

/// The analysis as tables for programs: one row per parameter and output with the derivative, the scaled sensitivity,
/// the composite of the parameter over all outputs of that kind, and the reason where there is none.
std::vector<DataTable> sensitivityTables(const LocalSensitivity& sensitivity, const AnalysisNames& names);

/// The analysis as lines of text for the log.
std::vector<std::string> formatSensitivity(const LocalSensitivity& sensitivity, const AnalysisNames& names);

}  // namespace mirevo
