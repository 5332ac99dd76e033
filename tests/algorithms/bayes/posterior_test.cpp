#include "algorithms/bayes/posterior.h"

#include <cmath>

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/bayes/sampled_function.h"

namespace mirevo {
namespace {

/// Chains of ln x ~ N(0, 0.5^2) and an error parameter, shown on their own scales.
struct ShownChains {
  ShownChains() {
    const auto density = [](std::span<const double> x) { return -2.0 * x[0] * x[0] - 0.5 * x[1] * x[1]; };
    DreamProblem problem = sampledFunction({-6.0, -6.0}, {6.0, 6.0}, density);
    problem.modelParameterCount = 1;
    settings = untilBudget(4'000);
    settings.effectiveSize = 200.0;
    chains.emplace(sampled(settings, std::move(problem)));
  }
  std::vector<std::string> report(const PosteriorSummary* summary, const RunsWithoutLikelihood& runs = {}) const {
    return formatPosterior(settings, *chains, dimensions, summary, runs,
                           {"basin_Posterior.dat", "basin_SampleCorrelation.dat"});
  }

  DreamSettings settings;
  std::optional<DreamSampler> chains;
  ShownDimensions dimensions{{"K", "sigma0 of flow"}, 1, [](std::span<const double> x) {
                               return std::vector{std::exp(x[0]), x[1]};
                             }};
  std::vector<std::vector<double>> prior{{-6.0, -6.0}, {0.0, 0.0}, {6.0, 6.0}};
};

// A proposal that was rejected is in no row, its state is there once more; the rate is of proposals that became states.
TEST(Posterior, IsOfTheStatesBehindBurnInAndTheAcceptanceRateOfTheirProposals) {
  const ShownChains shown;
  const auto summary = summarisePosterior(*shown.chains, shown.dimensions, shown.prior, 1000);
  ASSERT_TRUE(summary);
  const DataTable table = chainsTable(*shown.chains, shown.dimensions);
  std::size_t rows = 0;
  std::size_t accepted = 0;
  double mean = 0.0;
  double square = 0.0;
  for (std::size_t i = 0; i < table.rows.size(); ++i) {
    if (std::get<std::int64_t>(table.rows[i][2]) == 1) continue;
    ++rows;
    if (std::get<std::int64_t>(table.rows[i][4]) == 1) ++accepted;
    const double value = table.realColumns[2][i];
    EXPECT_NEAR(table.realColumns[0][i],
                -2.0 * std::log(value) * std::log(value) - 0.5 * std::pow(table.realColumns[3][i], 2), 1e-12);
    mean += value;
    square += value * value;
  }
  const auto count = static_cast<double>(rows);
  mean /= count;
  EXPECT_LT(rows, table.rows.size());
  EXPECT_EQ(summary->draws, rows);
  EXPECT_NEAR(summary->dimensions[0].mean, mean, 1e-9);
  EXPECT_NEAR(summary->dimensions[0].standardDeviation, std::sqrt((square - count * mean * mean) / (count - 1.0)),
              1e-9);
  // The mean of a lognormal quantity is not that of its logarithm, which is 0.
  EXPECT_NEAR(mean, std::exp(0.125), 4.0 * 0.6 / std::sqrt(summary->dimensions[0].effectiveSize));
  EXPECT_NEAR(summary->mostProbable[0], 1.0, 0.1);

  const double rate = static_cast<double>(accepted) / count;
  EXPECT_GT(rate, 0.2);
  EXPECT_LT(rate, 0.5);
  EXPECT_THAT(shown.report(&*summary),
              ::testing::Contains(::testing::StartsWith(
                  fmt::format("Acceptance rate behind burn-in: {:.1f} % of {} proposals", 100.0 * rate, rows))));
}

TEST(Posterior, IsSaidNotToBeThereOrNotToHaveConverged) {
  ShownChains shown;
  const std::vector<std::string> none = shown.report(nullptr, {.failed = 1, .untransformed = 3});
  EXPECT_THAT(none, ::testing::Contains(::testing::StartsWith("4 evaluations without a likelihood, whose sets were "
                                                              "rejected: 1 failed; 3 have simulated values without")));
  EXPECT_THAT(none, ::testing::Contains(::testing::HasSubstr("No posterior: there are fewer than 4 generations")));
  auto summary = summarisePosterior(*shown.chains, shown.dimensions, shown.prior, 1000);
  EXPECT_THAT(shown.report(&*summary), ::testing::Contains(::testing::HasSubstr("The chains have converged")));
  summary->dimensions[1].rHat = 1.3;
  EXPECT_THAT(
      shown.report(&*summary),
      ::testing::Contains(::testing::HasSubstr("have not converged: R-hat is above 1.05 for sigma0 of flow (1.3)")));
  summary->dimensions[1].rHat = std::nan("");
  EXPECT_THAT(shown.report(&*summary), ::testing::Contains(::testing::HasSubstr("have not converged")));
  summary->dimensions[1].rHat = 1.0;
  summary->dimensions[0].effectiveSize = 90.0;
  EXPECT_THAT(shown.report(&*summary),
              ::testing::Contains(::testing::HasSubstr("the effective sample size is below 200 for K (90)")));
  // One verdict, whatever the chains lack.
  for (const double rHat : {1.0, 1.3}) {
    summary->dimensions[1].rHat = rHat;
    int verdicts = 0;
    for (const std::string& line : shown.report(&*summary)) {
      if (line.find("converged") == std::string::npos && line.find("chains agree") == std::string::npos) continue;
      EXPECT_THAT(line, ::testing::StartsWith("Warning: The chains have not converged: "));
      ++verdicts;
    }
    EXPECT_EQ(verdicts, 1);
  }
}

// Chains that have found no set with a likelihood have figures, too, which would be those of where they began.
TEST(Posterior, IsNotOfStatesWithoutALikelihood) {
  const double none = -std::numeric_limits<double>::infinity();
  const ShownChains shown;
  const auto reportOf = [&](const DreamSampler& chains, const auto& summary) {
    return formatPosterior(shown.settings, chains, shown.dimensions, summary ? &*summary : nullptr,
                           {.untransformed = 300, .notFinite = 100}, {"p.dat", "c.dat"});
  };
  const auto nowhere = sampled(untilBudget(400), sampledFunction({-6.0, -6.0}, {6.0, 6.0}, [=](auto) { return none; }));
  const auto nothing = summarisePosterior(nowhere, shown.dimensions, shown.prior, 1000);
  EXPECT_FALSE(nothing);
  EXPECT_THAT(
      reportOf(nowhere, nothing),
      ::testing::ElementsAre(
          ::testing::_, ::testing::_,
          ::testing::AllOf(::testing::StartsWith("Warning: No posterior: none of the 399 evaluations "),
                           ::testing::HasSubstr("has a likelihood: 300 have simulated values without a Box-Cox"),
                           ::testing::HasSubstr("; 100 have no finite errors"),
                           ::testing::HasSubstr(". Zeros have a transformation with"),
                           ::testing::HasSubstr(" Error_Deviation, Error_Share and Error_Bias must fit"))));
  // A peak that chains reach late: what they were before is left out.
  const auto peak = [=](std::span<const double> x) { return std::abs(x[0] - 5.0) < 0.1 ? 0.0 : none; };
  DreamSettings settings = untilBudget(4'000);
  settings.burnInShare = 0.0;
  const auto late = sampled(settings, sampledFunction({-6.0, -6.0}, {6.0, 6.0}, peak));
  const auto found = summarisePosterior(late, shown.dimensions, shown.prior, 1000);
  ASSERT_TRUE(found);
  EXPECT_GT(found->withoutLikelihood, 4U);
  EXPECT_EQ(found->draws + found->withoutLikelihood, 4 * (late.history().generations() - *late.burnIn()));
  EXPECT_NEAR(found->dimensions[0].mean, std::exp(5.0), 15.0);
  EXPECT_THAT(
      reportOf(late, found),
      ::testing::Contains(::testing::StartsWith(fmt::format(
          "Warning: {} states more behind burn-in have no likelihood and are left out", found->withoutLikelihood))));
}

TEST(Posterior, OfManyDimensionsHasTheLargestCorrelationsAndSaysNothingOfParametersWhileChainsAreApart) {
  ShownChains shown;
  const auto matrix = summarisePosterior(*shown.chains, shown.dimensions, shown.prior, 2);
  auto summary = summarisePosterior(*shown.chains, shown.dimensions, shown.prior, 1);
  EXPECT_TRUE(matrix->largestCorrelations.empty());
  EXPECT_TRUE(summary->correlations.empty());
  ASSERT_EQ(summary->largestCorrelations.size(), 1U);
  EXPECT_EQ(summary->largestCorrelations[0].value, matrix->correlations[0][1]);
  const DataTable table = posteriorCorrelationTable(*summary, shown.dimensions);
  EXPECT_EQ(table.columns, (std::vector<std::string>{"First", "Second", "Correlation"}));
  EXPECT_EQ(table.rows.size(), 1U);
  summary->largestCorrelations[0].value = 0.9;
  const auto tradeOff = ::testing::Contains(::testing::HasSubstr("trade off: a correlation of 0.90"));
  EXPECT_THAT(shown.report(&*summary), tradeOff);
  summary->dimensions[0].rHat = 1.4;
  EXPECT_THAT(shown.report(&*summary), ::testing::Not(tradeOff));

  // The table of the log has those that the data have narrowed, which stand behind ten of which they say nothing.
  const PosteriorSummary::Dimension narrowed = summary->dimensions[1];
  PosteriorSummary::Dimension asBefore = narrowed;
  asBefore.quantiles = asBefore.priorQuantiles;
  summary->dimensions.assign(60, narrowed);
  std::fill_n(summary->dimensions.begin(), 10, asBefore);
  summary->mostProbable.assign(60, 0.0);
  shown.dimensions.names.clear();
  for (int j = 0; j < 60; ++j) shown.dimensions.names.push_back(fmt::format("p{}.", j));
  const std::vector<std::string> lines = shown.report(&*summary);
  const auto rows = [&](const std::string& name) {
    return std::ranges::count_if(
        lines, [&](const std::string& line) { return line.starts_with("   " + name) && line.size() > 100; });
  };
  EXPECT_EQ(rows("p"), 50);
  EXPECT_EQ(rows("p9."), 0);
  EXPECT_EQ(rows("p10."), 1);
  EXPECT_EQ(rows("p59."), 1);
  EXPECT_THAT(lines, ::testing::Contains(::testing::HasSubstr("The other 10 of 60 parameters, which the data have "
                                                              "narrowed less, are in basin_Posterior.dat")));
}

}  // namespace
}  // namespace mirevo
