#include <algorithm>
#include <cmath>
#include <limits>
#include <tuple>
#include <utility>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "algorithms/multi_objective_functions.h"
#include "algorithms/pareto/hypervolume.h"
#include "algorithms/searches/nsga_ii.h"
#include "algorithms/searches/padds.h"

namespace mirevo {
namespace {

using ::testing::Each;
using ::testing::Ge;
using ::testing::HasSubstr;
using testing::MultiObjectiveFunction;

EvaluationResult resultOfAll(std::vector<double> values) {
  EvaluationResult result;
  result.aggregate = 0.0;
  for (const double value : values) result.aggregate += value;
  result.objectiveValues = std::move(values);
  return result;
}

EvaluationResult failedOfAll(std::size_t objectives, EvaluationFailure::Kind kind = EvaluationFailure::Kind::exitCode) {
  EvaluationResult result = resultOfAll(std::vector<double>(objectives, kFailedRunValue));
  result.aggregate = kFailedRunValue;
  result.failure.emplace().kind = kind;
  return result;
}

const MultiObjectiveFunction& functionOf(const std::string& name) {
  static const std::vector<MultiObjectiveFunction> all = testing::multiObjectiveFunctions();
  return *std::ranges::find(all, name, &MultiObjectiveFunction::name);
}

/// A search by its name, with what it found.
struct FoundFront {
  SearchSummary summary;
  ParetoProblem pareto;
  std::vector<ParameterSet> sets;  ///< in the order of their evaluations
};

struct FrontCase {
  std::string search = "NSGA-II";
  std::string function = "ZDT1";
  int budget = 1000;
  int seed = 1;
  int population = 40;
  int candidates = 1;
  PaddsSelection selection = PaddsSelection::hypervolume;
  ParetoSettings pareto = {};
  Feasibility feasibility = {};
  bool includesInitial = false;
  std::vector<EarlierSearch> earlier = {};
  std::function<std::optional<EvaluationResult>(const ParameterSet&)> instead = {};  ///< of the function's result
};

FoundFront findFront(const FrontCase& one) {
  FoundFront found;
  const MultiObjectiveFunction& function = functionOf(one.function);
  FunctionEvaluator evaluator([&](const ParameterSet& set) {
    if (one.instead) {
      if (auto result = one.instead(set)) return *std::move(result);
    }
    return resultOfAll(function.values(set));
  });
  UniformGenerator random(one.seed);
  SearchProblem problem{{function.lower, function.upper, function.upper}, {one.budget}, {}, {}, evaluator, random};
  problem.initialSample.includeInitialParameters = one.includesInitial;
  problem.feasibility = one.feasibility;
  problem.earlierSearches = one.earlier;
  problem.pareto = &found.pareto;
  std::unique_ptr<SearchAlgorithm> search;
  if (one.search == "NSGA-II") {
    search = std::make_unique<NsgaIi>(NsgaIiSettings{.populationSize = one.population}, one.pareto, std::move(problem));
  } else {
    search = std::make_unique<Padds>(PaddsSettings{.candidates = one.candidates, .selection = one.selection},
                                     one.pareto, std::move(problem));
  }
  found.summary = runSearch(*search, one.search, {});
  for (const auto& batch : evaluator.batches) found.sets.insert(found.sets.end(), batch.begin(), batch.end());
  return found;
}

double frontVolumeOf(const FoundFront& found, std::size_t objectives) {
  return hypervolume(found.pareto.archive.front(), std::vector<double>(objectives, 1.0));
}

// PADDS has fewer evaluations, as each of its proposals costs more time than the function. The least values are a
// little below what was reached; the fronts themselves have 0.667, 0.333, 1.044, 0.667, 0.326 and 0.476.
TEST(ParetoSearch, FrontsOfPublishedFunctionsAreFound) {
  const std::tuple<const char*, const char*, int, double> cases[] = {
      {"NSGA-II", "ZDT1", 10000, 0.64}, {"NSGA-II", "ZDT2", 10000, 0.29}, {"NSGA-II", "ZDT3", 10000, 1.00},
      {"NSGA-II", "ZDT4", 15000, 0.50}, {"NSGA-II", "ZDT6", 12000, 0.10}, {"NSGA-II", "DTLZ2", 8000, 0.40},
      {"PADDS", "ZDT1", 5000, 0.53},    {"PADDS", "ZDT2", 5000, 0.15},    {"PADDS", "ZDT3", 5000, 0.88},
      {"PADDS", "DTLZ2", 1500, 0.30}};
  for (const auto& [search, name, budget, least] : cases) {
    const FoundFront found = findFront({.search = search, .function = name, .budget = budget, .population = 100});
    const MultiObjectiveFunction& function = functionOf(name);
    const double volume = frontVolumeOf(found, function.objectives);
    EXPECT_GT(volume, least) << search << " " << name;
    EXPECT_LE(volume, function.frontVolume + 1e-5) << search << " " << name << ": more than the front itself";
    EXPECT_EQ(found.summary.evaluationCount, budget);
    EXPECT_EQ(found.pareto.archive.evaluationCount(), budget);
    EXPECT_EQ(found.summary.terminationMessage, kBudgetUsedMessage);
  }
}

TEST(ParetoSearch, HypervolumeAtRestEndsTheSearch) {
  for (const char* search : {"NSGA-II", "PADDS"}) {
    const FoundFront found = findFront(
        {.search = search, .budget = 20000, .pareto = {.hypervolumeEvaluations = 1000, .hypervolumeChange = 0.01}});
    EXPECT_EQ(found.summary.terminationMessage, kHypervolumeSettledMessage) << search;
    EXPECT_LT(found.summary.evaluationCount, 15000);
    EXPECT_GT(found.summary.evaluationCount, 1000);
    EXPECT_THAT(found.summary.notes.back(), HasSubstr("In the last 1000 evaluations"));
    // As far as it went it is the same search.
    const FoundFront whole = findFront({.search = search, .budget = search == std::string("PADDS") ? 20000 : 4000});
    const std::size_t same = std::min<std::size_t>(found.sets.size(), whole.sets.size());
    EXPECT_TRUE(
        std::equal(found.sets.begin(), found.sets.begin() + static_cast<std::ptrdiff_t>(same), whole.sets.begin()));
  }
}

TEST(ParetoSearch, ASearchThatItsHypervolumeHasEndedTakesAllItHasSubmittedAndGoesOnWithARaisedBudget) {
  for (const auto& [search, candidates] : {std::pair("NSGA-II", 1), {"PADDS", 1}, {"PADDS", 4}}) {
    SCOPED_TRACE(fmt::format("{} {}", search, candidates));
    FrontCase one{.search = search,
                  .budget = 2000,
                  .candidates = candidates,
                  .pareto = {.hypervolumeEvaluations = 200, .hypervolumeChange = 0.2}};
    const FoundFront first = findFront(one);
    const int ended = first.summary.evaluationCount;
    EXPECT_EQ(first.summary.terminationMessage, kHypervolumeSettledMessage);
    EXPECT_EQ(std::ssize(first.sets), ended);
    EXPECT_EQ(first.pareto.archive.evaluationCount(), ended);

    one.earlier = {{2000, ended}};
    one.budget = 2500;
    const FoundFront second = findFront(one);
    const int secondEnd = second.summary.evaluationCount;
    EXPECT_GT(secondEnd, ended + 200);
    EXPECT_LT(secondEnd, 2500);
    EXPECT_TRUE(std::equal(first.sets.begin(), first.sets.end(), second.sets.begin()));

    one.earlier.push_back({2500, secondEnd});
    one.budget = 3000;
    const FoundFront third = findFront(one);
    EXPECT_GT(third.summary.evaluationCount, secondEnd + 200);
    EXPECT_TRUE(std::equal(second.sets.begin(), second.sets.end(), third.sets.begin()));
  }
}

TEST(ParetoSearch, FailedRunsAreNeverOnTheFrontAndDoNotStopIt) {
  for (const char* search : {"NSGA-II", "PADDS"}) {
    const auto fails = [](const ParameterSet& set) -> std::optional<EvaluationResult> {
      if (std::fmod(set[1] * 1000.0, 1.0) < 0.3) return failedOfAll(2);
      return std::nullopt;
    };
    const FoundFront found = findFront({.search = search, .budget = 4000, .instead = fails});
    EXPECT_EQ(found.pareto.archive.evaluationCount(), 4000);
    EXPECT_GT(frontVolumeOf(found, 2), 0.3) << search;
    for (const FrontMember& member : found.pareto.archive.members()) EXPECT_FALSE(fails(member.set));
    const FoundFront none = findFront({.search = search, .budget = 200, .instead = [](const ParameterSet&) {
                                         return std::optional(failedOfAll(2));
                                       }});
    EXPECT_TRUE(none.pareto.archive.members().empty());
    EXPECT_EQ(none.summary.evaluationCount, 200);
  }
}

TEST(ParetoSearch, ProposalsMeetTheConstraintsAndGivenSetsThatDoNotRankBehind) {
  const auto holds = [](std::span<const double> set) { return set[0] + set[1] <= 0.9; };
  const Feasibility feasibility(
      [=](std::span<const double> set) { return holds(set) ? std::nullopt : std::optional<std::string>("sum"); }, true,
      [](std::span<const double> set) { return set[0] + set[1] - 0.9; });
  for (const char* search : {"NSGA-II", "PADDS"}) {
    const auto instead = [&](const ParameterSet& set) -> std::optional<EvaluationResult> {
      if (holds(set)) return std::nullopt;
      return failedOfAll(2, EvaluationFailure::Kind::constraintsViolated);
    };
    const FoundFront found = findFront(
        {.search = search, .budget = 40, .feasibility = feasibility, .includesInitial = true, .instead = instead});
    EXPECT_FALSE(holds(found.sets.front())) << "the initial set is run as the setup gives it";
    for (std::size_t i = 1; i < found.sets.size(); ++i) EXPECT_TRUE(holds(found.sets[i])) << i;
    if (found.pareto.population.empty()) continue;
    EXPECT_EQ(found.pareto.population.back().number, 1);
    EXPECT_NEAR(found.pareto.population.back().objectives.violation, 1.1, 1e-12);
  }
}

TEST(ParetoSearch, SameSeedsGiveTheSameSearchWhateverTheBudgetOfNsgaII) {
  const FoundFront a = findFront({.budget = 330});
  const FoundFront b = findFront({.budget = 700});
  EXPECT_TRUE(std::equal(a.sets.begin(), a.sets.end(), b.sets.begin())) << "the last generation is cut";
  EXPECT_NE(findFront({.budget = 330, .seed = 2}).sets, a.sets);
  for (const ParameterSet& set : b.sets) EXPECT_THAT(set, Each(Ge(0.0)));
}

TEST(Padds, ARaisedBudgetBeginsAnewWithTheFrontAndKeepsTheEvaluations) {
  const FoundFront first = findFront({.search = "PADDS", .budget = 200, .candidates = 4});
  const FoundFront second = findFront({.search = "PADDS", .budget = 500, .candidates = 4, .earlier = {{200, 200}}});
  EXPECT_TRUE(std::equal(first.sets.begin(), first.sets.end(), second.sets.begin()));
  EXPECT_EQ(second.sets.size(), 500U);
  const auto changes = [](const FoundFront& found, std::size_t from, std::size_t to) {
    double moved = 0.0;
    for (std::size_t i = from; i < to; ++i) {
      // From the nearest earlier set: how many parameters were perturbed.
      std::size_t fewest = 30;
      for (std::size_t k = 0; k < i; ++k) {
        std::size_t count = 0;
        for (std::size_t j = 0; j < 30; ++j) count += found.sets[i][j] != found.sets[k][j] ? 1U : 0U;
        fewest = std::min(fewest, count);
      }
      moved += static_cast<double>(fewest);
    }
    return moved / static_cast<double>(to - from);
  };
  EXPECT_LT(changes(second, 180, 200), 2.5) << "towards the end of a budget one parameter or two";
  EXPECT_GT(changes(second, 202, 210), 8.0) << "at the beginning of the next most of them";
}

TEST(ParetoSearch, ARaisedBudgetKeepsWhatTheSearchHasMadeAndNoFinalModelRun) {
  struct Case {
    const char* what;
    int evaluations;  // without a gap
    int lastRow;
    std::vector<EarlierSearch> searches;
    int lastOfNsgaIi;  // 0: it begins no search behind the earlier ones
    int lastOfPadds;
  };
  const Case cases[] = {{"ended by its hypervolume", 119, 119, {}, 118, 118},
                        {"the same, a row is missing", 50, 119, {}, 118, 50},
                        {"ended by its budget", 401, 401, {}, 400, 400},
                        {"nothing but the final run follows an earlier search", 119, 119, {{300, 118}}, 0, 0},
                        {"ended twice by its hypervolume", 181, 181, {{300, 118}}, 180, 180}};
  NsgaIiMethod nsgaIi;
  PaddsMethod padds;
  nsgaIi.pareto.hypervolumeEvaluations = padds.pareto.hypervolumeEvaluations = 60;
  for (const Case& one : cases) {
    const SearchHistory history{400, one.evaluations, one.searches, 1, one.lastRow};
    for (const SearchMethod* method :
         {static_cast<const SearchMethod*>(&nsgaIi), static_cast<const SearchMethod*>(&padds)}) {
      SCOPED_TRACE(fmt::format("{} {}", method->facts().name.name, one.what));
      const int last = method == &padds ? one.lastOfPadds : one.lastOfNsgaIi;
      const RaisedBudget raised = method->raiseBudget(history, {500}, {});
      EXPECT_EQ(raised.earlier.has_value(), last > 0);
      EXPECT_EQ(raised.keptEvaluations, last > 0 ? last : one.searches.back().lastEvaluation);
      if (last == 0) continue;
      EXPECT_EQ(raised.earlier->lastEvaluation, last);
      EXPECT_EQ(raised.earlier->maxEvaluations, 400);
      EXPECT_THAT(raised.note, HasSubstr(fmt::format("the first {} evaluations, which are kept", last)));
    }
  }
}

TEST(Padds, EachWayToDrawFromTheFrontIsAnotherSearch) {
  const auto setsOf = [](PaddsSelection selection) {
    return findFront({.search = "PADDS", .budget = 300, .selection = selection}).sets;
  };
  EXPECT_NE(setsOf(PaddsSelection::hypervolume), setsOf(PaddsSelection::crowding));
  EXPECT_NE(setsOf(PaddsSelection::crowding), setsOf(PaddsSelection::random));
}

// Worked by hand from the formulas of the paper: parents at 0.2 and 0.6 of [0, 1], index 2.
TEST(NsgaII, OperatorsKeepToTheirFormulasAndBounds) {
  // beta = 1 + 2 (0.2 - 0) / 0.4 = 2, alpha = 2 - 2^-3 = 1.875, factor = (0.25 * 1.875)^(1/3); above the parents
  // beta = 1 + 2 (1 - 0.6) / 0.4 = 3, alpha = 2 - 3^-3.
  const auto [low, high] = simulatedBinaryCrossover(0.6, 0.2, 0.0, 1.0, 2.0, 0.25);
  EXPECT_NEAR(low, 0.4 - 0.2 * std::cbrt(0.46875), 1e-15);
  EXPECT_NEAR(high, 0.4 + 0.2 * std::cbrt(0.25 * (2.0 - 1.0 / 27.0)), 1e-15);
  EXPECT_NEAR(simulatedBinaryCrossover(0.6, 0.2, 0.0, 1.0, 2.0, 1.0 - 1e-12).first, 0.0, 1e-9) << "the bound";
  // At the middle: (2 u + (1 - 2 u) (1/2)^3)^(1/3) - 1.
  EXPECT_NEAR(polynomialMutation(0.5, 0.0, 1.0, 2.0, 0.25), 0.5 + std::cbrt(0.5 + 0.5 * 0.125) - 1.0, 1e-15);
  EXPECT_NEAR(polynomialMutation(0.5, 0.0, 1.0, 2.0, 0.75), 0.5 - (std::cbrt(0.5 + 0.5 * 0.125) - 1.0), 1e-15);
  EXPECT_EQ(polynomialMutation(0.3, 0.0, 1.0, 2.0, 0.5), 0.3);
  EXPECT_NEAR(polynomialMutation(0.3, 0.0, 1.0, 2.0, 1e-12), 0.0, 1e-9);
}

}  // namespace
}  // namespace mirevo
