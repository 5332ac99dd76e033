#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "integration/model_folder.h"
#include "integration/mpi_job.h"

namespace mirevo::testing {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;

constexpr const char* kPeriods = R"(Aggregation_Method = 0
    [VALIDATION_PERIODS]
      TqSEKdxListItemCount = 2
      [VALIDATION_1]
        Name = 'autumn'
        Start_Date = 2001-07-01
        End_Date = 2001-12-31
      [/VALIDATION_1]
      [VALIDATION_2]
        Start_Date = 1990-01-01
        End_Date = 1990-12-31
      [/VALIDATION_2]
    [/VALIDATION_PERIODS])";

class ValidationPeriods : public ::testing::Test {
 protected:
  void writeSetup(const RunSettings& settings) {
    setup_ = folder_.writeSetup(settings);
    resultFile_ = settings.resultFile();
    folder_.editSetup("End_Date = 2001-12-31", "End_Date = 2001-06-30");
  }
  void run(int exitCode = 0) const {
    const ProgramResult result = runProgram({setup_});
    ASSERT_EQ(result.exitCode, exitCode) << result.error << log();
  }
  std::string results() const { return withoutDates(folder_.read(resultFile_)); }
  std::string log() const { return folder_.read("basin.log"); }
  ReadTable table() const { return readDataTable(folder_.read(resultFile_)); }

  ModelFolder folder_;
  std::string setup_;
  std::string resultFile_;
};

TEST_F(ValidationPeriods, AreComputedLikeAnEvaluationPeriodAndChangeNothingElse) {
  writeSetup({.restart = 1, .modelArguments = "--fail-above 7.4"});
  run();
  const ReadTable without = table();
  folder_.editSetup("Aggregation_Method = 0", kPeriods);
  run(1);
  EXPECT_THAT(log(), HasSubstr("Start_Date of VALIDATION_1 (autumn): absent then, 2001-07-01"));
  folder_.editSetup("Restart = 1", "Restart = 0");
  run();
  const std::string whole = results();
  const ReadTable with = table();
  const std::size_t count = without.columns.size();
  ASSERT_EQ(with.columns.size(), count + 2);
  EXPECT_EQ(with.columns[count], "flow in autumn");
  EXPECT_EQ(with.columns[count + 1], "flow in 1990-01-01 to 1990-12-31");
  ASSERT_EQ(with.rows.size(), without.rows.size());
  for (std::size_t i = 0; i < with.rows.size(); ++i) {
    EXPECT_EQ(std::vector(with.rows[i].begin(), with.rows[i].begin() + static_cast<std::ptrdiff_t>(count)),
              without.rows[i]);
    EXPECT_EQ(with.rows[i][count] == "NaN", with.rows[i][1] == "FAILED");
    EXPECT_EQ(with.rows[i][count + 1], "NaN");
  }
  EXPECT_THAT(log(),
              AllOf(HasSubstr("Warning: output measure \"flow\" has no observation in the validation period \"1990"),
                    HasSubstr("\nCalibration and validation, evaluation ")));
  EXPECT_THAT(whole, HasSubstr("\n#      median of the best tenth "));
  EXPECT_NE(folder_.read("basin_Series.dat").find("\nflow\t2001-12-31T00:00:00\t"), std::string::npos);

  const std::string report = folder_.read("basin_Report.html");
  for (const char* part : {R"("kind":"validation","first":993945600000,"last":1009756800000,"best":{"n":184,)",
                           R"("figures":{"initial":{"n":181,)", R"("validation":{"best":)"}) {
    EXPECT_NE(report.find(part), std::string::npos) << part;
  }

  folder_.editSetup("Restart = 0", "Restart = 1");
  folder_.write(resultFile_, whole.substr(0, whole.find("\n20\t") + 1));
  run();
  EXPECT_EQ(results(), whole) << "of a run that goes on";

  const std::vector<std::string>& best = with.rows.back();
  writeSetup({.option = 0, .scenarios = {best[2] + ", " + best[3] + ", 1"}});
  folder_.editSetup("Start_Date = 2001-01-01", "Start_Date = 2001-07-01");
  folder_.editSetup("End_Date = 2001-06-30", "End_Date = 2001-12-31");
  run();
  EXPECT_EQ(table().rows.at(0).at(4), best[count]);
}

TEST_F(ValidationPeriods, MayBeInTheWarmUpWhichIsNoCalibration) {
  writeSetup({.option = 0, .scenarios = {"2, 1, 1"}});
  std::string periods = kPeriods;
  periods.replace(periods.find("2001-07-01"), 10, "2001-01-01").replace(periods.find("2001-12-31"), 10, "2001-01-20");
  folder_.editSetup("Aggregation_Method = 0", "Warm_Up_Days = 30\n" + periods);
  run();
  EXPECT_EQ(log().find("no independent test"), std::string::npos);
  EXPECT_THAT(log(), HasSubstr("151 of 181 observations in the evaluation period count"));
  const std::string report = folder_.read("basin_Report.html");
  for (const char* part : {R"("figures":{"initial":{"n":151,)", R"("best":{"n":20,)", R"("best":{"n":151,)"}) {
    EXPECT_NE(report.find(part), std::string::npos) << part;
  }
}

TEST_F(ValidationPeriods, AreQuantilesOfAnUncertaintyAnalysisAlsoInAJob) {
  if (!mpirunIsInstalled()) GTEST_SKIP() << "no mpirun";
  writeSetup({.option = 3, .maxEvaluations = 20});
  folder_.editSetup("Aggregation_Method = 0", kPeriods);
  folder_.editSetup("Start_Date = 1990-01-01\n        End_Date = 1990-12-31",
                    "Start_Date = 2001-12-01\n        End_Date = 2002-01-01");
  folder_.write("observed.csv", folder_.read("observed.csv") + "2002-01-01,5\n");  // the model ends before
  run();
  const auto found = [this] { return results() + folder_.read("basin_Quantiles.dat"); };
  const std::string alone = found();
  EXPECT_THAT(alone, AllOf(HasSubstr("\nvalidation\tflow in autumn\t20\t"), HasSubstr("\n#    flow in autumn ")));
  RunningProgram job = startJob(3, {setup_});
  EXPECT_EQ(job.wait().exitCode, 0);
  EXPECT_EQ(found(), alone);
  EXPECT_THAT(log(), AllOf(HasSubstr("\"flow\": 1 of 32 observations in the validation period \"2001-12-01 to "),
                           HasSubstr("\nflow in 2001-12-01 to 2002-01-01: of 31 of 32 observations in evaluation ")));
}

}  // namespace
}  // namespace mirevo::testing
