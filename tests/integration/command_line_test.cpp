#include <sys/stat.h>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "integration/model_folder.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

TEST(CommandLine, WithoutASetupFileTheUsageIsShown) {
  const ProgramResult result = runProgram({"//QMON", "a.kdx", " "});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.error, StartsWith("Mirevo: Usage: Mirevo kdx-file\nMirevo: Ignored: \"a.kdx\""));
  EXPECT_EQ(result.output, "");
}

TEST(CommandLine, QuestionsAboutAProgramAreAnsweredAndLeaveNoFile) {
  for (const char* program : {MIREVO_PROGRAM, MIREVO_VIEWER, MIREVO_REPORT}) {
    const std::string name = std::filesystem::path(program).filename();
    for (const auto& [question, answer] :
         {std::pair{"--version", name + " "}, {"--help", "Usage: " + name}, {"-h", "Usage: " + name}}) {
      const TemporaryFolder folder;
      const std::string command = "cd '" + folder.path() + "' && exec '" + program + "' " + question;
      const ProgramResult result = RunningProgram({"-c", command}, {}, "sh").wait();
      EXPECT_EQ(result.exitCode, 0);
      EXPECT_THAT(result.output, StartsWith(answer));
      const ProgramResult lost = RunningProgram({"-c", command + " >/dev/full"}, {}, "sh").wait();
      EXPECT_EQ(lost.exitCode, 1);
      EXPECT_EQ(lost.error, name + ": Unable to write the answer: No space left on device\n");
      EXPECT_TRUE(std::filesystem::is_empty(folder.path()));
    }
  }
}

TEST(CommandLine, QuestionsAreAnsweredUnlessTheLastArgumentIsAFile) {
  const TemporaryFolder folder;
  folder.write("Title", "");
  folder.write("--version", "");
  struct Case {
    const char* arguments;
    int exitCode;
    const char* output;
    const char* error;
  };
  const Case cases[] = {
      {"--version", 1, "", "Error: "},  // a setup file of that name
      {"--version --help", 0, "Usage: ", "Mirevo: Ignored: \"--version\"; --help is answered"},
      {"--help none.kdx", 0, "Usage: ", "Mirevo: Ignored: \"none.kdx\"; --help is answered"},
      {"--keyword", 0, "MIREVO_SIMULATION_OPTION/Option\n", ""},
      {"--keyword title //x", 0,
       "MIREVO_SIMULATION_OPTION/Title\n  Meaning: ", "Mirevo: Ignored: \"//x\"; --keyword is answered"},
      {"--keyword Title", 0, "MIREVO_SIMULATION_OPTION/Title\n  Meaning: ", ""},
      {"--keyword maxno", 1, "", "did you mean OPTIMISATION_ALGORITHM/STOPPING_CRITERIA/Max_No_Evaluations"},
      {"--help >&-", 1, "", "Mirevo: Unable to write the answer: "},
      {"--keywrd", 1, "", "Mirevo: Unknown option \"--keywrd\"\nMirevo: Usage: "},
  };
  for (const Case& each : cases) {
    const std::string command = fmt::format("cd '{}' && exec '{}' {}", folder.path(), MIREVO_PROGRAM, each.arguments);
    const ProgramResult result = RunningProgram({"-c", command}, {}, "sh").wait();
    EXPECT_EQ(result.exitCode, each.exitCode) << each.arguments;
    EXPECT_THAT(result.output, StartsWith(each.output));
    EXPECT_THAT(result.error, HasSubstr(each.error));
    EXPECT_EQ(result.output.empty(), each.output[0] == '\0') << each.arguments;
    EXPECT_EQ(result.error.empty(), each.error[0] == '\0') << each.arguments;
    for (const char* left : {"--version.log", "--version._spi_", "--version_Termination.log"}) {
      std::filesystem::remove(folder / left);  // of the run that is refused
    }
    EXPECT_EQ(std::distance(std::filesystem::directory_iterator(folder.path()), {}), 2) << each.arguments;
  }
}

TEST(CommandLine, ARefusedSetupLeavesOneLogAndKeepsThoseOfRuns) {
  const ModelFolder folder;
  const std::string setup = folder.writeSetup({.option = 0});
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  folder.editSetup("Option = 0", "Option = 'none'");
  for (int attempt = 0; attempt < 3; ++attempt) EXPECT_EQ(runProgram({setup}).exitCode, 1);
  EXPECT_THAT(
      folder.read("basin.log"),
      ::testing::ContainsRegex("\n\n[^\n]*basin.kdx:3:14: Option: .*\nThe setup is refused: .*\n\n"
                               "Error: Unable to read keyword in section MIREVO_SIMULATION_OPTION in KDX file\n$"));
  folder.writeSetup({.option = 0});
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("Normal termination"));
  EXPECT_THAT(folder.read("basin.1.log"), HasSubstr("Normal termination"));
  EXPECT_FALSE(folder.exists("basin.2.log"));
}

TEST(CommandLine, AMissingSetupFileIsNamedOnStandardErrorAndInTheLog) {
  const TemporaryFolder folder;
  const ProgramResult result = runProgram({"ignored.kdx", (folder / "basin.kdx")});
  EXPECT_EQ(result.exitCode, 1);
  EXPECT_THAT(result.error, HasSubstr("\nMirevo: Error: Unable to open " + (folder / "basin.kdx")));
  EXPECT_THAT(folder.read("basin.log"), EndsWith("\n\nError: Unable to open " + (folder / "basin.kdx") + "\n"));
  EXPECT_THAT(folder.read("basin.log"), HasSubstr("No such file or directory"));
  EXPECT_THAT(result.error, StartsWith("Mirevo: Ignored: \"ignored.kdx\"; "));
  // However often it is tried, a mistyped name leaves no more than these.
  runProgram({(folder / "basin.kdx")});
  std::vector<std::string> left;
  for (const auto& entry : std::filesystem::directory_iterator(folder.path())) left.push_back(entry.path().filename());
  EXPECT_THAT(left, ::testing::UnorderedElementsAre("basin.log", "basin._spi_"));

  // Nothing is made beside what is no file, as under /dev.
  ASSERT_EQ(::mkfifo((folder / "pipe").c_str(), 0600), 0);
  std::filesystem::create_directory((folder / "sub"));
  for (const auto& [name, reason] : {std::pair{"pipe", "Not a regular file"}, {"sub", "Is a directory"}}) {
    EXPECT_EQ(runProgram({(folder / name)}).error,
              "Mirevo: Error: Unable to open " + (folder / name) + "\n" + reason + "\n");
    for (const char* ending : {".log", "._spi_", "_Termination.log"})
      EXPECT_FALSE(folder.exists(name + std::string(ending)));
  }

  // Nor over the files of the setup that was meant, of which a run may be going on.
  folder.write("meant.kdx", "");
  folder.write("meant.log", "of the run");
  EXPECT_THAT(runProgram({(folder / "meant")}).error, HasSubstr("did you mean " + (folder / "meant.kdx") + "?"));
  EXPECT_THAT(runProgram({(folder / "meant.kdx/")}).error, HasSubstr("Unable to open " + (folder / "meant.kdx/\n") +
                                                                     (folder / "meant.kdx is a file and no folder")));
  EXPECT_EQ(folder.read("meant.log"), "of the run");
  EXPECT_FALSE(folder.exists("meant._spi_"));

  const ProgramResult nowhere = runProgram({(folder / "no/such/folder/basin.kdx")});
  EXPECT_EQ(nowhere.exitCode, 1);
  EXPECT_THAT(nowhere.error, HasSubstr("Unable to open " + folder / "no/such/folder/basin.kdx\nthere is no"));
}

TEST(CommandLine, AJobWhoseLauncherIsOfAnotherMpiIsRefusedBeforeAnyFileIsTouched) {
  const ModelFolder folder;
  for (const char* variable : {"OMPI_COMM_WORLD_SIZE", "PMI_SIZE"}) {
    const ProgramResult result = runProgram({folder.writeSetup({})}, {{variable, "4"}});
    EXPECT_EQ(result.exitCode, 1);
    EXPECT_THAT(result.error, HasSubstr("started 4 processes"));
    EXPECT_FALSE(folder.exists("basin.log"));
  }
}

TEST(CommandLine, AJobWithoutThePartForMpiIsRefusedWithWhatIsMissing) {
  const ModelFolder folder;
  const std::string setup = folder.writeSetup({.option = 0, .scenarios = {"5, 2, 1"}});
  std::filesystem::create_directory(folder / "bin");
  const std::string program = folder / "bin/Mirevo";
  std::filesystem::copy_file(MIREVO_PROGRAM, program);
  const auto start = [&](const RunningProgram::Environment& job) {
    return RunningProgram({setup}, job, program.c_str()).wait();
  };
  // PMIX has no variable for the number of processes.
  const RunningProgram::Environment jobs[] = {
      {{"OMPI_COMM_WORLD_SIZE", "4"}}, {{"PMI_SIZE", "4"}}, {{"PMIX_RANK", "0"}}};
  for (const char* fault : {"mirevo-mpi.so does not exist", "cannot be loaded"}) {
    for (const auto& job : jobs) {
      const ProgramResult result = start(job);
      EXPECT_EQ(result.exitCode, 1);
      EXPECT_THAT(result.error, AllOf(HasSubstr("cannot take part in this MPI job"), HasSubstr(fault),
                                      HasSubstr("packages mirevo and mirevo-mpi")));
      EXPECT_FALSE(folder.exists("basin.log"));
    }
    folder.write("bin/lib/mirevo/mirevo-mpi.so", "no module");
  }
  EXPECT_EQ(start({{"OMPI_COMM_WORLD_SIZE", "1"}}).exitCode, 0) << "a job of one process needs no MPI";
}

TEST(Results, WhatIsNotOfARunIsNeitherRenamedNorRemoved) {
  const ModelFolder folder;
  const std::string setup =
      folder.writeSetup({.option = 0, .scenarios = {"9, 1, 1", "5, 2, 1"}, .modelArguments = "--fail-above 8"});
  for (const char* name : {"basin.log", "basin.dat", "basin_Restart.dat", "basin_Run.dat", "basin_Failures.dat",
                           "basin_Quantiles.dat", "basin_Series.dat", "basin_Report.html", "basin_Saved/notes.txt",
                           "basin_Process1/notes.txt", "basin_Process1/.notes", "calSimErr.dat"}) {
    folder.write(name, "time,flow\n");
    const ProgramResult run = runProgram({setup});
    EXPECT_EQ(run.exitCode, 1) << name;
    const std::string taken = std::string(name).substr(0, std::string_view(name).find('/'));
    EXPECT_THAT(run.error, AllOf(HasSubstr(folder / taken), HasSubstr("It is not from a run of this program")));
    EXPECT_EQ(folder.read(name), "time,flow\n");
    std::filesystem::remove_all(folder / taken);
  }
  for (const char* name : {"basin.log", "basin.dat", "basin_Simulated.bin", "basin_Series.dat", "calSimErr.dat",
                           "basin_Saved", "basin_Process1"}) {
    for (const auto& [isLink, text] : {std::pair{true, "symbolic link to another.dat"}, {false, "a pipe"}}) {
      const std::string path = folder / name;
      std::filesystem::remove(path);
      ASSERT_EQ(isLink ? ::symlink("another.dat", path.c_str()) : ::mkfifo(path.c_str(), 0600), 0);
      const ProgramResult run = runProgram({setup});
      EXPECT_EQ(run.exitCode, 1) << name;
      EXPECT_THAT(run.error, AllOf(HasSubstr(path), HasSubstr(text)));
      EXPECT_FALSE(folder.exists("another.dat"));
      EXPECT_TRUE(std::filesystem::remove(path)) << name;
    }
  }
  folder.write("basin_Failed7/notes.txt", "the user's");
  std::filesystem::remove(folder / "basin._spi_");
  std::filesystem::create_symlink(folder.write("another.dat", "the user's"), folder / "basin._spi_");
  folder.useScript("rm -f *.log");                   // the mark of its process folder stays
  for (const char* cut : {"", "# Small test ba"}) {  // by a full disk
    folder.write("basin.dat", cut);
    EXPECT_EQ(runProgram({setup}).exitCode, 1);
    EXPECT_THAT(folder.read("basin.dat"), HasSubstr("\n1\tFAILED\t"));
  }
  for (const char* name : {"basin_Failed7/notes.txt", "another.dat"}) EXPECT_EQ(folder.read(name), "the user's");
}

TEST(Results, OfSetupsNamedAfterAResultOfAnotherAreNotLost) {
  const ModelFolder folder;
  folder.writeSetup({.option = 0});
  const std::string other = folder.read("basin.kdx");
  folder.writeSetup({.option = 0, .restart = 1});
  std::string told;
  for (const char* name : {"basin", "basin_Run", "basin_Termination", "basin_Restart", "calSimErr", "basin_Run"}) {
    if (std::string_view(name) != "basin") folder.write(name + std::string(".kdx"), other);
    const ProgramResult run = runProgram({folder / name + ".kdx"});
    EXPECT_EQ(run.exitCode, 0) << name << run.error;
    told = run.error;
  }
  EXPECT_THAT(told, HasSubstr("Results of another setup, " + folder / "calSimErr.kdx"));
  EXPECT_THAT(folder.read("basin_Run.1.dat"), HasSubstr("plannedEvaluations"));  // the account, and the results twice
  EXPECT_THAT(folder.read("basin_Run.2.dat"), HasSubstr("\n1\tOK\t"));
  EXPECT_EQ(runProgram({folder / "basin.kdx"}).exitCode, 1);  // its settings are those of basin_Restart.kdx no more
  std::filesystem::rename(folder / "basin_Restart.1.dat", folder / "basin_Restart.dat");
  const ProgramResult run = runProgram({folder / "basin.kdx"});
  EXPECT_THAT(run.error, HasSubstr("Results of another setup, " + folder / "basin_Run.kdx"));
  EXPECT_THAT(folder.read("basin_Run.3.dat"), HasSubstr("\n1\tOK\t"));
  EXPECT_THAT(folder.read("basin_Termination.2.log"), HasSubstr("Normal termination"));
}

}  // namespace
}  // namespace mirevo::testing
