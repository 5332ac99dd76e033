#pragma once

#include <cstdint>
#include <functional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/numbers/sample_summary.h"
#include "algorithms/numbers/special_functions.h"
#include "common/data_table.h"
#include "common/parameter_set.h"
#include "common/settings/keyword_row.h"
#include "evaluation/evaluator.h"
#include "parameters/search_space.h"

namespace mirevo {

/// The distribution of one variable parameter on the search scale; for a logarithmic parameter that of its logarithm.
struct NormalDistribution {
  double mean = 0.0;
  double standardDeviation = 0.0;
};

enum class SamplingType : std::int32_t { simpleRandom = 0, latinHypercube = 1 };
inline constexpr CodeName kSamplingTypeNames[] = {{0, "simple random"}, {1, "Latin hypercube"}};

struct UncertaintySettings {
  SamplingType samplingType = SamplingType::simpleRandom;
  std::int32_t sampleSize = 0;                 ///< N, at least 2
  std::vector<NormalDistribution> parameters;  ///< one per variable parameter, in setup order
};

/// The section UNCERTAINTY_ESTIMATION, and the seed of the run, which the initial sample sets, too.
struct UncertaintySection {
  UncertaintySettings& settings;
  std::int32_t& randomSeed;
};
const SettingSection<UncertaintySection>& uncertaintySection();
/// Its sections PARAMETER_n.
const SettingSection<NormalDistribution>& distributionSection();

/// N sets drawn from independent normal distributions, not checked against the bounds. The stream starts afresh from
/// the seed, whose sign does not matter. A deviate that has no quantile is reported to `messages` and yields the mean.
std::vector<ParameterSet> uncertaintySample(const UncertaintySettings& settings, std::int32_t seed,
                                            const MessageSink& messages = {});

/// The sets of an uncertainty analysis and their results, in the same order.
struct UncertaintyOutcome {
  std::vector<ParameterSet> sample;
  std::vector<EvaluationResult> results;
};

/// Draws the sample and evaluates it in one batch (an empty one where there is no variable parameter). The scale of the
/// objective functions is not taken from the sample: no aggregate is used here, and a constant objective function must
/// not end the analysis. `drawn` receives the sample before it is evaluated.
UncertaintyOutcome uncertaintyAnalysis(const UncertaintySettings& settings, std::int32_t seed, Evaluator& evaluator,
                                       const MessageSink& messages = {},
                                       const std::function<void(std::span<const ParameterSet>)>& drawn = {});

/// Names of what an analysis reports, for its tables; each list in setup order.
struct AnalysisNames {
  std::vector<std::string> parameters;
  std::vector<std::string> measures;
  std::vector<std::string> objectives;
};

struct UncertaintySummary {
  std::size_t evaluationCount = 0;
  std::size_t failedCount = 0;                    ///< left out of the statistics of measures and objective functions
  std::vector<SampleSummary> parameters;          ///< of all sets evaluated, as the model gets them
  std::vector<std::vector<double>> correlations;  ///< of the same values
  std::vector<SampleSummary> measures;
  std::vector<SampleSummary> objectives;
};

UncertaintySummary summariseUncertainty(const UncertaintyOutcome& outcome, const SearchSpace& space);

/// The summary as tables for programs: mean, standard deviation and quantiles of each parameter (model scale), measure
/// and objective function; the correlation of the sampled parameters.
std::vector<DataTable> uncertaintyTables(const UncertaintySummary& summary, const AnalysisNames& names);

/// The summary as lines of text for the log. `correlationFile` is the name of the file with the table of correlations.
std::vector<std::string> formatUncertainty(const UncertaintySummary& summary, const AnalysisNames& names,
                                           std::string_view correlationFile);

}  // namespace mirevo
