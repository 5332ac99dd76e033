#include "measures/objective_functions.h"

#include <cmath>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "matchers.h"
#include "measures/statistics.h"
#include "refusal.h"

namespace mirevo {
namespace {

ObjectiveFunction function(std::string name, FunctionType type, std::vector<MeasureTerm> measures) {
  return {.name = std::move(name), .functionType = type, .measures = std::move(measures)};
}

TEST(ObjectiveFunctions, CombineTheirMeasuresByType) {
  // 1 - NSE, times the weight.
  const OutputMeasure nse{.statisticType = findStatistic("NSE").value(), .weight = 4.0};
  const std::vector<ObjectiveFunction> functions{function("sum", FunctionType::sum, {0, 1}),
                                                 function("abs", FunctionType::sumOfAbsolutes, {0, 1}),
                                                 function("sq", FunctionType::sumOfSquares, {0, 1}),
                                                 function("none", FunctionType::sumOfSquares, {}),
                                                 function("unknown", static_cast<FunctionType>(3), {0, 1}),
                                                 function("twice", FunctionType::sum, {2, 2}),
                                                 function("criterion", FunctionType::sum, {{0, nse}, {2, nse}})};
  const std::vector<double> measures{-1.0, 2.0, 0.5};
  EXPECT_THAT(objectiveFunctionValues(functions, measures), ElementsAre(1.0, 3.0, 5.0, 0.0, 0.0, 1.0, 10.0));
}

TEST(ObjectiveFunctions, AggregateByMethod) {
  const double phiOfOne = 0.8413447460685429;  // standard normal distribution at 1, as tabulated
  const std::tuple<std::vector<double>, std::vector<double>, std::vector<double>, std::vector<double>,
                   AggregationMethod, double>
      cases[] = {
          {{2, 3}, {1, 0.5}, {}, {}, AggregationMethod::none, 3.5},
          {{4}, {1}, {2}, {1}, AggregationMethod::commonDistance, 3.0},
          {{4, 6}, {1, 2}, {2, 3}, {1, -1}, AggregationMethod::commonDistance, 5.0},
          {{7, 7}, {3, 1}, {2, 5}, {7, 7}, AggregationMethod::commonProbability, 2.0},
          {{5}, {2}, {4}, {1}, AggregationMethod::commonProbability, 2 * phiOfOne},
          {{-3}, {1}, {4}, {1}, AggregationMethod::commonProbability, 1 - phiOfOne},
          {{7, 7}, {3, 1}, {2, 5}, {7, 7}, AggregationMethod::zero, 0.0},
          {{7}, {3}, {2}, {7}, static_cast<AggregationMethod>(9), 0.0},
          {{}, {}, {}, {}, AggregationMethod::none, 0.0},
          {{}, {}, {}, {}, AggregationMethod::commonProbability, 0.0},
          {{3}, {1}, {0}, {1}, AggregationMethod::commonDistance, INFINITY},  // a zero σ is not guarded here
      };
  for (const auto& [values, weights, sigma, mu, method, expected] : cases) {
    const double aggregate = aggregateObjective(values, weights, sigma, mu, method);
    if (std::isinf(expected)) {
      EXPECT_EQ(aggregate, expected);
    } else {
      EXPECT_NEAR(aggregate, expected, 1e-15);
    }
  }
}

TEST(ObjectiveAggregator, TakesWhatTheSetupLeavesOpenFromTheSample) {
  // Standard deviations 1 and 10, means 2 and 30, best values 1 and 20.
  const std::vector<std::vector<double>> sample{{1, 40}, {2, 30}, {3, 20}};
  std::vector<ObjectiveFunction> functions{function("Q", FunctionType::sum, {0}),
                                           function("H", FunctionType::sum, {1})};
  functions[1].weight = 0.5;

  ObjectiveAggregator probability(functions, AggregationMethod::commonProbability);
  EXPECT_FALSE(probability.isSettled());
  EXPECT_TRUE(std::isnan(probability.aggregate(sample[0])));
  probability.fit(sample);
  EXPECT_TRUE(probability.isSettled());
  EXPECT_THAT(probability.sigma(), ElementsAre(DoubleNear(1, 1e-14), DoubleNear(10, 1e-13)));
  EXPECT_THAT(probability.mu(), ElementsAre(DoubleNear(2, 1e-14), DoubleNear(30, 1e-13)));
  EXPECT_NEAR(probability.aggregate(sample[1]), 0.75, 1e-14);
  EXPECT_EQ(probability.scaleLines().at(0), "Scale of Q: Standard deviation = 1, Mean = 2");

  // best/σ are 1 and 2: the offset of Q is 1, so that both best values lie at 2.
  ObjectiveAggregator distance(functions, AggregationMethod::commonDistance);
  distance.fit(sample);
  EXPECT_THAT(distance.mu(), ElementsAre(DoubleNear(1, 1e-14), DoubleNear(0, 1e-14)));
  EXPECT_NEAR(distance.aggregate(std::vector<double>{1, 20}), 2 + 0.5 * 2, 1e-13);
  EXPECT_EQ(distance.scaleLines().at(1), "Scale of H: Standard deviation = 10, Location parameter = 0");

  // What the setup gives stays, also against the sample.
  functions[0].standardDeviation = 4.0;
  functions[0].location = -7.0;
  ObjectiveAggregator given(functions, AggregationMethod::commonDistance);
  given.fit(sample);
  EXPECT_EQ(given.sigma()[0], 4.0);
  EXPECT_EQ(given.mu()[0], -7.0);

  for (const AggregationMethod method : {AggregationMethod::none, AggregationMethod::zero}) {
    EXPECT_TRUE(ObjectiveAggregator(functions, method).isSettled());
    EXPECT_TRUE(ObjectiveAggregator(functions, method).scaleLines().empty());
  }
}

TEST(ObjectiveAggregator, RefusesAnObjectiveFunctionWithoutSpreadByName) {
  std::vector<ObjectiveFunction> functions{function("Q", FunctionType::sum, {0}),
                                           function("low flow", FunctionType::sum, {1})};
  // 0.1 three times has a mean that is not 0.1 in 64 bits; it is constant nonetheless.
  const std::vector<std::vector<double>> sample{{1, 0.1}, {2, 0.1}, {3, 0.1}};
  ObjectiveAggregator aggregator(functions, AggregationMethod::commonProbability);
  EXPECT_THAT(refusalOf([&] { aggregator.fit(sample); }),
              AllOf(StartsWith("Error: Objective function \"low flow\" has no spread over the initial sample\n"),
                    HasSubstr("gave 0.1,"), HasSubstr("Standard_Deviation")));
  functions[1].standardDeviation = 1.0;
  ObjectiveAggregator withScale(functions, AggregationMethod::commonProbability);
  EXPECT_NO_THROW(withScale.fit(sample));
  ObjectiveAggregator tooFew(functions, AggregationMethod::commonDistance);
  EXPECT_THROW(tooFew.fit(std::span(sample).first(1)), FatalError);
}

}  // namespace
}  // namespace mirevo
