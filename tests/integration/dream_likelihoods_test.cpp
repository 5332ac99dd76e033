#include <algorithm>
#include <array>
#include <cmath>
#include <functional>
#include <random>
#include <sstream>

#include <fmt/format.h>
#include <gmock/gmock.h>

#include "common/data_table.h"
#include "integration/dream_folder.h"

namespace mirevo::testing {
namespace {

constexpr int kDays = 365;

double simulatedAt(double a, double b, int day) {
  return a + b * std::sin(day / 58.0) + day / 365.0;
}

/// ln of the skew exponential power density of Schoups and Vrugt (2010), equations A1 to A8, mean 0 and deviation 1.
double lnSkewExponentialPower(double a, double xi, double beta) {
  const double one = std::tgamma(0.5 * (1.0 + beta));
  const double three = std::tgamma(1.5 * (1.0 + beta));
  const double omega = std::sqrt(three) / ((1.0 + beta) * std::pow(one, 1.5));
  const double c = std::pow(three / one, 1.0 / (1.0 + beta));
  const double m1 = std::tgamma(1.0 + beta) / std::sqrt(three * one);
  const double mean = m1 * (xi - 1.0 / xi);
  const double spread = std::sqrt((1.0 - m1 * m1) * (xi * xi + 1.0 / (xi * xi)) + 2.0 * m1 * m1 - 1.0);
  const double centred = mean + spread * a;
  const double skewed = centred * std::pow(xi, centred < 0.0 ? 1.0 : -1.0);
  return std::log(2.0 * spread / (xi + 1.0 / xi) * omega) - c * std::pow(std::abs(skewed), 2.0 / (1.0 + beta));
}

double lnNormal(double a) {
  return -0.5 * a * a - 0.5 * std::log(2.0 * M_PI);
}

/// Student's t with 4 degrees of freedom: its constant is 3 / 8.
double lnStudent4(double a) {
  return std::log(0.375) - 2.5 * std::log1p(0.25 * a * a);
}

/// A likelihood whose error model is given, and what it is made of.
struct LikelihoodCase {
  const char* lines;
  double deviation = 0.0;
  double share = 0.0;        ///< of the simulated value, in the deviation
  double correlation = 0.0;  ///< of an error with the one before
  double lambda = 1.0;       ///< of a transformation of values plus 10
  double (*lnDensity)(double) = lnNormal;
};

double transformed(const LikelihoodCase& own, double value) {
  return own.lambda == 1.0 ? value : (std::pow(value + 10.0, own.lambda) - 1.0) / own.lambda;
}

double lnLikelihood(const LikelihoodCase& own, const std::vector<double>& observed, double a, double b) {
  double sum = 0.0;
  double before = 0.0;
  for (int t = 0; t < kDays; ++t) {
    const double simulated = simulatedAt(a, b, t);
    const double value = observed[static_cast<std::size_t>(t)];
    const double error = transformed(own, value) - transformed(own, simulated);
    double deviation = own.deviation + own.share * std::abs(simulated);
    if (t == 0) deviation /= std::sqrt(1.0 - own.correlation * own.correlation);
    sum += own.lnDensity((error - own.correlation * before) / deviation) - std::log(deviation);
    if (own.lambda != 1.0) sum += (own.lambda - 1.0) * std::log(value + 10.0);
    before = error;
  }
  return sum;
}

struct Moments {
  std::array<double, 2> mean{};       ///< of a and b
  std::array<double, 2> deviation{};  ///< their standard deviations
};

/// Of exp(lnDensity(a, b)) on a grid around the values that made the observations.
Moments momentsOnGrid(const std::function<double(double, double)>& lnDensity) {
  constexpr int kSteps = 40;
  constexpr double kWidth = 1.8;
  std::vector<std::array<double, 3>> points;
  double top = -1e300;
  for (int i = -kSteps; i <= kSteps; ++i) {
    for (int j = -kSteps; j <= kSteps; ++j) {
      const double a = 5.0 + kWidth * i / kSteps;
      const double b = 2.0 + kWidth * j / kSteps;
      points.push_back({a, b, lnDensity(a, b)});
      top = std::max(top, points.back()[2]);
    }
  }
  Moments moments;
  double total = 0.0;
  std::array<double, 2> squares{};
  for (const auto& point : points) {
    const double weight = std::exp(point[2] - top);
    total += weight;
    for (std::size_t k = 0; k < 2; ++k) {
      moments.mean[k] += weight * point[k];
      squares[k] += weight * point[k] * point[k];
    }
  }
  for (std::size_t k = 0; k < 2; ++k) {
    moments.mean[k] /= total;
    moments.deviation[k] = std::sqrt(squares[k] / total - moments.mean[k] * moments.mean[k]);
  }
  return moments;
}

/// Observations with normal errors of standard deviation 1.5, in the model's folder and as a vector.
std::vector<double> writeObserved(const ModelFolder& folder) {
  std::mt19937_64 engine(3);
  std::istringstream lines(folder.read("observed.csv"));
  std::vector<double> values;
  std::string text;
  for (std::string line; std::getline(lines, line);) {
    if (!text.empty()) {
      double noise = -6.0;  // twelve uniform numbers
      for (int k = 0; k < 12; ++k) noise += static_cast<double>(engine() >> 11U) / 9007199254740992.0;
      values.push_back(simulatedAt(5.0, 2.0, static_cast<int>(values.size())) + 1.5 * noise);
      line = fmt::format("{},{:.17g}", line.substr(0, line.find(',')), values.back());
    }
    text += line + "\n";
  }
  folder.write("observed.csv", text);
  return values;
}

void expectMoments(const std::string& posterior, const Moments& expected) {
  constexpr std::array kNames{"a", "b"};
  for (std::size_t k = 0; k < kNames.size(); ++k) {
    const double size = dreamCell(posterior, kNames[k], "Effective size");
    const double error = 4.0 * expected.deviation[k] / std::sqrt(size);
    EXPECT_GT(size, 10.0) << kNames[k];
    EXPECT_NEAR(dreamCell(posterior, kNames[k], "Mean"), expected.mean[k], error) << kNames[k];
    EXPECT_NEAR(dreamCell(posterior, kNames[k], "Standard deviation"), expected.deviation[k], error) << kNames[k];
  }
}

constexpr const char* kBurnIn = "\n Burn_In_Share = 0.4";

TEST(DreamLikelihoods, PosteriorsOfALinearModelAreThoseOfEachErrorModel) {
  const std::vector<LikelihoodCase> cases{
      {"Likelihood = 'normal'\n Error_Deviation = 1.5", 1.5},
      {"Likelihood = 'heteroscedastic'\n Error_Deviation = 0.5\n Error_Share = 0.2", 0.5, 0.2},
      {"Likelihood = 'AR(1)'\n Error_Deviation = 1.5\n Error_Correlation = 0.4", 1.5, 0.0, 0.4},
      {"Likelihood = 'Box-Cox'\n Error_Deviation = 0.2\n Box_Cox_Lambda = 0.3\n Box_Cox_Shift = 10.0", 0.2, 0.0, 0.0,
       0.3},
      {"Likelihood = 'Student'\n Error_Deviation = 1.2\n Student_Freedom = 4.0", 1.2, 0.0, 0.0, 1.0, lnStudent4},
      {"Likelihood = 'generalised'\n Error_Deviation = 1.0\n Error_Share = 0.1\n Error_Correlation = 0.2\n "
       "Error_Skewness = 1.5\n Error_Kurtosis = 0.5",
       1.0, 0.1, 0.2, 1.0, [](double a) { return lnSkewExponentialPower(a, 1.5, 0.5); }},
  };
  const ModelFolder folder;
  const std::vector<double> observed = writeObserved(folder);
  for (const LikelihoodCase& own : cases) {
    SCOPED_TRACE(own.lines);
    const ProgramResult run =
        runProgram({writeDream(folder, {.maxEvaluations = 600}, std::string(own.lines) + kBurnIn)});
    ASSERT_EQ(run.exitCode, 0) << run.error;
    const ReadTable chains = readDataTable(folder.read("basin_Chains.dat"));
    const auto value = [&](std::size_t row, const char* column) {
      return realCell(chains.rows[row][*chains.column(column)]).value();
    };
    for (std::size_t row = 0; row < chains.rows.size(); row += 7) {
      EXPECT_NEAR(value(row, "Log_Likelihood"), lnLikelihood(own, observed, value(row, "a"), value(row, "b")), 1e-3);
    }
    expectMoments(folder.read("basin_Posterior.dat"),
                  momentsOnGrid([&](double a, double b) { return lnLikelihood(own, observed, a, b); }));
  }
}

TEST(DreamLikelihoods, AnEstimatedErrorWidensThePosteriorAsItsPriorDemands) {
  // With a prior uniform for ln sigma the density of a and b is proportional to the sum of squares to the power -n / 2.
  const ModelFolder folder;
  const std::vector<double> observed = writeObserved(folder);
  const auto squaresAt = [&](double a, double b) {
    double sum = 0.0;
    for (int t = 0; t < kDays; ++t) {
      const double error = observed[static_cast<std::size_t>(t)] - simulatedAt(a, b, t);
      sum += error * error;
    }
    return sum;
  };
  const ProgramResult run = runProgram({writeDream(
      folder, {.maxEvaluations = 1200}, std::string("Likelihood = 'normal'\n Error_Deviation = 0.5, 5.0") + kBurnIn)});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  const Moments expected = momentsOnGrid([&](double a, double b) { return -0.5 * kDays * std::log(squaresAt(a, b)); });
  const std::string posterior = folder.read("basin_Posterior.dat");
  expectMoments(posterior, expected);
  // The sum of squares at the least over sigma^2 is a chi-square of n - 2 degrees of freedom.
  const double middle = std::sqrt(squaresAt(expected.mean[0], expected.mean[1]) / (kDays - 2.0));
  const double deviation = middle / std::sqrt(2.0 * (kDays - 2.0));
  const double error = 4.0 * deviation / std::sqrt(dreamCell(posterior, "sigma0 of flow", "Effective size"));
  EXPECT_NEAR(dreamCell(posterior, "sigma0 of flow", "Mean"), middle * (1.0 + 0.75 / (kDays - 2.0)), error);
  EXPECT_NEAR(dreamCell(posterior, "sigma0 of flow", "Standard deviation"), deviation, error);
}

}  // namespace
}  // namespace mirevo::testing
