#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "integration/model_folder.h"
#include "matchers.h"

// What comes from other programs and other runs: listings that instruction files read, and earlier results.
namespace mirevo::testing {
namespace {

class InputOfOthers : public ::testing::Test {
 protected:
  ProgramResult run() const { return runProgram({folder_ / "basin.kdx"}); }
  void expectRun() const {
    const ProgramResult result = run();
    ASSERT_EQ(result.exitCode, 0) << result.error << log();
  }
  std::string log() const { return folder_.read("basin.log"); }
  /// The rows up to the aggregate.
  std::vector<std::vector<std::string>> rows() const {
    auto rows = readDataTable(folder_.read("basin_Optimisation.dat")).rows;
    for (auto& row : rows) row.resize(7);
    return rows;
  }

  ModelFolder folder_;
};

/// A listing has the digits of the CSV, so that nothing else differs.
TEST_F(InputOfOthers, ASeriesFromAListingGivesWhatItGivesFromACsv) {
  folder_.writeSetup({.maxEvaluations = 12});
  expectRun();
  const auto expected = rows();

  std::string byDates = "pif ~\n~Results~\n";
  std::string bySteps = byDates;
  std::string table = "name,time\n";
  std::istringstream csv(folder_.read("model/simulated.csv"));
  std::string line;
  std::getline(csv, line);
  for (int day = 1; std::getline(csv, line); ++day) {
    std::string date = line.substr(0, 10);
    table += fmt::format("v{},{}\n", day, date);
    std::erase(date, '-');
    byDates += fmt::format("l1 !dum! !q_{}!\n", date);
    bySteps += fmt::format("l1 !dum! !v{}!\n", day);
  }
  folder_.write("dates.ins", byDates);
  folder_.write("steps.ins", bySteps);
  folder_.write("times.csv", table);
  folder_.write("model/run.sh",
                fmt::format("#!/bin/sh\n{} \"$@\" || exit $?\n(echo 'A model'; echo 'Results of 2001'; sed 1d "
                            "simulated.csv | tr ',' ' ') >out.lst\n",
                            MIREVO_TEST_MODEL),
                0755);
  folder_.write("model/out.lst", "");
  for (const char* times : {"dates.ins'\nInstruction_Dates = 'YYYYMMDD'",
                            "steps.ins'\nInstruction_Start = 2001-01-01\nInstruction_Step = 24.0",
                            "steps.ins'\nInstruction_Times = 'times.csv'"}) {
    folder_.writeSetup({.maxEvaluations = 12});
    folder_.editSetup("File_Name = 'model/simulated.csv'",
                      fmt::format("File_Name = 'model/out.lst'\nInstruction_File = '{}", times));
    expectRun();
    EXPECT_EQ(rows(), expected) << times;
    EXPECT_THAT(log(), HasSubstr("out.lst: 365 time steps in the evaluation period")) << times;
  }
  // What the table says is part of the results.
  folder_.editSetup("Restart = 0", "Restart = 1");
  folder_.write("times.csv", table + "\n");
  EXPECT_EQ(run().exitCode, 1);
  EXPECT_THAT(log(), HasSubstr("the content of times.csv has changed"));
  // One that is not as the instructions say is refused at the start, like any other series.
  folder_.editSetup("Restart = 1", "Restart = 0");
  folder_.write("model/out.lst", "Results\n2001-01-01 x\n");
  EXPECT_THAT(run().error, AllOf(HasSubstr("Error opening TS object for file: "),
                                 HasSubstr("out.lst:2:12: expected a number, found \"x\" (the number \"v1\" at ")));
}

}  // namespace
}  // namespace mirevo::testing
