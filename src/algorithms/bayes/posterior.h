#pragma once

#include <cstddef>
#include <functional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/bayes/dream_sampler.h"
#include "algorithms/numbers/sample_summary.h"
#include "common/data_table.h"

namespace mirevo {

/// The sampled dimensions as people and tables know them.
struct ShownDimensions {
  std::vector<std::string> names;
  std::size_t modelParameterCount = 0;  ///< the others are parameters of error models
  /// A point of the chains on the scale on which its values mean something: the model's, for model parameters.
  std::function<std::vector<double>(std::span<const double>)> shown;
};

/// What the chains say behind burn-in, each vector with one entry per dimension.
struct PosteriorSummary {
  struct Dimension {
    double mean = 0.0;
    double standardDeviation = 0.0;
    std::vector<double> quantiles;       ///< at kSummaryProbabilities
    std::vector<double> priorQuantiles;  ///< likewise, of draws from the prior
    double rHat = 0.0;
    double effectiveSize = 0.0;
  };
  std::vector<Dimension> dimensions;
  std::vector<std::vector<double>> correlations;  ///< empty where only the largest are kept
  std::vector<PairCorrelation> largestCorrelations;
  std::vector<double> mostProbable;  ///< the state of the largest posterior density
  int mostProbableRun = 0;
  std::size_t draws = 0;              ///< states behind burn-in
  std::size_t withoutLikelihood = 0;  ///< further ones, which are left out
};

/// `priorDraws`: points of the chains' scale. Of more dimensions than `matrixLimit` only the largest correlations are
/// kept. Empty while there are fewer than 4 generations behind burn-in, and where no state there has a likelihood.
std::optional<PosteriorSummary> summarisePosterior(const DreamSampler& sampler, const ShownDimensions& dimensions,
                                                   std::span<const std::vector<double>> priorDraws,
                                                   std::size_t matrixLimit);
DataTable posteriorCorrelationTable(const PosteriorSummary& summary, const ShownDimensions& dimensions);

/// Every state of every chain; rows with 1 in the column Burn_In are no part of the posterior.
DataTable chainsTable(const DreamSampler& sampler, const ShownDimensions& dimensions);
DataTable posteriorTable(const PosteriorSummary& summary, const ShownDimensions& dimensions);
/// Posterior and prior as histograms, for drawing: with bins of equal width, or of equal ratio where the prior
/// isOfMagnitudes().
DataTable marginalsTable(const DreamSampler& sampler, const ShownDimensions& dimensions,
                         std::span<const std::vector<double>> priorDraws);
/// R-hat and effective sample sizes each time that they were looked at.
DataTable convergenceTable(const DreamSampler& sampler, const ShownDimensions& dimensions);

/// The names of files that have what the log leaves out.
struct PosteriorFiles {
  std::string posterior;
  std::string correlations;
};

/// Model runs whose sets have no likelihood, by the reason.
struct RunsWithoutLikelihood {
  int failed = 0;
  int missing = 0;  ///< LikelihoodLack, likewise the next two
  int untransformed = 0;
  int notFinite = 0;
  int notNumbers = 0;  ///< the objective function that is the likelihood is not finite

  int count() const { return failed + missing + untransformed + notFinite + notNumbers; }
};

/// The same in words, for the log, with at most 50 dimensions in a table.
std::vector<std::string> formatPosterior(const DreamSettings& settings, const DreamSampler& sampler,
                                         const ShownDimensions& dimensions, const PosteriorSummary* summary,
                                         const RunsWithoutLikelihood& runs, const PosteriorFiles& files);

/// Says why there is no posterior though chains have states: no model run has a likelihood. Empty if one has.
std::string noLikelihoodText(const DreamSampler& sampler, const RunsWithoutLikelihood& runs);

}  // namespace mirevo
