#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "integration/model_folder.h"
#include "integration/pseudo_terminal.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

/// A run of this process, as its message file tells it.
std::string runningRun() {
  return "STATUSInitialisation\nMESSAGRun started 2026-11-21 00:00:00 +0000 on elsewhere, process 77\n"
         "MESSAGTitle: Hand-made\nSTATUSScenario runs: Multiple runs\nSTALBLModel evaluation\nMESLBL of 8\n"
         "MESSAGEvaluation of parameter set No. 1 completed: OK\nMESSAGBest so far: 4.5 (evaluation 1)\nPROGRE12.5\n";
}

/// A run that takes its time: 2000 evaluations of a tenth of a second.
RunSettings slowRun() {
  return {.maxEvaluations = 2000, .modelArguments = "--sleep-ms 100"};
}

class ViewerTest : public ::testing::Test {
 protected:
  void writeRun(const std::string& furtherRecords = "") const {
    folder_.write("basin.kdx", "");
    folder_.write("basin._spi_", runningRun() + furtherRecords);
  }
  static void cancelAndConfirm(TerminalProgram& viewer, const char* key = "q") {
    viewer.type(key);
    ASSERT_TRUE(viewer.shows("Cancel the run?"));
    viewer.type("y");
  }
  std::vector<std::string> attached() const { return {MIREVO_VIEWER, (folder_ / "basin.kdx")}; }

  const ModelFolder folder_;
};

TEST_F(ViewerTest, AttachedItFollowsARunAndOnlyAConfirmedKeyCancelsIt) {
  folder_.write("basin.kdx", "");
  TerminalProgram viewer(attached());
  ASSERT_TRUE(viewer.shows("waiting for one"));
  folder_.write("basin._spi_", runningRun());
  ASSERT_TRUE(viewer.shows("Hand-made"));
  ASSERT_TRUE(viewer.shows("1 of 8"));
  ASSERT_TRUE(viewer.shows("4.5 (No. 1)"));
  folder_.write("basin._spi_", runningRun() + "MESSAGEvaluation of parameter set No. 2 completed: FAILED - x\n");
  ASSERT_TRUE(viewer.shows("2 of 8, 1 failed"));
  viewer.resize(40, 10);
  ASSERT_TRUE(viewer.shows("Runs      2 of 8"));

  for (const std::string otherKey : {"n", "q", "\x1b[A", "\r"}) {
    viewer.type("q");
    ASSERT_TRUE(viewer.shows("Cancel the run?"));
    viewer.type(otherKey);
    ASSERT_TRUE(viewer.shows("q cancel run"));
  }
  EXPECT_FALSE(folder_.exists("basin._kill_"));
  cancelAndConfirm(viewer);
  ASSERT_TRUE(viewer.shows("Cancelling"));
  EXPECT_TRUE(folder_.exists("basin._kill_"));
  folder_.write("basin._spi_", runningRun() + "STATUSEnded: Simulation cancelled\nPROGRE100.0\n");
  ASSERT_TRUE(viewer.shows("Simulation cancelled"));
  viewer.type("q");
  EXPECT_EQ(viewer.wait(), 0);
}

TEST_F(ViewerTest, AttachedLeavingInAnyWayLeavesNoTrace) {
  writeRun();
  for (const std::string key : {"d", "\x03", ""}) {
    TerminalProgram viewer(attached());
    ASSERT_TRUE(viewer.shows("Hand-made"));
    if (key.empty()) viewer.hangUp();
    if (!key.empty()) viewer.type(key);
    EXPECT_EQ(viewer.wait(), 0);
    EXPECT_THAT(viewer.output(), HasSubstr(key.empty() ? "\x1b[?1049h" : "\x1b[?25h\x1b[?1049l"));
    EXPECT_FALSE(folder_.exists("basin._kill_"));
  }
}

TEST_F(ViewerTest, AKillFileThatCannotBeMadeIsSaid) {
  writeRun();
  std::filesystem::create_symlink("no/such/folder/file", (folder_ / "basin._kill_"));
  TerminalProgram viewer(attached());
  ASSERT_TRUE(viewer.shows("Hand-made"));
  cancelAndConfirm(viewer);
  EXPECT_TRUE(viewer.shows("Unable to cancel"));
}

TEST_F(ViewerTest, StartedWithTheRunItEndsWithTheRunsExitCode) {
  TerminalProgram good({MIREVO_PROGRAM, "//QMon", folder_.writeSetup({.maxEvaluations = 5})},
                       {{"VOLK_PROGRESS", "NONE"}});
  EXPECT_EQ(good.wait(), 0);
  EXPECT_THAT(good.output(), HasSubstr("Normal termination"));
  EXPECT_THAT(folder_.read("basin.log"), HasSubstr("Normal termination"));

  TerminalProgram bad({MIREVO_PROGRAM, "//qmon", folder_.writeSetup({.modelArguments = "--fail-above 0"})});
  EXPECT_EQ(bad.wait(), 1);
  EXPECT_THAT(bad.output(), HasSubstr("No of failed simulations too high"));
  EXPECT_THAT(bad.output(), HasSubstr("exited with code 3"));  // a line that stands on standard error alone
}

TEST_F(ViewerTest, ARunOutlivesItsViewerUntouched) {
  const std::pair<const char*, std::function<void(TerminalProgram&)>> parts[] = {
      {"d", [](TerminalProgram& viewer) { viewer.type("d"); }},
      {"hang-up", [](TerminalProgram& viewer) { viewer.hangUp(); }},
      {"crash", [](TerminalProgram& viewer) { ::kill(viewer.process(), SIGKILL); }}};
  for (const auto& [name, part] : parts) {
    SCOPED_TRACE(name);
    TerminalProgram viewer({MIREVO_PROGRAM, "//qmon", folder_.writeSetup(slowRun())});
    ASSERT_TRUE(viewer.shows("of 2001"));
    const int process = folder_.runsProcess();
    part(viewer);
    EXPECT_EQ(viewer.wait(), name == std::string("crash") ? 128 + SIGKILL : 0);
    const std::size_t size = folder_.read("basin._spi_").size();
    EXPECT_TRUE(waitUntil([&] { return folder_.read("basin._spi_").size() > size + 1000; }));
    EXPECT_TRUE(isRunning(process));
    if (name == std::string("d")) {
      EXPECT_THAT(viewer.output(), HasSubstr(fmt::format("The run goes on as process {}.", process)));
    }

    TerminalProgram again(attached());
    ASSERT_TRUE(again.shows("Small test basin"));
    again.type("qy");
    ASSERT_TRUE(again.shows("Simulation cancelled"));
    EXPECT_TRUE(waitUntil([&] { return !isRunning(process); }));
  }
}

/// A run whose lock is held by another one of the setup is starting for some seconds. It is stopped as soon as it waits
/// for the lock, so that its patience does not end while the keys are typed.
TEST_F(ViewerTest, CancellingARunThatIsOnlyStartingLeavesAnotherRunAlone) {
  const std::string setup = folder_.writeSetup(slowRun());
  RunningProgram other({setup});
  ASSERT_TRUE(folder_.reaches("basin._spi_", "COMSPD"));
  TerminalProgram viewer({MIREVO_PROGRAM, "//qmon", setup});
  int run = 0;
  ASSERT_TRUE(waitUntil([&] {
    run = std::atoi(TemporaryFolder::readFile(fmt::format("/proc/{0}/task/{0}/children", viewer.process())).c_str());
    std::error_code gone;
    for (const auto& open : std::filesystem::directory_iterator(fmt::format("/proc/{}/fd", run), gone)) {
      if (std::filesystem::read_symlink(open, gone) == folder_ / "basin._lock_") return true;
    }
    return false;
  }));
  ::kill(run, SIGSTOP);
  ASSERT_TRUE(viewer.shows("The run is starting."));
  cancelAndConfirm(viewer, "\x03");  // Ctrl-C, which asks as well
  ::kill(run, SIGCONT);
  EXPECT_EQ(viewer.wait(), 128 + SIGTERM);
  EXPECT_THAT(viewer.output(), HasSubstr("Mirevo: Termination request"));
  EXPECT_FALSE(folder_.exists("basin._kill_"));
  EXPECT_THAT(folder_.read("basin._spi_"), Not(HasSubstr("Ended")));
}

TEST_F(ViewerTest, NoPersonIsWaitedForAtNight) {
  writeRun("STATUSEnded: Normal termination\nPROGRE100.0\n");
  TerminalProgram viewer(attached(), {{"BUILDMODE", "NIGHT"}});
  EXPECT_EQ(viewer.wait(), 0);
}

TEST_F(ViewerTest, ARunThatWasKilledIsFoundGone) {
  RunningProgram run({folder_.writeSetup(slowRun())});
  ASSERT_TRUE(folder_.reaches("basin._spi_", "COMSPD"));
  TerminalProgram viewer(attached());
  ASSERT_TRUE(viewer.shows("running"));
  run.send(SIGKILL);
  run.wait();
  EXPECT_TRUE(viewer.shows("gone"));
}

TEST_F(ViewerTest, WithoutATerminalTheMessagesComeAsLines) {
  const ProgramResult result = runProgram({"//qmon", folder_.writeSetup({.maxEvaluations = 3})});
  EXPECT_EQ(result.exitCode, 0);
  EXPECT_THAT(result.output, HasSubstr("\nEvaluation of parameter set No. 2 completed: OK\nBest so far: "));
  EXPECT_THAT(result.output, EndsWith("-- Normal termination\n"));
  EXPECT_EQ(occurrences(result.output, "-- 4 of 4 evaluations"), 1);
  EXPECT_THAT(result.output, Not(HasSubstr("\x1b")));

  TerminalProgram dumb(attached(), {{"TERM", "dumb"}});
  EXPECT_EQ(dumb.wait(), 0);
  EXPECT_THAT(dumb.output(), HasSubstr("-- Normal termination"));
  EXPECT_THAT(dumb.output(), Not(HasSubstr("\x1b")));

  std::filesystem::remove((folder_ / "basin._spi_"));
  // As under a program that wants to hear nothing of its children.
  RunningProgram unheard({"--ignore-signal=CHLD", MIREVO_PROGRAM, "//qmon", (folder_ / "basin.kdx")}, {}, "env");
  EXPECT_EQ(unheard.wait().exitCode, 0);

  std::filesystem::remove((folder_ / "basin._spi_"));
  RunningProgram interrupted({"//qmon", folder_.writeSetup(slowRun())});
  ASSERT_TRUE(folder_.reaches("basin._spi_", "COMSPD"));
  interrupted.send(SIGTERM);
  EXPECT_EQ(interrupted.wait().exitCode, 128 + SIGTERM);
  EXPECT_THAT(folder_.read("basin.log"), HasSubstr("Termination request"));
}

TEST_F(ViewerTest, OnATerminalARunWithoutAViewerShowsOneLineThatMessagesReplace) {
  TerminalProgram slow(
      {MIREVO_PROGRAM, folder_.writeSetup({.maxEvaluations = 2, .modelArguments = "--sleep-ms 9000"})});
  EXPECT_TRUE(slow.shows("\r2 s: 0 of 3 runs\x1b[K"));  // time goes on during a model run
  slow.resize(12, 24);
  EXPECT_TRUE(slow.shows("\r0 of 3 runs\x1b[K") || slow.shows("\r0 of 3\x1b[K"));
  slow.type("\x03");
  EXPECT_EQ(slow.wait(), 128 + SIGINT);
  EXPECT_THAT(slow.output(), EndsWith("\r\x1b[KMirevo: Control-C send\r\n"));

  TerminalProgram good({MIREVO_PROGRAM, folder_.writeSetup({.maxEvaluations = 5})}, {{"NO_COLOR", ""}});
  EXPECT_EQ(good.wait(), 0);
  EXPECT_THAT(good.output(), ::testing::ContainsRegex("\r.\\[K[0-9] s: 6 of 6 runs, best [0-9.e-]+\r\n$"));

  TerminalProgram bad({MIREVO_PROGRAM, folder_.writeSetup({.modelArguments = "--fail-above 0"})});
  EXPECT_EQ(bad.wait(), 1);
  EXPECT_THAT(bad.output(), HasSubstr("\x1b[K\r\x1b[KMirevo: Error: Unable to continue. No of failed"));
  EXPECT_THAT(bad.output(), ::testing::ContainsRegex("\r.\\[K[0-9] s: [0-9]+ of 41 runs, [0-9]+ failed\r\n"));

  const std::string setup = folder_.writeSetup({.maxEvaluations = 2});
  for (const auto& [name, value] :
       RunningProgram::Environment{{"TERM", "dumb"}, {"VOLK_PROGRESS", "NONE"}, {"BUILDMODE", "NIGHT"}}) {
    TerminalProgram quiet({MIREVO_PROGRAM, setup}, {{name, value}});
    EXPECT_EQ(quiet.wait(), 0);
    EXPECT_EQ(quiet.output(), "") << name;
  }
  TerminalProgram messages({MIREVO_PROGRAM, setup}, {{"VOLK_PROGRESS", "STDOUT"}});
  EXPECT_EQ(messages.wait(), 0);
  EXPECT_THAT(messages.output(), AllOf(HasSubstr(" completed: OK"), Not(HasSubstr("\x1b"))));
}

TEST_F(ViewerTest, WithoutASetupItSaysSo) {
  TerminalProgram none({MIREVO_VIEWER});
  EXPECT_EQ(none.wait(), 1);
  EXPECT_THAT(none.output(), HasSubstr("Usage: mirevo-viewer kdx-file"));
  TerminalProgram missing({MIREVO_VIEWER, (folder_ / "missing.kdx")});
  EXPECT_EQ(missing.wait(), 1);
  EXPECT_THAT(missing.output(), HasSubstr("missing.kdx"));
}

}  // namespace
}  // namespace mirevo::testing
