#include "algorithms/analyses/sample_sensitivity.h"

#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/numbers/uniform_generator.h"
#include "algorithms/sobol_functions.h"
#include "matchers.h"

namespace mirevo {
namespace {

using OutputFunction = std::function<double(std::span<const double>)>;

SearchSpace spaceBetween(std::size_t p, double lower, double upper,
                         TransformationType transformation = TransformationType::none) {
  SearchSpace space;
  for (std::size_t j = 0; j < p; ++j) {
    space.names.push_back(std::string(1, static_cast<char>('a' + j)));
    space.lower.push_back(lower);
    space.upper.push_back(upper);
    space.transformation.push_back(transformation);
  }
  return space;
}

/// Uniform samples of the space; every `failing`-th run has failed.
UncertaintyOutcome sampleOf(const SearchSpace& space, int count, const OutputFunction& function, int seed,
                            int failing = 0) {
  UncertaintyOutcome outcome{
      uncertaintySample({SamplingType::simpleRandom, count, ParameterDistributions::uniform(space)}, seed), {}};
  for (int i = 0; i < count; ++i) {
    EvaluationResult& result = outcome.results.emplace_back();
    result.objectiveValues = {function(outcome.sample[static_cast<std::size_t>(i)])};
    if (failing == 0 || i % failing != 0) continue;
    result.failure.emplace();
    result.objectiveValues = {kFailedRunValue};
  }
  return outcome;
}

const AnalysisNames kNamesOfSample{{"a", "b", "c"}, {}, {"fit"}};

TEST(SampleSensitivity, FindsPublishedIndicesAlsoWithFailedRuns) {
  const SearchSpace space = spaceBetween(3, 0, 1);
  const std::vector<double> published = ishigami().first;
  for (const int failing : {0, 10}) {
    const SampleSensitivity found =
        sampleSensitivity(sampleOf(space, 5000, ishigami().value, 3, failing), space, kNamesOfSample, 3);
    ASSERT_EQ(found.outputs.size(), 1U);
    EXPECT_EQ(found.failedCount, failing == 0 ? 0U : 500U);
    EXPECT_EQ(found.outputs[0].count, 5000 - found.failedCount);
    for (std::size_t j = 0; j < 3; ++j) {
      const SampleDependence& one = found.outputs[0].parameters[j];
      EXPECT_NEAR(one.firstOrder, published[j], 0.03) << j;
      EXPECT_LT(one.lower, published[j]) << j;
      EXPECT_GT(one.upper, published[j]) << j;
      EXPECT_LT(one.upper - one.lower, 0.06) << j;
    }
  }
}

/// What has no effect is 0 on average: without the correction it would be 6 / 199.
TEST(SampleSensitivity, HasNoBiasWithoutAnEffect) {
  const SearchSpace space = spaceBetween(2, 0, 1);
  double sum = 0.0;
  int negative = 0;
  constexpr int kSamples = 60;
  for (int seed = 1; seed <= kSamples; ++seed) {
    const auto outcome = sampleOf(
        space, 200, [](std::span<const double> x) { return x[0]; }, seed);
    const SampleSensitivity found = sampleSensitivity(outcome, space, kNamesOfSample, seed);
    EXPECT_GT(found.outputs[0].parameters[0].firstOrder, 0.99);
    sum += found.outputs[0].parameters[1].firstOrder;
    negative += found.outputs[0].parameters[1].firstOrder < 0.0 ? 1 : 0;
  }
  EXPECT_NEAR(sum / kSamples, 0.0, 4 * std::sqrt(2 * 6.0) / 200 / std::sqrt(kSamples));
  EXPECT_GT(negative, kSamples / 4) << "values below 0 are kept";
}

TEST(SampleSensitivity, OfFewValuesIsThatOfTheirClasses) {
  // b is 0 or 1 with equal probability: the variance of 2 b + u - 1/2 is 1 + 1/12, of which b explains 1.
  const SearchSpace space = spaceBetween(2, 0, 2, TransformationType::integer);
  UncertaintyOutcome outcome = sampleOf(
      space, 3000, [](std::span<const double> x) { return x[0]; }, 8);
  UniformGenerator random(5);
  for (std::size_t i = 0; i < outcome.results.size(); ++i) {
    outcome.results[i].objectiveValues = {2 * std::floor(outcome.sample[i][1]) + random.next()};
  }
  const SampleSensitivity found = sampleSensitivity(outcome, space, kNamesOfSample, 1);
  EXPECT_NEAR(found.outputs[0].parameters[1].firstOrder, 12.0 / 13.0, 0.01);
  EXPECT_NEAR(found.outputs[0].parameters[0].firstOrder, 0.0, 0.005);
  EXPECT_NEAR(found.outputs[0].parameters[1].rankCorrelation, std::sqrt(0.75), 0.01);
}

TEST(SampleSensitivity, OfAParameterThatIsNotVariedIsUnknown) {
  const SearchSpace space = spaceBetween(2, 0, 1);
  UncertaintyOutcome outcome = sampleOf(
      space, 200, [](std::span<const double> x) { return x[0]; }, 3);
  for (ParameterSet& set : outcome.sample) set[1] = 0.5;
  const AnalysisNames names{{"a", "b"}, {}, {"fit"}};
  const SampleSensitivity found = sampleSensitivity(outcome, space, names, 1);
  const SampleDependence& b = found.outputs[0].parameters[1];
  for (const double value : {b.firstOrder, b.lower, b.upper, b.rankCorrelation}) EXPECT_TRUE(std::isnan(value));
  EXPECT_GT(found.outputs[0].parameters[0].lower, 0.9);
  std::string text;
  for (const std::string& line : formatSampleSensitivity(found, names, "x.dat", false)) text += line + "\n";
  EXPECT_THAT(text, HasSubstr("   Not varied in this sample, which says nothing of them: b\n"));
  EXPECT_THAT(text, Not(HasSubstr("Less than")));
}

TEST(SampleSensitivity, SaysWhyAnOutputHasNoIndices) {
  const SearchSpace space = spaceBetween(1, 1, 2);
  const AnalysisNames names{{"a"}, {}, {"fit"}};
  const std::pair<OutputFunction, const char*> cases[] = {
      {[](std::span<const double> x) { return 1e200 * x[0]; }, "No first-order indices: the variance of its values is"},
      {[](std::span<const double> x) { return 1e-200 * x[0]; }, "they are as large as 1e150, or as small as 1e-150"},
      {[](std::span<const double>) { return 3.0; }, "No indices: all runs have the same value"}};
  for (const auto& [function, reason] : cases) {
    const SampleSensitivity found = sampleSensitivity(sampleOf(space, 200, function, 3), space, names, 1);
    EXPECT_TRUE(std::isnan(found.outputs[0].parameters[0].firstOrder));
    EXPECT_THAT(formatSampleSensitivity(found, names, "x.dat", false), Contains(HasSubstr(reason)));
  }
}

TEST(SampleSensitivity, RankCorrelationIsThatOfRanksWithTies) {
  const SearchSpace space = spaceBetween(1, 0, 10);
  UncertaintyOutcome outcome;
  const double pairs[][2] = {{1, 5}, {2, 6}, {2, 7}, {4, 8}, {5, 7}, {9, kFailedRunValue}};
  for (const auto& [x, y] : pairs) {
    outcome.sample.push_back({x});
    EvaluationResult& result = outcome.results.emplace_back();
    result.objectiveValues = {y};
    result.measureValues = {y == 6 ? NAN : 1.0};
    if (y == kFailedRunValue) result.failure.emplace();
  }
  const SampleSensitivity found = sampleSensitivity(outcome, space, {{"a"}, {"m"}, {"fit"}}, 1);
  // Ranks 1, 2.5, 2.5, 4, 5 and 1, 2, 3.5, 5, 3.5: 7.25 / 9.5.
  EXPECT_NEAR(found.outputs[1].parameters[0].rankCorrelation, 7.25 / 9.5, 1e-14);
  EXPECT_TRUE(std::isnan(found.outputs[1].parameters[0].firstOrder)) << "five runs are too few";
  EXPECT_EQ(found.outputs[0].count, 4U);
  EXPECT_TRUE(std::isnan(found.outputs[0].parameters[0].rankCorrelation)) << "a constant";
  EXPECT_THAT(formatSampleSensitivity(found, {{"a"}, {"m"}, {"fit"}}, "x.dat", true),
              ElementsAre("", HasSubstr("Rank corr."), HasSubstr("0.763158"),
                          "   5 runs with a value are too few for first-order indices, at least 100",
                          "   Rank correlations within 0.98 of 0 may be chance",
                          "   The parameters are correlated: an index has what the parameter shares with others, and "
                          "their sum means nothing",
                          "   All outputs and parameters are in x.dat"));
}

TEST(SampleSensitivity, SaysWhatIsNegligibleAndWhenTheSampleIsSmall) {
  const SearchSpace space = spaceBetween(3, 0, 1);
  const auto lines = [&](int count) {
    const SampleSensitivity found =
        sampleSensitivity(sampleOf(space, count, ishigami().value, 3), space, kNamesOfSample, 3);
    return formatSampleSensitivity(found, kNamesOfSample, "x.dat", false);
  };
  EXPECT_THAT(lines(5000), AllOf(Contains(HasSubstr("Less than 0.05 of the variance each, by themselves: c; ")),
                                 Not(Contains(HasSubstr("The sample is small")))));
  EXPECT_THAT(lines(120), Contains(HasSubstr("The sample is small for this: limits are up to ")));
}

}  // namespace
}  // namespace mirevo
