#include "algorithms/searches/glm.h"

#include <algorithm>
#include <cmath>
#include <numeric>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "algorithms/searches/glm_step.h"
#include "algorithms/searches/population_search.h"
#include "algorithms/strd_functions.h"

namespace mirevo {
namespace {

using ::testing::AllOf;
using ::testing::DoubleNear;
using ::testing::Each;
using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::Pointwise;

using ResidualFunction = std::function<std::vector<double>(const ParameterSet&)>;

/// Without the tests of the change and the step, so that a run goes on until nothing is gained.
struct GlmConditions {
  GlmSettings settings = {.minStep = 0.0, .minGradient = 0.0};
  int budget = 2000;
  double minChange = 0.0;
  std::vector<TransformationType> transformation = {};
  std::function<bool(int number, const ParameterSet&)> fails = {};
  bool includesInitial = true;
  /// Of constraints, each to be 0 or more; on the search scale.
  std::function<std::vector<double>(const ParameterSet&)> margins = {};
  bool areStrict = false;
};

struct GlmTrial {
  SearchSummary summary;
  ResidualFit fit;
  std::vector<std::vector<ParameterSet>> batches;
  double sum() const { return summary.bestResult.aggregate; }
};

Feasibility feasibilityOf(const GlmConditions& c) {
  const auto margins = [&c](std::span<const double> set) {
    std::vector<ConstraintMargin> found;
    for (const double value : c.margins(ParameterSet(set.begin(), set.end()))) {
      found.push_back({value, std::abs(value), c.areStrict});
    }
    return found;
  };
  Feasibility feasibility([margins](std::span<const double> set) -> std::optional<std::string> {
    for (const ConstraintMargin& margin : margins(set)) {
      if (std::isnan(margin.value) || margin.isViolated()) return "violated";
    }
    return std::nullopt;
  });
  std::vector<std::string> texts;
  for (std::size_t i = 1; i <= margins(std::vector<double>(4, 1.0)).size(); ++i) {
    texts.push_back("constraint " + std::to_string(i));
  }
  feasibility.setMargins(margins, texts);
  return feasibility;
}

GlmTrial glmSearch(const SearchBounds& bounds, const ResidualFunction& residualsOf, const GlmConditions& c) {
  int number = 0;
  FunctionEvaluator evaluator([&](const ParameterSet& set) {
    ++number;
    if (c.fails && c.fails(number, set)) return failedResult();
    if (c.margins && !feasibilityOf(c).holds(set)) return failedResult();
    std::vector<double> residuals = residualsOf(set);
    EvaluationResult result = resultOf(std::inner_product(residuals.begin(), residuals.end(), residuals.begin(), 0.0));
    result.simulatedValues = std::move(residuals);
    return result;
  });
  UniformGenerator random(1);
  ResidualProblem residuals;
  residuals.space = {{}, bounds.initial, bounds.lower, bounds.upper, c.transformation};
  for (std::size_t j = 0; j < bounds.size(); ++j) residuals.space.names.push_back("p" + std::to_string(j + 1));
  residuals.space.transformation.resize(bounds.size(), TransformationType::none);
  residuals.residualsOf = [](const EvaluationResult& result) {
    return ResidualRows{result.simulatedValues, std::vector<double>(result.simulatedValues.size(), 0.0)};
  };
  InitialSampleSettings sample;
  sample.includeInitialParameters = c.includesInitial;
  SearchProblem problem{bounds, {c.budget, 10, c.minChange}, sample, {}, evaluator, random};
  problem.residuals = &residuals;
  if (c.margins) problem.feasibility = feasibilityOf(c);
  Glm glm(c.settings, std::move(problem));
  EXPECT_EQ(glm.advance(), kSearchNotInitialised);
  EXPECT_EQ(glm.initialise(), kSearchOk);
  for (int loop = 0; loop < 10000 && !glm.isTerminated(); ++loop) EXPECT_EQ(glm.advance(), kSearchOk);
  EXPECT_TRUE(glm.isTerminated());
  EXPECT_LE(glm.summary().evaluationCount, c.budget);
  return {glm.summary(), residuals.fit.value_or(ResidualFit{}), std::move(evaluator.batches)};
}

std::string notesOf(const GlmTrial& trial) {
  std::string text;
  for (const std::string& note : trial.summary.notes) text += note + "\n";
  return text + trial.summary.terminationMessage;
}

/// y = 3 - 2 t + 0.5 t^2 with errors that sum to 0 against each column: the optimum is known.
std::vector<double> parabola(const ParameterSet& b) {
  std::vector<double> residuals;
  constexpr double kErrors[] = {0.1, -0.3, 0.3, -0.1};  // a cubic contrast
  for (int t = 0; t < 4; ++t)
    residuals.push_back(b[0] + b[1] * t + b[2] * t * t - (3.0 - 2.0 * t + 0.5 * t * t) - kErrors[t]);
  return residuals;
}

const SearchBounds kParabolaBounds{{-10, -10, -10}, {10, 10, 10}, {1, 1, 1}};

TEST(Glm, FitsALinearModelInOneIteration) {
  const GlmTrial trial = glmSearch(kParabolaBounds, parabola, {});
  EXPECT_THAT(trial.summary.best, Pointwise(DoubleNear(1e-9), {3.0, -2.0, 0.5}));
  ASSERT_GE(trial.batches.size(), 3U);
  EXPECT_EQ(trial.batches[1].size(), 3U);  // forward differences
  EXPECT_THAT(trial.batches[2].front(), Pointwise(DoubleNear(1e-9), {3.0, -2.0, 0.5}));
  EXPECT_NEAR(trial.sum(), 0.2, 1e-12);
  ASSERT_TRUE(trial.fit.jacobian);
  EXPECT_THAT(trial.fit.jacobian->columns[2], Pointwise(DoubleNear(1e-9), {0.0, 1.0, 4.0, 9.0}));
}

/// In a valley as narrow as a set of the differences, to which no step leads.
TEST(Glm, TheBestSetIsTheOneOfTheLeastSumBeItADifference) {
  const auto residualsOf = [](const ParameterSet& set) {
    const bool isInValley = std::abs(set[0] - 5.2) < 1e-9;
    return isInValley ? std::vector{-2.9, 0.0} : std::vector{set[0] - 2.0, 1.0};
  };
  const GlmTrial trial = glmSearch({{-10}, {10}, {5}}, residualsOf, {.minChange = 1e-9});
  EXPECT_NEAR(trial.summary.best.at(0), 5.2, 1e-9);
  EXPECT_EQ(trial.summary.bestResult.number, 2);
  EXPECT_NEAR(trial.fit.set.at(0), 5.2, 1e-9);
  EXPECT_THAT(notesOf(trial), HasSubstr("The best set, evaluation 2, is one of the differences: sum of squares 8.41"));

  // A sample that uses up the budget has no differences; those that a budget cuts off count.
  const GlmTrial sampled = glmSearch({{-10}, {10}, {5}}, residualsOf, {.settings = {.sampleSize = 3}, .budget = 3});
  EXPECT_THAT(notesOf(sampled), Not(HasSubstr("differences")));
  const auto plane = [](const ParameterSet& set) { return std::vector{set[0] + set[1], 1.0}; };
  const GlmTrial cut = glmSearch({{-10, -10}, {10, 10}, {-5, -5}}, plane, {.budget = 2});
  EXPECT_EQ(cut.summary.bestResult.number, 2);
  EXPECT_THAT(notesOf(cut), HasSubstr("The best set, evaluation 2, is one of the differences"));
}

/// Where the unbounded optimum lies outside, that of the others is found with the parameter at its bound.
TEST(Glm, KeepsToBoundsThatAreActiveAtTheOptimum) {
  SearchBounds bounds = kParabolaBounds;
  bounds.upper[2] = 0.25;
  bounds.initial[2] = 0.0;
  const GlmTrial trial = glmSearch(bounds, parabola, {});
  // Least squares of 3 - 2 t + 0.25 t^2 (and the errors) by a line: 0.25 t^2 is -0.25 + 0.75 t at best.
  EXPECT_THAT(trial.summary.best, Pointwise(DoubleNear(1e-8), {2.75, -1.25, 0.25}));
  EXPECT_THAT(notesOf(trial), HasSubstr("The estimate of p3 is at its upper bound"));
  for (const auto& batch : trial.batches) {
    for (const ParameterSet& set : batch) EXPECT_LE(set[2], 0.25);
  }
}

/// A parameter at its bound is freed once the others have moved: from the corner the way leads along the bound.
TEST(Glm, ALinearModelFreesWhatItNeedNotHold) {
  // r = (x + y - 2, 10 (x - y)): optimum (1, 1), from (0, 0) with x >= 0, y >= 0.
  GlmLinearModel model({{1.0, 10.0}, {1.0, -10.0}}, std::vector<double>{-2.0, 0.0}, std::vector<double>{0.0, 0.0},
                       {{0.0, 0.0}, {5.0, 0.5}, {0.0, 0.0}}, 1e-12);
  const std::vector<double> set = model.setFor(0.0);
  EXPECT_EQ(set[1], 0.5);
  EXPECT_NEAR(set[0], (2.0 - 0.5 + 100.0 * 0.5) / 101.0, 1e-12);  // of x alone, with y at 0.5
  EXPECT_NEAR(model.sumOfSquaresAt(set), std::pow(set[0] - 1.5, 2) + 100.0 * std::pow(set[0] - 0.5, 2), 1e-12);
}

/// By hand: for lambda a scaled step is J'r / (1 + lambda) where columns are orthogonal; small directions stay.
TEST(Glm, DampsAndTruncates) {
  const SearchBounds wide{{-99.0, -99.0}, {99.0, 99.0}, {0.0, 0.0}};
  GlmLinearModel damped({{2.0, 0.0}, {0.0, 4.0}}, std::vector<double>{-2.0, -4.0}, wide.initial, wide, 0.0);
  EXPECT_THAT(damped.setFor(1.0), Pointwise(DoubleNear(1e-14), {0.5, 0.5}));
  EXPECT_NEAR(damped.largestCosine(), 4.0 / std::sqrt(20.0), 1e-14);
  // Two equal columns: only their sum is known.
  GlmLinearModel truncated({{1.0, 1.0}, {1.0, 1.0}}, std::vector<double>{-2.0, -2.0}, wide.initial, wide, 1e-8);
  EXPECT_THAT(truncated.setFor(0.0), Pointwise(DoubleNear(1e-12), {1.0, 1.0}));
}

TEST(Glm, PriorValuesDecideWhatObservationsDoNot) {
  GlmConditions c;
  c.settings.regularisation = 1e-4;
  c.settings.priorValues = {4.0, 1.0};
  const auto sumOnly = [](const ParameterSet& b) { return std::vector<double>{b[0] + b[1] - 3.0}; };
  const GlmTrial trial = glmSearch({{-10, -10}, {10, 10}, {0, 0}}, sumOnly, c);
  // Both are pulled by the same: (4, 1) less 1 each, but for the share of the prior.
  EXPECT_THAT(trial.summary.best, Pointwise(DoubleNear(1e-5), {3.0, 0.0}));
}

TEST(Glm, AFailedColumnIsTakenFromTheIterationBeforeAndAFailedTrialIsPassedOver) {
  const auto bent = [](const ParameterSet& b) {
    return std::vector<double>{10.0 * (b[1] - b[0] * b[0]), 1.0 - b[0]};  // Rosenbrock
  };
  GlmConditions c;
  c.settings.differences = GlmDifferences::forward;
  c.settings.broydenUpdates = 0;
  c.settings.perturbationFraction = 1e-6;
  const SearchBounds bounds{{-5, -5}, {5, 5}, {-1.2, 1.0}};
  // Evaluation 1 is the initial one, 2 and 3 are the first Jacobian, 4 to 7 its trials, 8 and 9 the next Jacobian.
  c.fails = [](int number, const ParameterSet&) { return number == 4 || number == 8; };
  const GlmTrial trial = glmSearch(bounds, bent, c);
  EXPECT_THAT(notesOf(trial), HasSubstr("Iteration 2: no derivatives by p1, as the run with its step failed; those of "
                                        "the iteration before are used, updated after Broyden"));
  EXPECT_THAT(trial.summary.best, Pointwise(DoubleNear(1e-7), {1.0, 1.0}));

  c.fails = [](int number, const ParameterSet&) { return number == 2; };
  EXPECT_THAT(notesOf(glmSearch(bounds, bent, c)), HasSubstr("Iteration 1: no derivatives by p1, as the run with its "
                                                             "step failed; the parameter is held"));
  c.fails = [](int, const ParameterSet&) { return true; };
  EXPECT_THAT(notesOf(glmSearch(bounds, bent, c)), HasSubstr("No model run of the initial sample succeeded"));
}

/// The budget cuts a batch and is never exceeded; a longer search begins as a shorter one.
TEST(Glm, ALargerBudgetTakesTheSameWayFurther) {
  const auto bent = [](const ParameterSet& b) { return std::vector<double>{10.0 * (b[1] - b[0] * b[0]), 1.0 - b[0]}; };
  std::vector<ParameterSet> longer;
  for (const int budget : {400, 33, 9, 1}) {
    GlmConditions c;
    c.budget = budget;
    const GlmTrial trial = glmSearch({{-5, -5}, {5, 5}, {-1.2, 1.0}}, bent, c);
    std::vector<ParameterSet> sets;
    for (const auto& batch : trial.batches) sets.insert(sets.end(), batch.begin(), batch.end());
    if (longer.empty()) longer = sets;
    EXPECT_LE(sets.size(), static_cast<std::size_t>(budget));
    EXPECT_TRUE(std::equal(sets.begin(), sets.end(), longer.begin()));
    EXPECT_EQ(trial.summary.terminationMessage.ends_with("Maximum number of model evaluations reached"), budget < 40)
        << notesOf(trial);
  }
}

TEST(Glm, SeveralStartsFindTheBetterValley) {
  // A double well of x with the better valley at 2 and the initial value in the other.
  const auto wells = [](const ParameterSet& b) { return std::vector<double>{b[0] * b[0] - 4.0, 0.1 * (b[0] - 2.0)}; };
  GlmConditions c;
  const SearchBounds bounds{{-5}, {5}, {-3}};
  EXPECT_NEAR(glmSearch(bounds, wells, c).summary.best[0], -2.0, 0.1);
  c.settings.sampleSize = 10;
  c.settings.startCount = 10;
  const GlmTrial trial = glmSearch(bounds, wells, c);
  EXPECT_NEAR(trial.summary.best[0], 2.0, 1e-6);
  EXPECT_THAT(notesOf(trial), HasSubstr("Run 2 of GLM starts from evaluation "));
}

TEST(Glm, SaysWhyItEndsAndWhichStartsTheBudgetLeftOut) {
  // Decays with errors that do not vanish: gains get smaller and smaller, with derivatives of its own as after Broyden.
  const auto decay = [](const ParameterSet& b) {
    std::vector<double> residuals;
    for (int t = 0; t < 12; ++t) {
      residuals.push_back(b[0] * std::exp(-b[1] * t) + b[2] - (5.0 * std::exp(-0.3 * t) + 1.0 + std::sin(7.0 * t)));
    }
    return residuals;
  };
  const SearchBounds bounds{{0, 0, -5}, {20, 2, 5}, {15, 1.5, -3}};
  GlmConditions c;
  c.minChange = 1e-3;
  EXPECT_THAT(notesOf(glmSearch(bounds, decay, c)), HasSubstr("changes by less than Min_Change"));
  c.settings.sampleSize = 10;
  c.settings.startCount = 5;
  c.budget = 25;
  const std::string cut = notesOf(glmSearch(bounds, decay, c));
  EXPECT_THAT(cut, HasSubstr("Run 1 of GLM was going on when the budget was used up: sum of squares "));
  EXPECT_THAT(cut, HasSubstr("Warning: The budget left none for 4 of 5 starts of GLM\n"));
  c.fails = [](int number, const ParameterSet&) { return number > 2 && number <= 10; };
  EXPECT_THAT(notesOf(glmSearch(bounds, decay, c)), HasSubstr("GLM has 2 starts in place of 5"));
  const auto inert = [](const ParameterSet&) { return std::vector<double>{1.0, 2.0}; };
  EXPECT_THAT(notesOf(glmSearch(bounds, inert, {})), HasSubstr("ended as no residual changes with any parameter"));
}

/// Estimates of least squares under constraints in closed form.
TEST(Glm, GoesAlongConstraintsToTheMinimumThatTheyLeave) {
  using Set = ParameterSet;
  // y = a + b x at x = 0 ... 9, of a = 1.6, b = 0.2 and errors whose sums, also with x, are 0.
  const auto line = [](const Set& set) {
    Set residuals;
    for (int x = 0; x < 10; ++x) {
      residuals.push_back(set[0] + set[1] * x - 1.6 - 0.2 * x -
                          (x == 0 || x == 9   ? 0.4
                           : x == 4 || x == 5 ? -0.4
                                              : 0.0));
    }
    return residuals;
  };
  // With a = A: b = 0.2 + (1.6 - A) * 45 / 285. With a + b = 1.5: b = sum (y - 1.5) (x - 1) / sum (x - 1)^2.
  const double alongSum = 51.5 / 205.0;
  struct Case {
    const char* name;
    Set start;
    std::function<Set(const Set&)> margins;
    Set expected;
    double tolerance;
    const char* note;
    bool isLogarithmic = false;
    bool areStrict = false;
  };
  const Case cases[] = {
      {"one bound from afar",
       {1.0, -3.0},
       [](const Set& s) { return Set{1.2 - s[0]}; },
       {1.2, 0.2 + 0.4 * 45.0 / 285.0},
       1e-6,
       "The estimate lies at constraint 1"},
      {"strict",
       {1.0, 0.0},
       [](const Set& s) { return Set{1.2 - s[0]}; },
       {1.2, 0.2 + 0.4 * 45.0 / 285.0},
       1e-6,
       "The estimate lies at constraint 1",
       false,
       true},
      {"a sum",
       {0.0, 0.0},
       [](const Set& s) { return Set{1.5 - s[0] - s[1]}; },
       {1.5 - alongSum, alongSum},
       1e-6,
       "The estimate lies at constraint 1"},
      {"two",
       {0.0, 0.0},
       [](const Set& s) {
         return Set{1.2 - s[0], 0.1 - s[1]};
       },
       {1.2, 0.1},
       1e-6,
       "The estimate lies at constraint 2"},
      {"one of two, the other holds no longer",
       {-4.0, 4.0},
       [](const Set& s) {
         return Set{1.2 - s[0], 8.0 + s[0] - s[1]};
       },
       {1.2, 0.2 + 0.4 * 45.0 / 285.0},
       1e-6,
       "The estimate lies at constraint 1"},
      {"logarithmic",
       {0.0, 0.0},
       [](const Set& s) { return Set{1.2 - std::exp(s[0])}; },
       {std::log(1.2), 0.2 + 0.4 * 45.0 / 285.0},
       1e-6,
       "The estimate lies at constraint 1",
       true},
  };
  for (const Case& each : cases) {
    GlmConditions c;
    c.margins = each.margins;
    c.areStrict = each.areStrict;
    c.minChange = 1e-9;
    if (each.isLogarithmic) c.transformation = {TransformationType::logarithmic, TransformationType::none};
    const auto residuals = [&](const Set& set) {
      return line(each.isLogarithmic ? Set{std::exp(set[0]), set[1]} : set);
    };
    const SearchBounds bounds{{-5, -5}, {10, 5}, each.start};
    const GlmTrial trial = glmSearch(bounds, residuals, c);
    EXPECT_THAT(trial.summary.best, Pointwise(DoubleNear(each.tolerance), each.expected)) << each.name << "\n"
                                                                                          << notesOf(trial);
    EXPECT_THAT(notesOf(trial), HasSubstr(each.note)) << each.name;
  }
}

/// The solution of the n linear equations with the rows a and, behind each, its right side; empty if there is none.
std::vector<double> solved(std::vector<std::vector<double>> a) {
  const std::size_t n = a.size();
  for (std::size_t k = 0; k < n; ++k) {
    std::size_t pivot = k;
    for (std::size_t i = k + 1; i < n; ++i) pivot = std::abs(a[i][k]) > std::abs(a[pivot][k]) ? i : pivot;
    std::swap(a[k], a[pivot]);
    if (std::abs(a[k][k]) < 1e-12) return {};
    for (std::size_t i = 0; i < n; ++i) {
      const double factor = i == k ? 0.0 : a[i][k] / a[k][k];
      for (std::size_t j = 0; j <= n; ++j) a[i][j] -= factor * a[k][j];
    }
  }
  std::vector<double> x;
  for (std::size_t k = 0; k < n; ++k) x.push_back(a[k][n] / a[k][k]);
  return x;
}

/// Of all choices of constraints that hold as equations, the feasible minimum with the least sum: random linear models
/// of three parameters with four constraints, from the origin, which meets them.
TEST(Glm, FindsTheLeastSquaresOfRandomConstraints) {
  UniformGenerator random(7);
  const auto draw = [&](double low, double high) { return low + random.next() * (high - low); };
  int activeCount = 0;
  for (int problem = 0; problem < 60; ++problem) {
    double columns[5][3];
    double observed[5];
    double normals[4][3];
    double rooms[4];
    for (int i = 0; i < 5; ++i) {
      for (double& value : columns[i]) value = draw(-1.0, 1.0);
      observed[i] = draw(-4.0, 4.0);
    }
    for (int c = 0; c < 4; ++c) {
      for (double& value : normals[c]) value = draw(-1.0, 1.0);
      rooms[c] = draw(0.1, 0.6);
    }
    const auto residuals = [&](const ParameterSet& x) {
      std::vector<double> found;
      for (int i = 0; i < 5; ++i) {
        found.push_back(columns[i][0] * x[0] + columns[i][1] * x[1] + columns[i][2] * x[2] - observed[i]);
      }
      return found;
    };
    GlmConditions c;
    c.minChange = 1e-9;
    c.settings.perturbationFraction = 1e-5;
    c.margins = [&](const ParameterSet& x) {
      std::vector<double> found;
      for (int k = 0; k < 4; ++k) {
        found.push_back(rooms[k] + normals[k][0] * x[0] + normals[k][1] * x[1] + normals[k][2] * x[2]);
      }
      return found;
    };
    double least = 1e30;
    ParameterSet expected;
    for (unsigned chosen = 0; chosen < 16; ++chosen) {
      std::vector<int> active;
      for (int k = 0; k < 4; ++k) {
        if ((chosen >> k & 1U) != 0U) active.push_back(k);
      }
      const std::size_t n = 3 + active.size();
      std::vector<std::vector<double>> kkt(n, std::vector<double>(n + 1, 0.0));
      for (std::size_t j = 0; j < 3; ++j) {
        for (int i = 0; i < 5; ++i) {
          for (std::size_t l = 0; l < 3; ++l) kkt[j][l] += columns[i][j] * columns[i][l];
          kkt[j][n] += columns[i][j] * observed[i];
        }
        for (std::size_t a = 0; a < active.size(); ++a) kkt[j][3 + a] = kkt[3 + a][j] = normals[active[a]][j];
      }
      for (std::size_t a = 0; a < active.size(); ++a) kkt[3 + a][n] = -rooms[active[a]];
      const std::vector<double> x = solved(kkt);
      if (x.empty()) continue;
      const ParameterSet set(x.begin(), x.begin() + 3);
      if (std::ranges::min(c.margins(set)) < -1e-9) continue;
      const std::vector<double> r = residuals(set);
      const double sum = std::inner_product(r.begin(), r.end(), r.begin(), 0.0);
      if (sum < least) expected = set;
      least = std::min(least, sum);
    }
    if (!std::ranges::all_of(expected, [](double value) { return std::abs(value) < 50.0; })) continue;  // of the bounds
    const GlmTrial trial = glmSearch({{-50, -50, -50}, {50, 50, 50}, {0, 0, 0}}, residuals, c);
    EXPECT_NEAR(trial.sum(), least, 1e-6 * least) << problem << "\n" << notesOf(trial).substr(0, 2000);
    if (std::ranges::min(c.margins(expected)) < 1e-6) ++activeCount;
  }
  EXPECT_GT(activeCount, 40);
}

/// The nearest point of a disc to one outside, and that of Rosenbrock's valley, whose end (1, 1) the disc cuts off.
TEST(Glm, GoesAlongACurvedConstraint) {
  GlmConditions c;
  c.minChange = 1e-9;
  c.settings.perturbationFraction = 1e-5;
  c.margins = [](const ParameterSet& s) { return ParameterSet{1.0 - s[0] * s[0] - s[1] * s[1]}; };
  const auto outside = [](const ParameterSet& s) { return std::vector{s[0] - 3.0, s[1] - 4.0}; };
  const SearchBounds bounds{{-5, -5}, {5, 5}, {-0.9, 0.1}};
  const GlmTrial nearest = glmSearch(bounds, outside, c);
  EXPECT_THAT(nearest.summary.best, Pointwise(DoubleNear(1e-3), {0.6, 0.8})) << notesOf(nearest);

  const auto valley = [](const ParameterSet& s) { return std::vector{10.0 * (s[1] - s[0] * s[0]), 1.0 - s[0]}; };
  const GlmTrial bent = glmSearch(bounds, valley, c);
  EXPECT_THAT(bent.summary.best, Pointwise(DoubleNear(1e-3), {0.78642, 0.61770})) << notesOf(bent);

  // Crossed by the first step only: without it, the end of the valley is found.
  c.margins = [](const ParameterSet& s) { return ParameterSet{s[1] + 0.5}; };
  const GlmTrial whole = glmSearch({{-5, -5}, {5, 5}, {-1.2, 1.0}}, valley, c);
  EXPECT_THAT(whole.summary.best, Pointwise(DoubleNear(1e-6), {1.0, 1.0})) << notesOf(whole);
  EXPECT_THAT(notesOf(whole), Not(HasSubstr("constraint")));
}

/// A band narrower than the steps of the differences, and an equation, within which there is no step.
TEST(Glm, ShortensDifferencesThatLeaveNoRoomAndSaysWhereThereAreNone) {
  GlmConditions c;
  c.settings.minGradient = 1e-8;
  const auto outside = [](const ParameterSet& s) { return std::vector{s[0] - 3.0, s[1] - 1.0}; };
  const SearchBounds bounds{{-5, -5}, {5, 5}, {1.0, 0.5}};
  c.margins = [](const ParameterSet& s) { return ParameterSet{s[0] + s[1] - 1.49, 1.51 - s[0] - s[1]}; };
  const GlmTrial band = glmSearch(bounds, outside, c);
  EXPECT_THAT(band.summary.best, Pointwise(DoubleNear(1e-6), {1.755, -0.245})) << notesOf(band);
  for (const auto& batch : band.batches) {
    for (const ParameterSet& set : batch) EXPECT_TRUE(feasibilityOf(c).holds(set));
  }
  c.margins = [](const ParameterSet& s) { return ParameterSet{s[0] + s[1] - 1.5, 1.5 - s[0] - s[1]}; };
  const GlmTrial equation = glmSearch(bounds, outside, c);
  EXPECT_EQ(equation.batches.size(), 1U);
  EXPECT_THAT(
      notesOf(equation),
      AllOf(HasSubstr("Warning: Run 1 of GLM need not have come to a minimum: the derivatives by p1, p2 are not"),
            HasSubstr("as the gradient is negligible where it is known")));
}

/// A parameter that no observation sees makes way for one that all see.
TEST(Glm, MovesWhatOnlyAConstraintDependsOn) {
  GlmConditions c;
  c.margins = [](const ParameterSet& s) { return ParameterSet{s[1] - s[0]}; };
  const auto first = [](const ParameterSet& s) { return std::vector{s[0] - 3.0, 1.0}; };
  const GlmTrial trial = glmSearch({{-5, -5}, {5, 5}, {0.0, 1.0}}, first, c);
  EXPECT_NEAR(trial.summary.best.at(0), 3.0, 1e-6) << notesOf(trial);
}

/// Moré, Garbow and Hillstrom (1981), Testing Unconstrained Optimization Software, doi:10.1145/355934.355936, with
/// their standard starting points and sums of squares.
TEST(Glm, SolvesTheProblemsOfMoreGarbowAndHillstrom) {
  using Set = ParameterSet;
  struct Case {
    const char* name;
    ResidualFunction residuals;
    Set start;
    double sum;
  };
  const Case cases[] = {{"Rosenbrock",
                         [](const Set& x) {
                           return Set{10.0 * (x[1] - x[0] * x[0]), 1.0 - x[0]};
                         },
                         {-1.2, 1.0},
                         0.0},
                        {"Freudenstein and Roth",
                         [](const Set& x) {
                           return Set{-13.0 + x[0] + ((5.0 - x[1]) * x[1] - 2.0) * x[1],
                                      -29.0 + x[0] + ((x[1] + 1.0) * x[1] - 14.0) * x[1]};
                         },
                         {0.5, -2.0},
                         48.98425367924004},
                        {"Beale",
                         [](const Set& x) {
                           return Set{1.5 - x[0] * (1.0 - x[1]), 2.25 - x[0] * (1.0 - x[1] * x[1]),
                                      2.625 - x[0] * (1.0 - x[1] * x[1] * x[1])};
                         },
                         {1.0, 1.0},
                         0.0},
                        {"Powell singular",
                         [](const Set& x) {
                           return Set{x[0] + 10.0 * x[1], std::sqrt(5.0) * (x[2] - x[3]),
                                      (x[1] - 2.0 * x[2]) * (x[1] - 2.0 * x[2]),
                                      std::sqrt(10.0) * (x[0] - x[3]) * (x[0] - x[3])};
                         },
                         {3.0, -1.0, 0.0, 1.0},
                         0.0},
                        {"Wood",
                         [](const Set& x) {
                           return Set{10.0 * (x[1] - x[0] * x[0]),
                                      1.0 - x[0],
                                      std::sqrt(90.0) * (x[3] - x[2] * x[2]),
                                      1.0 - x[2],
                                      std::sqrt(10.0) * (x[1] + x[3] - 2.0),
                                      (x[1] - x[3]) / std::sqrt(10.0)};
                         },
                         {-3.0, -1.0, -3.0, -1.0},
                         0.0},
                        {"Bard",
                         [](const Set& x) {
                           constexpr double kY[] = {0.14, 0.18, 0.22, 0.25, 0.29, 0.32, 0.35, 0.39,
                                                    0.37, 0.58, 0.73, 0.96, 1.34, 2.10, 4.39};
                           Set r;
                           for (int i = 1; i <= 15; ++i) {
                             const double u = i;
                             const double v = 16.0 - i;
                             r.push_back(kY[i - 1] - (x[0] + u / (v * x[1] + std::min(u, v) * x[2])));
                           }
                           return r;
                         },
                         {1.0, 1.0, 1.0},
                         8.214877306578994e-3},
                        {"Jennrich and Sampson",
                         [](const Set& x) {
                           Set r;
                           for (int i = 1; i <= 10; ++i)
                             r.push_back(2.0 + 2.0 * i - (std::exp(i * x[0]) + std::exp(i * x[1])));
                           return r;
                         },
                         {0.3, 0.4},
                         124.3621823556148}};
  for (const Case& each : cases) {
    GlmConditions c;
    c.settings.perturbationFraction = 1e-7;
    c.settings.smallestSingularValue = 1e-12;
    const std::size_t n = each.start.size();
    const GlmTrial trial = glmSearch({Set(n, -20.0), Set(n, 20.0), each.start}, each.residuals, c);
    EXPECT_NEAR(trial.sum(), each.sum, 1e-8 * std::max(each.sum, 1e-2)) << each.name << "\n" << notesOf(trial);
  }
}

/// Nonlinear regression problems of the StRD (tests/algorithms/strd_functions.h) with their certified parameters, from
/// both starts; on the logarithms of the parameters, too. bench/nist has all of them through the whole program.
TEST(Glm, HasTheCertifiedDigitsOfReferenceData) {
  struct Data {
    const char* name;
    std::vector<double> y;
    std::vector<double> x;
    ParameterSet starts[2];
    ParameterSet certified;
  };
  const Data sets[] = {
      {"Misra1a",
       {10.07, 14.73, 17.94, 23.93, 29.61, 35.18, 40.02, 44.82, 50.76, 55.05, 61.01, 66.40, 75.47, 81.78},
       {77.6, 114.9, 141.1, 190.8, 239.9, 289.0, 332.8, 378.4, 434.8, 477.3, 536.8, 593.1, 689.1, 760.0},
       {{500, 0.0001}, {250, 0.0005}},
       {2.3894212918e+02, 5.5015643181e-04}},
      {"BoxBOD",
       {109, 149, 149, 191, 213, 224},
       {1, 2, 3, 5, 7, 10},
       {{1, 1}, {100, 0.75}},
       {2.1380940889e+02, 5.4723748542e-01}},
      {"MGH10",
       {34780, 28610, 23650, 19630, 16370, 13720, 11540, 9744, 8261, 7030, 6005, 5147, 4427, 3820, 3307, 2872},
       {50, 55, 60, 65, 70, 75, 80, 85, 90, 95, 100, 105, 110, 115, 120, 125},
       {{2, 400000, 25000}, {0.02, 4000, 250}},
       {5.6096364710e-03, 6.1813463463e+03, 3.4522363462e+02}}};
  for (const Data& data : sets) {
    for (const bool isLogarithmic : {false, true}) {
      for (const ParameterSet& start : data.starts) {
        const auto scaled = [&](double value) { return isLogarithmic ? std::log(value) : value; };
        GlmConditions c;
        c.settings.perturbationOption = PerturbationOption::value;
        c.settings.perturbationFraction = 1e-5;
        c.settings.smallestSingularValue = 1e-13;
        c.settings.broydenUpdates = 0;
        c.transformation.assign(start.size(),
                                isLogarithmic ? TransformationType::logarithmic : TransformationType::none);
        SearchBounds bounds;
        for (std::size_t j = 0; j < start.size(); ++j) {
          const double least = std::min({data.starts[0][j], data.starts[1][j], data.certified[j]});
          const double most = std::max({data.starts[0][j], data.starts[1][j], data.certified[j]});
          bounds.lower.push_back(scaled(least / 10.0));
          bounds.upper.push_back(scaled(most * 10.0));
          bounds.initial.push_back(scaled(start[j]));
        }
        const auto residuals = [&](const ParameterSet& set) {
          ParameterSet b = set;
          for (double& value : b) value = isLogarithmic ? std::exp(value) : value;
          std::vector<double> found;
          for (std::size_t i = 0; i < data.y.size(); ++i) {
            found.push_back(testing::strdModels().at(data.name)(b, {&data.x[i], 1}) - data.y[i]);
          }
          return found;
        };
        const GlmTrial trial = glmSearch(bounds, residuals, c);
        for (std::size_t j = 0; j < start.size(); ++j) {
          const double value = isLogarithmic ? std::exp(trial.summary.best[j]) : trial.summary.best[j];
          EXPECT_NEAR(value / data.certified[j], 1.0, 1e-7) << data.name << isLogarithmic << "\n" << notesOf(trial);
        }
      }
    }
  }
}

}  // namespace
}  // namespace mirevo
