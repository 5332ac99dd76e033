#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "integration/model_folder.h"

namespace mirevo::testing {
namespace {

using ::testing::EndsWith;
using ::testing::HasSubstr;
using ::testing::Not;

/// A run whose second scenario sleeps for an hour.
class Interruption : public ::testing::Test {
 protected:
  Interruption() {
    folder_.write("model/run.sh", fmt::format("#!/bin/sh\n"
                                              "test -e first || {{ touch first; exec {0}; }}\n"
                                              "echo $$ > model.pid\n"
                                              "exec {0} \"$@\" --sleep-ms 3600000\n",
                                              MIREVO_TEST_MODEL));
    writeSetup("--grandchild grandchild.pid");
  }

  void writeSetup(const std::string& modelArguments) {
    setup_ = folder_.writeSetup({.option = 0, .scenarios = {"1, 1, 1", "2, 2, 1"}, .modelArguments = modelArguments});
  }

  /// The model's own child, which ignores SIGTERM.
  int waitForGrandchild() { return folder_.waitForProcess("basin_Process1/grandchild.pid"); }

  void expectGone(int process) {
    EXPECT_GT(process, 0);
    EXPECT_TRUE(waitUntil([&] { return !isRunning(process); }, 5.0));
  }

  void expectFirstRowIsThere() {
    const ResultTable table = readResults(folder_.read("basin.dat"));
    ASSERT_EQ(table.rows.size(), 2U);
    EXPECT_EQ(table.rows[1][1], "OK");
  }

  ModelFolder folder_;
  std::string setup_;
};

TEST_F(Interruption, AKillFileEndsTheRunWithinThreeSecondsAndNothingIsLeft) {
  writeSetup("");
  folder_.write("basin._kill_", "from an earlier run");
  RunningProgram program({setup_});
  const int model = folder_.waitForProcess("basin_Process1/model.pid");
  folder_.write("basin._kill_", "");
  const ProgramResult result = program.wait(3.0);  // models that ignore SIGTERM have 2 seconds of grace
  EXPECT_FALSE(result.timedOut);
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_EQ(result.error, "Mirevo: Simulation cancelled\n");
  EXPECT_EQ(folder_.read("basin_Termination.log"), "Abnormal completion\n");
  EXPECT_THAT(folder_.read("basin.log"), HasSubstr("Simulation cancelled"));
  EXPECT_THAT(folder_.read("basin.log"), Not(HasSubstr("Normal termination")));
  EXPECT_THAT(folder_.read("basin.dat"), HasSubstr("# Simulation cancelled\n"));
  EXPECT_THAT(folder_.read("basin._spi_"), HasSubstr("MESSAGSimulation cancelled\n"));
  expectFirstRowIsThere();
  expectGone(model);
}

TEST_F(Interruption, ASignalEndsTheRunWithItsMessageAndNothingIsLeft) {
  for (const auto& [signal, message] : {std::pair{SIGTERM, "Termination request"},
                                        {SIGINT, "Control-C send"},
                                        {SIGHUP, "Termination request"},
                                        {SIGSEGV, "Illegal storage access"}}) {
    RunningProgram program({setup_});
    const int grandchild = waitForGrandchild();
    program.send(signal);
    const ProgramResult result = program.wait(5.0);
    EXPECT_FALSE(result.timedOut);
    EXPECT_EQ(result.exitCode, 128 + signal);
    EXPECT_EQ(result.error, fmt::format("Mirevo: {}\n", message));
    EXPECT_THAT(folder_.read("basin.log"), EndsWith(fmt::format("\n{}\n", message)));
    EXPECT_THAT(folder_.read("basin.dat"), EndsWith(fmt::format("\n# {}\n", message)));
    EXPECT_THAT(folder_.read("basin._spi_"), EndsWith(fmt::format("\nSTATUSEnded: {}\nPROGRE100.0\n", message)));
    EXPECT_EQ(folder_.read("basin_Termination.log"), fmt::format("{}\nAbnormal completion\n", message));
    expectFirstRowIsThere();
    expectGone(grandchild);
    std::filesystem::remove_all((folder_ / "basin_Process1"));
  }
}

TEST_F(Interruption, ASetupThatIsBeingRunIsNotRunASecondTime) {
  RunningProgram program({setup_});
  waitForGrandchild();
  ASSERT_TRUE(waitUntil([&] { return folder_.read("basin.log").ends_with("No. 2 initiated\n"); }));
  const std::string log = folder_.read("basin.log");
  const ProgramResult second = runProgram({setup_});
  EXPECT_EQ(second.exitCode, 1);
  EXPECT_THAT(second.error, HasSubstr("Error: Another run of this setup is in progress"));
  EXPECT_EQ(folder_.read("basin.log"), log);
  EXPECT_FALSE(folder_.exists("basin.1.log"));
  program.send(SIGTERM);
  EXPECT_EQ(program.wait(5.0).exitCode, 143);
}

}  // namespace
}  // namespace mirevo::testing
