#pragma once

#include <array>
#include <optional>
#include <span>
#include <string>
#include <unordered_map>
#include <vector>

#include "algorithms/bayes/dream_sampler.h"
#include "algorithms/bayes/likelihoods.h"
#include "algorithms/bayes/posterior.h"
#include "algorithms/distributions/parameter_distributions.h"
#include "run/tasks/dream_section.h"
#include "run/tasks/task.h"

namespace mirevo {

/// What the dimensions of a posterior are derived from.
struct LikelihoodBasis {
  const SearchSpace& space;
  std::span<const OutputMeasure> measures;
  std::span<const ObjectiveFunction> objectives;
  std::span<const ObservedSeries> observed;  ///< TaskContext::observedSeries
};

/// The posterior that DREAM samples: parameters of the model, then those of the errors of each series.
class DreamTarget final {
 public:
  /// A series whose errors the likelihood is of.
  struct Series {
    std::string name;          ///< of its output measure
    std::size_t observed = 0;  ///< index in TaskContext::observedSeries
    std::size_t first = 0;     ///< of its values among the simulated ones of a run
    SeriesErrors errors;
    std::size_t observationCount = 0;
    ErrorValues fixed;
    std::array<std::optional<std::size_t>, kErrorTermCount> dimensions;  ///< of the terms that are estimated
  };

  /// Throws FatalError where the setup's error models do not fit the observations.
  DreamTarget(const DreamSection& settings, const ParameterDistributions& prior, const LikelihoodBasis& basis);

  /// For the sampler; `context` and this must outlive it.
  DreamProblem problem(const TaskContext& context);

  ShownDimensions shown(const SearchSpace& space) const;
  /// Draws from the prior that can be run; fewer than `count` where hardly any can.
  std::vector<std::vector<double>> priorDraws(const Feasibility& feasibility, std::size_t count) const;
  const std::vector<Series>& series() const { return series_; }
  ErrorValues errorsOf(const Series& series, std::span<const double> point) const;
  const RunsWithoutLikelihood& runsWithoutLikelihood() const { return withoutLikelihood_; }
  std::vector<std::string> descriptionLines() const;
  /// Which observations of a series the likelihood is of, once runs have told.
  struct CountLine {
    std::string text;
    bool isWarning = false;
  };
  std::vector<CountLine> countLines() const;
  bool hasCounted() const { return hasCounted_; }

 private:
  struct Dimension {
    std::string name;
    double lower = 0.0;
    double upper = 0.0;
    bool isLogarithmic = false;  ///< sampled as its logarithm
  };

  void addSeries(const DreamSection& settings, const LikelihoodBasis& basis);
  void addTerms(const DreamSection& settings, const ErrorModelSettings* own, LikelihoodForm form, Series& series);
  std::vector<double> pointAt(std::span<const double> unit) const;
  double logPrior(const Feasibility& feasibility, std::span<const double> point) const;
  std::vector<ProposalResult> evaluate(const TaskContext& context, std::span<const DreamProposal> proposals);
  void countObservations(const TaskContext& context, std::span<const EvaluationResult> results);
  double logLikelihood(const TaskContext& context, int number, std::span<const double> point) const;
  void countLack(const TaskContext& context, const EvaluationResult& result, std::span<const double> point);
  double objectiveOf(const TaskContext& context, const EvaluationResult& result) const;

  ParameterDistributions prior_;
  std::vector<double> lower_;
  std::vector<double> upper_;
  std::vector<Dimension> errors_;
  std::vector<Series> series_;
  std::optional<std::size_t> objective_;  ///< its number from 1, 0: the aggregate
  bool hasCounted_ = false;               ///< whether successful runs have told which observations count
  /// The log-likelihood of each run if it is an objective function, and -infinity of each that failed.
  std::unordered_map<int, double> known_;
  RunsWithoutLikelihood withoutLikelihood_;
};

}  // namespace mirevo
