#include "measures/weighted_residuals.h"

#include <cmath>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "measures/statistics.h"

namespace mirevo {
namespace {

constexpr double kNoValue = std::numeric_limits<double>::quiet_NaN();

struct ResidualCase {
  const char* statistic;
  FunctionType function;
  double weight;     ///< of the measure
  double objective;  ///< of the objective function
  double sum;        ///< of the squared residuals
};

OutputMeasure residualMeasure(const char* statistic, double weight) {
  OutputMeasure measure;
  measure.statisticType = *findStatistic(statistic);
  measure.weight = measure.weightAbove = weight;
  return measure;
}

/// Observed 1, 2, 6, of which the last one weighs half and the second is missing in the run; simulated 2, -, 4.
/// Differences 1 and -2, weighted 1 and -1; mean of the two observed values by squared weights (1 + 6/4) / 1.25 = 2, so
/// that their squares about it are 1 + 16/4 = 5.
TEST(WeightedResiduals, TheirSumOfSquaresIsTheAggregateOrTheSquareOfARoot) {
  const ObservedSeries observed{.days = {0, 1, 2}, .values = {1, 2, 6}, .weights = {1, 1, 0.5}};
  const std::vector<double> simulated{2, kNoValue, 4, 0.1, kNoValue, 0.1};
  const ResidualCase cases[] = {
      {"root mean square", FunctionType::sum, 3.0, 2.0, 4.0 * 9.0 * 2.0 / 2.0},
      {"root mean square", FunctionType::sumOfSquares, 3.0, 2.0, 2.0 * 9.0 * 2.0 / 2.0},
      {"sum of squared errors", FunctionType::sum, 3.0, 2.0, 2.0 * 3.0 * 2.0},
      {"NSE", FunctionType::sum, 3.0, 2.0, 2.0 * 3.0 * 2.0 / 5.0},
      {"RSR", FunctionType::sum, 3.0, 2.0, 4.0 * 9.0 * 2.0 / 5.0},
      {"KGE", FunctionType::sum, 3.0, 2.0, 2.0 * 3.0 * 2.0 / 5.0}};  // with the weights of an NSE
  for (const ResidualCase& each : cases) {
    const OutputMeasure measure = residualMeasure(each.statistic, each.weight);
    ObjectiveFunction objective{.functionType = each.function, .weight = each.objective};
    objective.measures.emplace_back(0, measure);
    WeightedResiduals residuals({&measure, 1}, {&objective, 1}, AggregationMethod::none, {&observed, 1});
    const ResidualRows rows = residuals.of(simulated, {});
    ASSERT_EQ(rows.values.size(), 2U) << each.statistic;
    EXPECT_GT(rows.values[0], 0.0);
    EXPECT_LT(rows.values[1], 0.0);
    EXPECT_NEAR(rows.values[0] * rows.values[0] + rows.values[1] * rows.values[1], each.sum, 1e-12) << each.statistic;
    EXPECT_NEAR(rows.units[0], 0.1 * rows.values[0], 1e-12);
    EXPECT_EQ(residuals.otherMeasures().size(), std::string(each.statistic) == "KGE" ? 1U : 0U);
    EXPECT_EQ(residuals.labels().size(), 2U);
    // A later run is judged by the observations of the first one.
    const ResidualRows later = residuals.of(std::vector<double>{kNoValue, 7, 4, kNoValue, 0.1, 0.1}, {});
    EXPECT_TRUE(std::isnan(later.values[0]));
    EXPECT_EQ(later.values[1], rows.values[1]);
  }
}

TEST(WeightedResiduals, TransformedWeightedOnOneSideAndScaled) {
  const ObservedSeries observed{.days = {0, 1}, .values = {1, 4}};
  OutputMeasure measure = residualMeasure("root mean square", 1.0);
  measure.transformation = ValueTransformation::squareRoot;
  measure.weightAbove = 5.0;
  ObjectiveFunction objective{.measures = {0}, .standardDeviation = 2.0};
  WeightedResiduals residuals({&measure, 1}, {&objective, 1}, AggregationMethod::commonDistance, {&observed, 1});
  const ResidualRows rows = residuals.of(std::vector<double>{9, 1, 0, 0}, {});
  EXPECT_NEAR(rows.values[0], 5.0 * 2.0 / 2.0 / std::sqrt(2.0), 1e-12);
  EXPECT_NEAR(rows.values[1], -1.0 / 2.0 / std::sqrt(2.0), 1e-12);
}

TEST(WeightedResiduals, RefusesWhatHasNoSquares) {
  OutputMeasure measure = residualMeasure("NSE", -1.0);
  ObjectiveFunction objective;
  const auto problem = [&] {
    objective.measures.assign(1, MeasureTerm(0, measure));
    return WeightedResiduals::problemOf({&measure, 1}, {&objective, 1}).value_or("");
  };
  EXPECT_THAT(problem(), ::testing::HasSubstr("has the weight -1: expected one that is not negative"));
  measure.weight = 1.0;
  EXPECT_EQ(problem(), "");
  objective.weight = 0.0;
  EXPECT_EQ(problem(), "no output measure enters an objective function with a weight");
  objective.weight = 1.0;
  measure.interfaceType = InterfaceType::measureFile;
  EXPECT_THAT(problem(), ::testing::HasSubstr("without Observed_Value"));
  measure.observedValue = 3.0;
  EXPECT_EQ(problem(), "");
}

}  // namespace
}  // namespace mirevo
