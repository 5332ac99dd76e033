#pragma once

#include <cstdint>
#include <deque>
#include <limits>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/analyses/perturbation_plan.h"
#include "algorithms/searches/feasible_points.h"
#include "algorithms/searches/glm_constraints.h"
#include "algorithms/searches/residual_problem.h"
#include "algorithms/searches/search_algorithm.h"
#include "algorithms/searches/search_method.h"

namespace mirevo {

class GlmLinearModel;

/// Forward until an iteration gains little, then central; or one of the two throughout.
enum class GlmDifferences : std::int32_t { automatic, forward, central };

struct GlmSettings {
  GlmDifferences differences = GlmDifferences::automatic;
  PerturbationOption perturbationOption = PerturbationOption::range;
  double perturbationFraction = 0.01;
  std::int32_t lambdaCount = 4;  ///< trial sets of an iteration
  double initialLambda = 0.01;
  double smallestSingularValue = 1.0e-7;  ///< as a share of the largest, of columns scaled to length 1
  std::int32_t broydenUpdates = 2;        ///< most iterations between two Jacobians made by runs
  double regularisation = 0.0;            ///< weight of the squared distances to the prior values
  std::vector<double> priorValues = {};   ///< model scale, p; empty: the initial values
  std::vector<double> priorWeights = {};  ///< p; empty: each 1
  std::int32_t sampleSize = 1;
  std::int32_t startCount = 1;
  double minStep = 1.0e-6;      ///< as a share of the ranges
  double minGradient = 1.0e-8;  ///< cosine of the angle between the residuals and the column of a parameter
};

/// Gauss-Levenberg-Marquardt on the residuals of all observations: Levenberg (1944), doi:10.1090/qam/10666; Marquardt
/// (1963), doi:10.1137/0111030. An iteration runs a batch for the derivatives and one for the trial sets of several
/// lambdas, of which the best is taken; the first trial has lambda 0. If they gain far less than the linear model
/// expects, as in a valley that bends, a third batch has the trial sets corrected for the curvature that their runs
/// have shown (after the geodesic acceleration of Transtrum and Sethna 2012, arXiv:1201.5885). The steps are those of
/// GlmLinearModel, led along constraints by GlmConstraints; between Jacobians made by differences they may be updated
/// after Broyden (1965), doi:10.1090/S0025-5718-1965-0198670-6. A run that lacks a residual of the start counts as
/// failed. A column without a run is that of the previous Jacobian, updated after Broyden; without one its parameter is
/// held. The best set is that of the least sum of squares, prior included, be it one of the differences.
class Glm final : public SearchAlgorithm {
 public:
  Glm(const GlmSettings& settings, SearchProblem problem);

  /// Evaluates the initial sample, the best sets of which are where the search starts, one after the other.
  SearchStatus initialise() override;
  /// Makes an iteration.
  SearchStatus advance() override;
  bool isTerminated() const override { return !summary_.terminationMessage.empty(); }
  const SearchSummary& summary() const override { return summary_; }
  /// It compares sums of squares.
  bool comparesBestValues() const override { return false; }

 private:
  struct Point {
    ParameterSet set;
    EvaluationResult result;
    ResidualRows rows;
    double squares = 0.0;  ///< of the residuals
    double sum = 0.0;      ///< with the prior
    int ordinal = 0;       ///< of its evaluation in this search, from 1
  };

  /// How a trial set was made.
  struct Trial {
    double lambda = 0.0;
    bool isStopped = false;  ///< drawn back towards the current set, as constraints stop its step
  };

  bool isProblemValid() const;
  /// Fewer results than sets if the budget is used up.
  std::vector<std::optional<Point>> run(std::span<const ParameterSet> sets);
  PerturbationPlan planDifferences() const;
  bool makeJacobian();
  void noteDifferences(std::span<const std::optional<Point>> points);
  GlmLinearModel linearModel() const;
  std::vector<double> lambdas(int attempt) const;
  std::vector<ParameterSet> trialSets(GlmLinearModel& model, std::span<const double> lambdas,
                                      std::vector<Trial>& trials);
  std::vector<std::string> stoppersOf(const ParameterSet& set) const;
  /// Runs the trial sets again, corrected for the curvature that they have shown. May replace the best of them.
  void correctTrials(GlmLinearModel& model, std::vector<std::optional<Point>>& points, std::vector<Trial>& trials);
  void accept(Point point, const Trial& trial, double expected);
  void judge(double reduction, double step, bool isAsExpected, bool isStopped);
  bool isLevelWith(const Point& point) const;
  /// Whether there are no better differences to go on with.
  bool isLastKind() const;
  void takeLevel(Point point);
  /// Of an iteration that gained nothing more: better derivatives, or the end of the run.
  void refineOr(std::string_view end);
  void startNext();
  void endRun(std::string_view reason);
  void end(std::string message);
  void noteBest(const Point& point);
  void note(std::string text);
  double priorSum(const ParameterSet& set) const;
  double priorDistance(const ParameterSet& set, std::size_t j) const;
  int budgetLeft() const { return problem_.stopping.maxEvaluations - summary_.evaluationCount; }

  GlmSettings settings_;
  SearchProblem problem_;
  FeasiblePoints feasible_;
  GlmConstraints constraints_;
  SearchSummary summary_;
  std::deque<Point> starts_;  ///< not used yet, the best first
  std::size_t startCount_ = 0;
  std::optional<Point> best_;
  std::string firstFailure_;                                      ///< of a run of the initial sample, one line
  double leastOfRuns_ = std::numeric_limits<double>::infinity();  ///< the least sum to which a run has come
  std::vector<double> units_;                                     ///< the finest of each residual

  // Of the current run:
  std::optional<Point> current_;
  std::vector<std::vector<double>> jacobian_;  ///< of the residuals, p columns; empty before the first
  std::shared_ptr<const DifferenceJacobian> differences_;
  bool needsJacobian_ = true;
  bool isCentral_ = false;
  int updates_ = 0;  ///< after Broyden since the last Jacobian by differences
  int smallChanges_ = 0;
  int stoppedChanges_ = 0;              ///< small ones of steps that constraints have stopped
  std::vector<std::string> stoppedBy_;  ///< the constraints that have stopped steps of this iteration
  double lambda_ = 0.0;
  int runCount_ = 0;
  int iteration_ = 0;
  int madeBefore_ = 0;  ///< evaluations before this iteration
};

/// GLM as a setup selects it.
class GlmMethod final : public SearchMethod {
 public:
  const SearchFacts& facts() const override;
  BoundSection section() override;
  std::optional<SettingRefusal> refusalFor(const SearchSpace& space) const override;
  bool evaluatesSample(const InitialSampleSettings& /*sample*/) const override { return false; }
  std::int64_t sampleSize(const InitialSampleSettings& sample, int budget) const override;
  std::vector<SearchDoubt> doubts() const override;
  std::vector<SearchDoubt> doubtsIn(const SearchSpace& space) const override;
  /// Only sets that are drawn depend on the seed.
  std::string seedDoubt(const InitialSampleSettings& sample) const override;
  RaisedBudget raiseBudget(const SearchHistory& history, const StoppingCriteria& stopping,
                           const InitialSampleSettings& sample) const override;
  std::unique_ptr<SearchAlgorithm> make(SearchProblem problem) const override;

  GlmSettings settings;
};

}  // namespace mirevo
