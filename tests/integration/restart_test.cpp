#include <algorithm>
#include <cstdlib>
#include <set>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "integration/model_folder.h"
#include "integration/mpi_job.h"
#include "matchers.h"

// What a run leaves that is killed at any call, or whose result file is cut, and how the next one goes on from there,
// is tried by the program `faults`.
namespace mirevo::testing {
namespace {

class Restart : public ::testing::Test {
 protected:
  /// Writes a setup that goes on with what it finds.
  void writeSetup(RunSettings settings) {
    settings.restart = 1;
    setup_ = folder_.writeSetup(settings);
    resultFile_ = settings.resultFile();
  }
  void removeResults() const {
    for (const auto& entry : std::filesystem::directory_iterator(folder_.path())) {
      const std::string name = entry.path().filename().string();
      if (name.starts_with("basin") && name != "basin.kdx") std::filesystem::remove_all(entry.path());
    }
  }
  void run(int exitCode = 0) const {
    const ProgramResult result = runProgram({setup_});
    ASSERT_EQ(result.exitCode, exitCode) << result.error << log();
  }
  std::string results() const { return withoutDates(folder_.read(resultFile_)); }
  std::string log() const { return folder_.read("basin.log"); }

  ModelFolder folder_;
  std::string setup_;
  std::string resultFile_;
};

TEST_F(Restart, ARunOfOneKindIsTakenUpByAnother) {
  if (!mpirunIsInstalled()) GTEST_SKIP() << "no mpirun";
  // Each run has tickets of its own, as models of the one that was killed may have a moment left.
  folder_.useScript(R"(tickets=../tickets$(cat ../round)
if test -e $tickets; then
  n=1; while ! mkdir $tickets/$n; do n=$((n + 1)); done 2>/dev/null
  while test $n -gt 12; do sleep 0.05; done
fi)");
  folder_.write("round", "none");
  int kind = 0;
  for (const RunSettings& settings :
       {RunSettings{.algorithm = 1, .usesSurrogate = true, .maxEvaluations = 60},
        RunSettings{.search = "OPSE", .maxEvaluations = 60}, RunSettings{.search = "CMA-ES", .maxEvaluations = 60},
        RunSettings{.search = "GLM", .maxEvaluations = 30}, RunSettings{.option = 3, .maxEvaluations = 40}}) {
    ++kind;
    writeSetup(settings);
    run();
    const std::string expected = results();
    removeResults();
    folder_.editSetup("NoSimultaneousSim = 1", "NoSimultaneousSim = 3");
    // Each has made twelve runs of its own when it is killed.
    for (const int processes : {0, 3}) {
      folder_.write("round", fmt::format("{}{}", kind, processes));
      std::filesystem::create_directory(folder_ / fmt::format("tickets{}{}", kind, processes));
      RunningProgram program = processes == 0 ? RunningProgram({setup_}) : startJob(processes, {setup_});
      const auto rows = processes == 0 ? 12 : 24;
      ASSERT_TRUE(waitUntil([&] { return std::ssize(readDataTable(folder_.read(resultFile_)).rows) == rows; }));
      ::kill(folder_.runsProcess(), SIGKILL);  // the master
      program.wait();
    }
    folder_.write("round", "none");
    run();
    EXPECT_EQ(results(), expected) << log();
    EXPECT_THAT(log(), HasSubstr("Restart: 24 evaluations are taken from"));
    removeResults();
  }
}

/// Models end in another order than they began, and rows are missing before others when the run is killed.
TEST_F(Restart, CandidatesUnderWayMakeTheSameRowsOnAnyNumberOfSlotsAndAfterAKill) {
  folder_.useScript(R"(n=$(tr -dc 1-9 <parameters.txt | tail -c 1); sleep 0.0${n:-0}
if test -e ../tickets; then
  n=1; while ! mkdir ../tickets/$n; do n=$((n + 1)); done 2>/dev/null
  while test $n = 13; do sleep 0.05; done
fi)");
  writeSetup({.maxEvaluations = 60});
  folder_.editSetup("Algorithm_Type = 2", "Algorithm_Type = 'PDDS'");
  const std::string text = folder_.read("basin.kdx");
  run();
  const std::string expected = results();
  for (const int slots : {2, 5}) {
    removeResults();
    folder_.write("basin.kdx", text);
    folder_.editSetup("NoSimultaneousSim = 1", fmt::format("NoSimultaneousSim = {}", slots));
    std::filesystem::create_directory(folder_ / "tickets");
    RunningProgram program({setup_});
    // The thirteenth model run does not end, and the five others of the six that are under way do. Which evaluation it
    // is depends on the times that slots take.
    ASSERT_TRUE(waitUntil([&] {
      std::set<int> numbers;
      for (const auto& row : readDataTable(folder_.read(resultFile_)).rows) {
        numbers.insert(std::atoi(row.front().c_str()));
      }
      int missing = 1;
      while (numbers.count(missing) > 0) ++missing;
      return folder_.exists("tickets/13") && std::ssize(numbers) == missing + 4 && *numbers.rbegin() == missing + 5;
    }));
    program.send(SIGKILL);
    program.wait();
    std::filesystem::remove_all(folder_ / "tickets");
    run();
    EXPECT_EQ(results(), expected) << slots << log();
    EXPECT_THAT(log(), HasSubstr("evaluations are taken from"));
  }
  if (!mpirunIsInstalled()) GTEST_SKIP() << "no mpirun";
  removeResults();
  EXPECT_EQ(startJob(4, {setup_}).wait().exitCode, 0);
  EXPECT_EQ(results(), expected) << log();
}

TEST_F(Restart, AFinishedRunIsWalkedThroughAndEndsWithTheSameFile) {
  writeSetup({.option = 3, .maxEvaluations = 20});
  run();
  const std::string expected = results();
  folder_.write("model/run.sh", folder_.read("model/run.sh") + "\n");  // the same model, but not the same text
  run(1);
  EXPECT_THAT(log(),
              AllOf(HasSubstr("the content of model/run.sh has changed"),
                    HasSubstr("\nThe run did not begin: no model was run, and the next start replaces this log\n"),
                    EndsWith("\n\nError: Unable to continue the earlier run\n")));
  EXPECT_EQ(results(), expected) << "refused without a change";
  folder_.useScript("");
  run();
  EXPECT_EQ(results(), expected);
  EXPECT_THAT(log(), Not(HasSubstr("initiated")));
  EXPECT_THAT(folder_.read("basin._spi_"), HasSubstr("MESSAGEvaluation of parameter set No. 20 taken from the earlier "
                                                     "run: OK\nPROGRE100.0\n"));
  EXPECT_FALSE(folder_.exists("basin.1.dat"));
  EXPECT_FALSE(folder_.exists("basin_Band_1.1.csv"));
  folder_.editSetup("Restart = 1", "Restart = 0");
  folder_.write("basin_Band_2.csv", "# Band of a measure that the setup had\n");
  folder_.write("basin_Band_3.csv", "of the model\n");
  run();
  EXPECT_EQ(results(), expected);
  EXPECT_FALSE(folder_.exists("basin_Band_2.csv"));
  EXPECT_TRUE(folder_.exists("basin_Band_3.csv"));
  for (const char* name : {"basin.", "basin_Run.", "basin_Restart.", "basin_Simulated.", "basin_Quantiles.",
                           "basin_Band_1.", "basin_Band_2.", "basin_Series."}) {
    EXPECT_THAT(log(), HasSubstr(" of an earlier run was kept as " + (folder_ / name) + "1.")) << name;
  }
  folder_.editSetup("Restart = 0", "Restart = 1");
  folder_.write(resultFile_, "");
  run();
  EXPECT_THAT(log(), HasSubstr("basin.dat has no rows, though basin_Checksums.dat has checksums of 20: something"));
}

TEST_F(Restart, ARaisedBudgetTakesAFinishedSearchFurther) {
  for (const RunSettings& settings : {RunSettings{.algorithm = 0},
                                      {.algorithm = 1, .usesSurrogate = true},
                                      {.search = "OPSE"},
                                      {.search = "CMA-ES"},
                                      {.search = "CMA-ES", .usesSurrogate = true},
                                      {.search = "GLM"}}) {
    writeSetup(settings);
    run();
    folder_.editSetup("Max_No_Evaluations = 40", "Max_No_Evaluations = 70");
    run();
    const std::string taken = results();
    removeResults();
    run();
    EXPECT_EQ(taken, results()) << settings.algorithm << settings.search;
    removeResults();
  }
}

TEST_F(Restart, GoesOnThoughAnotherTaskWasRunInBetween) {
  const auto files = [this](const std::string& task) {
    return withoutDates(folder_.read("basin_" + task + ".dat")) + folder_.read("basin_" + task + "_Failures.dat");
  };
  writeSetup({.modelArguments = "--fail-above 7.4"});
  run();
  const std::string search = files("Optimisation");
  const std::string expected = results();
  writeSetup({.option = 1, .modelArguments = "--fail-above 4.01"});
  run(1);
  const std::string analysis = files("Sensitivity") + folder_.read("basin_Sensitivity_Run.dat");
  const std::string told = folder_.read("calSimErr.dat");
  writeSetup({.modelArguments = "--fail-above 7.4"});
  folder_.write(resultFile_, expected.substr(0, expected.find("\n30\t") + 5));
  run();
  EXPECT_EQ(files("Optimisation"), search);
  EXPECT_EQ(files("Sensitivity") + folder_.read("basin_Sensitivity_Run.dat"), analysis);
  EXPECT_EQ(folder_.read("calSimErr.2.dat"), told);
}

TEST_F(Restart, RunsAreComparedWithTheFirstSuccessfulOneThatWasMadeBefore) {
  folder_.write("model/run.sh",
                fmt::format("#!/bin/sh\n{} \"$@\"\ngrep -Eq '^a = *5 *$' parameters.txt || exit 0\n"
                            "grep -Eq '^b = *2 *$' parameters.txt || exec sed -i 102,201d simulated.csv\n"
                            "head -3 simulated.csv >cut && mv cut simulated.csv\n",
                            MIREVO_TEST_MODEL),
                0755);
  std::vector<std::string> values = scenarios(12);
  values[5] = "5, 2, 1";      // which would be perfect if it did not end after two days
  values[7] = "5, 2.001, 1";  // which has no steps for a hundred days
  const std::string fewer = "output measure \"flow\" has 2 pairs, 365 in the first successful run, No. 1";
  const std::string bestIsPoor =
      "The best evaluation, No. 6, is judged by fewer observations than the first successful run: " + fewer;
  const std::string gap =
      "simulated.csv has no time step between 2001-04-10 00:00 and 2001-07-20 00:00, 2424 hours; in the first "
      "successful run, No. 1, steps are at most 24 hours apart";
  const std::string bestHasGap =
      "The best evaluation, No. 8, has a longer gap in its simulated steps than the first successful run: " + gap;
  for (const bool mayFail : {false, true}) {
    writeSetup({.option = 0, .scenarios = values, .slots = 3});
    if (mayFail) folder_.editSetup("    Aggregation_Method", "    Minimum_Coverage = 0.5\n    Aggregation_Method");
    std::string expected;
    for (const char* lastRow : {"", "\n5\t", "\n9\t", "\n5\tOK"}) {
      const std::string whole = results();
      if (*lastRow != '\0') folder_.write(resultFile_, whole.substr(0, whole.find(lastRow) + 4));
      const bool losesPairs = std::string_view(lastRow).ends_with("OK");
      if (losesPairs) std::filesystem::remove(folder_ / "basin_Pairs.dat");
      const ProgramResult program = runProgram({setup_});
      ASSERT_EQ(program.exitCode, 0) << program.error;
      EXPECT_EQ(occurrences(log(), "basin_Pairs.dat does not have the pairs of evaluation No. 1, "),
                losesPairs ? 1 : 0);
      const std::string found = results() + folder_.read("basin_Pairs.dat");
      if (*lastRow == '\0') expected = found;
      EXPECT_EQ(found, expected) << mayFail << lastRow;
      EXPECT_EQ(occurrences(found, "\n6\tFAILED\t"), mayFail ? 1 : 0);
      EXPECT_EQ(occurrences(found, "\n# Gap: evaluation 8: " + gap + "\n"), 1);
      EXPECT_EQ(occurrences(log(), "\nWarning: Evaluation of parameter set No. 8: " + gap + "\n"), 1);
      const int named = mayFail ? 0 : 1;
      const std::string report = folder_.read("basin_Report.html");  // at its top and in the closing lines
      for (const std::string& text : {found, log(), program.error}) {
        EXPECT_EQ(occurrences(text, bestHasGap), 1 - named) << text;
      }
      EXPECT_EQ(occurrences(report, bestHasGap), 2 * (1 - named));
      EXPECT_EQ(occurrences(found, "\n# Warning: " + bestIsPoor + "\n"), named);
      EXPECT_EQ(occurrences(found, "\n# Fewer pairs: evaluation 6: " + fewer + "\n"), named);
      EXPECT_EQ(occurrences(log(), "\nWarning: " + bestIsPoor + "\n"), named);
      EXPECT_EQ(occurrences(program.error, bestIsPoor), named) << program.error;
      EXPECT_EQ(occurrences(report, "No. 6, is judged by fewer"), 2 * named);
      EXPECT_THAT(
          log(),
          HasSubstr("\n   flow: simulated.csv, item No. 1 (simulated), 2001-01-01 00:00 to 2001-12-31 00:00 with "
                    "observed.csv, item No. 1 (simulated), 2001-01-01 00:00 to 2001-12-31 00:00: 365 pairs, 0 "
                    "observations without a simulated value, 2001-01-01 00:00 to 2001-12-31 00:00; observed "));
    }
    removeResults();
  }
}

TEST_F(Restart, ARaisedBudgetIsANewSearchOfDds) {
  writeSetup({.includesInitial = false, .maxEvaluations = 20});
  run();
  const auto first = readDataTable(results()).rows;
  folder_.editSetup("Max_No_Evaluations = 20", "Max_No_Evaluations = 50");
  run();
  EXPECT_THAT(log(), HasSubstr("a new search starts from the best of the first 20 evaluations, which are kept"));
  const std::string expected = results();
  const auto rows = readDataTable(expected).rows;
  ASSERT_EQ(rows.size(), 51U);  // 50 and the final run
  EXPECT_TRUE(std::equal(first.begin(), first.end(), rows.begin()));
  // Cut off in the second search, it goes on in the second search.
  folder_.write(resultFile_, expected.substr(0, expected.find("\n37\t") + 5));
  run();
  EXPECT_EQ(results(), expected);
}

TEST_F(Restart, ABudgetOfDdsThatIsRaisedTwiceLeavesNoGap) {
  for (const RunSettings& settings : {RunSettings{.includesInitial = false, .maxEvaluations = 60},
                                      {.search = "PDDS", .maxEvaluations = 60, .slots = 3}}) {
    SCOPED_TRACE(settings.search);
    writeSetup(settings);
    run();
    std::vector<std::vector<std::string>> before;
    std::string expected = results();
    for (const int budget : {100, 150}) {
      before = readDataTable(expected).rows;
      const int last = static_cast<int>(before.size()) - 1;
      folder_.editSetup(fmt::format("Max_No_Evaluations = {}", last), fmt::format("Max_No_Evaluations = {}", budget));
      run();
      EXPECT_THAT(log(), HasSubstr(fmt::format("raised from {} to {}", last, budget)));
      EXPECT_THAT(log(), ::testing::ContainsRegex(fmt::format("found by evaluation [0-9]+ of {}[;\n]", budget)));
      expected = results();
      const auto rows = readDataTable(expected).rows;
      ASSERT_EQ(std::ssize(rows), budget + 1);
      for (int i = 0; i <= budget; ++i) ASSERT_EQ(rows[static_cast<std::size_t>(i)][0], std::to_string(i + 1));
      EXPECT_TRUE(std::equal(before.begin(), before.end(), rows.begin()));
    }
    for (const char* const cut : {"\n61\t", "\n83\t", "\n101\t"}) {
      const std::string whole = folder_.read(resultFile_);
      folder_.write(resultFile_, whole.substr(0, whole.find(cut) + 5));
      run();
      auto rows = readDataTable(results()).rows;
      // What was a final model run is now, at the start of the search behind it, the repetition of its best set.
      for (auto& row : rows) row.resize(before.front().size());
      EXPECT_EQ(rows, readDataTable(expected).rows) << "cut off at" << cut;
    }
    removeResults();
  }
}

/// Every run of the model hangs until its time is over; none of those that end is under a limit.
TEST_F(Restart, FailuresThatEndedARunAreMadeAgainWhenAsked) {
  folder_.useScript("test -e ../healthy || sleep 3600");
  writeSetup({.option = 0, .scenarios = scenarios(30)});
  const std::string limit = "    MaxSimulationTime = 0.1\n";
  folder_.editSetup("    NoSimultaneousSim", limit + "    NoSimultaneousSim");
  run(1);
  const std::string why =
      "   4 x batch ran too long; first No. 1: run.sh was ended because it ran longer than 0.1 seconds\n";
  EXPECT_THAT(log(), HasSubstr("Why evaluations failed:\n" + why + "\nfailed evaluations: 4; at most 3 may fail"));
  EXPECT_THAT(log(), EndsWith("\nfailed evaluations are described in calSimErr.dat\n\n"
                              "Error: Unable to continue. No of failed simulations too high.\n"));
  for (const int number : {1, 2, 3, 4}) {
    EXPECT_EQ(folder_.exists(fmt::format("basin_Failed{}/mirevo_batch.log", number)), number < 4) << number;
  }
  folder_.write("healthy", "");
  folder_.editSetup(limit, "");
  run(1);  // the same failures, so the same end
  EXPECT_THAT(log(), HasSubstr(why));
  folder_.editSetup("Restart = 1", "Restart = 2");
  run();
  EXPECT_EQ(readDataTable(results()).rows.size(), 30U);
  EXPECT_THAT(results(), Not(HasSubstr("FAILED")));
  EXPECT_EQ(folder_.read("calSimErr.dat"), "# Failed evaluations of basin\n");
  EXPECT_FALSE(folder_.exists("basin_Failed1"));
}

}  // namespace
}  // namespace mirevo::testing
