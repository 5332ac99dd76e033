#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/analyses/evaluated_sample.h"
#include "algorithms/analyses/glue_settings.h"
#include "algorithms/analyses/uncertainty.h"
#include "algorithms/numbers/sample_summary.h"
#include "common/data_table.h"
#include "common/settings/keyword_row.h"
#include "measures/objective_functions.h"
#include "measures/output_measure.h"
#include "measures/statistics.h"

namespace mirevo {

/// Generalised likelihood uncertainty estimation (Beven and Binley 1992, doi:10.1002/hyp.3360060305; 2014,
/// doi:10.1002/hyp.10082): of sets drawn from the distributions of the parameters those that are acceptable, the
/// behavioural ones, each with a weight, its likelihood scaled to the sum 1. Quantiles of parameters, measures and
/// simulated series are those of the weighted behavioural sets (numbers/weighted_sample).

/// What sets are judged by.
struct GlueJudge {
  std::string name = {};
  bool isObjective = false;
  std::size_t index = 0;       ///< 0-based, among the output measures or the objective functions
  Best best = Best::smallest;  ///< of an objective function, which a search makes small: smallest
  /// Of values that are no squares: measures in the unit of the series, or differences and percentages.
  bool isSquaredForVariance = false;
  std::string description = {};  ///< "output measure flow (Nash-Sutcliffe efficiency; large is good, best 1)"

  /// The values of the sample by which it is judged.
  const std::vector<double>& valuesOf(const EvaluatedSample& sample) const {
    return (isObjective ? sample.objectives : sample.measures)[index];
  }
  /// How far a value is from the best one, 0 or more for a measure; the smaller, the better.
  double distanceOf(double value) const;
  /// The error variance e, as far as the value tells it: the distance from the best value of an efficiency (1 - NSE is
  /// the error variance over the observed one), the square of an error in the unit of the series, a sum of squares or
  /// an objective function as it is.
  double varianceOf(double value) const;
  /// "0.7 or more", "2 or less", "-10 to 10"
  std::string rangeText(double threshold) const;
};

/// The measure or objective function of the settings; empty, with `refusal` filled, if there is none of that name, or
/// threshold or likelihood do not fit to it.
std::optional<GlueJudge> glueJudge(const GlueSettings& settings, std::span<const OutputMeasure> measures,
                                   std::span<const ObjectiveFunction> objectives, SettingRefusal& refusal);

/// The behavioural sets among those of a sample.
struct GlueWeights {
  std::vector<std::size_t> behavioural;  ///< indices of the sample, rising
  std::vector<double> weights;           ///< one per behavioural set; their sum is 1, or all are 0
  std::size_t successCount = 0;
  std::size_t failedCount = 0;
  std::size_t undefinedCount = 0;   ///< behavioural sets without a likelihood, whose weight is 0
  std::size_t unweightedCount = 0;  ///< behavioural sets with the weight 0, those included
  std::optional<std::size_t> best;  ///< index of the best set of all
  bool isInfinite = false;          ///< a set without any error has an infinite likelihood, and all of the weight
  double effective = 0.0;           ///< effectiveCount() of the weights

  bool hasWeights() const { return effective > 0.0; }
  /// One per set of the sample, 0 for those that are not behavioural.
  std::vector<double> ofAll(std::size_t count) const;
};

GlueWeights glueWeights(const EvaluatedSample& sample, const GlueJudge& judge, const GlueSettings& settings);

/// What the observations say of a parameter.
struct GlueParameter {
  SampleSummary drawn;        ///< of all sets
  SampleSummary behavioural;  ///< of the behavioural ones, weighted
  double distance = 0.0;      ///< distributionDistance() of the behavioural values from those of all that succeeded
};

struct GlueSummary {
  std::vector<GlueParameter> parameters;
  std::vector<SampleSummary> measures;  ///< of the behavioural sets, weighted, as the following
  std::vector<SampleSummary> objectives;
  std::vector<SampleSummary> validation;
  std::vector<std::vector<double>> correlations;     ///< of the behavioural sets; empty for too many parameters ...
  std::vector<PairCorrelation> largestCorrelations;  ///< ... of which only these are kept
  /// chanceDistance() of the behavioural sets from all that succeeded: a smaller distance does not tell that the
  /// observations say anything of the parameter. Regional sensitivity analysis (Spear and Hornberger 1980,
  /// doi:10.1016/0043-1354(80)90040-8) compares the same way.
  double distanceLimit = 0.0;
};

/// Of more parameters than `matrixLimit` only the largest correlations are kept.
GlueSummary summariseGlue(const EvaluatedSample& sample, const GlueWeights& weights, std::int32_t matrixLimit);

/// For programs: `_Glue.dat` with the weight of each successful evaluation, and the tables of sampling with what they
/// have of the behavioural sets.
std::vector<DataTable> glueTables(const EvaluatedSample& sample, const GlueWeights& weights, const GlueSummary& summary,
                                  const GlueJudge& judge, const GlueSettings& settings, const AnalysisNames& names);

/// "behavioural: output measure flow (...) of 0.7 or more", before any evaluation.
std::string behaviouralText(const GlueJudge& judge, const GlueSettings& settings);
/// "likelihood: ..."
std::string likelihoodText(const GlueSettings& settings);

/// The result for people, for log, result file and report. `areDrawn`: the sets are a sample of distributions.
std::vector<std::string> formatGlue(const EvaluatedSample& sample, const GlueWeights& weights,
                                    const GlueSummary& summary, const GlueJudge& judge, const GlueSettings& settings,
                                    const AnalysisNames& names, std::string_view correlationFile, bool areDrawn);
/// What to doubt, and what to do about it: no or few behavioural sets, weights that are those of a few sets, no choice
/// at all.
std::vector<std::string> glueWarnings(const EvaluatedSample& sample, const GlueWeights& weights, const GlueJudge& judge,
                                      const GlueSettings& settings);

}  // namespace mirevo
