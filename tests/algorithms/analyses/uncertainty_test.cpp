#include "algorithms/analyses/uncertainty.h"

#include <cmath>
#include <set>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/analyses/sampled_distributions.h"
#include "algorithms/function_evaluator.h"
#include "algorithms/numbers/sample_summary.h"
#include "algorithms/numbers/uniform_generator.h"
#include "matchers.h"
#include "refusal.h"

namespace mirevo {
namespace {

/// Independent normal distributions: means and standard deviations.
ParameterDistributions normals(const std::vector<std::pair<double, double>>& parameters) {
  std::vector<DistributionPointer> made;
  for (const auto& [mean, deviation] : parameters) made.push_back(normalDistribution(mean, deviation));
  return ParameterDistributions(std::move(made));
}

TEST(UncertaintySample, DrawsColumnByColumnFromTheSeed) {
  const UncertaintySettings settings{SamplingType::simpleRandom, 3, normals({{10.0, 2.0}, {-1.0, 0.5}})};
  const std::vector<ParameterSet> sample = uncertaintySample(settings, 5);
  UniformGenerator random(5);
  for (std::size_t j = 0; j < 2; ++j) {
    for (std::size_t i = 0; i < 3; ++i) {
      const double z = (sample[i][j] - (j == 0 ? 10.0 : -1.0)) / (j == 0 ? 2.0 : 0.5);
      EXPECT_NEAR(normalProbability(z), random.next(), 1e-14);
    }
  }
  EXPECT_EQ(sample, uncertaintySample(settings, -5));
}

TEST(UncertaintySample, LatinHypercubeHitsEachStratumOnceInRankOrder) {
  for (const int n : {4, 1000}) {
    const UncertaintySettings settings{SamplingType::latinHypercube, n, normals({{0.0, 1.0}, {0.0, 1.0}, {3.0, 0.0}})};
    const std::vector<ParameterSet> sample = uncertaintySample(settings, 17);
    for (std::size_t j = 0; j < 2; ++j) {
      std::set<int> strata;
      for (const ParameterSet& set : sample) strata.insert(static_cast<int>(normalProbability(set[j]) * n));
      EXPECT_EQ(strata.size(), n);
    }
    if (n == 1000) {
      EXPECT_LT(std::abs(correlationMatrix(sample)[0][1]), 0.1);
    }
    // The permutation ranks the deviates that simple random sampling would use.
    const std::vector<ParameterSet> simple =
        uncertaintySample({SamplingType::simpleRandom, n, normals({{0.0, 1.0}})}, 17);
    for (std::size_t i = 1; i < sample.size(); ++i) {
      EXPECT_EQ(sample[i][0] < sample[0][0], simple[i][0] < simple[0][0]) << i;
      EXPECT_EQ(sample[i][2], 3.0);
    }
  }
}

TEST(UncertaintySample, DrawsOnlySetsThatCannotBeRunAgain) {
  const auto above = [](double limit) {
    return feasibleWhere([limit](const auto& set) { return set[0] > limit; }, "too small");
  };
  for (const SamplingType type : {SamplingType::simpleRandom, SamplingType::latinHypercube}) {
    const UncertaintySettings settings{type, 200, normals({{0.0, 1.0}, {3.0, 2.0}})};
    const std::vector<ParameterSet> drawn = uncertaintySample(settings, 5);
    const FeasibleSample sample = feasibleUncertaintySample(settings, 5, above(0.0));
    ASSERT_EQ(sample.sets.size(), 200U);
    for (std::size_t i = 0; i < 200; ++i) {
      EXPECT_GT(sample.sets[i][0], 0.0);
      EXPECT_EQ(sample.sets[i] == drawn[i], drawn[i][0] > 0.0);
    }
    EXPECT_NEAR(static_cast<double>(sample.drawnCount), 400, 80) << "half of the sets can be run";
    EXPECT_EQ(feasibleUncertaintySample(settings, 5, {}).sets, drawn);
    EXPECT_EQ(refusalOf([&] { feasibleUncertaintySample(settings, 5, above(40.0)); }),
              "Error: No parameter set found that satisfies the constraints\n"
              "0 of the 200 sets wanted, of 1200200 drawn, an acceptance rate of 0 %; the last one: too small\n"
              "Make means, standard deviations and constraints (or equations) agree, so that more of the sets drawn "
              "can be run");
    EXPECT_THAT(refusalOf([&] { feasibleUncertaintySample(settings, 5, above(3.9)); }),
                StartsWith("Error: Too few parameter sets found that can be run\n"));
  }
}

TEST(UncertaintyAnalysis, EvaluatesOneBatchAndLeavesFailuresOut) {
  int call = 0;
  FunctionEvaluator evaluator([&](const ParameterSet& set) {
    EvaluationResult result = resultOf(++call <= 3 ? call : kFailedRunValue);
    result.measureValues = {result.aggregate, set[0]};
    if (call > 3) result.failure = EvaluationFailure{};
    return result;
  });
  const UncertaintyOutcome outcome =
      uncertaintyAnalysis(uncertaintySample({SamplingType::simpleRandom, 5, normals({{1.0, 0.0}})}, 1), evaluator);
  ASSERT_EQ(evaluator.batches.size(), 1U);
  EXPECT_EQ(evaluator.batches[0].size(), 5U);
  const SearchSpace space{.names = {"K"}, .lower = {0.0}, .upper = {5.0}, .transformation = {TransformationType::none}};
  const UncertaintySummary summary = summariseUncertainty(outcome, space);
  EXPECT_EQ(summary.failedCount, 2U);
  EXPECT_EQ(summary.objectives[0].count, 3U);
  EXPECT_EQ(summary.objectives[0].mean, 2.0);
  EXPECT_EQ(summary.objectives[0].standardDeviation, 1.0);
  EXPECT_DOUBLE_EQ(summary.objectives[0].quantiles[0], 1.1);
  EXPECT_EQ(summary.parameters[0].count, 5U);
  EXPECT_THAT(
      formatUncertainty(summary, {{"K"}, {"bias", "peak"}, {"low"}}, ""),
      ElementsAre(
          "Uncertainty analysis: 5 evaluations, 2 failed and left out of the statistics", "",
          HasSubstr("Parameter (model scale)"),
          "   K                                    1              0              1              1              1"
          "              1              1",
          "", HasSubstr("Std. deviation"), HasSubstr("bias "), HasSubstr("peak "), "", HasSubstr("95 %"),
          "   low                             2              1            1.1            1.5              2"
          "            2.5            2.9",
          "", "   Sample correlation              K", "   K                               1"));
}

TEST(UncertaintySummary, IsOfTheValuesThatTheModelGets) {
  const SearchSpace space{.names = {"a", "b"},
                          .lower = {0.0, 0.0},
                          .upper = {std::log(2.5), 4.0},  // b is at most 3
                          .transformation = {TransformationType::logarithmic, TransformationType::integer}};
  const std::vector<ParameterSet> sample{{-0.1, 2.9}, {std::log(2.0), 1.2}, {std::log(3.0), 4.5}, {std::log(4.0), 3.1}};
  const UncertaintySummary summary = summariseUncertainty({sample, {}}, space);
  EXPECT_DOUBLE_EQ(summary.parameters[0].mean, (std::exp(-0.1) + 9.0) / 4.0);
  EXPECT_EQ(summary.parameters[1].mean, 2.5);
  EXPECT_THAT(summary.parameters[1].quantiles, ElementsAre(1, 1, 2, 3, 3)) << "1, 2, 3, 4: values that the model got";
  const std::vector<std::vector<double>> got{{std::exp(-0.1), 2}, {2, 1}, {3, 4}, {4, 3}};
  EXPECT_DOUBLE_EQ(summary.correlations[0][1], correlationMatrix(got)[0][1]);
  EXPECT_EQ(setsOutsideBounds(sample, space), "Sets outside the bounds of a parameter: 3 of 4 (a in 3, b in 1)");
}

TEST(DistributionWarnings, AreOfMeansOutsideTheBoundsAndOfMostValuesThere) {
  const SearchSpace space{.names = {"a", "n"},
                          .lower = {std::log(0.5), 0.0},
                          .upper = {std::log(4.0), 7.0},  // n is at most 6
                          .transformation = {TransformationType::logarithmic, TransformationType::integer}};
  const std::pair<double, const char*> ofIntegers[] = {
      {0, nullptr},
      {6.9, nullptr},  // of values around 6
      {7, "Mean_Value of PARAMETER_2 (n) is 7: outside the bounds 0 to 6"},
      {-0.5, "Mean_Value of PARAMETER_2 (n) is -0.5: outside the bounds 0 to 6"}};
  for (const auto& [mean, warning] : ofIntegers) {
    const ParameterDistributions distributions = normals({{0.0, 1.0}, {mean, 0.6}});
    const std::vector<std::string> found = distributionWarnings(distributions, space);
    EXPECT_EQ(found, warning == nullptr ? std::vector<std::string>{} : std::vector<std::string>{warning}) << mean;
  }
  // Values from -1 to 7 become 0 to 6: the normal distribution has 0.3829 within half a standard deviation.
  EXPECT_THAT(distributionWarnings(normals({{0.0, 1.0}, {3.0, 8.0}}), space),
              ElementsAre("Standard_Deviation of PARAMETER_2 (n) is 8: about 62 % of the values drawn are outside the "
                          "bounds 0 to 6"));
  const ParameterDistributions distributions = normals({{3.0, 1.0}, {2.0, 0.6}});
  EXPECT_THAT(
      distributionWarnings(distributions, space),
      ElementsAre("Mean_Value of PARAMETER_1 (a) is 3, on the model scale 20.0855: outside the bounds 0.5 to 4; "
                  "the mean of a logarithmic parameter is that of its natural logarithm, ln(3) = 1.09861"));

  const SearchSpace equal{.names = {"x"}, .lower = {0.5}, .upper = {0.5}, .transformation = {TransformationType::none}};
  EXPECT_THAT(distributionWarnings(ParameterDistributions(std::vector{uniformDistribution(0.5, 0.5)}), equal),
              ElementsAre("x has one value alone, 0.5, and is not varied: its bounds are equal"));
  constexpr std::size_t kMany = 60;
  const SearchSpace many{.names = std::vector<std::string>(kMany, "x"),
                         .lower = std::vector<double>(kMany, 0.0),
                         .upper = std::vector<double>(kMany, 1.0),
                         .transformation = std::vector<TransformationType>(kMany, TransformationType::none)};
  const std::vector<std::string> told =
      distributionWarnings(ParameterDistributions(std::vector(kMany, uniformDistribution(5.0, 6.0))), many);
  ASSERT_EQ(told.size(), 51U);
  EXPECT_EQ(told.back(), "The distributions of 10 more parameters fit their bounds as little");
}

}  // namespace
}  // namespace mirevo
