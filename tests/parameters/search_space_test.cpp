#include "parameters/search_space.h"

#include <cmath>
#include <limits>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "refusal.h"

namespace mirevo {
namespace {

ModelParameter parameter(std::string name, double initial, double lower, double upper,
                         TransformationType transformation = TransformationType::none,
                         ParameterType type = ParameterType::variable) {
  return {initial, lower, upper, transformation, type, 0.0, std::move(name)};
}

TEST(TransformParameterValue, FollowsItsTable) {
  constexpr auto kForward = TransformDirection::forward;
  constexpr auto kBackward = TransformDirection::backward;
  constexpr auto kInteger = TransformationType::integer;
  constexpr auto kLog = TransformationType::logarithmic;
  const std::tuple<double, double, TransformationType, TransformDirection, double, bool> cases[] = {
      {0.1, 7, TransformationType::none, kForward, 0.1, false},
      {-5e-324, 7, TransformationType::none, kBackward, -5e-324, false},
      {5.9999, 1, kInteger, kBackward, 5, false},
      {2.999999995, 1, kInteger, kBackward, 3, false},
      {2.99999998, 1, kInteger, kBackward, 2, false},
      {3.7, 1, kInteger, kForward, 3, false},
      {3.7, 0.5, kInteger, kForward, 3.5, false},
      {-2.5, -4, kInteger, kForward, -3, false},
      {0.2, 1, kInteger, kForward, 1, false},  // below the bound: truncated towards it
      {std::exp(1.0), 1, kLog, kForward, 1, false},
      {0, 1, kLog, kForward, 0, true},
      {-1, 1, kLog, kForward, 0, true},
      {std::numeric_limits<double>::quiet_NaN(), 1, kLog, kForward, 0, true},
      {-1, 1, kLog, kBackward, std::exp(-1.0), false},
      {5, 1, static_cast<TransformationType>(3), kForward, 0, false},
  };
  for (const auto& [value, lower, type, direction, expected, fails] : cases) {
    bool failed = !fails;
    EXPECT_EQ(TransformParameterValue(value, lower, type, direction, failed), expected) << value;
    EXPECT_EQ(failed, fails) << value;
  }
}

TEST(BuildSearchSpace, TransformsTheVariableParametersInOrder) {
  const std::vector<ModelParameter> parameters{
      parameter("fixed", 99, 0, 1, TransformationType::logarithmic, ParameterType::fixed),
      parameter("count  ", 3.7, 1, 5.5, TransformationType::integer),
      parameter("dependent", 99, 0, 1, TransformationType::logarithmic, ParameterType::dependent),
      parameter("k", 1e-5, 1e-6, 1e-3, TransformationType::logarithmic), parameter("same", 2, 2, 2)};
  const SearchSpace space = BuildSearchSpace(parameters);
  EXPECT_EQ(space.names, (std::vector<std::string>{"count", "k", "same"}));
  EXPECT_EQ(space.initial, (std::vector<double>{3, std::log(1e-5), 2}));
  EXPECT_EQ(space.lower, (std::vector<double>{1, std::log(1e-6), 2}));
  EXPECT_EQ(space.upper, (std::vector<double>{6, std::log(1e-3), 2}));
  EXPECT_EQ(ToModelScale(space, std::vector<double>{5.9999, std::log(1e-4), -0.1}),
            (std::vector<double>{5, std::exp(std::log(1e-4)), -0.1}));
}

/// exp(ln(x)) differs from x by up to two units in the last place for these values.
TEST(ToModelScale, ALogarithmicParameterKeepsAGivenValue) {
  ModelParameter k = parameter("k", 10, 0.7, 1e7, TransformationType::logarithmic);
  k.givenValues = {5, 2000, -1};  // the last is refused elsewhere
  const SearchSpace space = BuildSearchSpace(std::vector<ModelParameter>{parameter("x", 10, 0, 20), k});
  for (const double value : {10.0, 1e7, 0.7, 5.0, 2000.0}) {
    EXPECT_EQ(ToModelScale(space, std::vector<double>{5, std::log(value)})[1], value);
  }
  const double between = std::nextafter(std::log(5.0), 0.0);
  EXPECT_EQ(ToModelScale(space, std::vector<double>{std::log(10.0), between}),
            (std::vector<double>{std::log(10.0), std::exp(between)}));
  EXPECT_TRUE(std::isnan(toModelScale(space, 1, std::numeric_limits<double>::quiet_NaN())));
}

TEST(BuildSearchSpace, RefusesInItsOrder) {
  constexpr auto kLog = TransformationType::logarithmic;
  const std::tuple<std::vector<ModelParameter>, const char*> cases[] = {
      {{parameter("f", 1, 0, 2, kLog, ParameterType::fixed)}, "Error: No variable model parameters defined"},
      {{parameter("low ", -1, 0, 2)}, "Error: Initial parameter value smaller than lower bound for parameter low"},
      {{parameter("high", 3, 0, 2)}, "Error: Initial parameter value larger than upper bound for parameter high"},
      {{parameter("swapped", 3, 4, 2)},
       "Error: Initial parameter value smaller than lower bound for parameter swapped"},
      {{parameter("zero", 1, 0, 2, kLog)}, "Error: Invalid parameter transformation for parameter zero"},
      {{parameter("both", -1, 0, 2, kLog)},
       "Error: Initial parameter value smaller than lower bound for parameter both"},
      {{parameter("first", 1, 0, 2, kLog), parameter("second", 3, 0, 2)},
       "Error: Invalid parameter transformation for parameter first"},
  };
  EXPECT_EQ(refusalMessageOf([] { BuildSearchSpace({}); }), "Error: No variable model parameters defined");
  for (const auto& [parameters, message] : cases) {
    EXPECT_EQ(refusalMessageOf([&, &set = parameters] { BuildSearchSpace(set); }), message);
  }
}

}  // namespace
}  // namespace mirevo
