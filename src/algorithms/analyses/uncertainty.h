#pragma once

#include <cstdint>
#include <functional>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/distributions/parameter_distributions.h"
#include "algorithms/numbers/sample_summary.h"
#include "algorithms/numbers/special_functions.h"
#include "common/data_table.h"
#include "common/date_record.h"
#include "common/parameter_set.h"
#include "common/settings/keyword_row.h"
#include "evaluation/evaluator.h"
#include "parameters/feasibility.h"
#include "parameters/search_space.h"

namespace mirevo {

enum class SamplingType : std::int32_t { simpleRandom = 0, latinHypercube = 1 };
/// The forms of the uncertainty analysis; those that do not sample independently have a name only.
inline constexpr CodeName kSamplingTypeNames[] = {
    {0, "simple random"}, {1, "Latin hypercube"}, {std::nullopt, "GLUE"}, {std::nullopt, "DREAM"}};

/// At which times the bands of simulated series are made. Without codes: names only, in the order of the enumerators.
enum class BandTimes : std::int32_t { observations, steps };
inline constexpr CodeName kBandTimesNames[] = {{std::nullopt, "observations"}, {std::nullopt, "steps"}};

inline constexpr std::int32_t kMatrixLimit = 1000;

struct UncertaintySettings {
  SamplingType samplingType = SamplingType::simpleRandom;
  std::int32_t sampleSize = 0;           ///< N, at least 2
  ParameterDistributions distributions;  ///< of the variable parameters, in setup order
  bool redrawsInfeasible = false;        ///< whether sets that cannot be run are drawn again
  BandTimes bandTimes = BandTimes::observations;
  std::optional<DateRecord> bandEnd;  ///< of the steps; empty: that of the evaluation period
  /// Of more parameters only the largest correlations are kept: the matrix grows with the square of their number.
  std::int32_t matrixLimit = kMatrixLimit;
};

inline constexpr std::string_view kUncertaintySection = "UNCERTAINTY_ESTIMATION";
inline constexpr std::string_view kUncertaintyTypeKeyword = "Uncertainty_Type";
inline constexpr std::string_view kRedrawKeyword = "Redraw_Infeasible";
inline constexpr std::string_view kSampleSizeKeyword = "Sample_Size";
inline constexpr std::string_view kBandTimesKeyword = "Band_Times";
inline constexpr std::string_view kBandEndKeyword = "Band_End_Date";
inline constexpr std::string_view kSampleSizeRefusal = "Error: Sample size in uncertainty estimation invalid";

/// The section UNCERTAINTY_ESTIMATION, and the seed of the run, which the initial sample sets, too.
struct UncertaintySection {
  UncertaintySettings& settings;
  std::int32_t& randomSeed;
};
const SettingSection<UncertaintySection>& uncertaintySection();

/// N sets drawn from the distributions, not checked against the bounds: the deviates of the first parameter come first.
/// With Latin hypercube sampling they are stratified; of parameters that are correlated, those of the first, and of the
/// others the part that is not explained by those before. The stream starts afresh from the seed, whose sign does not
/// matter. A deviate that is rounded to 1 has no normal quantile: that is reported to `messages`, and a normal
/// distribution yields its mean.
std::vector<ParameterSet> uncertaintySample(const UncertaintySettings& settings, std::int32_t seed,
                                            const MessageSink& messages = {});

/// A sample of sets that can be run.
struct FeasibleSample {
  std::vector<ParameterSet> sets;
  std::int64_t drawnCount = 0;  ///< sets that were drawn for it
};

/// The sets, of which those that cannot be run are replaced by what `drawOne` makes, one after another. Throws as
/// feasibleUncertaintySample().
FeasibleSample redrawInfeasible(std::vector<ParameterSet> sets, const Feasibility& feasibility,
                                const std::function<ParameterSet()>& drawOne);

/// The uncertaintySample() whose sets that cannot be run are replaced by further ones: the stream goes on behind the
/// sample, with one deviate for each parameter in setup order, whatever the type of sampling. Throws FatalError "Error:
/// No parameter set found that satisfies the constraints" if a million draws, and a thousand more for each set, do not
/// yield them.
FeasibleSample feasibleUncertaintySample(const UncertaintySettings& settings, std::int32_t seed,
                                         const Feasibility& feasibility, const MessageSink& messages = {});

/// The sets of an uncertainty analysis and their results, in the same order.
struct UncertaintyOutcome {
  std::vector<ParameterSet> sample;
  std::vector<EvaluationResult> results;
};

/// Evaluates the sample in one batch. The scale of the objective functions is not taken from it: no aggregate is used
/// here, and a constant objective function must not end the analysis.
UncertaintyOutcome uncertaintyAnalysis(std::vector<ParameterSet> sample, Evaluator& evaluator);

/// Names of what an analysis reports, for its tables; each list in setup order.
struct AnalysisNames {
  std::vector<std::string> parameters;
  std::vector<std::string> measures;
  std::vector<std::string> objectives;
  std::vector<std::string> validation = {};  ///< measures in validation periods
};

struct UncertaintySummary {
  std::size_t evaluationCount = 0;
  std::size_t failedCount = 0;                    ///< left out of the statistics of measures and objective functions
  std::vector<SampleSummary> parameters;          ///< of all sets evaluated, as the model gets them
  std::vector<std::vector<double>> correlations;  ///< of the same values; empty if only the largest are kept
  std::vector<PairCorrelation> largestCorrelations;
  std::vector<SampleSummary> measures;
  std::vector<SampleSummary> objectives;
  std::vector<SampleSummary> validation;  ///< of measures in validation periods
};

/// `matrixLimit`: see UncertaintySettings.
UncertaintySummary summariseUncertainty(const UncertaintyOutcome& outcome, const SearchSpace& space,
                                        std::int32_t matrixLimit = kMatrixLimit);

/// The summary as tables for programs: mean, standard deviation and quantiles of each parameter (model scale), measure
/// and objective function; the correlation of the sampled parameters.
std::vector<DataTable> uncertaintyTables(const UncertaintySummary& summary, const AnalysisNames& names);

/// The summary as lines of text for the log. `correlationFile` is the name of the file with the table of correlations.
std::vector<std::string> formatUncertainty(const UncertaintySummary& summary, const AnalysisNames& names,
                                           std::string_view correlationFile);

}  // namespace mirevo
