#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/analyses/covariance.h"
#include "algorithms/analyses/perturbation_plan.h"
#include "algorithms/analyses/uncertainty.h"
#include "evaluation/evaluator.h"
#include "measures/objective_functions.h"
#include "measures/output_measure.h"
#include "parameters/feasibility.h"
#include "parameters/parameter_fields.h"
#include "parameters/search_space.h"

namespace mirevo {

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

/// Says that perturbed runs fit better than the base set, the first of the results; empty where none does.
std::string betterFitText(std::span<const EvaluationResult> results);

}  // namespace mirevo
