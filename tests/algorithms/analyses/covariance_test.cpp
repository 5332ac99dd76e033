#include "algorithms/analyses/covariance.h"

#include <cmath>
#include <tuple>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/analyses/local_sensitivity.h"
#include "matchers.h"

namespace mirevo {
namespace {

SearchSpace spaceOf(const std::vector<double>& initial, TransformationType type = TransformationType::none) {
  const std::size_t n = initial.size();
  std::vector<std::string> names;
  for (std::size_t j = 1; j <= n; ++j) names.push_back(fmt::format("b{}", j));
  return {names, initial, std::vector(n, -1000.0), std::vector(n, 1000.0), std::vector(n, type)};
}

/// The straight line a + b x through x = 0..4: X'X = (5 10; 10 30), its inverse (0.6 -0.2; -0.2 0.1).
const LinearisedModel kLine{{0.1, -0.2, 0.3, -0.3, 0.1}, {}, {{1, 1, 1, 1, 1}, {0, 1, 2, 3, 4}}};

TEST(ParameterCovariance, MatchesTheStraightLineInClosedForm) {
  const double s2 = (0.01 + 0.04 + 0.09 + 0.09 + 0.01) / 3.0;
  const ParameterCovariance result = parameterCovariance(kLine);
  EXPECT_EQ(result.degreesOfFreedom, 3U);
  EXPECT_NEAR(result.errorVariance, s2, 1e-16);
  EXPECT_NEAR(result.covariance[0][0], 0.6 * s2, 1e-15);
  EXPECT_NEAR(result.covariance[1][0], -0.2 * s2, 1e-15);
  EXPECT_NEAR(result.covariance[1][1], 0.1 * s2, 1e-15);
  EXPECT_NEAR(result.correlation[0][1], -0.2 / std::sqrt(0.06), 1e-14);
  EXPECT_NEAR(result.tQuantile, 3.182446305284263, 1e-12);  // table of Student's t, 3 degrees of freedom

  // A weight of 2 is the same row twice but for the degrees of freedom; a weight of 0 and a missing residual are no row
  // but for those of the former.
  LinearisedModel weighted = kLine;
  weighted.weights = {2, 1, 1, 1, 1};
  LinearisedModel doubled{{0.1, 0.1, -0.2, 0.3, -0.3, 0.1, NAN}, {}, {{1, 1, 1, 1, 1, 1, 1}, {0, 0, 1, 2, 3, 4, 9}}};
  const ParameterCovariance a = parameterCovariance(weighted);
  const ParameterCovariance b = parameterCovariance(doubled);
  EXPECT_EQ(b.observationCount, 6U);
  EXPECT_NEAR(a.covariance[0][1] * 3.0, b.covariance[0][1] * 4.0, 1e-15);
}

TEST(ParameterCovariance, SurvivesExtremeUnitsOfAParameter) {
  const LinearisedModel line{
      {0.1, -0.2, 0.3, -0.3, 0.1}, {}, {{1e-200, 1e-200, 1e-200, 1e-200, 1e-200}, {0, 1e140, 2e140, 3e140, 4e140}}};
  const ParameterCovariance result = parameterCovariance(line);
  EXPECT_NEAR(result.standardDeviations[0] / 1e200, std::sqrt(0.6 * 0.08), 1e-14);
  EXPECT_NEAR(result.correlation[0][1], -0.2 / std::sqrt(0.06), 1e-14);
}

TEST(ParameterCovariance, LeavesOutWhatHasNoVarianceByName) {
  // Columns: constant, zero, unknown, line, constant + 2 line.
  const LinearisedModel model{
      {0.1, -0.2, 0.3, -0.3, 0.1},
      {},
      {{1, 1, 1, 1, 1}, {0, 0, 0, 0, 0}, {NAN, NAN, NAN, NAN, NAN}, {0, 1, 2, 3, 4}, {1, 3, 5, 7, 9}}};
  const ParameterCovariance result = parameterCovariance(model);
  EXPECT_THAT(result.kept, ElementsAre(0, 3));
  EXPECT_NEAR(result.covariance[1][1], 0.1 * 0.08, 1e-15);
  const SearchSpace space = spaceOf({1, 2, 3, 4, 5});
  EXPECT_THAT(formatCovariance(result, space, space.initial),
              ::testing::IsSupersetOf<std::string>(
                  {"Parameter covariance: 5 observations, 2 parameters, 3 degrees of freedom",
                   "Warning: Parameter b2 is left out of the covariance matrix: no simulated value changes with its "
                   "step; if it has an effect, a larger step or more digits in the model's output show it",
                   "Warning: Parameter b3 is left out of the covariance matrix: its derivatives are not known",
                   "Warning: Parameter b5 is left out of the covariance matrix: its effect cannot be told from that of "
                   "the parameters before it"}));
}

TEST(ParameterCovariance, LeavesOutTheRowThatAnyColumnLacks) {
  LinearisedModel longer{{0.1, -0.2, 9, 0.3, -0.3, 0.1}, {}, {{1, 1, NAN, 1, 1, 1}, {0, 1, 7, 2, 3, 4}}};
  longer.jacobian.emplace_back(6, NAN);  // a failed run's
  const ParameterCovariance result = parameterCovariance(longer);
  EXPECT_EQ(result.covariance, parameterCovariance(kLine).covariance);
  EXPECT_THAT(result.kept, ElementsAre(0, 1));
  EXPECT_THAT(formatCovariance(result, spaceOf({1, 2, 3}), std::vector<double>{1, 2, 3}),
              Contains("Warning: 1 observation is left out of the covariance matrix: a perturbed run has no value "
                       "there"));
}

TEST(ParameterCovariance, TellsRoundingFromAnEffect) {
  // The second column is the first but for what values of three digits leave of it.
  LinearisedModel model{{0.1, -0.2, 0.3, -0.3, 0.1}, {}, {{1, 2, 3, 4, 5}, {1.003, 1.998, 3.004, 4, 4.997}}};
  EXPECT_THAT(parameterCovariance(model).kept, ElementsAre(0, 1));
  model.units.assign(5, 0.001);
  model.widths = {0.1, 0.1};
  EXPECT_THAT(parameterCovariance(model).kept, ElementsAre(0));
  model.widths = {10, 10};
  EXPECT_THAT(parameterCovariance(model).kept, ElementsAre(0, 1));
  // Single units of the model's steps, and then of several on end, both interpolated.
  model.residuals.assign(10, 0.1);
  model.units.assign(10, 1);
  model.widths = {1, 1};
  model.jacobian = {{0, 0.3, 0.7, 0, 0, 0, 0.3, 0.7, 0, 0}, {0, 0, 0, 0.3, 1, 1, 1, 1, 0.7, 0}};
  EXPECT_THAT(parameterCovariance(model).kept, ElementsAre(1));
}

/// Central differences, a fraction of the value, of a model that prints 300 values with so many decimals.
ParameterCovariance ofPrinted(double (*value)(const ParameterSet&, double), int decimals, double fraction,
                              const std::vector<double>& initial) {
  const SearchSpace space = spaceOf(initial);
  const PerturbationPlan plan =
      planPerturbations({Differencing::central, PerturbationOption::value, fraction}, space, initial);
  std::vector<std::vector<double>> simulated;
  std::vector<double> observed;
  for (const ParameterSet& set : plan.sets) {
    simulated.emplace_back();
    for (int i = 0; i < 300; ++i)
      simulated.back().push_back(std::stod(fmt::format("{:.{}f}", value(set, i), decimals)));
  }
  for (int i = 0; i < 300; ++i) observed.push_back(simulated[0][static_cast<std::size_t>(i)] + 0.1 * std::sin(i * i));
  auto model = linearise(plan, simulated, observed, {});
  model->units.assign(300, std::pow(10.0, -decimals));
  return parameterCovariance(*model);
}

TEST(ParameterCovariance, LeavesOutWhatRoundingHidesAndNothingElse) {
  constexpr auto kOrthogonal = [](const ParameterSet& p, double i) {
    return 3 + 0.1 * p[0] * std::sin(i / 7) + p[1] * std::cos(i / 11) + p[2] * std::sin(i / 3);
  };
  constexpr auto kReversed = [](const ParameterSet& p, double i) {
    return 3 + p[0] * std::cos(i / 11) + p[1] * std::sin(i / 3) + 0.1 * p[2] * std::sin(i / 7);
  };
  constexpr auto kSum = [](const ParameterSet& p, double i) { return 3 + (p[0] + p[1]) * std::sin(i / 7); };
  constexpr auto kSumAndOther = [](const ParameterSet& p, double i) {
    return 3 + (p[0] + p[1]) * std::sin(i / 7) + p[2] * p[2] * std::cos(i / 11);
  };
  constexpr auto kFewRows = [](const ParameterSet& p, double i) {
    return 3 + p[0] * std::sin(i / 7) + (i >= 100 && i < 110 ? p[1] : 0.0);
  };
  constexpr auto kFewRowsFirst = [](const ParameterSet& p, double i) {
    return 3 + p[1] * std::sin(i / 7) + (i >= 100 && i < 110 ? p[0] : 0.0);
  };
  const std::string sum = "its effect cannot be told from that of the parameters before it";
  const std::string lost = "the effect of its step is lost in the rounding of the model's output";
  using LeftOut = std::vector<std::pair<std::size_t, std::string>>;
  using Model = double (*)(const ParameterSet&, double);
  // The model, its decimals, the fraction, the initial values, what is left out.
  const std::tuple<const char*, Model, int, double, std::vector<double>, LeftOut> cases[] = {
      {"a weak one first", kOrthogonal, 2, 0.01, {1, 1, 1}, {{0, lost}}},
      {"a weak one last", kReversed, 2, 0.01, {1, 1, 1}, {{2, lost}}},
      {"a weak one, finer", kOrthogonal, 3, 0.01, {1, 1, 1}, {}},
      {"a sum", kSum, 2, 0.01, {1, 2}, {{1, sum}}},
      {"a sum at a small step", kSum, 3, 1e-3, {1, 2}, {{1, sum}}},
      {"a sum and another", kSumAndOther, 2, 0.01, {1, 2, 1}, {{1, sum}}},
      {"a sum and another at a small step", kSumAndOther, 3, 1e-3, {1, 2, 1}, {{1, sum}}},
      {"a sum and another, all lost", kSumAndOther, 3, 1e-4, {1, 1, 1}, {{0, lost}, {1, lost}, {2, lost}}},
      {"a few rows", kFewRows, 2, 0.01, {1, 2}, {}},
      {"a few rows by one unit", kFewRows, 2, 0.01, {1, 0.5}, {}},
      {"a few rows, first", kFewRowsFirst, 2, 0.01, {2, 1}, {}},
  };
  for (const auto& [what, value, decimals, fraction, initial, expected] : cases) {
    LeftOut leftOut;
    for (const LeftOutParameter& one : ofPrinted(value, decimals, fraction, initial).leftOut) {
      leftOut.emplace_back(one.index, one.reason);
    }
    EXPECT_EQ(leftOut, expected) << what;
  }
}

TEST(ParameterCovariance, SaysWhatTheCorrelationOfTheResidualsDoesToIt) {
  LinearisedModel model{{1, 1, -1, -1, 1, 1}, {}, {{1, 1, 1, 1, 1, 1}}};
  EXPECT_NEAR(parameterCovariance(model).lagOne, 1.0 / 6.0, 1e-15);
  model.series = {0, 0, 1, 1, 2, 2};
  const ParameterCovariance result = parameterCovariance(model);
  EXPECT_NEAR(result.lagOne, 0.5, 1e-15);
  EXPECT_THAT(formatCovariance(result, spaceOf({1}), std::vector<double>{1}),
              Contains("Lag-1 correlation of the residuals: 0.500, which makes the standard deviations about 1.7 times "
                       "too small, and the limits as much too narrow"));
  model.residuals.assign(6, 0.0);
  const ParameterCovariance perfect = parameterCovariance(model);
  EXPECT_THAT(formatCovariance(perfect, spaceOf({1}), std::vector<double>{1}), Not(Contains(HasSubstr("Lag-1"))));
  EXPECT_EQ(covarianceTables(perfect, spaceOf({1}), std::vector<double>{1}).back().headLines.size(), 1U);
}

TEST(ParameterCovariance, ItsJacobianHasTheRowsThatCount) {
  const LinearisedModel model{{0.5, NAN, -1}, {1, 4, 0.25}, {{1, 2, 3}, {4, 5, NAN}}};
  const ObservationLabel labels[] = {{"flow", "2001-01-01"}, {"flow", "2001-01-02"}, {"head", "2001-01-03"}};
  SearchSpace space = spaceOf({1, 2});
  space.names = {"a", "b"};
  const std::string text = dataTableText(jacobianTable(model, space, labels));
  EXPECT_EQ(text.substr(text.find('\n') + 1),
            "Measure\tTime\tWeight\tResidual\ta\tb\nflow\t2001-01-01\t1\t0.5\t1\t4\n"
            "head\t2001-01-03\t0.25\t-1\t3\tNaN\n");
}

TEST(ParameterCovariance, SaysWhenThereIsLittleOrNothingToEstimateItFrom) {
  const SearchSpace space = spaceOf({1, 2});
  const ParameterCovariance exact = parameterCovariance({{0.1, 0.2}, {}, {{1, 1}, {0, 1}}});
  EXPECT_THAT(formatCovariance(exact, space, space.initial),
              ElementsAre(HasSubstr("0 degrees"), HasSubstr("more observations than parameters")));
  const ParameterCovariance none = parameterCovariance({{0.1, 0.2}, {}, {{0, 0}, {0, 0}}});
  EXPECT_TRUE(none.kept.empty());
  EXPECT_EQ(formatCovariance(none, space, space.initial).size(), 3U);
  EXPECT_TRUE(parameterCovariance({}).kept.empty());
  const ParameterCovariance hardlyApart =
      parameterCovariance({{0.1, -0.2, 0.3, -0.3, 0.1}, {}, {{10, 11, 12, 13, 14}, {1, 1, 1, 1, 1}}});
  EXPECT_EQ(formatCovariance(hardlyApart, space, space.initial).back(),
            "Warning: Parameters b1 and b2 are correlated by -0.9931: the observations hardly tell them apart");
}

TEST(ParameterLimits, AreTransformedForALogarithmicParameter) {
  ParameterCovariance result = parameterCovariance({{0.1, -0.2, 0.3, -0.3, 0.1}, {}, {{1, 1, 1, 1, 1}}});
  const std::vector<double> set = {std::log(20.0)};
  const SearchSpace space = spaceOf(set, TransformationType::logarithmic);
  const double deviation = std::sqrt(0.24 / 4.0 / 5.0);
  const double reach = 2.7764451051977987 * deviation;  // 4 degrees of freedom
  const ParameterLimits limits = parameterLimits(result, space, set).front();
  EXPECT_NEAR(limits.value, 20.0, 1e-13);
  EXPECT_NEAR(limits.standardDeviation, 20.0 * deviation, 1e-13);
  EXPECT_NEAR(limits.lower, 20.0 * std::exp(-reach), 1e-11);
  EXPECT_NEAR(limits.upper, 20.0 * std::exp(reach), 1e-11);
}

}  // namespace
}  // namespace mirevo
