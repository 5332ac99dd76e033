#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include <fmt/format.h>

#include "algorithms/pareto/dominance.h"
#include "algorithms/pareto/pareto_archive.h"
#include "algorithms/searches/feasible_points.h"
#include "algorithms/searches/search_algorithm.h"
#include "algorithms/searches/search_problem.h"
#include "common/settings/keyword_row.h"
#include "common/settings/named_choice.h"

namespace mirevo {

/// At which times the simulated series of the front are kept.
enum class FrontSeries : std::int32_t { none, observations, steps };
inline constexpr CodeName kFrontSeriesNames[] = {
    {std::nullopt, "none"}, {std::nullopt, "observations"}, {std::nullopt, "steps"}};

/// What the searches for a front have in common.
struct ParetoSettings {
  std::int32_t hypervolumeEvaluations = 0;  ///< over which the rise of the hypervolume is tested; 0: it is not
  double hypervolumeChange = 0.001;         ///< relative rise below which the search ends
  std::vector<double> referencePoint = {};  ///< one value per objective function; empty: FrontScale's
  FrontSeries series = FrontSeries::observations;
};

/// An evaluated set of a search with several objectives.
struct ParetoPoint {
  int number = 0;  ///< of its evaluation
  ParameterSet set;
  ObjectivePoint objectives;
};

/// What a search for a front works on besides the problem of every search, and what it has found, complete after every
/// step, for what follows the search.
struct ParetoProblem {
  ParetoArchive archive = {};
  std::vector<ParetoPoint> population = {};  ///< the last one; empty of a search without
};

/// Whether all objectives of an evaluation are known, so that it may be on a front.
bool hasObjectives(const EvaluationResult& result);

inline constexpr std::string_view kReferencePointKeyword = "Reference_Point";
inline constexpr std::string_view kFrontSeriesKeyword = "Front_Series";
inline constexpr std::string_view kHypervolumeSettledMessage =
    "Optimisation terminated: Hypervolume convergence criterion met";

/// What NSGA-II and PADDS have in common: each objective function is an objective of its own, all are minimised; a
/// failed run ranks behind all others and is never on the front, and so do sets that violate constraints, which come
/// from the setup alone, as every proposal can be run. The best set is that of the least aggregate.
class ParetoSearch : public SearchAlgorithm {
 public:
  bool comparesBestValues() const final { return false; }
  bool isTerminated() const final { return !summary_.terminationMessage.empty(); }
  const SearchSummary& summary() const final { return summary_; }

 protected:
  /// `problem.pareto` must be there and outlive the search.
  ParetoSearch(ParetoSettings settings, SearchProblem problem);

  bool isProblemValid() const;
  /// Evaluates a batch, whose sets are the first ones of the search, and determines the scale of the aggregates.
  std::vector<ParetoPoint> runSample(std::span<const ParameterSet> sets);
  std::vector<ParetoPoint> run(std::span<const ParameterSet> sets);
  /// Takes the next evaluation. `isOnFront` tells whether no earlier one covers it.
  ParetoPoint take(const ParameterSet& set, const EvaluationResult& result, bool* isOnFront = nullptr);
  /// Ends the search if its budget is used up or its hypervolume has come to rest. The latter is tested over
  /// evaluations behind the earlier searches alone: otherwise a search that ended by it would end there again with any
  /// budget.
  void checkEnd();
  int budgetLeft() const { return problem_.stopping.maxEvaluations - summary_.evaluationCount; }

  SearchProblem problem_;
  FeasiblePoints feasible_;
  SearchSummary summary_;

 private:
  bool hasHypervolumeSettled();

  ParetoSettings settings_;
  int nextTest_ = 0;  ///< evaluations after which the hypervolume is looked at again
};

/// What a restart with a raised budget says of the test of the hypervolume, behind other text; empty without the test.
std::string hypervolumeNote(const ParetoSettings& settings);

/// The fixed texts with which a search for a front refuses values of its keywords.
struct ParetoRefusals {
  std::string_view evaluations;
  std::string_view change;
};

/// The rows of the keywords that these searches have in common. `Method` has the members `pareto` and `kRefusals`.
template <class Method>
std::vector<KeywordRow> paretoKeywordRows() {
  return {
      setting<Method>([](auto& m) -> auto& { return m.pareto.hypervolumeEvaluations; },
                      {.name = "Hypervolume_Evaluations",
                       .defaultValue = "0",
                       .range = from(0),
                       .refusal = Method::kRefusals.evaluations,
                       .meaning = "The search ends when the hypervolume of the front has grown by less than "
                                  "`Hypervolume_Change` over so many evaluations. 0: it ends with its budget."}),
      setting<Method>([](auto& m) -> auto& { return m.pareto.hypervolumeChange; },
                      {.name = "Hypervolume_Change",
                       .defaultValue = "0.001",
                       .range = kNonNegative,
                       .refusal = Method::kRefusals.change,
                       .meaning = "That share of the hypervolume."}),
      setting<Method>(
          [](auto& m) -> auto& { return m.pareto.referencePoint; },
          {.name = kReferencePointKeyword,
           .defaultValue = kNoDefault,
           .meaning = "One value for each objective function: the point up to which the hypervolume counts. "
                      "Without it a tenth of the front's range behind the greatest value of each."}),
      namedChoice<Method, kFrontSeriesNames>(
          [](auto& m) -> auto& { return m.pareto.series; },
          {.name = kFrontSeriesKeyword,
           .defaultValue = "'observations'",
           .meaning =
               "At which times the simulated series of the front are kept: those of the observations, every "
               "simulated step as well, or none. The series of all evaluations are kept on disk for it; with 'steps' "
               "the times are those of the simulated file as it is in the model's folder."})};
}

/// All rows of such a search: its own before those.
template <class Method>
std::vector<KeywordRow> withParetoRows(std::vector<KeywordRow> rows) {
  for (KeywordRow& row : paretoKeywordRows<Method>()) rows.push_back(std::move(row));
  return rows;
}

}  // namespace mirevo
