#pragma once

#include <deque>
#include <functional>
#include <limits>
#include <optional>
#include <span>
#include <string_view>
#include <utility>
#include <vector>

#include "algorithms/numbers/uniform_generator.h"
#include "algorithms/searches/feasible_points.h"
#include "algorithms/searches/search_algorithm.h"
#include "algorithms/searches/search_method.h"
#include "evaluation/evaluator.h"

namespace mirevo {

struct DdsSettings {
  double perturbation = 0.2;  ///< neighbourhood size r, as a fraction of a parameter's range
  int candidates = 1;         ///< that may be under way at a time
  bool waitsForAll = true;    ///< before it makes further candidates; otherwise for the first of those under way
};

/// Dynamically Dimensioned Search after Tolson and Shoemaker (2007), doi:10.1029/2005WR004723. A candidate is the best
/// set with some parameters perturbed, ever fewer of them as the budget is used up. With several candidates at a time
/// they are accepted in the order in which they were made, whatever the order in which their evaluations end: what a
/// candidate is made from depends on those accepted before it was made, never on time. If two candidates improve the
/// same set, the next one unites them.
///
/// Differs from the paper in four ways: the start points count as evaluations in the inclusion probability, a point
/// reflected past the opposite bound is set to the bound that it violated first, of the two normal deviates that the
/// polar method yields one is discarded, and a candidate that violates a constraint is drawn again.
class Dds final : public SearchAlgorithm {
 public:
  /// `maxEvaluations` (m) is the whole budget, start points included. The evaluator and the stream must outlive the
  /// object.
  Dds(DdsSettings settings, int maxEvaluations, bool startFromInitial, SearchBounds bounds, Evaluator& evaluator,
      UniformGenerator& random, Feasibility feasibility = {});

  /// Evaluates the start points in one batch: the initial set, those given, or ddsStartPointCount(m) random ones.
  /// Returns kDdsInvalidInput, without an evaluation, for a budget below 1 and for bounds that are missing, crossed or
  /// not finite.
  SearchStatus initialise() override;
  /// Makes candidates until as many are under way as may be, and accepts or rejects the first of them, or all. Does
  /// nothing once terminated; kDdsInvalidInput before initialise().
  SearchStatus advance() override;
  /// To be called before initialise(): the start points are the initial set, if the search starts from it, and these.
  void startFrom(std::vector<ParameterSet> sets) { givenStarts_ = std::move(sets); }
  /// To be called before initialise(): makes no candidate after this evaluation, as if it had been cut off there.
  void endAfter(int evaluations) { lastEvaluation_ = evaluations; }
  bool isTerminated() const override { return !summary_.terminationMessage.empty(); }
  const SearchSummary& summary() const override { return summary_; }

 private:
  struct Candidate {
    ParameterSet set;
    ParameterSet origin;  ///< the best set from which it was made
    double originValue = 0.0;
  };

  std::vector<ParameterSet> startPoints();
  ParameterSet drawCandidate(int evaluation);
  void submitCandidate();
  void takeFirstCandidate();
  /// If the candidate improved the set from which it was made, and another one has replaced that since: puts both
  /// improvements into the next candidate.
  void mergeImprovements(const Candidate& candidate, double value);
  void takeAsBest(const ParameterSet& set, EvaluationResult& result);
  void checkBudget();
  void noteSteps(const ParameterSet& firstDraw, const ParameterSet& candidate);
  std::vector<std::size_t> heldParameters() const;

  DdsSettings settings_;
  int maxEvaluations_;
  bool startFromInitial_;
  SearchBounds bounds_;
  Evaluator& evaluator_;
  UniformGenerator& random_;
  FeasiblePoints feasible_;
  SearchSummary summary_;
  std::deque<Candidate> underWay_;      ///< submitted and not accepted or rejected, in order
  std::optional<ParameterSet> merged_;  ///< the next candidate, if it is not to be drawn
  std::vector<ParameterSet> givenStarts_;
  int lastEvaluation_ = std::numeric_limits<int>::max();
  std::vector<int> replacedSteps_;    ///< by parameter, how many of its steps could not be run and were replaced
  std::vector<double> largestSteps_;  ///< by parameter, from the best set to a candidate
};

inline constexpr SearchStatus kDdsInvalidInput = 1;

/// Uniform deviates in [0, 1), one per call.
using DeviateSource = std::function<double()>;

/// Number of random start points for a budget of m >= 1 evaluations: max(5, 0.005 m), never more than m.
int ddsStartPointCount(int maxEvaluations);

/// P = 1 - ln(i) / ln(m), the probability with which evaluation i of m (both from 1, start points included) perturbs a
/// parameter; 0 for m = 1.
double ddsInclusionProbability(int evaluation, int maxEvaluations);

/// A standard normal deviate by the polar method; one further uniform deviate chooses between the two that it yields.
double ddsNormalDeviate(const DeviateSource& deviate);

/// `value`, reflected at the bound that it violates; at that bound itself if the reflection violates the other one.
double ddsReflect(double value, double lower, double upper);

/// The best set with each parameter perturbed with the given probability, and at least one of them in any case; r is
/// the standard deviation of the perturbation as a fraction of the range of the parameter. While the set cannot be run,
/// the perturbations are drawn again, and after every ten draws the parameters, too; FeasiblePoints::draw() then draws
/// the set back towards the best one. `firstDraw`, if any, gets what was drawn first.
ParameterSet ddsCandidate(std::span<const double> best, const SearchBounds& bounds, double r,
                          double inclusionProbability, const DeviateSource& deviate, FeasiblePoints& feasible,
                          ParameterSet* firstDraw = nullptr);

inline constexpr std::string_view kPerturbationKeyword = "Perturbation_Parameter";
inline constexpr std::string_view kPerturbationMeaning =
    "Neighbourhood size r: standard deviation of a perturbation as a fraction of the parameter's range.";

/// DDS as a setup selects it.
class DdsMethod : public SearchMethod {
 public:
  const SearchFacts& facts() const override;
  BoundSection section() override;
  std::vector<SearchDoubt> doubts() const override;
  std::string_view budgetRefusal() const override;
  /// Several start points: random ones, unless it starts from the initial set, or those of an earlier run.
  bool evaluatesSample(const InitialSampleSettings& sample) const override;
  std::int64_t sampleSize(const InitialSampleSettings& sample, int budget) const override;
  /// DDS perturbs ever fewer parameters as its budget is used up, so that another budget means another search. It
  /// starts from the best parameter set of the earlier one, whose evaluations are kept.
  RaisedBudget raiseBudget(const SearchHistory& history, const StoppingCriteria& stopping,
                           const InitialSampleSettings& sample) const override;
  /// The search that follows the earlier ones, with the rest of the budget.
  std::unique_ptr<SearchAlgorithm> make(SearchProblem problem) const override;
  /// Runs the earlier searches with smaller budgets first, each from the best set of the one before.
  SearchSummary run(SearchProblem problem, const PeriodicStep& periodicStep) const override;

  DdsSettings settings;

 private:
  std::unique_ptr<Dds> makeDds(SearchProblem problem) const;
};

}  // namespace mirevo
