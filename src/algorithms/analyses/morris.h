#pragma once

#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/analyses/effect_statistics.h"
#include "algorithms/analyses/elementary_effects.h"
#include "algorithms/analyses/morris_settings.h"
#include "algorithms/analyses/uncertainty.h"
#include "common/data_table.h"
#include "evaluation/evaluator.h"
#include "measures/objective_functions.h"
#include "measures/output_measure.h"

namespace mirevo {

/// An output that parameters have effects on.
struct ScreenedOutput {
  std::string kind;  ///< "measure", "objective" or "validation"
  std::string name;
  OutputEffects effects;
  /// Effects that are unknown although both model runs succeeded: the value is not finite, or judged by other
  /// observations.
  std::size_t incomparable = 0;
};

struct MorrisOutcome {
  std::vector<ScreenedOutput> outputs;  ///< measures, objective functions, measures in validation periods
  std::size_t plannedEffects = 0;       ///< of each output
  std::size_t lostEffects = 0;          ///< of these, those of evaluations that failed or were not made
  std::size_t failedCount = 0;
  std::size_t missingCount = 0;  ///< evaluations that were not made
};

/// The results of a plan, by number: evaluation n is at n - 1. Those that were not made have failed with `notMade`.
using EffectResults = std::vector<EvaluationResult>;

/// Evaluates the sets of the plan, in batches of whole trajectories; of up to 4 million values in one, so that the
/// memory of the sets does not grow with the design. `taken` has the results of the batches that are complete, also
/// when one ends with an exception.
void evaluateEffects(const EffectPlan& plan, const ParameterDistributions& distributions, Evaluator& evaluator,
                     EffectResults& taken);

/// The statistics of the elementary effects on all outputs, in 64 bits where results have them. An effect one of whose
/// two evaluations failed, or judges the model by other observations, is left out; all others stay as they are.
MorrisOutcome screenParameters(const EffectPlan& plan, const EffectResults& results, const MorrisSettings& settings,
                               std::int32_t seed, std::span<const ObjectiveFunction> objectives,
                               const AnalysisNames& names);

/// The statistics as a table for programs, one row per output and parameter.
DataTable morrisTable(const MorrisOutcome& outcome, const MorrisSettings& settings, const AnalysisNames& names);

/// The statistics as lines of text for the log; `file` is the name of the file with the table.
std::vector<std::string> formatMorris(const MorrisOutcome& outcome, const EffectPlan& plan,
                                      const MorrisSettings& settings, const AnalysisNames& names,
                                      std::string_view file);

/// Of a screening of correlated parameters.
inline constexpr const char* kCorrelatedStepsText =
    "The parameters are correlated: a step takes those along that follow in the list, as the correlations want it, and "
    "an effect is that of all of them";

/// Which points and effects the analysis has to do without, as sets cannot be run; empty: none.
std::string infeasiblePointsText(const EffectPlan& plan, std::span<const std::string> parameters);

/// The name of a verdict in the table: "fix", "keep", "undecided"; empty for none.
std::string_view verdictName(ScreeningVerdict verdict);

}  // namespace mirevo
