#include <algorithm>
#include <cstdlib>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "integration/model_folder.h"

namespace mirevo::testing {
namespace {

using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::Not;
using ::testing::StartsWith;

double number(const std::string& cell) {
  return std::strtod(cell.c_str(), nullptr);
}

TEST(Optimisation, ACalibrationEndsWithItsBestSetInLogResultsAndModelFolder) {
  const ModelFolder folder;
  const ProgramResult result = runProgram({folder.writeSetup({.maxEvaluations = 200})});
  ASSERT_EQ(result.exitCode, 0) << result.error;
  EXPECT_EQ(result.output + result.error, "");

  const ResultTable table = readResults(folder.read("basin_Optimisation.dat"));
  ASSERT_EQ(table.rows.size(), 202U);  // header, the search's evaluations, the final model run
  EXPECT_THAT(table.rows[0], ElementsAre("Evaluation", "Status", "a", "b", "flow", "fit", "Aggregate"));
  double best = 1e30;
  for (std::size_t i = 1; i < table.rows.size(); ++i) {
    ASSERT_EQ(table.rows[i].size(), 7U);
    EXPECT_EQ(table.rows[i][0], std::to_string(i));
    EXPECT_EQ(table.rows[i][1], "OK");
    best = std::min(best, number(table.rows[i][6]));
  }
  EXPECT_LT(best, 0.1);
  EXPECT_EQ(number(table.rows.back()[6]), best);
  EXPECT_THAT(table.comments.front(), HasSubstr("Small test basin"));
  EXPECT_THAT(table.comments, Contains("# Optimisation terminated: Maximum number of model evaluations reached"));
  EXPECT_THAT(table.comments, Contains(StartsWith("# Best evaluation: ")));
  EXPECT_THAT(table.comments, Contains("# Best a = " + table.rows.back()[2]));

  const std::string log = folder.read("basin.log");
  EXPECT_THAT(log, HasSubstr("Optimisation terminated: Maximum number of model evaluations reached"));
  EXPECT_THAT(log, HasSubstr("   a = " + table.rows.back()[2] + "\n"));
  EXPECT_THAT(log, EndsWith("\n\nNormal termination\n"));
  EXPECT_THAT(folder.read("basin._spi_"), EndsWith("PROGRE100.0\n"));
  EXPECT_THAT(folder.read("basin._spi_"), HasSubstr("\nMESLBL of 201\n"));
  EXPECT_EQ(folder.read("basin_Termination.log"), "Successful completion\n");
  EXPECT_FALSE(folder.exists("calSimErr.dat"));
  EXPECT_EQ(folder.read("model/parameters.txt"), "a = 5\nb = 2\nc = 1\n") << "the model's own folder is never written";
  EXPECT_NEAR(number(folder.read("basin_Process1/parameters.txt").substr(4)), number(table.rows.back()[2]), 1e-6);
}

TEST(Optimisation, OfEqualSetsTheResultsNameTheOneThatTheSearchTookAndUnusedParametersAreWarnedOf) {
  const ModelFolder folder;
  folder.write("model/parameters.tpl", "!\na = 4\nc = !c!\n# 1!c!\n");
  ASSERT_EQ(runProgram({folder.writeSetup({.maxEvaluations = 10})}).exitCode, 0);
  const ResultTable table = readResults(folder.read("basin_Optimisation.dat"));
  ASSERT_EQ(table.rows.size(), 12U);
  EXPECT_THAT(table.comments, Contains("# Best evaluation: 10"));
  EXPECT_THAT(table.comments, Contains("# Best a = " + table.rows[10][2]));
  EXPECT_EQ(table.rows[11][2], table.rows[10][2]);
  const std::string log = folder.read("basin.log");
  for (const char* name : {"a", "b"}) {
    EXPECT_THAT(log, HasSubstr(fmt::format("Warning: the variable parameter \"{}\" stands in no template", name)));
  }
  EXPECT_THAT(log, Not(HasSubstr("parameter \"c\" stands in no template"))) << "a fixed one";
  EXPECT_THAT(log, HasSubstr("parameters.tpl:4: the placeholder of parameter \"c\""));
}

TEST(Optimisation, ResultsAreTheSameBitsWhateverOrderTheModelRunsEndIn) {
  const ModelFolder folder;
  folder.useScript(kSleepByParameters);
  for (RunSettings settings :
       {RunSettings{.algorithm = 1, .maxEvaluations = 50}, RunSettings{.option = 3, .maxEvaluations = 40}}) {
    std::string ofOneSlot;
    for (const int slots : {1, 2, 4}) {
      settings.slots = slots;
      ASSERT_EQ(runProgram({folder.writeSetup(settings)}).exitCode, 0);
      const std::string results = withoutDates(folder.read(settings.resultFile()));
      if (slots == 1) ofOneSlot = results;
      EXPECT_EQ(results, ofOneSlot) << slots << " slots";
      std::vector<int> ended;
      std::istringstream log(folder.read("basin.log"));
      for (std::string line; std::getline(log, line);) {
        const auto at = line.find(" completed: OK");
        if (at != std::string::npos) ended.push_back(std::atoi(line.c_str() + line.rfind(' ', at - 1)));
      }
      ASSERT_EQ(ended.size(), settings.option == 3 ? 40U : 51U);
      EXPECT_EQ(std::is_sorted(ended.begin(), ended.end()), slots == 1);
    }
  }
}

TEST(Scenarios, ASingleRunEvaluatesTheInitialSet) {
  const ModelFolder folder;
  ASSERT_EQ(runProgram({folder.writeSetup({.option = 0})}).exitCode, 0);
  const ResultTable table = readResults(folder.read("basin.dat"));
  ASSERT_EQ(table.rows.size(), 2U);
  EXPECT_THAT(table.comments, Not(Contains(StartsWith("# Random seed"))));  // nothing is drawn
  EXPECT_THAT(std::vector(table.rows[1].begin(), table.rows[1].begin() + 4), ElementsAre("1", "OK", "4", "1"));
  // Simulated minus observed is -1 - sin(t / 58) over t = 0 ... 364.
  EXPECT_NEAR(number(table.rows[1][4]), 1.224418, 1e-5);
}

TEST(Scenarios, RunsThatEndInAnotherOrderStandInTheirOwnInTheResults) {
  const ModelFolder folder;
  folder.useScript(
      "while grep -q '^a = *1$' parameters.txt && ! test -e ../fourth; do sleep 0.01; done\n"
      "grep -q '^a = *4$' parameters.txt && touch ../fourth");
  const std::string setup =
      folder.writeSetup({.option = 0, .scenarios = {"1, 1, 1", "2, 1, 1", "3, 1, 1", "4, 1, 1"}, .slots = 2});
  const ProgramResult result = runProgram({setup}, {{"VOLK_PROGRESS", "STDOUT"}});
  ASSERT_EQ(result.exitCode, 0) << result.error;
  EXPECT_LT(result.output.find("No. 3 completed: OK"), result.output.find("No. 1 completed: OK")) << result.output;
  const ResultTable table = readResults(folder.read("basin.dat"));
  ASSERT_EQ(table.rows.size(), 5U);
  for (std::size_t i = 1; i < 5; ++i) {
    EXPECT_EQ(table.rows[i][0], std::to_string(i));
    EXPECT_EQ(table.rows[i][2], std::to_string(i));
  }
  EXPECT_FALSE(folder.exists("basin._spi_"));
}

TEST(SavedOutput, EveryEvaluationKeepsItsOwnAndAnEarlierRunsIsNotMixedIn) {
  const ModelFolder folder;
  folder.useScript(MIREVO_TEST_MODEL " && head -n 180 simulated.csv >half && exec mv half simulated.csv");
  RunSettings settings{
      .option = 0, .scenarios = {"1, 1, 1", "2, 1, 1", "3, 1, 1"}, .slots = 2, .savedFile = "model/simulated.csv"};
  ASSERT_EQ(runProgram({folder.writeSetup(settings)}).exitCode, 0);
  for (const int number : {1, 2, 3}) {
    EXPECT_THAT(folder.read(fmt::format("basin_Saved/{}/simulated.csv", number)),
                StartsWith(fmt::format("time,simulated\n2001-01-01,{}\n", number)));
  }
  // Half of each series is missing; the first run to finish says so, once.
  const std::string log = folder.read("basin.log");
  const auto warning = log.find("observations in the evaluation period are not used");
  EXPECT_NE(warning, std::string::npos);
  EXPECT_EQ(log.find("are not used", warning + 60), std::string::npos);

  settings.scenarios = {"4, 1, 1"};
  ASSERT_EQ(runProgram({folder.writeSetup(settings)}).exitCode, 0);
  EXPECT_TRUE(folder.exists("basin_Saved.1/3/simulated.csv"));
  EXPECT_FALSE(folder.exists("basin_Saved/2"));
}

TEST(FailedRuns, ASingleRunThatFailsEndsTheRunWithTheReason) {
  const ModelFolder folder;
  const ProgramResult result = runProgram({folder.writeSetup({.option = 0, .modelArguments = "--fail-above 3"})});
  EXPECT_EQ(result.exitCode, 1);
  for (const std::string& text : {result.error, folder.read("basin.log")}) {
    EXPECT_THAT(text, HasSubstr("Error: Unable to continue. No of failed simulations too high."));
    EXPECT_THAT(text, HasSubstr("run.sh exited with code 3"));
  }
  EXPECT_THAT(folder.read("basin.log"), Not(HasSubstr("Normal termination")));
  EXPECT_THAT(folder.read("basin.dat"), HasSubstr("\n1\tFAILED\t4\t1\t1e+30\t1e+30\t1e+30\n"));
  EXPECT_THAT(folder.read("basin.dat"), HasSubstr("# Error: Unable to continue."));
  EXPECT_THAT(folder.read("calSimErr.dat"), HasSubstr("   a = 4\n   b = 1\n"));
  EXPECT_THAT(folder.read("calSimErr.dat"), HasSubstr("a = 4 is too large"));
  // With its standard outputs closed, what it writes there must not get into the files that it opens.
  const std::string results = folder.read("basin.dat");
  EXPECT_NE(std::system(fmt::format("'{}' '{}' <&- >&- 2>&-", MIREVO_PROGRAM, folder / "basin.kdx").c_str()), 0);
  EXPECT_EQ(withoutDates(folder.read("basin.dat")), withoutDates(results));
}

TEST(Refusals, WhatIsMissingIsNamedBeforeAnyModelRun) {
  for (const std::string name : {"model/parameters.tpl", "model/simulated.csv", "observed.csv", "model/run.sh"}) {
    const ModelFolder folder;
    const std::string setup = folder.writeSetup({});
    folder.editSetup(name, "model/none");
    const ProgramResult result = runProgram({setup});
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_THAT(result.error, StartsWith("Mirevo: Error"));
    EXPECT_THAT(result.error, HasSubstr("model/none"));
    EXPECT_THAT(folder.read("basin.log"), EndsWith("\n\n" + result.error.substr(std::size("Mirevo: ") - 1)));
    EXPECT_FALSE(folder.exists("basin_Optimisation.dat"));
  }
}

}  // namespace
}  // namespace mirevo::testing
