#include "algorithms/analyses/morris.h"

#include <algorithm>
#include <array>
#include <cmath>
#include <map>
#include <memory>
#include <optional>
#include <set>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/function_evaluator.h"
#include "algorithms/numbers/uniform_generator.h"
#include "algorithms/screening_functions.h"
#include "matchers.h"

namespace mirevo {
namespace {

constexpr EffectDesign kDesigns[] = {EffectDesign::radial, EffectDesign::trajectories};

ModelParameter parameter(const std::string& name, double lower, double upper,
                         TransformationType type = TransformationType::none) {
  return {lower, lower, upper, type, ParameterType::variable, 0.0, name};
}

SearchSpace spaceOf(std::size_t count, double lower = 0.0, double upper = 1.0) {
  std::vector<ModelParameter> parameters;
  for (std::size_t i = 0; i < count; ++i) parameters.push_back(parameter("p" + std::to_string(i), lower, upper));
  return BuildSearchSpace(parameters);
}

/// A space with all kinds of parameters; that of the last one is a single value.
SearchSpace mixedSpace() {
  const auto integer = TransformationType::integer;
  return BuildSearchSpace(std::vector{parameter("a", -1.0, 3.0),
                                      parameter("log", 1.0, std::exp(2.0), TransformationType::logarithmic),
                                      parameter("choice", 3.0, 4.0, integer), parameter("steps", 1.0, 11.0, integer),
                                      parameter("single", 2.0, 2.0, integer)});
}

struct Screening {
  EffectPlan plan;
  EffectResults results;
  MorrisOutcome outcome;
};

template <class Function>
Screening screen(const MorrisSettings& settings, const SearchSpace& space, const Function& function,
                 const Feasibility& feasibility = {}) {
  const ParameterDistributions distributions = ParameterDistributions::uniform(space);
  Screening made{planEffects(settings, space, distributions, 1, feasibility), {}, {}};
  int number = 0;
  FunctionEvaluator evaluator([&](const ParameterSet& set) { return function(++number, ToModelScale(space, set)); });
  evaluateEffects(made.plan, distributions, evaluator, made.results);
  EXPECT_EQ(evaluator.evaluationCount, made.plan.evaluationCount);
  made.outcome = screenParameters(made.plan, made.results, settings, 1, {}, {space.names, {"y"}, {}});
  return made;
}

TEST(ElementaryEffects, EveryPairOfSetsDiffersInOneParameterByTheStep) {
  const SearchSpace space = mixedSpace();
  const ParameterDistributions distributions = ParameterDistributions::uniform(space);
  for (const EffectDesign design : kDesigns) {
    const MorrisSettings settings{.design = design, .trajectories = 40};
    const EffectPlan plan = planEffects(settings, space, distributions, 7);
    std::vector<ParameterSet> sets;
    std::map<std::size_t, int> effects;
    for (const EffectTrajectory& trajectory : plan.trajectories) {
      for (ParameterSet& set : setsOf(plan, trajectory, distributions)) sets.push_back(std::move(set));
      for (const EffectPair& pair : pairsOf(plan, trajectory)) {
        ++effects[pair.parameter];
        const auto from = ToModelScale(space, sets.at(static_cast<std::size_t>(pair.from - 1)));
        const auto to = ToModelScale(space, sets.at(static_cast<std::size_t>(pair.to - 1)));
        for (std::size_t k = 0; k < space.size(); ++k) EXPECT_EQ(from[k] != to[k], k == pair.parameter);
        const double change = to[pair.parameter] - from[pair.parameter];
        const double shares[] = {change / 4.0, std::log(to[1] / from[1]) / 2.0, change, change / 10.0};
        EXPECT_NEAR(shares[pair.parameter], pair.width, 1e-6);
        EXPECT_GT(std::abs(pair.width), design == EffectDesign::radial ? 0.09 : 0.19);
      }
    }
    EXPECT_EQ(std::ssize(sets), plan.evaluationCount);
    EXPECT_THAT(effects, ElementsAre(std::pair(0, 40), std::pair(1, 40), std::pair(2, 40), std::pair(3, 40)));
    EXPECT_THAT(plan.unchanged, ElementsAre(0, 0, 0, 0, 40));
    EXPECT_EQ(plan.evaluationCount, 40 * 5) << "no run for a step that changes nothing";
  }
}

TEST(ElementaryEffects, StepOverTheDistributionsOfTheParameters) {
  const SearchSpace space =
      BuildSearchSpace(std::vector{parameter("normal", 0.0, 20.0),
                                   parameter("rare", 1.0, 5.0, TransformationType::integer), parameter("c", 0.0, 1.0)});
  const double values[] = {1.5, 2.5, 5.5};
  const double weights[] = {0.9, 0.05, 0.05};
  const std::vector<DistributionPointer> ofParameters{normalDistribution(10.0, 2.0),
                                                      discreteDistribution(values, weights), uniformDistribution(0, 1)};
  for (const EffectDesign design : kDesigns) {
    const ParameterDistributions distributions(ofParameters);
    const EffectPlan plan = planEffects({.design = design, .trajectories = 30}, space, distributions, 1);
    std::vector<ParameterSet> sets;
    std::size_t ofRare = 0;
    for (const EffectTrajectory& trajectory : plan.trajectories) {
      for (ParameterSet& set : setsOf(plan, trajectory, distributions)) sets.push_back(std::move(set));
      for (const EffectPair& pair : pairsOf(plan, trajectory)) {
        const ParameterSet& from = sets.at(static_cast<std::size_t>(pair.from - 1));
        const ParameterSet& to = sets.at(static_cast<std::size_t>(pair.to - 1));
        const auto probability = [](double x) { return 0.5 * std::erfc((10.0 - x) / 2.0 / std::sqrt(2.0)); };
        if (pair.parameter == 0) {
          EXPECT_NEAR(probability(to[0]) - probability(from[0]), pair.width, 1e-9);
        }
        if (pair.parameter != 1) continue;
        EXPECT_NE(to[1], from[1]);
        ++ofRare;
      }
    }
    EXPECT_EQ(ofRare + plan.unchanged[1], 30U);
    EXPECT_EQ(plan.unchanged[1] > 0, design == EffectDesign::trajectories) << "radial steps look for the rare values";
    EXPECT_FALSE(plan.isCorrelated);
  }
  const ParameterDistributions correlated(
      ofParameters, GaussianCopula({{1.0, 0.0, 0.5}, {0.0, 1.0, 0.0}, {0.5, 0.0, 1.0}}, space.names));
  EXPECT_TRUE(planEffects({.trajectories = 5}, space, correlated, 1).isCorrelated);
}

TEST(ElementaryEffects, StartEquallyOftenAtAllLevelsAndTheTrajectoriesTakenAreMostDifferent) {
  const SearchSpace space = spaceOf(3);
  const ParameterDistributions distributions = ParameterDistributions::uniform(space);
  const auto nearest = [&](std::int32_t candidates) {
    const EffectPlan plan =
        planEffects({.design = EffectDesign::trajectories, .trajectories = 12, .levels = 6, .candidates = candidates},
                    space, distributions, 1);
    std::vector<std::vector<double>> centroids;
    std::map<int, int> starts;
    for (const EffectTrajectory& trajectory : plan.trajectories) {
      for (const double u : trajectory.base) ++starts[static_cast<int>(6.0 * u)];
      for (std::size_t j = 0; j < 3; ++j) {
        const double steps = 6.0 * std::abs(trajectory.moved[j] - trajectory.base[j]);
        EXPECT_NEAR(steps, std::round(steps), 1e-9);
        EXPECT_TRUE(steps > 1.9 && steps < 4.1) << steps;
      }
      std::vector<double>& centroid = centroids.emplace_back(3);
      for (const ParameterSet& set : setsOf(plan, trajectory, distributions)) {
        for (std::size_t k = 0; k < 3; ++k) centroid[k] += set[k] / 4.0;
      }
    }
    EXPECT_EQ(starts.size(), 6U);
    for (const auto& [level, count] : starts) EXPECT_EQ(count, 3 * 12 / 6) << level;
    double least = 9.0;
    for (std::size_t i = 0; i < centroids.size(); ++i) {
      for (std::size_t j = 0; j < i; ++j) {
        double squared = 0.0;
        for (std::size_t k = 0; k < 3; ++k) squared += std::pow(centroids[i][k] - centroids[j][k], 2);
        least = std::min(least, squared);
      }
    }
    return least;
  };
  EXPECT_GT(nearest(500), 2.0 * nearest(1));
}

/// A uniform distribution that counts how often it is asked for a value.
class CountedDistribution final : public Distribution {
 public:
  explicit CountedDistribution(int& count) : count_(count) {}
  std::string_view name() const override { return "counted"; }
  std::string text() const override { return ""; }
  double cumulative(double x) const override { return x; }
  double quantile(double p) const override {
    ++count_;
    return p;
  }
  double logDensity(double /*x*/) const override { return 0.0; }

 private:
  int& count_;
};

// Quantiles such as those of a beta distribution take their time.
TEST(ElementaryEffects, TakeAFewQuantilesForEachStep) {
  constexpr std::size_t kSize = 300;
  constexpr int kTrajectories = 5;
  constexpr int kSteps = static_cast<int>(kSize) * kTrajectories;
  std::vector<std::vector<double>> correlations(kSize, std::vector<double>(kSize, 0.0));
  for (std::size_t j = 0; j < kSize; ++j) correlations[j][j] = 1.0;
  correlations[3][8] = correlations[8][3] = 0.5;
  for (const TransformationType type : {TransformationType::none, TransformationType::integer}) {
    SearchSpace space = spaceOf(kSize);
    space.transformation.assign(kSize, type);
    for (const bool isCorrelated : {false, true}) {
      for (const EffectDesign design : kDesigns) {
        int count = 0;
        const auto counted = std::make_shared<CountedDistribution>(count);
        const ParameterDistributions distributions(
            std::vector<DistributionPointer>(kSize, counted),
            isCorrelated ? std::optional(GaussianCopula(correlations, space.names)) : std::nullopt);
        const EffectPlan plan = planEffects({.design = design, .trajectories = kTrajectories, .candidates = 1}, space,
                                            distributions, 1, feasibleWhere([](const auto&) { return true; }, ""));
        for (const EffectTrajectory& trajectory : plan.trajectories) setsOf(plan, trajectory, distributions);
        EXPECT_LT(count, 200 * kSteps) << isCorrelated << static_cast<int>(type);
      }
    }
  }
}

// Steps of one width do not see what repeats itself at that distance.
TEST(ElementaryEffects, OfAPeriodicOutputAreSeenWhateverTheLevels) {
  const SearchSpace space = spaceOf(2);
  for (const int levels : {4, 6, 8, 10}) {
    const MorrisSettings settings{.design = EffectDesign::trajectories, .trajectories = 30, .levels = levels};
    const auto found =
        screen(settings, space, [](int, const auto& x) { return resultOf(std::pow(std::sin(2.0 * M_PI * x[0]), 2)); });
    const OutputEffects& effects = found.outcome.outputs.at(0).effects;
    EXPECT_GT(effects.parameters[0].muStar.value, 0.3) << levels;
    // What the other one does in a corner, no step may have met.
    EXPECT_EQ(effects.parameters[1].verdict, ScreeningVerdict::fix);
    EXPECT_TRUE(std::isnan(effects.parameters[1].certainty));
    EXPECT_TRUE(std::isnan(effects.fixedTogether));
    std::string log;
    for (const std::string& line : formatMorris(found.outcome, found.plan, settings, {space.names, {"y"}, {}}, ""))
      log += line;
    EXPECT_THAT(log, ::testing::HasSubstr("in 30 or more steps: what acts in less than 9.5 % of the space"));
  }
}

TEST(ElementaryEffects, OfALinearModelAreItsCoefficientsTimesTheRanges) {
  const SearchSpace space = mixedSpace();
  for (const EffectDesign design : kDesigns) {
    const auto found = screen({.design = design, .trajectories = 10}, space, [](int, const auto& x) {
      return resultOf(2.0 * x[0] - 3.0 * std::log(x[1]) + 5.0 * x[2] + 0.5 * x[3] + x[4]);
    });
    const double expected[] = {8.0, -6.0, 5.0, 5.0};
    const OutputEffects& effects = found.outcome.outputs.at(0).effects;
    for (std::size_t j = 0; j < 4; ++j) {
      const ParameterEffects& p = effects.parameters[j];
      EXPECT_NEAR(p.mu.value, expected[j], 1e-5) << j;
      EXPECT_NEAR(p.muStar.value, std::abs(expected[j]), 1e-5);
      EXPECT_NEAR(p.sigma.value, 0.0, 1e-5);
      EXPECT_NEAR(p.muStar.upper - p.muStar.lower, 0.0, 1e-5);
      EXPECT_EQ(p.verdict, ScreeningVerdict::keep);
    }
    EXPECT_EQ(effects.parameters[4].count, 0U);
    EXPECT_EQ(effects.parameters[4].rank, 0U);
  }
}

// Published implementations let a failed run's value into the indices.
TEST(ElementaryEffects, AFailedRunCostsTheEffectsThatItIsPartOfAndNoMore) {
  const SearchSpace space = spaceOf(20);
  for (const EffectDesign design : kDesigns) {
    const MorrisSettings settings{.design = design, .trajectories = 20, .bootstrapSamples = 100};
    const auto evaluated = [&](const std::set<int>& failed) {
      return screen(settings, space, [&](int number, const auto& x) {
        return failed.contains(number) ? failedResult() : resultOf(morrisFunction(x));
      });
    };
    const Screening whole = evaluated({});
    const EffectPlan& plan = whole.plan;
    // In the middle, at the beginning and at the end of a trajectory of 21 sets.
    for (const auto& [number, lost] : std::map<int, std::size_t>{{21 * 4 + 10, 2}, {21 * 5 + 1, 1}, {21 * 7, 1}}) {
      const Screening holed = evaluated({number});
      const bool isBase = number % 21 == 1;
      const std::size_t expected = design == EffectDesign::trajectories ? lost : isBase ? 20 : 1;
      EXPECT_EQ(holed.outcome.failedCount, 1U);
      EXPECT_EQ(holed.outcome.lostEffects, expected);
      EXPECT_EQ(holed.outcome.plannedEffects, 400U);
      std::set<std::size_t> concerned;
      for (const EffectPair& pair : pairsOf(plan, plan.trajectories[static_cast<std::size_t>((number - 1) / 21)])) {
        if (pair.from == number || pair.to == number) concerned.insert(pair.parameter);
      }
      EXPECT_EQ(concerned.size(), expected);
      for (std::size_t j = 0; j < 20; ++j) {
        const ParameterEffects& one = whole.outcome.outputs[0].effects.parameters[j];
        const ParameterEffects& other = holed.outcome.outputs[0].effects.parameters[j];
        EXPECT_EQ(other.count, concerned.contains(j) ? 19U : 20U);
        if (!concerned.contains(j)) {
          EXPECT_EQ(other.muStar.value, one.muStar.value);
          EXPECT_EQ(other.sigma.value, one.sigma.value);
        }
      }
    }
  }
}

TEST(ElementaryEffects, SetsThatCannotBeRunAreNotHandedOver) {
  const SearchSpace space = spaceOf(3);
  const Feasibility feasibility = feasibleWhere([](const auto& set) { return set[0] + set[1] < 1.4; }, "a + b < 1.4");
  for (const EffectDesign design : kDesigns) {
    const auto found = screen(
        {.design = design, .trajectories = 20}, space,
        [](int, const auto& x) {
          EXPECT_LT(x[0] + x[1], 1.4);
          return resultOf(x[0] + 2.0 * x[1] + x[2]);
        },
        feasibility);
    const OutputEffects& effects = found.outcome.outputs[0].effects;
    EXPECT_EQ(found.outcome.lostEffects, 0U);
    for (std::size_t j = 0; j < 3; ++j) EXPECT_EQ(effects.parameters[j].count, 20U - found.plan.infeasible[j]);
    EXPECT_NEAR(effects.parameters[1].mu.value, 2.0, 1e-6);
    EXPECT_EQ(found.plan.infeasiblePoints > 0, design == EffectDesign::trajectories) << "radial ones look elsewhere";
    // What the plan tells before the first run.
    const std::vector<std::string> names{"a", "b", "c"};
    const std::string told = infeasiblePointsText(found.plan, names);
    EXPECT_EQ(told.find(fmt::format("{} of 80 points of the trajectories cannot be run and ",
                                    found.plan.infeasiblePoints)) == 0,
              design == EffectDesign::trajectories);
    for (std::size_t j = 0; j < 3; ++j) {
      const std::string lacking = fmt::format("{} ({} of 20)", names[j], found.plan.infeasible[j]);
      EXPECT_EQ(told.find(lacking) != std::string::npos, found.plan.infeasible[j] > 0) << told;
    }
  }
}

TEST(ElementaryEffects, TheConstraintThatLeavesNoStepIsNamed) {
  const SearchSpace space = spaceOf(2);
  const ParameterDistributions distributions = ParameterDistributions::uniform(space);
  // No step of at least a tenth of its range leads from one value of b to another that can be run.
  const Feasibility feasibility =
      feasibleWhere([](const auto& set) { return std::abs(set[1] - 0.5) < 0.04; }, "b is 0.5");
  const EffectPlan plan = planEffects({.trajectories = 4}, space, distributions, 1, feasibility);
  EXPECT_EQ(plan.infeasiblePoints, 0U);
  EXPECT_EQ(infeasiblePointsText(plan, std::vector<std::string>{"a", "b"}),
            "Of some parameters no step that can be run was found; one that was tried: b is 0.5\n"
            "   Parameters that lack effects, in how many trajectories: b (4 of 4)");
}

class CountingEvaluator final : public Evaluator {
 public:
  std::vector<EvaluationResult> evaluateParameterSets(std::span<const ParameterSet> sets, DispatchMode) override {
    largest = std::max(largest, sets.size());
    if (++batches == 3) throw std::runtime_error("the third one");
    std::vector<EvaluationResult> results;
    for (const ParameterSet& set : sets) results.push_back(resultOf(set[0]));
    return results;
  }
  std::size_t largest = 0;
  int batches = 0;
};

TEST(ElementaryEffects, OfManyParametersAreEvaluatedInBatchesOfWholeTrajectories) {
  const SearchSpace space = spaceOf(999);
  const ParameterDistributions distributions = ParameterDistributions::uniform(space);
  const EffectPlan plan = planEffects({.trajectories = 12}, space, distributions, 1);
  CountingEvaluator evaluator;
  EffectResults taken;
  EXPECT_THROW(evaluateEffects(plan, distributions, evaluator, taken), std::runtime_error);
  EXPECT_EQ(evaluator.largest, 5000U);
  EXPECT_EQ(taken.size(), 10000U) << "those of complete batches are there";
}

TEST(EffectStatistics, AreThoseOfTheKnownEffects) {
  const double nan = std::nan("");
  const EffectRows effects{{1.0, 2.0, nan}, {-3.0, 2.0, nan}, {nan, 2.0, nan}, {5.0, 2.0, nan}};
  const OutputEffects found = effectStatistics(effects, drawResamples(4, 100, 1), 0.1);
  EXPECT_DOUBLE_EQ(found.parameters[0].mu.value, 1.0);
  EXPECT_DOUBLE_EQ(found.parameters[0].muStar.value, 3.0);
  EXPECT_DOUBLE_EQ(found.parameters[0].sigma.value, 4.0);
  EXPECT_EQ(found.parameters[0].count, 3U);
  EXPECT_FALSE(found.parameters[0].muStar.hasLimits()) << "of three effects";
  EXPECT_EQ(found.parameters[0].verdict, ScreeningVerdict::none);
  EXPECT_EQ(found.parameters[0].rank, 1U);
  EXPECT_EQ(found.parameters[1].rank, 2U);
  EXPECT_DOUBLE_EQ(found.parameters[1].share.value, 2.0 / 3.0);
  EXPECT_EQ(found.parameters[2].rank, 0U);
  EXPECT_TRUE(std::isnan(found.parameters[2].muStar.value));
}

/// Effects of mean 1 and a heavy tail, as absolute effects have: squares of normal deviates, nearly.
double skewedEffect(UniformGenerator& random) {
  return -std::log(random.next());
}

TEST(EffectStatistics, LimitsHoldNearlyAsOftenAsTheySay) {
  constexpr std::size_t kParameters = 300;
  UniformGenerator random(3);
  for (const std::size_t r : {10U, 40U}) {
    EffectRows effects(r, std::vector<double>(kParameters));
    for (std::vector<double>& row : effects) {
      for (double& effect : row) effect = skewedEffect(random);
    }
    const OutputEffects found = effectStatistics(effects, drawResamples(r, 400, 1), 0.1);
    int holding = 0;
    int ofSigma = 0;
    for (const ParameterEffects& p : found.parameters) {
      if (p.muStar.lower <= 1.0 && 1.0 <= p.muStar.upper) ++holding;
      if (p.sigma.lower <= 1.0 && 1.0 <= p.sigma.upper) ++ofSigma;
    }
    // The percentile interval holds in 87 % of the cases with 10 effects.
    EXPECT_NEAR(holding, 0.95 * kParameters, 0.03 * kParameters) << r;
    EXPECT_GT(ofSigma, 0.86 * kParameters) << r;
  }
}

TEST(EffectStatistics, TheVerdictIsOfTheLimitsAndNotOfTheValue) {
  constexpr std::size_t kTrajectories = 20;
  UniformGenerator random(5);
  EffectRows effects(kTrajectories, std::vector<double>(5));
  for (std::size_t t = 0; t < kTrajectories; ++t) {
    const double skewed = skewedEffect(random);
    effects[t] = {10.0 + random.next(), 0.8 * skewed * skewed, 0.1 * random.next(), 5.0, 0.0};
  }
  const OutputEffects found = effectStatistics(effects, drawResamples(kTrajectories, 1000, 1), 0.1);
  const auto& p = found.parameters;
  EXPECT_EQ(p[0].verdict, ScreeningVerdict::keep);
  EXPECT_EQ(p[1].verdict, ScreeningVerdict::undecided);
  EXPECT_EQ(p[2].verdict, ScreeningVerdict::fix);
  EXPECT_EQ(p[3].verdict, ScreeningVerdict::keep);
  EXPECT_EQ(p[4].verdict, ScreeningVerdict::fix);
  EXPECT_GT(p[2].certainty, 0.99);
  EXPECT_LT(p[3].certainty, 0.01);
  EXPECT_GT(p[1].certainty, 0.01);
  EXPECT_LT(p[1].certainty, 0.99);
  EXPECT_GT(found.fixedTogether, 0.99);
  EXPECT_GT(found.trajectoriesToDecide, static_cast<double>(kTrajectories));
  EXPECT_EQ(p[0].rankStability, 1.0);
  EXPECT_EQ(p[3].rank, 2U);
}

TEST(EffectStatistics, ParametersWithEqualMuStarShareARankThatIsNotCertain) {
  UniformGenerator random(5);
  EffectRows effects(10, std::vector<double>(6, 0.0));
  for (std::vector<double>& row : effects) row = {5.0 + random.next(), 0.0, 1.0, 0.0, 1.0 + 1e-14, std::nan("")};
  const OutputEffects found = effectStatistics(effects, drawResamples(10, 200, 1), 0.1);
  const std::array<std::array<std::size_t, 3>, 6> expected{{{1, 1, 1}, {4, 4, 5}, {2, 2, 3}, {4, 4, 5}, {2, 2, 3}, {}}};
  for (std::size_t j = 0; j < 6; ++j) {
    const ParameterEffects& p = found.parameters[j];
    EXPECT_EQ((std::array{p.rank, p.rankLower, p.rankUpper}), expected[j]) << j;
    EXPECT_EQ(std::isnan(p.rankStability), j != 0) << j;
  }
  EXPECT_EQ(found.topCount, 3U);
  EXPECT_EQ(found.topStability, 1.0);
}

// Powers of such effects are no numbers, or 0.
TEST(EffectStatistics, DoNotDependOnTheUnitOfTheOutput) {
  constexpr std::size_t kTrajectories = 12;
  UniformGenerator random(7);
  EffectRows effects(kTrajectories, std::vector<double>(4));
  for (std::vector<double>& row : effects) {
    row = {4.0 + random.next(), skewedEffect(random), 0.2 * random.next(), 0.0};
  }
  const Resamples resamples = drawResamples(kTrajectories, 300, 1);
  const OutputEffects expected = effectStatistics(effects, resamples, 0.1);
  for (const int exponent : {700, 1000, -700, -1000}) {
    EffectRows scaled = effects;
    for (std::vector<double>& row : scaled) {
      for (double& effect : row) effect = std::ldexp(effect, exponent);
    }
    const OutputEffects found = effectStatistics(scaled, resamples, 0.1);
    for (std::size_t j = 0; j < 4; ++j) {
      const ParameterEffects& p = found.parameters[j];
      const ParameterEffects& of = expected.parameters[j];
      for (const auto value : {&ParameterEffects::mu, &ParameterEffects::muStar, &ParameterEffects::sigma}) {
        for (const auto part : {&LimitedValue::value, &LimitedValue::lower, &LimitedValue::upper}) {
          EXPECT_NEAR(std::ldexp(p.*value.*part, -exponent), of.*value.*part, 1e-12) << exponent << " " << j;
        }
      }
      EXPECT_EQ(p.share.lower, of.share.lower) << exponent << " " << j;
      EXPECT_EQ(p.share.upper, of.share.upper) << exponent << " " << j;
      EXPECT_EQ(p.verdict, of.verdict);
      EXPECT_EQ(p.rank, of.rank);
      EXPECT_EQ(p.rankUpper, of.rankUpper);
    }
  }
}

TEST(ElementaryEffects, OfOneRunFarFromAllOthersAreWarnedOf) {
  const SearchSpace space = spaceOf(3);
  const MorrisSettings settings{.trajectories = 20};
  for (const double far : {1.0, 1.0e6, 1.0e160}) {
    const Screening found = screen(settings, space, [far](int number, const auto& x) {
      return resultOf(number == 18 ? far : x[0] + x[1] * x[2]);  // the second set of a trajectory
    });
    const ParameterEffects& first = found.outcome.outputs.at(0).effects.parameters[0];
    EXPECT_TRUE(std::isfinite(first.sigma.value));
    EXPECT_EQ(first.largestPart > 0.9, far > 1.0);
    std::string log;
    for (const std::string& line : formatMorris(found.outcome, found.plan, settings, {space.names, {"y"}, {}}, ""))
      log += line;
    EXPECT_EQ(log.find("A single effect on y makes more than 90 % of the mu* of p0: ") != std::string::npos, far > 1.0);
  }
}

}  // namespace
}  // namespace mirevo
