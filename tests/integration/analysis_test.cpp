#include <algorithm>
#include <cmath>
#include <cstdlib>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "integration/model_folder.h"

namespace mirevo::testing {
namespace {

using ::testing::AllOf;
using ::testing::Contains;
using ::testing::HasSubstr;
using ::testing::StartsWith;

/// The numbers of a report's row: those behind `name` in the first comment that begins with it, after a line that
/// begins with `table`.
std::vector<double> reportRow(const ResultTable& results, const std::string& table, const std::string& name) {
  bool inTable = false;
  for (const std::string& comment : results.comments) {
    const auto begin = comment.find_first_not_of("# ");
    const std::string line = begin == std::string::npos ? "" : comment.substr(begin);
    if (inTable && line.starts_with(name + " ")) {
      std::istringstream cells(line.substr(name.size()));
      std::vector<double> numbers;
      for (double number = 0.0; cells >> number;) numbers.push_back(number);
      return numbers;
    }
    inTable = line.empty() ? false : inTable || line.starts_with(table);
  }
  return {};
}

TEST(LocalSensitivity, OfALinearModelGivesTheCovarianceOfItsClosedForm) {
  const ModelFolder folder;
  const ProgramResult run = runProgram({folder.writeSetup({.option = 1})});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  const ResultTable results = readResults(folder.read("basin_Sensitivity.dat"));
  ASSERT_EQ(results.rows.size(), 6U);  // header, base, two sets a parameter
  EXPECT_EQ(results.rows[1][2], "4");
  EXPECT_EQ(results.rows[3][2], "4.02");

  // By hand: simulated = a + b sin(t / 58), residuals of a - 5 = -1 and b - 2 = -1, (X'X)^-1 of the columns 1 and
  // sin(t / 58) over t = 0 ... 364, Student's t of 363 degrees of freedom 1.966521.
  const auto a = reportRow(results, "Parameter (model scale)", "a");
  const auto b = reportRow(results, "Parameter (model scale)", "b");
  ASSERT_EQ(a.size(), 4U);
  ASSERT_EQ(b.size(), 4U);
  EXPECT_NEAR(a[1] / 0.06426530, 1.0, 2e-5);
  EXPECT_NEAR(b[1] / 0.09095656, 1.0, 2e-5);
  EXPECT_NEAR(a[2], 3.873621, 1e-4);
  EXPECT_NEAR(b[3], 1.178868, 1e-4);
  EXPECT_NEAR(reportRow(results, "Correlation", "a")[1], 0.000008, 1e-4);
  EXPECT_NEAR(reportRow(results, "Covariance", "b")[0], 0.000000048, 1e-7);
  EXPECT_NEAR(reportRow(results, "Derivatives of objective functions", "a")[0], -0.816710, 1e-4);
  EXPECT_THAT(results.comments, Contains(HasSubstr("1. a")));

  EXPECT_THAT(folder.read("basin.log"), HasSubstr("\nParameter covariance: 365 observations, 2 parameters, 363 "));
}

TEST(Uncertainty, SummaryAndBandAreThoseOfTheSample) {
  const ModelFolder folder;
  std::string observed = folder.read("observed.csv");
  const auto second = observed.find("2001-01-02,") + 11;
  observed.erase(second, observed.find('\n', second) - second);  // a missing value
  folder.write("observed.csv", observed);
  // a ~ N(5, 0.5), b ~ N(2, 0.1), 400 sets.
  const ProgramResult run =
      runProgram({folder.writeSetup({.option = 3, .maxEvaluations = 400, .modelArguments = "--fail-above 6.2"})});
  ASSERT_EQ(run.exitCode, 0) << run.error;
  const ResultTable results = readResults(folder.read("basin.dat"));
  const auto a = reportRow(results, "Parameter (search scale)", "a");
  ASSERT_EQ(a.size(), 7U);
  EXPECT_NEAR(a[0], 5.0, 0.005);
  EXPECT_NEAR(a[1], 0.5, 0.01);
  EXPECT_THAT(results.comments, Contains(StartsWith("# Uncertainty analysis: 400 evaluations, 3 failed")));
  EXPECT_EQ(reportRow(results, "Output measure", "flow").size(), 7U);
  EXPECT_LT(std::abs(reportRow(results, "Sample correlation", "a")[1]), 0.15);

  std::istringstream band(folder.read("basin_Band_1.csv"));
  std::vector<std::string> lines;
  for (std::string line; std::getline(band, line);) lines.push_back(line);
  ASSERT_EQ(lines.size(), 2U + 364U);  // the missing observation is not there
  EXPECT_EQ(lines[0], "# Band of flow");
  EXPECT_EQ(lines[1], "time,observed,5 %,50 %,95 %");
  EXPECT_THAT(lines[3], StartsWith("2001-01-03 00:00,"));
  double values[4];
  ASSERT_EQ(
      std::sscanf(lines[2].c_str(), "2001-01-01 00:00,%lf,%lf,%lf,%lf", values, values + 1, values + 2, values + 3), 4);
  EXPECT_EQ(values[0], 5.0);
  // At t = 0 the model gives a: the band's median lies amid the values of the runs that succeeded.
  const auto below = std::ranges::count_if(results.rows, [&](const auto& row) {
    return row[1] == "OK" && std::strtod(row[2].c_str(), nullptr) < values[2];
  });
  EXPECT_EQ(below, 198);  // of 397; in single precision the median itself may count
  EXPECT_THAT(results.comments, Contains("# Band of flow: 100.0 % of 364 observations lie between the 5 and the 95 % "
                                         "quantile"));
  EXPECT_THAT(folder.read("basin.log"), AllOf(HasSubstr("\nBand of flow: 100.0 % of 364"),
                                              HasSubstr("\n400 model evaluations, 3 of them failed\n")));
}

}  // namespace
}  // namespace mirevo::testing
