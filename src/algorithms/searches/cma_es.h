#pragma once

#include <optional>
#include <span>
#include <string>
#include <vector>

#include "algorithms/searches/cma_bounds.h"
#include "algorithms/searches/cma_distribution.h"
#include "algorithms/searches/cma_margin.h"
#include "algorithms/searches/cma_restarts.h"
#include "algorithms/searches/cma_surrogate.h"
#include "algorithms/searches/cma_tests.h"
#include "algorithms/searches/feasible_points.h"
#include "algorithms/searches/population.h"
#include "algorithms/searches/population_method.h"
#include "algorithms/searches/search_algorithm.h"

namespace mirevo {

struct CmaEsSettings {
  std::int32_t populationSize = 0;  ///< λ of the first run; 0: cmaPopulationSize()
  double initialStep = 0.2;         ///< σ at the start, as a fraction of the range of each parameter
  std::int32_t doublings = 9;       ///< restarts with twice the population
};

/// Covariance Matrix Adaptation Evolution Strategy after Hansen (2016), The CMA Evolution Strategy: A Tutorial,
/// arXiv:1604.00772, with active covariance, restarts after BIPOP, a margin for integer parameters and a penalty
/// outside the bounds; see the classes whose names begin with Cma. A loop is one generation, all of it one batch.
///
/// It works in the unit cube of the bounds. What the publications leave open: the first run starts at a
/// given set if it is the best of the initial sample, else at the mean of the better half, weighted as parents are;
/// failed points rank behind all others, and of two the one nearer to the mean is the better one, so that steps become
/// smaller where all fail; a point that violates a constraint is drawn again and finally drawn back towards the mean;
/// differences of values are negligible in relation to the values.
///
/// With a surrogate model only a part of a generation is run: the points that the model ranks first, and more until it
/// ranks the parents no differently with the new results. This is the approximate ranking of Kern, Hansen and
/// Koumoutsakos (2006), doi:10.1007/11844297_95, with the criterion of Bouzarkouna, Auger and Ding (2010),
/// doi:10.1007/978-3-642-12239-2_54. Beyond these, the minimum that the model predicts takes the place of one point of
/// the generation, its step limited in length after Hansen (2011), arXiv:1110.4181; and the model may be a Gaussian
/// process.
class CmaEs final : public SearchAlgorithm {
 public:
  CmaEs(const CmaEsSettings& settings, SearchProblem problem);

  SearchStatus initialise() override;
  SearchStatus advance() override;
  bool isTerminated() const override { return !summary_.terminationMessage.empty(); }
  const SearchSummary& summary() const override { return summary_; }
  /// It does, but by their sizes.
  bool comparesBestValues() const override { return false; }

 private:
  struct Point {
    std::vector<double> step;   ///< y
    std::vector<double> place;  ///< relative to the bounds, maybe outside them
    ParameterSet set;
    EvaluationResult result;
    bool isRun = false;
    std::optional<double> value;  ///< of its run, or predicted; empty if it failed or is likely to
    double rank = 0.0;            ///< value with penalty, or length of the step if it failed
  };

  bool isProblemValid() const;
  std::vector<double> centreOf(std::span<const ParameterSet> sample, std::span<const EvaluationResult> results) const;
  void startRun(const CmaRun& run, std::vector<double> mean);
  void noteRun(std::string_view end);
  /// Ends the run and starts the next one, or ends the search.
  void endRun(std::string_view reason);
  Point drawPoint();
  std::vector<Point> drawGeneration();
  /// Runs the points with these places in the generation; false if the budget ends before.
  bool runPoints(std::vector<Point>& points, std::span<const std::size_t> which);
  /// Runs as many of the points as the model leaves undecided, and gives the others its values.
  bool runWithModel(std::vector<Point>& points);
  std::size_t takeKnown(std::vector<Point>& points) const;
  /// Puts the minimum that the model predicts in the place of the last point; false if there is none to be run.
  bool proposeMinimum(std::vector<Point>& points) const;
  void predict(std::vector<Point>& points) const;
  void learnFrom(std::vector<Point>& points);
  bool isAhead(const Point& a, const Point& b) const;
  std::vector<EvaluationResult> run(std::span<const ParameterSet> sets);
  void noteBest(const ParameterSet& set, const EvaluationResult& result);
  void noteGeneration(std::span<const Point> points);
  std::vector<double> relative(const ParameterSet& set) const;
  ParameterSet setAt(const std::vector<double>& place) const;
  int budgetLeft() const { return problem_.stopping.maxEvaluations - summary_.evaluationCount; }

  CmaEsSettings settings_;
  SearchProblem problem_;
  FeasiblePoints feasible_;
  CmaMargin margin_;
  CmaRestarts restarts_;
  SearchSummary summary_;

  // Of the current run:
  CmaRun run_;
  std::optional<CmaDistribution> distribution_;
  std::optional<CmaBounds> bounds_;
  std::optional<CmaTests> tests_;
  std::optional<StoppingTests> change_;  ///< of the best value, over a history that is as long as that of the own tests
  double bestOfRun_ = 0.0;
  int startedAt_ = 0;  ///< evaluations before the run
  int runCount_ = 0;

  std::optional<CmaSurrogate> surrogate_;
  std::size_t firstRuns_ = 0;  ///< of a generation, before the model is asked again; 0: not known yet
};

/// CMA-ES as a setup selects it.
class CmaEsMethod final : public PopulationMethod {
 public:
  const SearchFacts& facts() const override;
  BoundSection section() override;
  void setVariableCount(std::size_t n) override { variableCount_ = n; }
  std::vector<SearchAdvice> advice(std::size_t n) const override;
  std::int64_t populationSize() const override;
  /// Its runs end by CmaTests.
  bool testsPopulationRange() const override { return false; }
  double evaluationsPerLoop() const override { return static_cast<double>(populationSize()); }
  std::unique_ptr<SearchAlgorithm> make(SearchProblem problem) const override;

  CmaEsSettings settings;

 private:
  std::size_t variableCount_ = 1;
};

}  // namespace mirevo
