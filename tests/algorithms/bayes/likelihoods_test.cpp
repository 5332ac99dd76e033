#include "algorithms/bayes/likelihoods.h"

#include <cmath>
#include <numbers>

#include <gtest/gtest.h>

namespace mirevo {
namespace {

constexpr double kMissing = std::numeric_limits<double>::quiet_NaN();

ErrorValues errors(std::initializer_list<std::pair<ErrorTerm, double>> set) {
  ErrorValues values = neutralErrors();
  for (const auto& [term, value] : set) values[term] = value;
  return values;
}

double lnNormal(double x, double deviation) {
  return -0.5 * x * x / (deviation * deviation) - std::log(deviation) - 0.5 * std::log(2.0 * std::numbers::pi);
}

const std::vector<double> kDays{0.0, 1.0, 2.0, 3.0};
const std::vector<double> kObserved{1.0, 2.5, 2.0, 4.0};
const std::vector<double> kSimulated{1.5, 2.0, 2.5, 3.0};

TEST(Likelihoods, OfIndependentErrorsIsTheSumOfNaturalLogarithmsOfTheirDensities) {
  const SeriesErrors normal(LikelihoodForm::normal, 0.0, kDays, kObserved);
  double expected = 0.0;
  for (std::size_t t = 0; t < 4; ++t) expected += lnNormal(kObserved[t] - kSimulated[t], 0.7);
  EXPECT_NEAR(normal.logLikelihood(kSimulated, errors({{kDeviation, 0.7}})), expected, 1e-12);

  const SeriesErrors growing(LikelihoodForm::heteroscedastic, 0.0, kDays, kObserved);
  expected = 0.0;
  for (std::size_t t = 0; t < 4; ++t) expected += lnNormal(kObserved[t] - kSimulated[t], 0.1 + 0.3 * kSimulated[t]);
  EXPECT_NEAR(growing.logLikelihood(kSimulated, errors({{kDeviation, 0.1}, {kShare, 0.3}})), expected, 1e-12);

  const std::vector<double> weights{1.0, 0.5, 1.0, 1.0};
  const SeriesErrors weighted(LikelihoodForm::normal, 0.0, kDays, kObserved, weights);
  expected = 0.0;
  for (std::size_t t = 0; t < 4; ++t) expected += lnNormal(kObserved[t] - kSimulated[t], 0.7 / weights[t]);
  EXPECT_NEAR(weighted.logLikelihood(kSimulated, errors({{kDeviation, 0.7}})), expected, 1e-12);
}

/// The density of n normal values with a covariance matrix, by its Cholesky factor.
double lnMultivariateNormal(const std::vector<double>& values, const std::vector<std::vector<double>>& covariance) {
  const std::size_t n = values.size();
  std::vector<std::vector<double>> factor(n, std::vector<double>(n, 0.0));
  std::vector<double> solved(n);
  double sum = -0.5 * static_cast<double>(n) * std::log(2.0 * std::numbers::pi);
  for (std::size_t i = 0; i < n; ++i) {
    solved[i] = values[i];
    for (std::size_t j = 0; j <= i; ++j) {
      double entry = covariance[i][j];
      for (std::size_t k = 0; k < j; ++k) entry -= factor[i][k] * factor[j][k];
      factor[i][j] = i == j ? std::sqrt(entry) : entry / factor[j][j];
    }
    for (std::size_t k = 0; k < i; ++k) solved[i] -= factor[i][k] * solved[k];
    solved[i] /= factor[i][i];
    sum -= 0.5 * solved[i] * solved[i] + std::log(factor[i][i]);
  }
  return sum;
}

TEST(Likelihoods, OfCorrelatedErrorsIsThatOfTheStationaryProcessThroughGapsToo) {
  // A day is missing: the errors around it are two days apart.
  const std::vector<double> days{0.0, 1.0, 2.0, 3.0, 4.0};
  const std::vector<double> observed{1.0, 2.5, kMissing, 2.0, 4.0};
  const std::vector<double> simulated{1.5, 2.0, 2.2, 2.5, 3.0};
  const double phi = 0.6;
  const double deviation = 0.4;
  const std::vector<double> times{0.0, 1.0, 3.0, 4.0};
  std::vector<std::vector<double>> covariance(4, std::vector<double>(4));
  for (std::size_t i = 0; i < 4; ++i) {
    for (std::size_t j = 0; j < 4; ++j) {
      covariance[i][j] = deviation * deviation / (1.0 - phi * phi) * std::pow(phi, std::abs(times[i] - times[j]));
    }
  }
  const SeriesErrors series(LikelihoodForm::autoregressive, 0.0, days, observed);
  EXPECT_NEAR(series.logLikelihood(simulated, errors({{kDeviation, deviation}, {kCorrelation, phi}})),
              lnMultivariateNormal({-0.5, 0.5, -0.5, 1.0}, covariance), 1e-12);
}

TEST(Likelihoods, OfTransformedErrorsIsTheDensityOfTheObservationsThemselves) {
  // Over all observations y of one simulated value it integrates to 1, which it does not without the Jacobian.
  for (const double lambda : {0.0, 0.3, 1.0}) {
    double integral = 0.0;
    const double step = 1e-3;
    for (double y = step / 2; y < 60.0; y += step) {
      const SeriesErrors series(LikelihoodForm::boxCox, 0.5, std::vector{0.0}, std::vector{y});
      integral +=
          step * std::exp(series.logLikelihood(std::vector{8.0}, errors({{kDeviation, 0.3}, {kLambda, lambda}})));
    }
    EXPECT_NEAR(integral, 1.0, 1e-3) << lambda;
  }
}

TEST(Likelihoods, InnovationsHaveTheirDensities) {
  struct Case {
    LikelihoodForm form;
    ErrorValues values;
    double deviation;
    double at;       ///< a point ...
    double density;  ///< ... whose density is known
  };
  const double root = std::sqrt(2.0);
  const std::vector<Case> cases{
      {LikelihoodForm::normal, neutralErrors(), 1.0, 0.0, 0.3989422804},
      {LikelihoodForm::student, errors({{kFreedom, 5.0}}), std::sqrt(5.0 / 3.0), 0.0, 0.3796066898},
      {LikelihoodForm::generalised, neutralErrors(), 1.0, 1.0, 0.2419707245},
      // Double exponential with variance 1: exp(-sqrt(2) |a|) / sqrt(2).
      {LikelihoodForm::generalised, errors({{kKurtosis, 1.0}}), 1.0, 0.5, std::exp(-0.5 * root) / root},
      {LikelihoodForm::generalised, errors({{kKurtosis, -0.5}, {kSkewness, 2.0}}), 1.0, kMissing, 0.0},
      {LikelihoodForm::generalised, errors({{kKurtosis, 0.7}, {kSkewness, 0.4}}), 1.0, kMissing, 0.0},
  };
  for (const Case& own : cases) {
    const ErrorShape shape(own.form, own.values);
    if (!std::isnan(own.at)) {
      EXPECT_NEAR(std::exp(shape.logDensity(own.at)), own.density, 1e-9);
    }
    double mass = 0.0;
    double mean = 0.0;
    double squares = 0.0;
    const double step = 1e-3;
    for (double a = -60.0 + step / 2; a < 60.0; a += step) {
      const double density = step * std::exp(shape.logDensity(a));
      mass += density;
      mean += a * density;
      squares += a * a * density;
    }
    EXPECT_NEAR(mass, 1.0, 1e-5);
    EXPECT_NEAR(mean, 0.0, 1e-5);
    EXPECT_NEAR(std::sqrt(squares), own.deviation, 1e-3);
    // Draws have the distribution function of the density.
    ChainRandom random(7);
    const int count = 20'000;
    int below = 0;
    double sum = 0.0;
    for (int i = 0; i < count; ++i) {
      const double draw = shape.draw(random);
      sum += draw;
      if (draw < -0.5) ++below;
    }
    double share = 0.0;
    for (double a = -60.0 + step / 2; a < -0.5; a += step) share += step * std::exp(shape.logDensity(a));
    EXPECT_NEAR(static_cast<double>(below) / count, share, 0.015);
    EXPECT_NEAR(sum / count, 0.0, 0.04);
  }
}

TEST(Likelihoods, ARunWithoutAValueThatTheFirstOneHadHasNone) {
  SeriesErrors series(LikelihoodForm::normal, 0.0, kDays, kObserved);
  series.countWhere(std::vector{kMissing, 2.0, 2.5, 3.0});
  EXPECT_EQ(series.count(), 3U);
  EXPECT_TRUE(std::isfinite(series.logLikelihood(kSimulated, neutralErrors())));
  EXPECT_EQ(series.logLikelihood(std::vector{1.5, kMissing, 2.5, 3.0}, neutralErrors()),
            -std::numeric_limits<double>::infinity());
}

TEST(Likelihoods, OfASimulatedZeroIsTheOneThatDrawsFromItHave) {
  struct Case {
    double simulated;
    double lambda;
    double shift;
    bool isPossible;  ///< an observation of 1
    double drawn;     ///< NaN: no value; infinity: not always the same
  };
  const double infinity = std::numeric_limits<double>::infinity();
  const Case cases[] = {
      {0.0, 0.5, 0.0, true, infinity}, {0.0, 0.3, 0.0, true, infinity},   {0.0, 1.0, 0.0, true, infinity},
      {0.0, 0.0, 0.0, false, 0.0},     {0.0, -0.5, 0.0, false, 0.0},      {-0.2, 0.0, 0.2, false, -0.2},
      {0.0, 0.0, 0.2, true, infinity}, {-0.1, 0.5, 0.0, false, kMissing}, {-0.1, 0.0, 0.0, false, kMissing},
  };
  for (const auto& [simulated, lambda, shift, isPossible, drawn] : cases) {
    SCOPED_TRACE(::testing::Message() << simulated << " " << lambda << " " << shift);
    const SeriesErrors series(LikelihoodForm::boxCox, shift, std::vector{0.0}, std::vector{1.0});
    const ErrorValues values = errors({{kDeviation, 0.8}, {kLambda, lambda}});
    const double found = series.logLikelihood(std::vector{simulated}, values);
    EXPECT_EQ(std::isfinite(found), isPossible);
    if (isPossible && lambda < 1.0 && lambda > 0.0) {
      // T(1) = 0 and T(0) = -1 / lambda; the Jacobian of 1 is 1.
      EXPECT_NEAR(found, lnNormal(1.0 / lambda, 0.8), 1e-12);
    }
    ChainRandom random(5);
    SeriesErrors::Path path(series, values);
    EXPECT_EQ(path.hasErrors(simulated), std::isinf(drawn));
    const double first = path.next(0, simulated, random);
    const double second = SeriesErrors::Path(series, values).next(0, simulated, random);
    if (std::isinf(drawn)) {
      EXPECT_TRUE(std::isfinite(first));
      EXPECT_TRUE(std::isfinite(second));
    } else {
      EXPECT_EQ(std::isnan(first), std::isnan(drawn));
      if (!std::isnan(drawn)) {
        EXPECT_EQ(first, drawn);
        EXPECT_EQ(second, drawn);
      }
    }
  }
}

TEST(Likelihoods, PathsOfObservableValuesHaveTheModelsSpread) {
  // Box-Cox with lambda 0, correlated: ln y ~ N(ln f, 0.2^2 / (1 - phi^2)) at every time.
  const std::vector<double> days{0.0, 1.0, 2.0, 5.0};
  const SeriesErrors series(LikelihoodForm::boxCox, 0.0, days, std::vector(4, 10.0));
  const ErrorValues values = errors({{kDeviation, 0.2}, {kCorrelation, 0.8}, {kLambda, 0.0}});
  ChainRandom random(3);
  std::vector<double> sums(4, 0.0);
  std::vector<double> squares(4, 0.0);
  const int count = 20'000;
  for (int i = 0; i < count; ++i) {
    SeriesErrors::Path path(series, values);
    for (std::size_t t = 0; t < 4; ++t) {
      const double logarithm = std::log(path.next(t, 10.0, random) / 10.0);
      sums[t] += logarithm / count;
      squares[t] += logarithm * logarithm / count;
    }
  }
  for (std::size_t t = 0; t < 4; ++t) {
    EXPECT_NEAR(sums[t], 0.0, 0.01);
    EXPECT_NEAR(std::sqrt(squares[t]), 0.2 / 0.6, 0.01);
  }
}

TEST(Likelihoods, PathsOfWeightedObservationsHaveErrorsBetweenThemToo) {
  const std::vector<double> observed{1.0, kMissing, 2.0, kMissing, kMissing, 4.0};
  const std::vector<double> days{0.0, 1.0, 2.0, 3.0, 4.0, 5.0};
  for (const double correlation : {0.0, 0.7}) {
    const ErrorValues values = errors({{kDeviation, 0.5}, {kCorrelation, correlation}});
    const auto drawn = [&](const std::vector<double>& weights) {
      const SeriesErrors series(LikelihoodForm::normal, 0.0, days, observed, weights);
      SeriesErrors::Path path(series, values);
      ChainRandom random(5);
      std::vector<double> found;
      for (std::size_t t = 0; t < days.size(); ++t) found.push_back(path.next(t, 3.0, random) - 3.0);
      return found;
    };
    const std::vector<double> plain = drawn({});
    EXPECT_EQ(drawn({1.0, 0.0, 1.0, 0.0, 0.0, 1.0}), plain);
    if (correlation > 0.0) continue;
    const std::vector<double> weighted = drawn({2.0, 0.0, 8.0, 0.0, 0.0, 4.0});
    const double expected[] = {2.0, 4.0, 8.0, 4.0, 4.0, 4.0};
    for (std::size_t t = 0; t < days.size(); ++t) EXPECT_NEAR(weighted[t], plain[t] / expected[t], 1e-12) << t;
  }
}

}  // namespace
}  // namespace mirevo
