#include <algorithm>
#include <signal.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "common/text.h"
#include "integration/model_folder.h"
#include "integration/mpi_job.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

/// The best so far of the rows of a result file, by their numbers: the first column and the last one.
std::vector<std::string> improvements(const std::string& results) {
  std::vector<std::string> numbers;
  double best = 1e30;
  const ReadTable table = readDataTable(results);
  for (const auto& row : table.rows) {
    const double aggregate = std::stod(row.back());
    if (aggregate >= best) continue;
    best = aggregate;
    numbers.push_back(row.front());
  }
  return numbers;
}

class Improvement : public ::testing::Test {
 protected:
  /// `command`: a script, `hook.sh` in the setup's folder.
  std::string setupWith(const std::string& command, RunSettings settings = {.maxEvaluations = 15},
                        const std::string& more = "") const {
    folder_.write("hook.sh", command);
    const std::string setup = folder_.writeSetup(settings);
    folder_.editSetup("    Title", "    Improvement_Command = 'sh hook.sh'\n" + more + "    Title");
    return setup;
  }
  std::string log() const { return folder_.read("basin.log"); }

  ModelFolder folder_;
};

/// Tells what it gets; every one ends before the next evaluation does.
constexpr char kTell[] =
    "echo \"$MIREVO_REASON $MIREVO_STATE $MIREVO_EVALUATION $MIREVO_AGGREGATE $MIREVO_PARAMETER_a $MIREVO_PARAMETER_c "
    "$MIREVO_OBJECTIVE_fit $MIREVO_NAME\" >>told\ncat $MIREVO_VALUES >values\n[ \"$PWD\" = \"$MIREVO_FOLDER\" ] && [ "
    "-f "
    "\"$MIREVO_SETUP\" ]\n";

TEST_F(Improvement, TheCommandGetsTheNewestBestSetAndTheLastWord) {
  const std::string setup = folder_.writeSetup({.maxEvaluations = 15});
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  const std::string without = withoutDates(folder_.read("basin_Optimisation.dat"));
  setupWith(kTell);
  folder_.useScript("sleep 0.1");  // so that each command has ended before the next improvement
  ASSERT_EQ(runProgram({setup}).exitCode, 0) << log();
  EXPECT_EQ(withoutDates(folder_.read("basin_Optimisation.dat")), without);

  const std::vector<std::string> better = improvements(without);
  const std::string told = folder_.read("told");
  std::vector<std::string> numbers;
  for (const std::string_view line : splitLines(told)) {
    const auto words = splitAt(line, ' ');
    ASSERT_EQ(words.size(), 8U) << line;
    const bool isLast = words[0] == "end";
    EXPECT_EQ(words[1], isLast ? "finished" : "running");
    EXPECT_EQ(words[3], words[6]);
    EXPECT_EQ(words[5], "1");
    EXPECT_EQ(words[7], "basin");
    EXPECT_THAT(without, HasSubstr(fmt::format("\n{}\tOK\t{}\t", words[2], words[4])));
    if (!isLast) numbers.emplace_back(words[2]);
    EXPECT_TRUE(!isLast || words[2] == better.back()) << line;
  }
  EXPECT_EQ(told.find("end finished"), told.rfind("end "));
  EXPECT_THAT(numbers, ::testing::IsSubsetOf(better));
  EXPECT_EQ(numbers.front(), better.front());
  EXPECT_GE(numbers.size(), 2U);
  EXPECT_THAT(folder_.read("values"), AllOf(StartsWith("Kind\tName\tValue\nparameter\ta\t"),
                                            HasSubstr("\nparameter\tc\t1\n"), HasSubstr("\nmeasure\tflow\t"),
                                            HasSubstr("\nobjective\tfit\t"), HasSubstr("\naggregate\tAggregate\t")));
  EXPECT_THAT(log(), HasSubstr("The improvement command at the end of the run exited with code 0 after "));
  EXPECT_THAT(log(),
              HasSubstr(fmt::format("The improvement command was run {} times, 0 of them failed", numbers.size() + 1)));
}

TEST_F(Improvement, WhateverBecomesOfTheCommandTheRunGoesOn) {
  struct Case {
    const char* command;
    const char* log;
  };
  const Case cases[] = {
      {"echo no mail; exit 3", "Warning: The improvement command for evaluation No. 1 exited with code 3 after "},
      {"echo no mail; exit 3", "\n   no mail\n"},
      {"kill -SEGV $$", "exited with code 139"},
      {"trap '' TERM; (setsid sh -c 'trap \"\" TERM; echo $$ >daemon; while :; do sleep 1; done' &); while :; do sleep "
       "1; done",
       "was ended because it ran longer than 0.2 seconds after 2."},
      {"[ \"$MIREVO_REASON\" = end ] || sleep 100", "skipped, as a newer one waited"},
      {"(setsid sh -c 'echo $$ >daemon; while :; do sleep 1; done' &); while [ ! -s daemon ]; do :; done",
       "The improvement command at the end of the run exited with code 0 after "},
  };
  for (const Case& each : cases) {
    SCOPED_TRACE(each.command);
    std::filesystem::remove(folder_ / "daemon");
    const std::string setup = setupWith(each.command, {.maxEvaluations = 6}, "    Improvement_Command_Time = 0.2\n");
    EXPECT_EQ(runProgram({setup}).exitCode, 0) << log();
    EXPECT_THAT(log(), HasSubstr(each.log));
    EXPECT_THAT(log(), Not(HasSubstr("run.sh left")));
    EXPECT_THAT(log(), EndsWith("Normal termination\n"));
    if (folder_.exists("daemon")) {
      const int daemon = std::atoi(folder_.read("daemon").c_str());
      EXPECT_TRUE(waitUntil([daemon] { return !isRunning(daemon); }, 10.0));
    }
  }
}

TEST_F(Improvement, TheCommandEndsWithACancelledOrKilledRun) {
  for (const int signal : {0, SIGTERM, SIGKILL}) {
    SCOPED_TRACE(signal);
    for (const char* name : {"hook.pid", "told", "basin._kill_"}) std::filesystem::remove(folder_ / name);
    const std::string setup = setupWith(
        std::string(kTell) +
        "[ $MIREVO_REASON = end ] && exit\n(setsid sleep 250 &)\necho $$ >hook.pid\nwhile :; do sleep 1; done");
    folder_.useScript("[ ! -e ../hook.pid ] || sleep 250");
    RunningProgram run({setup});
    const int hook = folder_.waitForProcess("hook.pid");
    if (signal == 0) folder_.write("basin._kill_", "");
    if (signal != 0) run.send(signal);
    const ProgramResult result = run.wait();
    EXPECT_EQ(result.exitCode, signal == SIGKILL ? -1 : signal == 0 ? 1 : 128 + signal);
    EXPECT_TRUE(waitUntil([hook] { return !isRunning(hook); }, 10.0));
    const std::string told = folder_.read("told");
    EXPECT_EQ(told.find("\nend cancelled ") != std::string::npos, signal == 0) << told;
  }
}

/// The kill file ends the job within five seconds, on a machine that is not busy: the command does not count.
TEST_F(Improvement, OfACancelledJobTheLastCommandHasASecond) {
  if (!mpirunIsInstalled()) GTEST_SKIP() << "mpirun is not installed";
  const std::string setup = setupWith(
      "trap '' TERM\necho $MIREVO_REASON $MIREVO_STATE >>told\n"
      "[ $MIREVO_REASON = end ] && while :; do sleep 0.1; done",
      {.option = 3, .maxEvaluations = 1000});
  folder_.useScript("sleep 0.1");
  RunningProgram job = startJob(3, {setup});
  EXPECT_TRUE(folder_.reaches("told", "improvement running"));
  folder_.write("basin._kill_", "");
  const ProgramResult result = job.wait(60.0);
  EXPECT_FALSE(result.timedOut);
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(folder_.read("told"), EndsWith("end cancelled\n"));
  EXPECT_THAT(result.error, HasSubstr("at the end of the run was ended because it ran longer than 1 second after 1."));
  EXPECT_THAT(result.error, Not(HasSubstr("are aborted")));
  EXPECT_THAT(log(), EndsWith("EM: Simulation cancelled\n"));
}

TEST_F(Improvement, OfAJobTheMasterAloneRunsTheCommand) {
  if (!mpirunIsInstalled()) GTEST_SKIP() << "mpirun is not installed";
  const std::string setup = setupWith("echo $MIREVO_REASON >>told", {.option = 3, .maxEvaluations = 12});
  EXPECT_EQ(startJob(3, {setup}).wait().exitCode, 0) << log();
  const std::string told = folder_.read("told");
  EXPECT_EQ(occurrences(told, "end"), 1);
  EXPECT_THAT(told, AllOf(StartsWith("improvement\n"), EndsWith("end\n")));
}

}  // namespace
}  // namespace mirevo::testing
