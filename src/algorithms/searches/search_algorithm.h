#pragma once

#include <cstddef>
#include <cstdint>
#include <limits>
#include <optional>
#include <string>
#include <vector>

#include "algorithms/numbers/search_bounds.h"
#include "algorithms/searches/best_course.h"
#include "common/parameter_set.h"
#include "evaluation/evaluation_result.h"

namespace mirevo {

/// 0 is success; anything else ends the run.
using SearchStatus = std::int32_t;
inline constexpr SearchStatus kSearchOk = 0;

/// How a search that judges sets by sums of squares, and not by aggregates, has come on.
struct SumsOfSquares {
  double start = std::numeric_limits<double>::quiet_NaN();  ///< the least of the initial sample
  double best = std::numeric_limits<double>::quiet_NaN();   ///< of the best set
  BestCourse course;                                        ///< of the best set's
};

/// What a search has found so far and why it stopped.
struct SearchSummary {
  ParameterSet best;  ///< search scale; empty before the initial sample
  EvaluationResult bestResult;
  int evaluationCount = 0;  ///< model evaluations made, failed ones included
  int loopCount = 0;
  int replacedCount = 0;  ///< proposals that could not be run and were replaced before their evaluation
  int returnedCount = 0;  ///< those of them that could only be replaced by a set already evaluated
  /// Parameters that proposals would have changed and that stayed (nearly) where they were, as these proposals could
  /// not be run and were replaced by others.
  std::vector<std::size_t> heldParameters;
  double populationSpread = 0.0;   ///< search scale; populationSpread() of a search with a population
  double populationRange = 0.0;    ///< normalisedPopulationRange() of a search with a population
  std::string terminationMessage;  ///< empty while it runs
  /// Why it has found nothing at all, which is an error, and more about it; empty if it has found something.
  std::string failure;
  std::string failureDetail;
  int finalRunOf = 0;              ///< the evaluation whose set the final model run repeats; 0: the best
  std::vector<std::string> notes;  ///< what the log should say of its course, one line each
  /// Search scale; of a search that draws nothing once it has its sample, the sets from which it went on: another that
  /// goes on from the same ones is the same search. Empty of the others.
  std::vector<ParameterSet> starts;
  std::optional<SumsOfSquares> sums;  ///< of a search that judges sets by them
};

/// A search in steps: initialise() once, then advance() until isTerminated().
class SearchAlgorithm {
 public:
  SearchAlgorithm() = default;
  SearchAlgorithm(const SearchAlgorithm&) = delete;
  SearchAlgorithm& operator=(const SearchAlgorithm&) = delete;
  virtual ~SearchAlgorithm() = default;

  /// Draws and evaluates the initial sample.
  virtual SearchStatus initialise() = 0;
  /// Makes one loop.
  virtual SearchStatus advance() = 0;
  virtual bool isTerminated() const = 0;
  virtual const SearchSummary& summary() const = 0;
  /// Whether it ends when its best value changes too little, which negative values would do at once.
  virtual bool comparesBestValues() const { return true; }
};

}  // namespace mirevo
