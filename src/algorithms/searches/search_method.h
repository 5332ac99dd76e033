#pragma once

#include <cstddef>
#include <cstdint>
#include <functional>
#include <limits>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "algorithms/searches/initial_sample.h"
#include "algorithms/searches/optimisation_driver.h"
#include "algorithms/searches/search_problem.h"
#include "common/settings/keyword_row.h"

namespace mirevo {

struct ParetoSettings;

/// What is true of a search whatever its settings.
struct SearchFacts {
  CodeName name;                    ///< in setups; the name is also used in messages and reports: "SCE"
  std::string_view longName;        ///< "Shuffled Complex Evolution"
  bool runsInParallel = false;      ///< its batches fill several slots
  bool usesSurrogate = false;       ///< a surrogate model can choose among its proposals
  bool drawsInitialSample = false;  ///< it begins with the sample that the section INITIAL_SAMPLE describes
  bool needsRanges = false;         ///< it uses the range of each parameter, which must not be empty
  bool usesResiduals = false;       ///< it needs the residuals of every run, and continuous parameters
  /// Of a search that does not fill several slots: what a job of several processes runs at once all the same.
  std::string_view runsAtOnceUnderMpi = {};
  bool findsFront = false;                   ///< each objective function is an objective of its own; it needs several
  std::string_view modelChooses = "one";     ///< how many of the proposals for one run a surrogate model chooses
  std::string_view populationKeywords = {};  ///< "Population_Size"; empty if it has no population
};

/// A keyword whose value is small for the number of variable parameters: the search may end early.
struct SearchAdvice {
  std::string_view keyword;
  std::int64_t found = 0;
  std::int64_t advised = 0;  ///< the least value advised
};

/// A setting that is valid and hardly meant.
struct SearchDoubt {
  std::string_view keyword;
  std::string text;
};

/// A search that was interrupted or ended, and is to be continued with a raised budget.
struct SearchHistory {
  int budget = 0;                       ///< Max_No_Evaluations then
  int evaluations = 0;                  ///< completed without a gap from the first one on
  std::vector<EarlierSearch> searches;  ///< the searches that it continued
  int repetitions = 1;                  ///< Repetitions then
  int lastRow = 0;                      ///< the highest number of an evaluation
};

/// What becomes of an earlier search when its budget is raised.
struct RaisedBudget {
  std::string refusal;                                    ///< why it cannot be continued; empty when it can
  std::string note;                                       ///< what the log should say, one line; empty: nothing
  int keptEvaluations = std::numeric_limits<int>::max();  ///< evaluations with higher numbers are repeated
  std::optional<EarlierSearch> earlier;                   ///< the earlier search, if another one begins behind it
};

/// A search together with its settings: everything that a setup, a run, a restart or a report asks about it. One class
/// per search, beside its algorithm; search_methods.cpp lists them.
class SearchMethod {
 public:
  SearchMethod() = default;
  SearchMethod(const SearchMethod&) = delete;
  SearchMethod& operator=(const SearchMethod&) = delete;
  virtual ~SearchMethod() = default;

  virtual const SearchFacts& facts() const = 0;

  /// Its section inside OPTIMISATION_ALGORITHM with its keywords, bound to this object's settings.
  virtual BoundSection section() = 0;
  /// The number of variable parameters, on which defaults may depend; called once the section is read.
  virtual void setVariableCount(std::size_t /*n*/) {}
  /// Settings that are small for n variable parameters.
  virtual std::vector<SearchAdvice> advice(std::size_t /*n*/) const { return {}; }
  /// Settings that are valid and of which it is certain that they make the search pointless, or have no effect.
  virtual std::vector<SearchDoubt> doubts() const { return {}; }
  /// Settings that are valid and hardly meant for these parameters.
  virtual std::vector<SearchDoubt> doubtsIn(const SearchSpace& /*space*/) const { return {}; }
  /// Settings that do not fit the parameters.
  virtual std::optional<SettingRefusal> refusalFor(const SearchSpace& /*space*/) const { return std::nullopt; }
  /// The fixed text for a budget below 1, if the search has one of its own.
  virtual std::string_view budgetRefusal() const { return {}; }
  /// Whether it ends by the tests of its population: its range, and the change of its best value over loops.
  virtual bool testsPopulationRange() const { return false; }
  /// Whether it evaluates a sample from which the scale of the objective functions can be determined.
  virtual bool evaluatesSample(const InitialSampleSettings& sample) const = 0;

  /// Of a search that finds a front, what these have in common; nullptr of the others.
  virtual const ParetoSettings* paretoSettings() const { return nullptr; }

  /// Number of points of its population; 0 if it has none.
  virtual std::int64_t populationSize() const { return 0; }
  /// Number of sets that it evaluates before it proposes any, unless the budget is smaller.
  virtual std::int64_t sampleSize(const InitialSampleSettings& /*sample*/, int /*budget*/) const {
    return populationSize();
  }
  /// Why another seed would make no difference to it, and what would; empty if it does.
  virtual std::string seedDoubt(const InitialSampleSettings& /*sample*/) const { return {}; }
  /// Most evaluations at a time, whatever the number of slots; 0: a limit is not known.
  virtual std::int64_t mostAtOnce() const { return 0; }
  /// Least number of evaluations in a loop.
  virtual double evaluationsPerLoop() const { return 1.0; }
  /// Number of loops after the initial sample until `sets` parameter sets are evaluated, before a surrogate model is
  /// asked.
  virtual double loopsBefore(double sets) const {
    static_cast<void>(sets);
    return 0.0;
  }

  virtual RaisedBudget raiseBudget(const SearchHistory& history, const StoppingCriteria& stopping,
                                   const InitialSampleSettings& sample) const = 0;

  /// The search itself. `problem.evaluator` and `problem.random` must outlive it.
  virtual std::unique_ptr<SearchAlgorithm> make(SearchProblem problem) const = 0;
  /// Makes the search and runs it from its start to its end. Throws what runSearch() throws.
  virtual SearchSummary run(SearchProblem problem, const PeriodicStep& periodicStep) const;
};

/// The least number of evaluations that the sample and `loops` loops after it make.
double evaluationsAfter(const SearchMethod& method, double loops);

}  // namespace mirevo
