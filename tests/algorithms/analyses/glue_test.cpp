#include "algorithms/analyses/glue.h"

#include <cmath>
#include <numeric>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/analyses/series_band.h"
#include "algorithms/function_evaluator.h"
#include "matchers.h"

namespace mirevo {
namespace {

OutputMeasure measureOf(std::string_view statistic, const std::string& name = "flow") {
  OutputMeasure measure;
  measure.name = name;
  measure.statisticType = findStatistic(statistic).value();
  return measure;
}

/// A sample of one parameter, 10 times its number, whose measure and objective function have these values; NaN: failed.
EvaluatedSample sampleOf(const std::vector<double>& values) {
  EvaluatedSample sample;
  for (const double value : values) {
    EvaluationResult result = std::isnan(value) ? failedResult() : resultOf(value);
    result.number = static_cast<int>(sample.size()) + 1;
    sample.add(std::vector<double>{10.0 * result.number}, result);
  }
  return sample;
}

constexpr double kFailed = std::numeric_limits<double>::quiet_NaN();

GlueJudge judgeOf(const OutputMeasure& measure, const GlueSettings& settings = {.share = 1.0}) {
  SettingRefusal refusal;
  return glueJudge(settings, std::span(&measure, 1), {}, refusal).value();
}

std::vector<int> behaviouralNumbers(const EvaluatedSample& sample, const GlueWeights& weights) {
  std::vector<int> numbers;
  for (const std::size_t i : weights.behavioural) numbers.push_back(sample.numbers[i]);
  return numbers;
}

TEST(GlueBehavioural, IsWhatIsAtLeastAsGoodAsTheThresholdWhicheverWayIsGood) {
  const EvaluatedSample sample = sampleOf({0.9, -0.2, kFailed, 0.5, 0.2, -0.6, 0.5});
  const struct {
    std::string_view statistic;
    double threshold;
    std::vector<int> behavioural;
    int best;
  } cases[] = {
      {"NSE", 0.5, {1, 4, 7}, 1},                     // large is good
      {"NSE", -1.0, {1, 2, 4, 5, 6, 7}, 1},           // all but the failed one
      {"root mean square", 0.5, {2, 4, 5, 6, 7}, 6},  // small is good
      {"mean", 0.5, {2, 4, 5, 7}, 2},                 // 0 is best, on both sides
      {"percent bias", 0.2, {2, 5}, 2},
  };
  for (const auto& one : cases) {
    GlueSettings settings{.threshold = one.threshold, .likelihood = LikelihoodShape::equal};
    SettingRefusal refusal;
    const OutputMeasure measure = measureOf(one.statistic);
    const auto judge = glueJudge({.share = 1.0}, std::span(&measure, 1), {}, refusal);
    ASSERT_TRUE(judge);
    const GlueWeights weights = glueWeights(sample, *judge, settings);
    EXPECT_EQ(behaviouralNumbers(sample, weights), one.behavioural) << one.statistic << " " << one.threshold;
    EXPECT_EQ(sample.numbers[*weights.best], one.best) << one.statistic;
    EXPECT_EQ(weights.failedCount, 1U);
    for (const double weight : weights.weights) {
      EXPECT_DOUBLE_EQ(weight, 1.0 / static_cast<double>(one.behavioural.size()));
    }
  }
}

TEST(GlueBehavioural, AShareIsThatOfTheBestThatSucceededWithTheirEquals) {
  const EvaluatedSample sample = sampleOf({0.1, 0.7, kFailed, 0.7, 0.3, 0.9});
  const OutputMeasure measure = measureOf("NSE");
  const std::pair<double, std::vector<int>> cases[] = {{0.01, {6}},      {0.2, {6}},          {0.4, {2, 4, 6}},
                                                       {0.6, {2, 4, 6}}, {0.8, {2, 4, 5, 6}}, {1.0, {1, 2, 4, 5, 6}}};
  for (const auto& [share, numbers] : cases) {
    const GlueSettings settings{.share = share};
    EXPECT_EQ(behaviouralNumbers(sample, glueWeights(sample, judgeOf(measure), settings)), numbers) << share;
  }
}

TEST(GlueWeights, AreInProportionToTheLikelihoods) {
  const EvaluatedSample efficiencies = sampleOf({0.8, 0.6, 0.5, 0.2});
  const EvaluatedSample errors = sampleOf({1.0, 2.0, 4.0, 9.0});
  const struct {
    std::string_view statistic;
    GlueSettings settings;
    std::vector<double> likelihoods;  // of the behavioural ones
  } cases[] = {
      {"NSE", {.threshold = 0.5, .likelihood = LikelihoodShape::efficiency}, {0.8, 0.6, 0.5}},
      {"NSE", {.threshold = 0.5, .likelihood = LikelihoodShape::efficiency, .shapeFactor = 2.0}, {0.64, 0.36, 0.25}},
      // 1 - NSE is the error variance over the observed one.
      {"NSE", {.threshold = 0.5, .shapeFactor = 2.0}, {25.0, 6.25, 4.0}},
      {"root mean square", {.threshold = 4.0}, {1.0, 0.25, 0.0625}},
      {"sum of squared errors", {.threshold = 4.0}, {1.0, 0.5, 0.25}},
      {"NSE",
       {.threshold = 0.5, .likelihood = LikelihoodShape::exponential, .shapeFactor = 3.0},
       {std::exp(-0.6), std::exp(-1.2), std::exp(-1.5)}},
      {"root mean square",
       {.threshold = 4.0, .likelihood = LikelihoodShape::exponential},
       {std::exp(-1.0), std::exp(-4.0), std::exp(-16.0)}},
      {"NSE", {.threshold = 0.4, .likelihood = LikelihoodShape::rescaled}, {0.4, 0.2, 0.1}},
      {"root mean square", {.threshold = 5.0, .likelihood = LikelihoodShape::rescaled}, {4.0, 3.0, 1.0}},
      // Up to the best one that is not behavioural.
      {"root mean square", {.share = 0.75, .likelihood = LikelihoodShape::rescaled}, {8.0, 7.0, 5.0}},
  };
  for (const auto& one : cases) {
    const bool isEfficiency = one.statistic == "NSE";
    const OutputMeasure measure = measureOf(one.statistic);
    const GlueWeights weights = glueWeights(isEfficiency ? efficiencies : errors, judgeOf(measure), one.settings);
    ASSERT_EQ(weights.weights.size(), one.likelihoods.size()) << one.statistic;
    const double sum = std::accumulate(one.likelihoods.begin(), one.likelihoods.end(), 0.0);
    for (std::size_t i = 0; i < one.likelihoods.size(); ++i) {
      EXPECT_NEAR(weights.weights[i], one.likelihoods[i] / sum, 1e-14)
          << one.statistic << " " << likelihoodText(one.settings) << " " << i;
    }
  }
}

TEST(GlueWeights, HoldForLikelihoodsThatNoNumberOfTheComputerHolds) {
  const OutputMeasure measure = measureOf("root mean square");
  const GlueWeights steep =
      glueWeights(sampleOf({1e-3, 1.001e-3, 2e-3}), judgeOf(measure), {.share = 1.0, .shapeFactor = 2000.0});
  const double ratio = std::pow(1.001, -4000.0);
  EXPECT_NEAR(steep.weights[0], 1.0 / (1.0 + ratio), 1e-12);
  EXPECT_NEAR(steep.weights[1], ratio / (1.0 + ratio), 1e-12);
  EXPECT_EQ(steep.weights[2], 0.0);
  EXPECT_EQ(steep.unweightedCount, 1U);
  // A perfect set has an infinite likelihood.
  const GlueWeights perfect = glueWeights(sampleOf({0.0, 1.0, 0.0}), judgeOf(measure), {.share = 1.0});
  EXPECT_EQ(perfect.weights, (std::vector<double>{0.5, 0.0, 0.5}));
}

TEST(GlueWeights, SayWhyThereAreNone) {
  const OutputMeasure efficiency = measureOf("NSE");
  const GlueJudge judge = judgeOf(efficiency);
  const auto warningsOf = [&](const EvaluatedSample& sample, const GlueSettings& settings) {
    return glueWarnings(sample, glueWeights(sample, judge, settings), judge, settings);
  };
  EXPECT_THAT(warningsOf(sampleOf({0.3, 0.71, kFailed}), {.threshold = 0.9}),
              ElementsAre(AllOf(StartsWith("No set is behavioural: none of 2 evaluations has output measure flow "
                                           "(Nash-Sutcliffe efficiency; large is good, best 1) of 0.9 or more; the "
                                           "best is No. 2 with 0.71. The results are kept. A run with Restart = 1 "),
                                HasSubstr("runs no model"))));
  EXPECT_THAT(warningsOf(sampleOf({kFailed, kFailed}), {.threshold = 0.9}),
              ElementsAre("No set is behavioural, as no evaluation has succeeded"));
  EXPECT_THAT(warningsOf(sampleOf({-0.3, -0.1}), {.threshold = -1.0, .likelihood = LikelihoodShape::efficiency}),
              ElementsAre(StartsWith("The likelihood of all 2 behavioural sets is 0")));
  EXPECT_THAT(warningsOf(sampleOf({0.3, 0.5}), {.threshold = 0.1}),
              ElementsAre(StartsWith("Only 2 behavioural sets: "), StartsWith("Every evaluation is behavioural: ")));
  EXPECT_THAT(warningsOf(sampleOf({-0.3, 0.1, 0.99}),
                         {.share = 1.0, .likelihood = LikelihoodShape::efficiency, .shapeFactor = 9.0}),
              ElementsAre(StartsWith("1 of 3 behavioural sets weighs nothing, as its"),
                          StartsWith("Only 2 behavioural sets have a weight: "),
                          StartsWith("The weights of 2 behavioural sets tell as much as 1.0 sets")));
  const OutputMeasure error = measureOf("root mean square");
  const GlueSettings all{.share = 1.0};
  const EvaluatedSample perfect = sampleOf({0.0, 1.0, 0.0});
  EXPECT_THAT(glueWarnings(perfect, glueWeights(perfect, judgeOf(error), all), judgeOf(error), all),
              Contains("1 of 3 behavioural sets weighs nothing, as its likelihood is finite, and that of sets without "
                       "any error is not"));
  std::vector<double> many(300, 0.5);
  many[7] = 0.9999;
  EXPECT_THAT(warningsOf(sampleOf(many), {.share = 1.0, .shapeFactor = 2.0}),
              ElementsAre(StartsWith("The weights of 300 behavioural sets tell as much as 1.0 sets")));
  EXPECT_THAT(warningsOf(sampleOf(std::vector<double>(300, 0.5)), {.share = 1.0}), IsEmpty());
}

TEST(GlueJudge, IsTheMeasureOfTheNameOrElseTheObjectiveFunctionAndRefusesWhatCannotBeMeant) {
  const std::vector<OutputMeasure> measures{measureOf("NSE", "flow"), measureOf("root mean square", "level")};
  std::vector<ObjectiveFunction> objectives(2);
  objectives[0].name = "fit";
  objectives[1].name = "flow";
  SettingRefusal refusal;
  const auto found = [&](const GlueSettings& settings) { return glueJudge(settings, measures, objectives, refusal); };
  EXPECT_EQ(found({.share = 0.1})->description, "objective function fit (small is good)");
  EXPECT_FALSE(found({.judgedBy = "FLOW", .share = 0.1})->isObjective);
  EXPECT_EQ(found({.judgedBy = "level", .threshold = 2.0})->index, 1U);
  EXPECT_TRUE(found({.judgedBy = "fit", .threshold = -1.0})) << "any value may be one of an objective function";
  const std::vector<OutputMeasure> alike{measureOf("NSE", "q"), measureOf("NSE", "Q"), measureOf("NSE", "Level")};
  objectives[0].name = "LEVEL";
  const auto among = [&](const char* name) {
    return glueJudge({.judgedBy = name, .share = 0.1}, alike, objectives, refusal);
  };
  EXPECT_EQ(among("Q")->index, 1U);
  EXPECT_EQ(among("q")->index, 0U);
  EXPECT_TRUE(among("LEVEL")->isObjective) << "exactly this name before a measure's in another case";
  EXPECT_FALSE(among("level")->isObjective);
  const std::vector<OutputMeasure> three{measureOf("NSE", "qQ"), measureOf("NSE", "Qq")};
  EXPECT_FALSE(glueJudge({.judgedBy = "qq", .share = 0.1}, three, objectives, refusal));
  EXPECT_THAT(refusal.explanation, StartsWith("\"qq\" may be each of \"qQ\", \"Qq\", which differ by case alone"));
  objectives[0].name = "fit";
  const std::pair<GlueSettings, const char*> refused[] = {
      {{.judgedBy = "flw", .share = 0.1},
       "expected the name of an output measure or an objective function, \"flow\", \"level\", \"fit\", \"flow\", found "
       "\"flw\""},
      {{.judgedBy = "flow", .threshold = 1.5}, "no set can be that good: expected 1 or less, "},
      {{.judgedBy = "level", .threshold = -0.5}, "no set can be that good: expected 0 or more, "},
      {{.judgedBy = "level", .share = 0.1, .likelihood = LikelihoodShape::efficiency},
       "'efficiency' is for statistics whose best value is 1, found output measure level (root mean square; "},
  };
  for (const auto& [settings, text] : refused) {
    EXPECT_FALSE(found(settings)) << text;
    EXPECT_THAT(refusal.explanation, StartsWith(text));
  }
}

TEST(GlueSummary, ComparesTheBehaviouralWithTheDrawnParameters) {
  // NSE falls from 1 with the distance of the parameter from 500, of 1,000 values from 1 to 1,000.
  EvaluatedSample sample;
  for (int i = 1; i <= 1000; ++i) {
    EvaluationResult result = resultOf(1.0 - std::abs(i - 500) / 1000.0);
    result.number = i;
    const double other = (i * 7919) % 1000;  // has nothing to do with it
    sample.add(std::vector<double>{static_cast<double>(i), other}, result);
  }
  const GlueSettings settings{.threshold = 0.8, .likelihood = LikelihoodShape::equal};
  const OutputMeasure measure = measureOf("NSE");
  const GlueWeights weights = glueWeights(sample, judgeOf(measure), settings);
  ASSERT_EQ(weights.behavioural.size(), 401U);
  EXPECT_NEAR(weights.effective, 401.0, 1e-9);
  const GlueSummary summary = summariseGlue(sample, weights, 10);
  EXPECT_NEAR(summary.parameters[0].behavioural.mean, 500.0, 1e-9);
  EXPECT_EQ(summary.parameters[0].behavioural.quantiles[0], 320.0);
  EXPECT_EQ(summary.parameters[0].drawn.quantiles[0], 50.0);
  EXPECT_NEAR(summary.parameters[0].distance, 0.3, 0.002) << "of 300 to 700 among 1 to 1,000";
  EXPECT_LT(summary.parameters[1].distance, summary.distanceLimit);
  EXPECT_NEAR(summary.distanceLimit, 1.358 * std::sqrt(1.0 / 401.0 + 1.0 / 1000.0), 1e-12);
  EXPECT_LT(std::abs(summary.correlations[0][1]), 0.1);
  const GlueSummary large = summariseGlue(sample, weights, 1);  // too many parameters for a matrix
  EXPECT_TRUE(large.correlations.empty());
  ASSERT_EQ(large.largestCorrelations.size(), 1U);
  EXPECT_NEAR(large.largestCorrelations[0].value, summary.correlations[0][1], 1e-12);
  const AnalysisNames names{{"Weight", "Weight (2)"}, {"m"}, {"o"}, {}};
  const auto tables = glueTables(sample, weights, large, judgeOf(measure), settings, names);
  EXPECT_EQ(tables.back().columns,
            (std::vector<std::string>{"Evaluation", "Value", "Behavioural", "Weight", "Weight (2)", "Weight (2) (2)"}));
  EXPECT_EQ(tables[1].columns, (std::vector<std::string>{"First", "Second", "Correlation"}));
}

TEST(WeightedBand, IsOfTheWeightedQuantilesAndTellsItsWidth) {
  // Three runs of four times; the last time has a value of the first run alone.
  const double nan = std::nan("");
  const std::vector<std::vector<double>> columns{{1.0, 2.0, 3.0}, {3.0, 1.0, 2.0}, {5.0, 5.0, 5.0}, {4.0, nan, nan}};
  const auto read = [&](std::size_t first, std::size_t count) {
    std::vector<double> values;
    for (std::size_t t = first; t < first + count; ++t)
      values.insert(values.end(), columns[t].begin(), columns[t].end());
    return values;
  };
  const std::vector<double> observed{2.0, 2.5, nan, 6.0};
  const SeriesBand band = seriesBand(observed, 3, read, std::vector<double>{0.03, 0.03, 0.94});
  EXPECT_EQ(band.lower, (std::vector<double>{2.0, 2.0, 5.0, 4.0}));
  EXPECT_EQ(band.median, (std::vector<double>{3.0, 2.0, 5.0, 4.0}));
  EXPECT_EQ(band.upper, (std::vector<double>{3.0, 2.0, 5.0, 4.0}));
  EXPECT_EQ(band.runs, (std::vector<std::size_t>{3, 3, 3, 1}));
  EXPECT_DOUBLE_EQ(band.coverage.shareInside, 1.0 / 3.0) << "the first of the three observations";
  EXPECT_DOUBLE_EQ(band.coverage.meanWidth, 1.0 / 3.0);
  // The observations 2, 2.5 and 6: mean 3.5, variance 9.5 / 3.
  EXPECT_DOUBLE_EQ(band.coverage.relativeWidth, 1.0 / 3.0 / std::sqrt(9.5 / 3.0));
  // Without weights: type 7, between the values.
  EXPECT_DOUBLE_EQ(seriesBand(observed, 3, read).lower[0], 1.1);
}

}  // namespace
}  // namespace mirevo
