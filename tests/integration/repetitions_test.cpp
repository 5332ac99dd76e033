#include <algorithm>
#include <limits>
#include <map>
#include <set>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "integration/model_folder.h"
#include "integration/mpi_job.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

constexpr const char* kInSideBySideOrder = "Repetition_Order = 'side by side'";
/// Searches that are made several times.
class Repeated : public ::testing::Test {
 protected:
  /// Searches for a front have a small population, and GLM draws where it starts.
  void writeSetup(const RunSettings& settings, int count, const std::string& order) {
    setup_ = folder_.writeSetup(settings);
    folder_.editSetup("Use_Surrogate_Model", fmt::format("Repetitions = {}\n{}\nUse_Surrogate_Model", count, order));
    const std::map<std::string, std::string> controls{
        {"NSGA-II", "[NSGAII_CONTROL_PARAMETERS]\nPopulation_Size = 8\n[/NSGAII_CONTROL_PARAMETERS]\n"},
        {"PADDS", "[PADDS_CONTROL_PARAMETERS]\nCandidates = 2\n[/PADDS_CONTROL_PARAMETERS]\n"},
        {"GLM", "[GLM_CONTROL_PARAMETERS]\nSample_Size = 4\nStarts = 2\n[/GLM_CONTROL_PARAMETERS]\n"}};
    if (const auto control = controls.find(settings.search); control != controls.end()) {
      folder_.editSetup("    [SCE_CONTROL_PARAMETERS]", control->second + "    [SCE_CONTROL_PARAMETERS]");
    }
    if (findsFront(settings)) folder_.addOtherObjective();
  }
  static bool findsFront(const RunSettings& settings) {
    return settings.search == "NSGA-II" || settings.search == "PADDS";
  }
  ProgramResult run(int processes = 0) const {
    return processes == 0 ? runProgram({setup_}) : startJob(processes, {setup_}).wait();
  }
  void runToEnd(int processes = 0) const {
    const ProgramResult result = run(processes);
    ASSERT_EQ(result.exitCode, 0) << result.error << log();
  }
  /// All that a run has found.
  std::vector<std::string> results() const {
    std::vector<std::string> texts{withoutDates(folder_.read(kResults)), folder_.read(kTable), folder_.read(kRows)};
    for (const char* const name :
         {"basin_Pareto.dat", "basin_ParetoCourse.dat", "basin_ParetoSeries.dat", "basin_Optimisation_Jacobian.dat"}) {
      if (folder_.exists(name)) texts.push_back(folder_.read(name));
    }
    EXPECT_THAT(texts, Each(Not(IsEmpty())));
    return texts;
  }
  void removeResults() const {
    for (const auto& entry : std::filesystem::directory_iterator(folder_.path())) {
      const std::string name = entry.path().filename().string();
      if (name.starts_with("basin") && name != "basin.kdx") std::filesystem::remove_all(entry.path());
    }
  }
  ReadTable table() const { return readDataTable(folder_.read(kTable)); }
  std::string log() const { return folder_.read("basin.log"); }
  /// In the log; -1 if there is none.
  int numberBehind(const std::string& words) const {
    const std::string text = log();
    const std::size_t place = text.find(words);
    return place == std::string::npos ? -1 : std::atoi(text.c_str() + place + words.size());
  }

  static constexpr const char* kResults = "basin_Optimisation.dat";
  static constexpr const char* kTable = "basin_Optimisation_Repetitions.dat";
  static constexpr const char* kRows = "basin_Optimisation_RepetitionRows.dat";

  ModelFolder folder_;
  std::string setup_;
};

TEST_F(Repeated, AnyNumberOfSlotsMakesTheSameFiles) {
  const std::tuple<RunSettings, int, int> cases[] = {
      {{.maxEvaluations = 8}, 3, 3},
      {{.algorithm = 0, .includesInitial = false, .aggregation = 1, .maxEvaluations = 14}, 2, 3},
      {{.search = "PDDS", .maxEvaluations = 8}, 3, 4},
      {{.algorithm = 1, .usesSurrogate = true, .maxEvaluations = 26}, 2, 3},
      {{.search = "NSGA-II", .maxEvaluations = 12}, 2, 3},
      {{.search = "PADDS", .maxEvaluations = 10}, 2, 4},
      {{.search = "GLM", .maxEvaluations = 12}, 2, 3},
  };
  folder_.useScript(kSleepByParameters);
  for (auto [settings, count, slots] : cases) {
    SCOPED_TRACE(::testing::Message() << settings.algorithm << settings.search);
    removeResults();
    writeSetup(settings, count, kInSideBySideOrder);
    runToEnd();
    const auto expected = results();
    EXPECT_EQ(std::ssize(table().rows), count);
    settings.slots = slots;
    writeSetup(settings, count, kInSideBySideOrder);
    runToEnd();
    EXPECT_EQ(results(), expected);
  }
}

TEST_F(Repeated, AnyNumberOfRanksMakesTheSameFiles) {
  if (!mpirunIsInstalled()) GTEST_SKIP() << "no mpirun";
  folder_.useScript(kSleepByParameters);
  for (const auto& [settings, order, processes] :
       {std::tuple(RunSettings{.maxEvaluations = 8}, std::string(kInSideBySideOrder), 4),
        {RunSettings{.algorithm = 1, .maxEvaluations = 12}, "", 3}}) {
    removeResults();
    writeSetup(settings, 3, order);
    runToEnd();
    const auto expected = results();
    runToEnd(processes);
    EXPECT_EQ(results(), expected) << processes;
  }
}

TEST_F(Repeated, ARunThatWasCutOffAnywhereGoesOnToTheSameFiles) {
  for (const RunSettings& settings :
       {RunSettings{.algorithm = 0, .includesInitial = false, .maxEvaluations = 14, .restart = 1},
        {.search = "NSGA-II", .maxEvaluations = 14, .restart = 1},
        {.search = "PADDS", .maxEvaluations = 14, .restart = 1},
        {.search = "GLM", .maxEvaluations = 14, .restart = 1}}) {
    for (const std::string order : {"", kInSideBySideOrder}) {
      SCOPED_TRACE(settings.search + order);
      removeResults();
      writeSetup(settings, 3, order);
      runToEnd();
      const auto expected = results();
      EXPECT_EQ(expected.size(), findsFront(settings) ? 6U : settings.search == "GLM" ? 4U : 3U);
      const std::string rows = folder_.read(kResults);
      for (const char* last : {"\n24\t", "\n5\t", "\n15\t", "\n36\t"}) {
        if (!settings.search.empty() && std::string_view(last) != "\n24\t") continue;
        folder_.write(kResults, rows.substr(0, rows.find(last) + 9));
        runToEnd();
        EXPECT_EQ(results(), expected) << last;
        EXPECT_THAT(log(), HasSubstr("evaluations are taken from"));
      }
    }
  }
}

/// The samples of the first repetition fail, those of the second do not; then all fail.
TEST_F(Repeated, OfGlmWithoutARunToStartFromIsToldAndAnErrorIfAllAre) {
  const RunSettings settings{.search = "GLM", .includesInitial = false, .maxEvaluations = 50};
  writeSetup(settings, 2, "");
  folder_.useScript(
      "n=1; until test $n -gt 4 || mkdir ../tickets/$n; do n=$((n + 1)); done 2>/dev/null\ntest $n -gt 4 || exit 3");
  std::filesystem::create_directory(folder_ / "tickets");
  const ProgramResult run = runProgram({setup_});
  EXPECT_EQ(run.exitCode, 0) << run.error;
  EXPECT_THAT(log(), HasSubstr("Warning: No model run of the initial sample of GLM succeeded: 4 evaluations made"));
  EXPECT_THAT(log(), HasSubstr("Best parameter set"));

  folder_.useScript("exit 3");
  const ProgramResult none = runProgram({setup_});
  EXPECT_EQ(none.exitCode, 1);
  EXPECT_THAT(none.error, HasSubstr("Error: No model run of the initial sample of GLM succeeded"));
  EXPECT_THAT(log(), Not(HasSubstr("Best parameter set")));
}

TEST_F(Repeated, TheLimitsOfGlmAreThoseOfTheBestRepetition) {
  writeSetup({.search = "GLM", .includesInitial = false, .maxEvaluations = 14}, 3, kInSideBySideOrder);
  runToEnd();
  double least = std::numeric_limits<double>::infinity();
  std::string best;
  const ReadTable found = table();
  for (const auto& row : found.rows) {
    if (const double sum = realCell(row[found.column("Sum_of_Squares").value()]).value(); sum < least) {
      least = sum;
      best = row[3];
    }
  }
  EXPECT_THAT(log(), HasSubstr(fmt::format("Covariance at evaluation {}, the estimate", best)));
}

/// Cut off when the first ones have made derivatives and none has ended: the first is not the best with every seed.
TEST_F(Repeated, TheLimitsOfGlmInAnUnfinishedRunAreThoseOfTheLeastSum) {
  folder_.useScript(
      "n=1; while ! mkdir ../tickets/$n; do n=$((n + 1)); done 2>/dev/null\n"
      "while test $n -gt 30; do sleep 0.05; done");
  std::set<int> whose;
  for (const int seed : {1, 2, 3}) {
    removeResults();
    std::filesystem::remove_all(folder_ / "tickets");
    std::filesystem::create_directory(folder_ / "tickets");
    writeSetup({.search = "GLM", .includesInitial = false, .maxEvaluations = 60, .slots = 3}, 3, kInSideBySideOrder);
    folder_.editSetup("Random_Seed = 1", fmt::format("Random_Seed = {}", seed));
    RunningProgram program({setup_});
    ASSERT_TRUE(waitUntil([&] { return folder_.exists("tickets/31"); }));
    folder_.write("basin._kill_", "");
    EXPECT_EQ(program.wait().exitCode, 1);
    const auto rows = table().rows;
    ASSERT_EQ(rows.size(), 3U);
    // Each knows at least its sample of 4 and the first derivatives by 2 parameters, in turn.
    const ReadTable results = readDataTable(folder_.read(kResults));
    const auto aggregateOf = [&](int number) {
      const auto row = std::ranges::find(results.rows, std::to_string(number), [](const auto& one) { return one[0]; });
      return row == results.rows.end() ? std::nan("") : realCell((*row)[results.column("Aggregate").value()]).value();
    };
    double least = std::numeric_limits<double>::infinity();
    for (int number = 1; number <= 18; ++number) least = std::min(least, aggregateOf(number));
    const int repetition = numberBehind("The covariance is that of repetition ");
    whose.insert(repetition);
    const int evaluation = numberBehind("Covariance at evaluation ");
    EXPECT_LE(aggregateOf(evaluation), least) << folder_.read(kTable);
    const ReadTable stretches = readDataTable(folder_.read(kRows));
    EXPECT_TRUE(std::ranges::any_of(stretches.rows, [&](const auto& one) {
      return std::stoi(one[0]) == repetition && std::stoi(one[1]) <= evaluation && evaluation <= std::stoi(one[2]);
    })) << evaluation;
  }
  EXPECT_GT(whose.size(), 1U);
}

TEST_F(Repeated, ThoseOfGlmThatStartFromTheSameSetAreOneSearch) {
  folder_.useScript("true");
  writeSetup({.search = "GLM", .maxEvaluations = 12}, 3, "");
  folder_.editSetup("Starts = 2", "Starts = 1");
  folder_.editSetup("Initial_Value = 4.0", "Initial_Value = 4.9");
  folder_.editSetup("Initial_Value = 1.0", "Initial_Value = 1.9");
  runToEnd();
  const std::string warning = "Warning: Repetitions 1, 2 and 3 started from the same sets and are the same search";
  EXPECT_THAT(log(), AllOf(HasSubstr(warning), HasSubstr("With a single search there is nothing to compare"),
                           Not(HasSubstr("Whatever the seed"))));
  EXPECT_EQ(occurrences(log(), warning), 1);
  const ReadTable found = table();
  for (std::size_t i = 0; i < 3; ++i) EXPECT_EQ(found.rows.at(i)[found.column("Same_As").value()], i == 0 ? "0" : "1");
  EXPECT_THAT(folder_.read("basin_Report.html"), HasSubstr(R"("sameAs":1)"));
}

TEST_F(Repeated, MoreOfThemCanFollowAndNothingElseCanBeRaised) {
  const RunSettings settings{.algorithm = 1, .maxEvaluations = 14, .restart = 1};
  const RunSettings ofFronts{.search = "PADDS", .maxEvaluations = 14, .restart = 1};
  for (const auto& [of, before, cutAt] : {std::tuple(ofFronts, 1, ""), std::tuple(ofFronts, 2, "\n17\t"),
                                          std::tuple(settings, 1, ""), std::tuple(settings, 2, "")}) {
    removeResults();
    writeSetup(of, before, "");
    runToEnd();
    const std::string rows = folder_.read(kResults);
    if (*cutAt != '\0') folder_.write(kResults, rows.substr(0, rows.find(cutAt) + 9));
    writeSetup(of, 3, "Repetition_Order = 'consecutive'");  // the default
    runToEnd();
    EXPECT_THAT(log(), HasSubstr(fmt::format("Repetitions was raised from {} to 3: further ones follow", before)));
    const auto found = results();
    removeResults();
    runToEnd();
    EXPECT_EQ(results(), found) << before << cutAt;
  }
  RunSettings raised = settings;
  raised.maxEvaluations = 30;
  const std::tuple<RunSettings, int, std::string, const char*> refused[] = {
      {raised, 3, "", "Max_No_Evaluations: 14 then, 30 now: it holds for each of 3 repetitions"},
      {settings, 2, "", "Repetitions of OPTIMISATION_ALGORITHM: 3 then, 2 now"},
      {settings, 4, kInSideBySideOrder,
       "Repetition_Order of OPTIMISATION_ALGORITHM: 'consecutive' then, 'side by side' now"}};
  const auto before = results();
  for (const auto& [other, count, order, reason] : refused) {
    writeSetup(other, count, order);
    EXPECT_EQ(run().exitCode, 1);
    EXPECT_THAT(log(), AllOf(HasSubstr(reason), EndsWith("\n\nError: Unable to continue the earlier run\n")));
    EXPECT_EQ(results(), before);
  }
  removeResults();
  writeSetup(settings, 2, kInSideBySideOrder);
  runToEnd();
  writeSetup(settings, 3, kInSideBySideOrder);
  EXPECT_EQ(run().exitCode, 1);
  EXPECT_THAT(log(), HasSubstr("Repetitions of OPTIMISATION_ALGORITHM: 2 then, 3 now\nRepetitions side by side take "
                               "turns: evaluations of further ones would have stood among those that were made. "
                               "Repetitions = 2 goes on with the earlier run; a copy of the setup under another name, "
                               "with Repetitions = 1 and Random_Seed = 3, makes the further ones.\n"));
}

TEST_F(Repeated, WhatEndsARunLeavesTheRepetitionsAsFarAsTheyHadCome) {
  // After 12 model runs each waits for the one that cancels, or fails.
  const std::string counted = "n=1; while ! mkdir ../tickets/$n; do n=$((n + 1)); done 2>/dev/null\n";
  for (const auto& [search, order] : {std::pair<std::string, std::string>("PDDS", ""),
                                      {"PDDS", kInSideBySideOrder},
                                      {"PADDS", ""},
                                      {"NSGA-II", kInSideBySideOrder}}) {
    for (const bool fails : {false, true}) {
      SCOPED_TRACE(search + order);
      removeResults();
      std::filesystem::remove_all(folder_ / "tickets");
      std::filesystem::create_directory(folder_ / "tickets");
      folder_.useScript(counted + (fails ? "test $n -gt 12 && exit 3" : "while test $n -gt 12; do sleep 0.05; done"));
      writeSetup({.search = search, .maxEvaluations = 10, .slots = 2}, 3, order);
      RunningProgram program({setup_});
      if (!fails) {
        ASSERT_TRUE(waitUntil([&] { return folder_.exists("tickets/14"); }));
        folder_.write("basin._kill_", "");
      }
      const ProgramResult result = program.wait();
      EXPECT_EQ(result.exitCode, 1);
      EXPECT_THAT(log(), HasSubstr(fails ? "Error: Unable to continue. No of failed simulations too high."
                                         : "Simulation cancelled"));
      EXPECT_THAT(log(), HasSubstr("repetitions of the search"));
      const ReadTable found = table();
      ASSERT_EQ(found.rows.size(), order.empty() ? 2U : 3U);
      int evaluations = 0;
      for (const auto& row : found.rows) evaluations += std::stoi(row[2]);
      EXPECT_THAT(found.headLines,
                  Contains(StartsWith(fmt::format("Unfinished run: statistics of {} of 30 ", evaluations))));
      EXPECT_EQ(found.rows[0].back().empty(), !order.empty()) << "the first one has ended where they are consecutive";
      EXPECT_EQ(found.rows[1].back(), "");
      // The 12 runs do not reach the third sample of NSGA-II, of 8 sets.
      const std::size_t count = search == "NSGA-II" ? 2 : found.rows.size();
      for (std::size_t i = 0; i < count; ++i) EXPECT_NE(found.rows[i][3], "0") << "each has a best set";
      EXPECT_FALSE(readDataTable(folder_.read(kRows)).rows.empty());
      if (search == "PDDS") continue;
      // The front is that of all that had succeeded, whether a search had taken it or not.
      EXPECT_THAT(log(), HasSubstr(fmt::format("no other set dominates, of {} evaluations", evaluations)));
      const ReadTable front = readDataTable(folder_.read("basin_Pareto.dat"));
      EXPECT_THAT(front.headLines, AllOf(Contains(StartsWith("Unfinished run: statistics of ")),
                                         Contains("Sets that no other set of the search dominates (rank 1)")));
      ASSERT_FALSE(front.rows.empty());
      const auto rows = readDataTable(folder_.read(kResults)).rows;
      for (const std::size_t objective : {6U, 7U}) {  // in both tables
        const auto leastOf = [objective](const auto& all) {
          double least = std::numeric_limits<double>::infinity();
          for (const auto& row : all) least = std::min(least, realCell(row.at(objective)).value());
          return least;
        };
        EXPECT_EQ(leastOf(front.rows), leastOf(rows));
      }
    }
  }
}

TEST_F(Repeated, TheReportOfARunThatASignalEndedSaysWhyItHasNone) {
  folder_.useScript("echo >>../calls; while test $(wc -l <../calls) -gt 5; do sleep 0.05; done");
  writeSetup({.maxEvaluations = 4}, 2, "");
  const auto report = [&] {
    EXPECT_EQ(RunningProgram({setup_}, {}, MIREVO_REPORT).wait().exitCode, 0);
    return folder_.read("basin_Report.html");
  };
  RunningProgram program({setup_});
  ASSERT_TRUE(waitUntil([&] { return occurrences(folder_.read("calls"), "\n") > 5; }));
  EXPECT_THAT(report(), HasSubstr("There is no table of the repetitions yet"));
  program.send(SIGTERM);
  EXPECT_EQ(program.wait().exitCode, 128 + SIGTERM);
  EXPECT_THAT(report(), HasSubstr("No table of the repetitions was written, as the run was not finished. Started"));
}

TEST_F(Repeated, ASetupIsCheckedWithItsRepetitions) {
  const std::tuple<RunSettings, int, std::string, const char*> refused[] = {
      {{}, 0, "", "Error: No. of repetitions of the search invalid"},
      {{}, 1001, "", "Error: No. of repetitions of the search invalid"},
      {{}, 2, "Repetition_Order = 'at once'", "'side by side'"},
      {{.maxEvaluations = 1500000000}, 2, "", "expected at most 1073741823 for Repetitions = 2, found 1500000000"},
      {{.slots = 2},
       2,
       "",
       "expected 1 with this Algorithm_Type, found 2; several model runs at a time: Repetition_Order = 'side by "
       "side', "},
      {{.slots = 2}, 1, kInSideBySideOrder, "expected 1 with this Algorithm_Type, found 2"}};
  for (const auto& [settings, count, order, reason] : refused) {
    writeSetup(settings, count, order);
    const ProgramResult result = runProgram({"--check", setup_});
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_THAT(result.output + result.error, HasSubstr(reason)) << count << order;
  }
  writeSetup({.search = "GLM"}, 2, "");
  folder_.editSetup("Sample_Size = 4\nStarts = 2", "");
  const ProgramResult glm = runProgram({"--check", setup_});
  EXPECT_EQ(glm.exitCode, 1);
  EXPECT_THAT(glm.output + glm.error,
              HasSubstr("expected 1, found 2: the repetitions of GLM would be the same, as all "
                        "would start from the one set that is given. A Sample_Size or Starts above 1"));
  // What would end another search has no effect on one for a front, which has a budget of five generations here.
  for (const auto& [loops, change, isWarned] : {std::tuple(5, 0.001, true), {5, 0.0, false}, {6, 0.001, false}}) {
    writeSetup({.search = "NSGA-II", .maxEvaluations = 40}, 2, "");
    folder_.editSetup("No_Loops_Convergence = 5", fmt::format("No_Loops_Convergence = {}", loops));
    folder_.editSetup("Min_Change = 0.001", fmt::format("Min_Change = {}", change));
    EXPECT_EQ(occurrences(runProgram({"--check", setup_}).output, "has no effect: NSGA-II ends with its budget"),
              isWarned ? 2 : 0);
  }
  writeSetup({.maxEvaluations = 25, .slots = 8}, 4, kInSideBySideOrder);
  const ProgramResult result = runProgram({"--check", setup_});
  EXPECT_EQ(result.exitCode, 0) << result.error;
  EXPECT_THAT(result.output, HasSubstr("Dynamically Dimensioned Search, 4 repetitions\nPlanned model runs: 101\n"));
  EXPECT_THAT(result.output + result.error, HasSubstr("only 4 can be used by the evaluations of this run"));
  writeSetup({}, 1, kInSideBySideOrder);
  EXPECT_THAT(runProgram({"--check", setup_}).output, HasSubstr("has no effect with Repetitions = 1"));
}

}  // namespace
}  // namespace mirevo::testing
