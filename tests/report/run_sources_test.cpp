// What a report takes from the files of a run, as the program writes them.
#include "report/run_sources.h"

#include <cmath>
#include <limits>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "algorithms/analyses/covariance.h"
#include "common/run_files.h"
#include "report/report_analyses.h"
#include "temporary_folder.h"

namespace mirevo {
namespace {

using ::testing::ElementsAre;

TEST(FailureReasons, AreGroupedWhereTheyDifferInNumbersAlone) {
  const TemporaryFolder folder;
  std::string text = failureTableHead({"Title"});
  const auto add = [&text](int number, std::string reason, std::vector<std::string> output = {}) {
    text += failureRowText({number, {EvaluationFailure::Kind::exitCode, std::move(reason), std::move(output)}});
  };
  add(3, "run.sh exited with code 3", {"1", "2", "3", "4", "5\r", "", "7"});
  add(7, "/x/basin_Process2/out.csv: Evaluation No. 1");
  add(12, "/x/basin_Process17/out.csv: Evaluation No. 4", {"not shown"});
  add(13, "cut off");
  folder.write("basin_Failures.dat", text.substr(0, text.size() - 2));
  const auto source = readFailures(folder / "basin", run_files::kPlain);
  ASSERT_TRUE(source.content.has_value());
  const auto reasons = groupFailures(*source.content);
  ASSERT_EQ(reasons.size(), 2U);
  EXPECT_EQ(reasons[0].count, 2);
  EXPECT_EQ(reasons[0].reason, "/x/basin_Process2/out.csv: Evaluation No. 1");
  EXPECT_EQ(reasons[0].example, "Evaluation 7: /x/basin_Process2/out.csv: Evaluation No. 1");
  EXPECT_EQ(reasons[1].count, 1);
  EXPECT_EQ(reasons[1].example, "Evaluation 3: run.sh exited with code 3\n2\n3\n4\n5\n\n7");
  const auto missing = readFailures(folder / "other", run_files::kPlain);
  EXPECT_FALSE(missing.content.has_value());
  EXPECT_EQ(missing.file + ": " + missing.reason, "other_Failures.dat: No such file or directory");
}

TEST(ReportedCovariance, IsThatOfTheAnalysisToTheLastBit) {
  const double nan = std::numeric_limits<double>::quiet_NaN();
  const LinearisedModel model{
      {0.1, -0.2, 0.3, -0.3, nan, 0.1}, {}, {{1, 1, 1, 1, 9, 1}, {0, 0, 0, 0, 0, 0}, {0, 1.1, 2.3, 3, 9, 4}}};
  SearchSpace space;
  space.names = {"Correlation of # it", "snow\t\"melt", "k"};
  space.initial = space.lower = space.upper = {1.0 / 3.0, 2.0, -1.0};
  space.transformation = {TransformationType::none, TransformationType::none, TransformationType::logarithmic};
  const ParameterCovariance covariance = parameterCovariance(model);
  const std::vector<DataTable> tables = covarianceTables(covariance, space, space.initial);
  const TemporaryFolder folder;
  std::string fault;
  EXPECT_FALSE(reportedCovariance(folder / "basin", fault));
  EXPECT_EQ(fault, "") << "there is none";
  for (const DataTable& table : tables) {
    folder.write(runFilePath("basin", table.file), dataTableText(table));
  }
  const auto reported = reportedCovariance(folder / "basin", fault);
  ASSERT_TRUE(reported.has_value());
  EXPECT_THAT(reported->names, ElementsAre(space.names[0], space.names[2]));
  EXPECT_THAT(reported->leftOut, ElementsAre(ReportedLeftOut{space.names[1], covariance.leftOut[0].reason}));
  EXPECT_EQ(reported->correlation, covariance.correlation);
  EXPECT_THAT(reported->lagText, ::testing::StartsWith("Lag-1 correlation of the residuals: -0."));
  const std::vector<ParameterLimits> limits = parameterLimits(covariance, space, space.initial);
  EXPECT_THAT(reported->estimate, ElementsAre(1.0 / 3.0, std::exp(-1.0)));
  EXPECT_THAT(reported->standardDeviation, ElementsAre(limits[0].standardDeviation, limits[1].standardDeviation));
  EXPECT_THAT(reported->lower95, ElementsAre(limits[0].lower, limits[1].lower));
  EXPECT_THAT(reported->upper95, ElementsAre(limits[0].upper, limits[1].upper));

  folder.write("basin_Correlation.dat", dataTableHead(tables[1]));
  EXPECT_FALSE(reportedCovariance(folder / "basin", fault));
  EXPECT_NE(fault, "") << "cut off: all of it or nothing";
}

}  // namespace
}  // namespace mirevo
