#include <map>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "common/text.h"
#include "integration/model_folder.h"
#include "integration/mpi_job.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

using ::testing::AllOf;
using ::testing::AnyOf;
using ::testing::HasSubstr;
using ::testing::Not;

constexpr const char* kTables[] = {"basin_Optimisation_Covariance.dat", "basin_Optimisation_Correlation.dat",
                                   "basin_Optimisation_ParameterLimits.dat", "basin_Optimisation_Jacobian.dat"};

class GlmRun : public ::testing::Test {
 protected:
  void writeSetup(int slots = 1, int maxEvaluations = 60) {
    setup_ = folder_.writeSetup({.search = "GLM", .maxEvaluations = maxEvaluations, .slots = slots});
  }
  std::string log() const { return folder_.read("basin.log"); }
  /// The result file and the tables but for the head of each, which has dates.
  std::map<std::string, std::string> files() const {
    std::map<std::string, std::string> found;
    for (const char* name : kTables) {
      const std::string text = folder_.read(name);
      found[name] = text.substr(std::min(text.size(), text.find('\n', text.find("Setup file"))));
    }
    found["results"] = withoutDates(folder_.read("basin_Optimisation.dat"));
    found["series"] = folder_.read("basin_Series.dat");
    return found;
  }
  void removeFiles() const {
    for (const auto& entry : std::filesystem::directory_iterator(folder_.path())) {
      const std::string name = entry.path().filename().string();
      if (name.starts_with("basin") && name != "basin.kdx") std::filesystem::remove_all(entry.path());
    }
  }

  ModelFolder folder_;
  std::string setup_;
};

TEST_F(GlmRun, HasTheSameBitsOnAnyNumberOfSlotsAndRanks) {
  folder_.useScript(kSleepByParameters);
  std::map<std::string, std::string> expected;
  for (const int processes : {0, 0, 3}) {
    if (processes > 0 && !mpirunIsInstalled()) continue;
    writeSetup(processes == 0 && !expected.empty() ? 4 : 1);
    const ProgramResult run = processes > 0 ? startJob(processes, {setup_}).wait() : runProgram({setup_});
    ASSERT_EQ(run.exitCode, 0) << run.error << log();
    if (expected.empty()) expected = files();
    EXPECT_EQ(files(), expected) << processes;
    for (const char* name : kTables) EXPECT_TRUE(folder_.exists(name)) << name;
    removeFiles();
  }
}

/// The covariance is that of the derivatives that were there, and a restart ends as a run that was left alone.
TEST_F(GlmRun, OfAnInterruptedRunTellsTheCovarianceAndARestartGoesOn) {
  writeSetup();
  ASSERT_EQ(runProgram({setup_}).exitCode, 0) << log();
  const std::map<std::string, std::string> expected = files();
  // Behind the initial sample of 6 sets and the first derivatives by 2 parameters come the trials, which do not end.
  struct Case {
    int rows;
    bool hasCovariance;
  };
  for (const auto& [rows, hasCovariance] : {Case{7, false}, Case{8, true}, Case{20, true}}) {
    SCOPED_TRACE(rows);
    removeFiles();
    folder_.write("hold", "");
    folder_.useScript(
        fmt::format("echo run >>../runs\ntest ! -e ../hold -o $(wc -l <../runs) -le {} || exec sleep 3600", rows));
    folder_.write("runs", "");
    writeSetup();
    RunningProgram program({setup_});
    EXPECT_TRUE(folder_.reaches("basin_Optimisation.dat", fmt::format("\n{}\tOK\t", rows)));
    folder_.write("basin._kill_", "");
    EXPECT_EQ(program.wait().exitCode, 1);
    for (const char* name : kTables) EXPECT_EQ(folder_.exists(name), hasCovariance) << name << log();
    if (hasCovariance) {
      const ReadTable limits = readDataTable(folder_.read(kTables[2]));
      EXPECT_EQ(limits.rows.size(), 2U);
      EXPECT_THAT(log(), HasSubstr("Covariance at evaluation "));
      EXPECT_THAT(folder_.read(kTables[0]), HasSubstr("# Unfinished run"));
    }
    std::filesystem::remove(folder_ / "hold");
    folder_.editSetup("Restart = 0", "Restart = 1");
    ASSERT_EQ(runProgram({setup_}).exitCode, 0) << log();
    EXPECT_THAT(log(), HasSubstr(fmt::format("Restart: {} evaluations are taken from", rows)));
    EXPECT_EQ(files(), expected);
  }
}

/// The least sum of squares need not belong to the least aggregate: the best set is that of the former, and its final
/// run has its series.
TEST_F(GlmRun, KeepsTheSeriesOfItsBestSetThoughAnotherHasTheLeastAggregate) {
  for (const int processes : {0, 3}) {
    if (processes > 0 && !mpirunIsInstalled()) continue;
    writeSetup();
    folder_.editSetup("Statistic_Type = 1", "Statistic_Type = 'KGE'");
    const std::string fixed =
        "\n      Lower_Bound = 0.0\n      Upper_Bound = 5.0\n      Transformation_Type = 0\n      "
        "Parameter_Type = 1";
    folder_.editSetup("Initial_Value = 1.0" + fixed,
                      "Initial_Value = 3.0" + fixed);  // c, which is 1 of the observations
    const ProgramResult run = processes > 0 ? startJob(processes, {setup_}).wait() : runProgram({setup_});
    ASSERT_EQ(run.exitCode, 0) << run.error << log();
    const ReadTable results = readDataTable(folder_.read("basin_Optimisation.dat"));
    const ReadTable best = readDataTable(folder_.read("basin_Series.dat"));
    const std::size_t aggregate = results.column("Aggregate").value();
    double least = 1e30;
    for (const auto& row : results.rows) least = std::min(least, realCell(row[aggregate]).value());
    EXPECT_GT(realCell(results.rows.back()[aggregate]).value(), least) << "else the test tells nothing";
    EXPECT_THAT(log(),
                AllOf(Not(HasSubstr("they were not kept")), HasSubstr("Final model run"),
                      HasSubstr(fmt::format("The least aggregate, {}, is that of evaluation", formatReal(least)))));
    EXPECT_EQ(best.rows.size(), 365U);
    EXPECT_FALSE(std::isnan(realCell(best.rows.front()[best.column("Best").value()]).value()));
    removeFiles();
  }
}

/// The best set, a = 5 and b = 2, is cut off.
TEST_F(GlmRun, GoesAlongAConstraintAndTellsThatTheLimitsTakeNoAccountOfIt) {
  writeSetup();
  folder_.editSetup(
      "TqSEKdxListItemCount = 0\n    [/INTERNAL_CONSTRAINTS]",
      "TqSEKdxListItemCount = 1\n      [CONSTRAINT_1]\n        Left_Equation = 'a + b'\n        "
      "Right_Equation = '6.5'\n        Logical_Operator = 1\n      [/CONSTRAINT_1]\n    [/INTERNAL_CONSTRAINTS]");
  const ProgramResult run = runProgram({setup_});
  ASSERT_EQ(run.exitCode, 0) << run.error << log();
  EXPECT_THAT(log(), AllOf(HasSubstr("The estimate lies at constraint 1 (a + b <= 6.5)\n"),
                           HasSubstr("Warning: The estimate lies at constraint 1 (a + b <= 6.5), of which covariance, "
                                     "correlation and limits take no account")));
  EXPECT_THAT(log(), Not(HasSubstr("FAILED")));
}

TEST_F(GlmRun, WithoutARunToStartFromIsAnError) {
  folder_.useScript("exit 3");
  for (const int restart : {0, 1}) {
    setup_ = folder_.writeSetup({.search = "GLM", .maxEvaluations = restart == 0 ? 60 : 80, .restart = restart});
    const ProgramResult run = runProgram({setup_});
    EXPECT_EQ(run.exitCode, 1);
    EXPECT_THAT(run.error, AllOf(HasSubstr("Error: No model run of the initial sample of GLM succeeded"),
                                 HasSubstr("the first of them, evaluation 1: run.sh exited with code 3")));
    EXPECT_THAT(log(), Not(AnyOf(HasSubstr("Best parameter set"), HasSubstr("Final model run"),
                                 HasSubstr("Normal termination"))));
    EXPECT_THAT(folder_.read("basin_Optimisation.dat"), HasSubstr("\n6\tFAILED\t"));
    EXPECT_EQ(log().find("6 evaluations are taken from") != std::string::npos, restart == 1) << log();
  }
}

TEST_F(GlmRun, IsCheckedBeforeItRuns) {
  writeSetup();
  const ProgramResult check = runProgram({"--check", setup_});
  EXPECT_EQ(check.exitCode, 0) << check.error;
  EXPECT_THAT(check.output, HasSubstr("Gauss-Levenberg-Marquardt"));
  EXPECT_FALSE(folder_.exists("basin_Optimisation.dat"));

  const std::string sound = folder_.read("basin.kdx");
  struct Case {
    const char* from;
    const char* to;
    const char* expected;
  };
  const Case cases[] = {
      {"Starts = 4", "Starts = 4\nLambdas = 0", "Lambdas: expected 1 to 64, found 0"},
      {"Starts = 4", "Starts = 4\nPrior_Values = 4, 1, 1", "expected 2, one for each variable parameter, found 3"},
      {"Starts = 4", "Starts = 4\nPrior_Weights = 1, -1", "expected weights of 0 or more, found -1"},
      {"Starts = 4", "Starts = 4\nDifferencing = 'sideways'", "'forward', 'central', found the text"},
      {"Upper_Bound = 5.0\n      Transformation_Type = 0", "Upper_Bound = 5.0\n      Transformation_Type = 2",
       "expected 0 or 1 for GLM, found an integer parameter"},
  };
  for (const Case& each : cases) {
    folder_.write("basin.kdx", sound);
    folder_.editSetup(each.from, each.to);
    for (const std::vector<std::string>& arguments : {std::vector{setup_}, {"--check", setup_}}) {
      const ProgramResult refused = runProgram(arguments);
      EXPECT_EQ(refused.exitCode, 1) << each.to;
      EXPECT_THAT(refused.error, AllOf(HasSubstr(each.expected), HasSubstr("basin.kdx:"))) << each.to;
    }
  }
  const std::pair<const char*, const char*> warnings[] = {
      {"Starts = 4\nPrior_Values = 4, 1", "Prior_Values: has no effect with Regularisation = 0"},
      {"Starts = 4\nPrior_Weights = 1, 1", "Prior_Weights: has no effect with Regularisation = 0"},
      {"Starts = 4\nRegularisation = 1\nPrior_Values = 4, 1000",
       "Prior_Values: outside the bounds, towards which the estimates are drawn: 1000 of b"}};
  for (const auto& [to, expected] : warnings) {
    folder_.write("basin.kdx", sound);
    folder_.editSetup("Starts = 4", to);
    const ProgramResult doubted = runProgram({"--check", setup_});
    EXPECT_EQ(doubted.exitCode, 0) << doubted.error;
    EXPECT_THAT(doubted.error + doubted.output, HasSubstr(expected));
  }
}

}  // namespace
}  // namespace mirevo::testing
