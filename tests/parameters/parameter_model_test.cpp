#include "parameters/parameter_model.h"

#include <algorithm>
#include <cmath>
#include <numeric>
#include <random>
#include <tuple>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "matchers.h"
#include "parameters/dependency_order.h"
#include "refusal.h"

namespace mirevo {
namespace {

ModelParameter variable(std::string name, double initial = 1, double lower = 0, double upper = 10) {
  return {.initialValue = initial, .lowerBound = lower, .upperBound = upper, .name = std::move(name)};
}

ModelParameter fixed(std::string name, double value) {
  return {.initialValue = value, .parameterType = ParameterType::fixed, .name = std::move(name)};
}

ModelParameter dependent(std::string name, std::string equation) {
  return {.parameterType = ParameterType::dependent, .name = std::move(name), .equation = std::move(equation)};
}

std::string refused(const std::vector<ModelParameter>& parameters,
                    const std::vector<InternalConstraint>& constraints = {}) {
  return refusalOf([&] { const ParameterModel model(parameters, constraints); });
}

TEST(ParameterModel, AssignsInThreePasses) {
  ModelParameter count = variable("n", 3, 1, 5);
  count.transformationType = TransformationType::integer;
  ParameterModel model({dependent("late", "early * 2 + F"), count, dependent("early", "n + [x 1]"), fixed("F", 100),
                        variable("x 1"), dependent("constant", "2 ^ 0.5")},
                       {});
  EXPECT_THAT(model.evaluationOrder(), ElementsAre(2, 4, 5, 3, 1, 6));
  for (const double x : {0.5, 7.25}) {
    const auto values = std::get<0>(model.MapToModelValues(std::vector<double>{4.9999, x}));
    EXPECT_THAT(values, ElementsAre((4 + x) * 2 + 100, 4, 4 + x, 100, x, std::sqrt(2.0)));
  }
}

TEST(ParameterModel, RefusesIllegalRelationships) {
  const auto v = variable("v");
  const auto mutual = [](int first, int second) {
    return fmt::format(
        "Illegal relationship between dependent parameters {} and {} in the Model Parameters list. Two dependent "
        "parameters cannot depend mutually on each other !!\n",
        first, second);
  };
  EXPECT_THAT(refused({v, fixed("f", 1), dependent("a", "1 + b"), fixed("g", 1), dependent("b", "a * v")}),
              AllOf(StartsWith(mutual(3, 5)), HasSubstr("\"a\" and \"b\"")));
  EXPECT_THAT(refused({v, dependent("a", "a + 1")}), StartsWith(mutual(2, 2)));
  EXPECT_EQ(refused({dependent("q", "a"), dependent("a", "b"), dependent("b", "c"), v, dependent("c", "a + v")}),
            "Illegal relationship between dependent parameters 2, 3 and 5 in the Model Parameters list. Dependent "
            "parameters cannot depend on each other in a ring !!\n\"a\" names \"b\" names \"c\" names \"a\"");
}

TEST(ParameterModel, NamesWhatItRefuses) {
  EXPECT_THAT(refused({}), StartsWith("Error: No model parameters defined"));
  EXPECT_EQ(refused({variable("Manning"), dependent("d", "2 * Maning")}),
            "Error: Unable to create the expression 2 * Maning in equation parser\n"
            "equation of the dependent parameter \"d\"\ncolumn 5: no parameter is called \"Maning\"\n    2 * Maning\n"
            "        ^\ndid you mean \"Manning\"?");
  EXPECT_THAT(refused({variable("a")}, {{"a", "1", {}}, {"a", "b +", {}}}),
              AllOf(StartsWith("Error: Invalid equation for internal constraints\n"),
                    HasSubstr("right equation of constraint 2\nError: Unable to create the expression b + "
                              "in equation parser\ncolumn 1: no parameter is called \"b\"")));
}

using Named = std::vector<std::vector<std::size_t>>;  // by each parameter, from 0

/// By one swap and one scan after the other.
std::vector<int> orderStepByStep(const Named& named) {
  std::vector<int> order;
  for (std::size_t i = 0; i < named.size(); ++i) order.push_back(static_cast<int>(i) + 1);
  const auto namesLater = [&](std::size_t p) {
    const std::vector<std::size_t>& list = named[static_cast<std::size_t>(order[p]) - 1];
    return std::any_of(order.begin() + static_cast<std::ptrdiff_t>(p) + 1, order.end(), [&](int number) {
      return std::find(list.begin(), list.end(), static_cast<std::size_t>(number) - 1) != list.end();
    });
  };
  for (std::size_t p = 0; p < order.size();) {
    const bool isMoved = namesLater(p);
    for (std::size_t q = p; namesLater(q); ++q) std::swap(order[q], order[q + 1]);
    p = isMoved ? 0 : p + 1;
  }
  return order;
}

/// Not the order that puts the first free parameter first.
TEST(ParameterModel, OrdersAsStepByStep) {
  const auto order = [](const Named& named) {
    std::vector<ModelParameter> parameters;
    for (const auto& list : named) parameters.push_back(list.empty() ? variable("v") : dependent("d", "v"));
    return OrderDependentParameters(parameters, named);
  };
  EXPECT_EQ(order({{4}, {4, 5}, {}, {1}, {5}, {2}, {0, 3}}), (std::vector<int>{3, 6, 5, 1, 2, 4, 7}));
  std::mt19937 random(1);
  for (std::size_t round = 0; round < 400; ++round) {
    std::vector<std::size_t> rank(round < 396 ? 2 + random() % 12 : 90);  // each names those of a lower rank
    std::iota(rank.begin(), rank.end(), std::size_t{0});
    if (round % 2 == 0) std::shuffle(rank.begin(), rank.end(), random);
    if (round % 2 == 1) std::reverse(rank.begin(), rank.end());
    const std::size_t sparse = 1 + random() % rank.size();
    Named named(rank.size());
    for (std::size_t i = 0; i < named.size(); ++i) {
      for (std::size_t j = 0; j < named.size(); ++j) {
        if (rank[j] < rank[i] && (random() % sparse == 0 || rank[j] + 1 == rank[i])) named[i].push_back(j);
      }
    }
    EXPECT_EQ(order(named), orderStepByStep(named)) << ::testing::PrintToString(named);
  }
}

TEST(CheckConstraint, FollowsItsTable) {
  //                              operator: 0      1      2      3      4      -1
  const std::tuple<double, double, std::vector<bool>> cases[] = {{1, 2, {false, false, true, true, false, false}},
                                                                 {2, 2, {true, false, true, false, false, false}},
                                                                 {3, 2, {true, true, false, false, false, false}}};
  for (const auto& [left, right, violated] : cases) {
    for (int i = 0; i < 6; ++i) {
      const auto logicalOperator = static_cast<LogicalOperator>(i == 5 ? -1 : i);
      EXPECT_EQ(CheckConstraint(left, right, logicalOperator), violated.at(i)) << left << " operator " << i;
    }
  }
}

TEST(ParameterModel, SaysWhyASetIsNotRun) {
  using Kind = ParameterFailure::Kind;
  using enum LogicalOperator;
  ParameterModel model({variable("a"), variable("b"), dependent("d", "ln(a)")},
                       {{"a + b", "10", less},
                        {"sqrt(b - 1)", "5", lessOrEqual},
                        {"1 / (b - 2)", "1e300", lessOrEqual},
                        {"a", "a", static_cast<LogicalOperator>(7)}});
  const std::tuple<double, double, Kind, const char*> cases[] = {
      {4, 6, Kind::constraintViolated, "constraint 1 (a + b < 10): left side 10, right side 10"},
      {-1, 3, Kind::equationNotFinite, "the equation of parameter \"d\" gives NaN: ln(a)"},
      {0, 3, Kind::equationNotFinite, "the equation of parameter \"d\" gives -Inf: ln(a)"},
      {1, 0.5, Kind::equationNotFinite, "constraint 2 (sqrt(b - 1) <= 5): left side NaN, right side 5"},
      {1, 2, Kind::constraintViolated, "constraint 3 (1 / (b - 2) <= 1e300): left side Inf, right side 1e+300"},
  };
  for (const auto& [a, b, kind, detail] : cases) {
    const auto result = model.MapToModelValues(std::vector<double>{a, b});
    ASSERT_EQ(result.index(), 1) << detail;
    EXPECT_EQ(std::get<1>(result).kind, kind) << detail;
    EXPECT_EQ(std::get<1>(result).detail, detail);
    EXPECT_EQ(model.feasibility().violation(std::vector<double>{a, b}), detail);
  }
  EXPECT_EQ(model.MapToModelValues(std::vector<double>{1, 3}).index(), 0);
  EXPECT_TRUE(model.feasibility().holds(std::vector<double>{1, 3}));
  EXPECT_FALSE(ParameterModel({variable("a")}, {}).feasibility().isTested()) << "nothing can be wrong with its sets";
  // Equations alone are tested, too.
  ParameterModel ofEquations({variable("a"), dependent("d", "ln(a)")}, {});
  EXPECT_EQ(ofEquations.feasibility().violation(std::vector<double>{-1}),
            "the equation of parameter \"d\" gives NaN: ln(a)");
  EXPECT_TRUE(ofEquations.feasibility().holds(std::vector<double>{1}));
  EXPECT_EQ(ofEquations.feasibility().noSetMessage(),
            "Error: No parameter set found for which all equations have a finite value");
}

}  // namespace
}  // namespace mirevo
