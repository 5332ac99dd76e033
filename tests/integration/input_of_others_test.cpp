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

TEST_F(InputOfOthers, EverySearchStartsFromSetsOfAnEarlierRunAndGoesOnFromThem) {
  folder_.writeSetup({.maxEvaluations = 30});
  expectRun();
  const auto earlier = rows();
  folder_.write("earlier.dat", folder_.read("basin_Optimisation.dat"));
  folder_.write("earlier_Restart.dat", folder_.read("basin_Optimisation_Restart.dat"));
  std::vector<std::vector<std::string>> best(earlier.begin(), earlier.end() - 1);  // without the final run
  std::ranges::stable_sort(best, {}, [](const auto& row) { return std::stod(row.back()); });

  const std::tuple<const char*, int, std::size_t> searches[] = {{"SCE", 1, 5},    {"PSE", 3, 5}, {"OPSE", 3, 5},
                                                                {"CMA-ES", 3, 5}, {"DDS", 1, 2}, {"PDDS", 3, 2}};
  for (const auto& [search, slots, startCount] : searches) {
    folder_.writeSetup({.search = search, .maxEvaluations = 40, .slots = slots});
    const bool hasPopulation = startCount == 5;
    folder_.editSetup("Initial_Sample_File_Name = ''",
                      hasPopulation ? "Earlier_Result_File = 'earlier.dat'\nEarlier_Result_Sets = 4"
                                    : "Earlier_Result_File = 'earlier.dat'");
    expectRun();
    const std::string expected = withoutDates(folder_.read("basin_Optimisation.dat"));
    const auto found = rows();
    ASSERT_GE(found.size(), 40U) << search;
    EXPECT_EQ(found[0], earlier[0]) << search << ": the initial set";
    for (std::size_t i = 1, k = 0; i < startCount; ++i, ++k) {
      while (best[k][2] == earlier[0][2] && best[k][3] == earlier[0][3]) ++k;
      EXPECT_EQ(std::vector(found[i].begin() + 2, found[i].end()), std::vector(best[k].begin() + 2, best[k].end()))
          << search << i;
    }
    EXPECT_THAT(log(),
                HasSubstr(fmt::format("\nInitial sample: {} of {}, the best of {} successful evaluations, run "
                                      "anew\n",
                                      hasPopulation ? "4 sets" : "1 set", folder_ / "earlier.dat", earlier.size())));
    folder_.editSetup("Restart = 0", "Restart = 1");
    folder_.write("basin_Optimisation.dat", expected.substr(0, expected.find("\n17\t") + 5));
    expectRun();
    EXPECT_EQ(withoutDates(folder_.read("basin_Optimisation.dat")), expected) << search;
  }
  folder_.editSetup("Max_No_Evaluations = 40", "Max_No_Evaluations = 55");
  expectRun();
  EXPECT_THAT(log(), HasSubstr("a new search starts from the best of the first 40 evaluations"));
  folder_.write("earlier.dat", folder_.read("earlier.dat") + "# read\n");
  EXPECT_EQ(run().exitCode, 1);
  EXPECT_THAT(log(), HasSubstr("the content of earlier.dat has changed"));
}

}  // namespace
}  // namespace mirevo::testing
