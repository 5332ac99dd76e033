#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "integration/model_folder.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

/// A run whose second scenario sleeps for an hour and has a child that ignores SIGTERM.
class Interruption : public ::testing::Test {
 protected:
  Interruption() {
    folder_.useScript("test -e first || set --; touch first");
    setup_ = folder_.writeSetup({.option = 0,
                                 .scenarios = {"1, 1, 1", "2, 2, 1"},
                                 .modelArguments = "--sleep-ms 3600000 --grandchild grandchild.pid"});
  }
  int waitForGrandchild() { return folder_.waitForProcess("basin_Process1/grandchild.pid"); }

  ModelFolder folder_;
  std::string setup_;
};

TEST_F(Interruption, ASignalOrAKillFileEndsTheRunWithItsMessageAndNothingIsLeft) {
  for (const auto& [signal, message] : {std::pair{0, "Simulation cancelled"},
                                        {SIGTERM, "Termination request"},
                                        {SIGINT, "Control-C send"},
                                        {SIGHUP, "Termination request"},
                                        {SIGSEGV, "Illegal storage access"}}) {
    folder_.write("basin._kill_", "from an earlier run");
    RunningProgram program({setup_});
    const int grandchild = waitForGrandchild();
    signal == 0 ? static_cast<void>(folder_.write("basin._kill_", "")) : program.send(signal);
    const ProgramResult result = program.wait();
    EXPECT_EQ(result.exitCode, signal == 0 ? 1 : 128 + signal);
    EXPECT_EQ(result.error, fmt::format("Mirevo: {}\n", message));
    EXPECT_THAT(folder_.read("basin.log"), HasSubstr(fmt::format("\n{}\n", message)));
    EXPECT_THAT(folder_.read("basin.log"), Not(HasSubstr("Normal termination")));
    EXPECT_THAT(folder_.read("basin._spi_"), HasSubstr(fmt::format("\nSTATUSEnded: {}\nPROGRE100.0\n", message)));
    EXPECT_EQ(folder_.read("basin_Termination.log"),
              fmt::format("{}Abnormal completion\n", signal == 0 ? "" : std::string(message) + "\n"));
    EXPECT_THAT(folder_.read("basin.dat"),
                ::testing::ContainsRegex(fmt::format("\n1\tOK\t[^\n]*\n(#[^\n]*\n)*# {}\n", message)));
    EXPECT_TRUE(waitUntil([&] { return !isRunning(grandchild); }));
    std::filesystem::remove_all(folder_ / "basin_Process1");
  }
}

TEST_F(Interruption, ASecondRunOfTheSameFilesOrFoldersIsRefused) {
  folder_.write("other/x", "");
  folder_.editSetup("ProcessFolder = ''", fmt::format("ProcessFolder = '{}'", folder_ / "other"));
  RunningProgram program({setup_});
  ASSERT_TRUE(waitUntil([&] { return folder_.read("basin.log").ends_with("No. 2 initiated\n"); }));
  const std::string log = folder_.read("basin.log");
  folder_.write("new", folder_.read("basin.kdx"));  // as an editor saves
  std::filesystem::rename(folder_ / "new", setup_);
  const std::string holder = "run \\(process [0-9]+ on [^)]*\\) ";
  for (const auto& [setup, reason] :
       {std::pair{"basin.kdx", "another " + holder + "writes the files"},
        {"basin.KDX", "another " + holder + "writes the files"},
        {"basin_Run.kdx", "a " + holder + "of .*/basin.kdx, which has results with the"}}) {
    folder_.write(setup, folder_.read("basin.kdx"));
    const ProgramResult second = runProgram({folder_ / setup});
    EXPECT_EQ(second.exitCode, 1);
    EXPECT_THAT(second.error, ::testing::ContainsRegex("Another run of this setup is in progress\n.*: " + reason));
  }
  EXPECT_EQ(folder_.read("basin.log"), log);
  for (const char* file : {"basin.1.log", "basin_Run.log"}) EXPECT_FALSE(folder_.exists(file));

  // Another setup whose process folders have the same names.
  const std::string first = folder_ / folder_.processFolder("other", 1);
  folder_.editSetup(fmt::format("ProcessFolder = '{}'", folder_ / "other"), "ProcessFolder = ''");
  std::string text = folder_.read("basin.kdx");
  for (const char* file : {"model/", "observed.csv"}) {
    for (auto at = text.find(file); at != std::string::npos; at = text.find(file, at + 4)) text.insert(at, "../");
  }
  const std::string name = first.substr(0, first.size() - std::string("_Process1").size());
  folder_.write(name.substr(folder_.path().size() + 1) + ".kdx", text);
  const ProgramResult third = runProgram({name + ".kdx"});
  EXPECT_EQ(third.exitCode, 1);
  EXPECT_THAT(third.error, HasSubstr(fmt::format("works in a folder {}_Process<number>", name)));
  EXPECT_TRUE(std::filesystem::exists(first + "/first")) << "the folder of the first run was made afresh";

  program.send(SIGTERM);
  program.wait();
  EXPECT_FALSE(folder_.exists("basin._lock_"));
  EXPECT_FALSE(std::filesystem::exists(name + "_Process._lock_"));
}

// Its aggregate, by which it is the best, is known only when the initial sample gives the scale.
TEST(EarlyEnd, NamesTheBestSetAsOneWithFewerPairsAfterItsMessageWithWhichTheLogEnds) {
  for (const auto& [sixteenth, message] :
       {std::pair{"exec sleep 3600", "Simulation cancelled"},
        {"exit 7", "Error: Unable to continue. No of failed simulations too high."}}) {
    const ModelFolder folder;
    folder.write("model/run.sh",
                 fmt::format("#!/bin/sh\necho run >>../runs\ntest $(wc -l <../runs) -lt 16 || {}\n{}\n"
                             "grep -Eq '^a = *5 *$' parameters.txt || exit 0\n"
                             "head -3 simulated.csv >cut && mv cut simulated.csv\n",
                             sixteenth, MIREVO_TEST_MODEL),
                 0755);
    folder.write("sample.txt", "a b\n4 1\n5 2\n1 1\n2 3\n9 4\n8 2\n3 4\n7 1\n6 5\n2 2\n");
    const std::string setup = folder.writeSetup({.algorithm = 0, .includesInitial = false, .aggregation = 1});
    folder.editSetup("Initial_Sample_Generation = 0", "Initial_Sample_Generation = 4");
    folder.editSetup("Initial_Sample_File_Name = ''", "Initial_Sample_File_Name = 'sample.txt'");
    RunningProgram program({setup});
    EXPECT_TRUE(folder.reaches("basin_Optimisation.dat", "\n15\tOK\t"));
    if (!std::string_view(message).starts_with("Error")) folder.write("basin._kill_", "");
    const std::string error = program.wait().error;
    EXPECT_THAT(error, StartsWith(fmt::format("Mirevo: {}\n", message)));
    EXPECT_EQ(occurrences(error, "\nMirevo: The best evaluation, No. 2, is judged by fewer observations"), 1);
    EXPECT_EQ(occurrences(folder.read("basin.log"), "\nWarning: The best evaluation, No. 2, is judged by fewer"), 1);
    EXPECT_THAT(folder.read("basin.log"), EndsWith(fmt::format("\n\n{}\n", message)));
  }
}

TEST(EarlyEnd, TheReportOfARunThatASignalEndedNamesTheBestSetAsOneWithFewerPairs) {
  const ModelFolder folder;
  folder.write("model/run.sh",
               fmt::format("#!/bin/sh\ngrep -Eq '^a = *6 *$' parameters.txt && exec sleep 3600\n{}\n"
                           "grep -Eq '^a = *5 *$' parameters.txt || exit 0\n"
                           "head -3 simulated.csv >cut && mv cut simulated.csv\n",
                           MIREVO_TEST_MODEL),
               0755);
  RunningProgram program({folder.writeSetup({.option = 0, .scenarios = {"4, 1, 1", "5, 2, 1", "6, 1, 1"}})});
  EXPECT_TRUE(folder.reaches("basin.dat", "\n2\tOK\t"));
  program.send(SIGTERM);
  program.wait();
  EXPECT_EQ(RunningProgram({folder / "basin.kdx"}, {}, MIREVO_REPORT).wait().exitCode, 0);
  EXPECT_EQ(occurrences(folder.read("basin_Report.html"), "The best evaluation, No. 2, is judged by fewer"), 1);
}

}  // namespace
}  // namespace mirevo::testing
