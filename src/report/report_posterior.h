#pragma once

#include <cstddef>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/bayes/dream_sampler.h"
#include "algorithms/bayes/posterior_words.h"
#include "report/json_writer.h"

namespace mirevo {

/// A sampled dimension: a parameter of the model or of an error model. What is not known is NaN or empty.
struct ReportedDimension {
  std::string name;
  bool isOfErrors = false;
  double mean = 0.0;
  double standardDeviation = 0.0;
  std::vector<double> quantiles;       ///< at kSummaryProbabilities
  std::vector<double> priorQuantiles;  ///< likewise
  double mostProbable = 0.0;
  double rHat = 0.0;
  double effectiveSize = 0.0;
  double narrowing = 0.0;                   ///< see DimensionFigures
  bool isLogarithmic = false;               ///< its bins are of equal ratio
  std::vector<double> edges;                ///< of the bins, ascending; one more than there are bins
  std::vector<double> posterior;            ///< shares in the bins
  std::vector<double> prior;                ///< likewise
  std::vector<double> rHats;                ///< at ReportedPosterior::checkedRuns
  std::vector<double> effectiveSizes;       ///< likewise
  std::vector<std::vector<double>> traces;  ///< of each drawn chain, at ReportedPosterior::generations
  std::vector<double> draws;                ///< some states behind burn-in, the same for all dimensions
};

/// The posterior distribution that Markov chains found. Traces and draws are thinned; figures are of all states.
struct ReportedPosterior {
  std::vector<ReportedDimension> dimensions;
  ConvergenceLimits limits;
  std::size_t chainCount = 0;
  std::size_t generationCount = 0;
  std::size_t burnIn = 0;      ///< generations
  std::size_t stateCount = 0;  ///< behind burn-in, with a likelihood
  double acceptance = 0.0;     ///< share of the proposals behind burn-in; NaN without any
  std::vector<double> chainAcceptance;
  double rise = 0.0;                ///< of the mean log-likelihood behind burn-in; NaN if it is not known
  std::vector<double> generations;  ///< that the traces show
  std::vector<std::vector<double>> logLikelihoods;
  std::vector<double> checkedRuns;                ///< model runs at which the chains were compared
  std::vector<std::vector<double>> correlations;  ///< of all dimensions; empty if they are not known
  std::vector<PairCorrelation> largestCorrelations;
  bool isUnfinished = false;   ///< the run was interrupted
  bool hasLikelihood = false;  ///< one of the states
  bool hasPosterior = false;   ///< else the run ended in burn-in, or its table cannot be read
};

/// What Markov chains have written beside their results; empty if there are no chains. Each file that cannot be read is
/// left out, with a text in `faults`. `parameterCount`: dimensions that are parameters of the model.
std::optional<ReportedPosterior> reportedPosterior(const std::string& filePrefix, const DreamSettings& settings,
                                                   std::size_t parameterCount, std::vector<std::string>& faults);

/// As the member "posterior".
void writePosterior(JsonWriter& json, const ReportedPosterior& posterior);

}  // namespace mirevo
