#include <filesystem>
#include <map>
#include <signal.h>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "integration/model_folder.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

/// All files below a folder with their content, and when they were written.
using FolderState = std::map<std::string, std::pair<std::string, std::filesystem::file_time_type>>;

FolderState stateOf(const TemporaryFolder& folder) {
  FolderState state;
  for (const auto& entry : std::filesystem::recursive_directory_iterator(folder.path())) {
    const std::string name = std::filesystem::relative(entry.path(), folder.path());
    if (entry.is_regular_file()) state[name] = {folder.read(name), entry.last_write_time()};
  }
  return state;
}

ProgramResult check(const std::string& setup) {
  return runProgram({"--check", setup});
}

TEST(SetupCheck, ShowsWhatWasReadWhateverTheTaskAndTouchesNothing) {
  const ModelFolder folder;
  for (const int option : {0, 1, 2, 3}) {
    for (const bool wasRun : {false, true}) {
      SCOPED_TRACE(fmt::format("option {}, {}", option, wasRun ? "after a run" : "at first"));
      const std::string setup = folder.writeSetup({.option = option, .maxEvaluations = 5});
      if (wasRun) {
        ASSERT_EQ(runProgram({setup}).exitCode, 0);
      }
      folder.editSetup("Restart = 0", wasRun ? "Restart = 1" : "Restart = 0");
      const FolderState before = stateOf(folder);
      const ProgramResult result = check(setup);
      EXPECT_EQ(result.exitCode, 0) << result.error;
      EXPECT_TRUE(stateOf(folder) == before);
      EXPECT_FALSE(folder.exists("basin_Check_Process1"));
      // a + b sin(t/58) + c t/365, with a = 4 and b = 1, and for the observations 5 and 2
      EXPECT_THAT(
          result.output,
          AllOf(HasSubstr("   a = 4\n   b = 1\n   c = 1 (fixed)\n"),
                HasSubstr("Output measure flow, root mean square: "),
                HasSubstr("   simulated: simulated.csv, item No. 1 (simulated): 365 values, the first 4 at 2001-01-01 "
                          "00:00, the last 4.98994 at 2001-12-31 00:00\n"),
                HasSubstr(": 365 values, the first 5 at 2001-01-01 00:00, the last 5.98"),
                HasSubstr("   365 pairs, 0 observations without a simulated value\n"
                          "   first pair: simulated 4, observed 5 at 2001-01-01 00:00\n"),
                HasSubstr("Objective functions:\n   fit = "), HasSubstr("Nothing is wrong; no file of a run")));
      EXPECT_EQ(result.error, "");
    }
  }
}

TEST(SetupCheck, ShowsEachMeasureItsOwnSeries) {
  const std::tuple<const char*, const char*, const char*> cases[] = {
      // keywords of the first and of the second measure on the same items, and what is shown of the second
      {"", "Time_Offset = 24",
       "365 values, the first 5 at 2001-01-01 00:00, the last 5.98261 at 2001-12-31 00:00\n   364 pairs, 1 observation "
       "without a simulated value\n   first pair: simulated 4.01998, observed 5 at 2001-01-01 00:00\n"},
      {"Months = 1", "",
       ": 365 values, the first 5 at 2001-01-01 00:00, the last 5.98261 at 2001-12-31 00:00\n   365 pairs"},
      {"", "Months = 1", ": 31 values, the first 5 at 2001-01-01 00:00, the last "},
  };
  for (const auto& [first, second, shown] : cases) {
    const ModelFolder folder;
    const std::string setup = folder.writeSetup({.option = 0});
    folder.addMeasure("again", second);
    folder.editSetup("Weight_Above = 1.0", fmt::format("Weight_Above = 1.0\n{}", first));
    const ProgramResult result = check(setup);
    EXPECT_EQ(result.exitCode, 0) << result.error;
    const std::size_t own = result.output.find("Output measure again");
    ASSERT_NE(own, std::string::npos) << result.output;
    EXPECT_THAT(result.output.substr(own), HasSubstr(shown));
  }
}

TEST(SetupCheck, ShowsNamesInAnyEncodingAndWarnsOfObservationsThatAreNotUsed) {
  const ModelFolder folder;
  const std::string setup = folder.writeSetup({.option = 0});
  folder.editSetup("Weight_Above = 1.0", "Weight_Above = 1.0\nTime_Offset = 24");
  const std::string observed = folder.read("observed.csv");
  folder.write("observed.csv", "time,Abflu\xDF" + observed.substr(observed.find('\n')));
  const ProgramResult result = check(setup);
  EXPECT_EQ(result.exitCode, 0) << result.error;
  EXPECT_THAT(
      result.output,
      AllOf(HasSubstr("item No. 1 (Abflu\xEF\xBF\xBD)"), Not(HasSubstr("\xDF")),
            HasSubstr("\nWarning: output measure \"flow\": 1 of 365 observations in the evaluation period are not "
                      "used"),
            HasSubstr("Nothing is wrong, but for 1 warning; ")));
}

TEST(SetupCheck, SaysWhatIsWrong) {
  struct Case {
    const char* from;
    const char* to;
    const char* script;
    const char* error;
    bool keepsFolder;
  };
  const Case cases[] = {
      {"Lower_Bound = 0.0", "Lowr_Bound = 0.0", "", "did you mean \"Lower_Bound\"?", false},
      {"    Title", "    Base_Folder = 'none'\n    Title", "", "/none\n", false},
      {"    Title", "    Base_Folder = '.'\n    Title", "", "", false},
      {"'observed.csv'", "'observd.csv'", "", "observd.csv: No such file", false},
      {"", "", "echo no licence; exit 7",
       "run.sh exited with code 7\n   no licence\nThe folder in which the model was run is kept: ", true},
      {"", "", "exit 0", "simulated.csv", true},
      {"", "", "echo 'time,x' >simulated.csv; exit 0", "simulated.csv", true},
      {"2001-12-31", "2101-12-31", "", "", false},
      {"Start_Date = 2001-01-01\n    End_Date = 2001-12-31", "Start_Date = 2051-01-01\n    End_Date = 2051-12-31", "",
       "2051", false},
  };
  for (const Case& each : cases) {
    const ModelFolder folder;
    const std::string setup = folder.writeSetup({});
    folder.editSetup(each.from, each.to);
    if (each.script[0] != '\0') folder.useScript(each.script);
    const ProgramResult result = check(setup);
    EXPECT_EQ(result.exitCode, each.error[0] == '\0' ? 0 : 1) << result.output << result.error;
    EXPECT_THAT(result.error, HasSubstr(each.error));
    EXPECT_EQ(folder.exists("basin_Check_Process1"), each.keepsFolder) << result.error;
    EXPECT_FALSE(folder.exists("basin.log"));
    EXPECT_FALSE(folder.exists("basin_Check_Process._lock_"));
  }
}

/// a + b must be 6 or more: the initial values are too small.
void constrainToSix(const ModelFolder& folder) {
  folder.editSetup("TqSEKdxListItemCount = 0\n    [/INTERNAL_CONSTRAINTS]",
                   "TqSEKdxListItemCount = 1\n[CONSTRAINT_1]\nLeft_Equation = '6'\nRight_Equation = 'a + b'\n"
                   "Logical_Operator = 0\n[/CONSTRAINT_1]\n[/INTERNAL_CONSTRAINTS]");
}

TEST(SetupCheck, RunsASetOfTheTaskWhereInitialValuesThatItDoesWithoutCannotBeRun) {
  struct Case {
    int option;
    const char* from;
    const char* to;
    const char* told;
    const char* error = "";
  };
  constexpr const char* kInstead =
      "   a = 4\n   b = 1\n   c = 1 (fixed)\nThey cannot be run, and this task does without";
  const Case cases[] = {
      {1, "Sensitivity_Type = 0", "Sensitivity_Type = 'Sobol'\n[SOBOL]\nSample_Size = 32\n[/SOBOL]",
       " of 128 sets of the design are not run and fail", "Error: The run would end before it is complete\n"},
      {1, "Sensitivity_Type = 0", "Sensitivity_Type = 'Morris'\n[MORRIS]\nDesign = 'trajectories'\n[/MORRIS]",
       " points of the trajectories cannot be run and are left out"},
      {1, "Sensitivity_Type = 0", "Sensitivity_Type = 'Morris'", kInstead},
      {3, "", "", kInstead},
      {3, "Uncertainty_Type = 1", "Uncertainty_Type = 1\nRedraw_Infeasible = 1", kInstead},
      {3, "Uncertainty_Type = 1", "Uncertainty_Type = 'GLUE'\n[GLUE]\nBehavioural_Share = 0.5\n[/GLUE]", kInstead},
      {3, "Uncertainty_Type = 1", "Uncertainty_Type = 'DREAM'\n[DREAM]\nLikelihood = 'normal'\n[/DREAM]", kInstead},
      {2, "Include_Initial_Parameters = 1", "Include_Initial_Parameters = 0", kInstead},
      {2, "", "", "Warning: ", "The evaluation of the initial values failed: parameter constraints violated\n"},
      {0, "", "", "Warning: ", "The evaluation of the initial values failed: parameter constraints violated\n"},
      {1, "", "", "", "The evaluation of the initial values failed: parameter constraints violated\n"},
  };
  for (const Case& each : cases) {
    SCOPED_TRACE(each.to);
    const ModelFolder folder;
    const std::string setup = folder.writeSetup({.option = each.option, .maxEvaluations = 80});
    folder.editSetup(each.from, each.to);
    constrainToSix(folder);
    const FolderState before = stateOf(folder);
    const ProgramResult result = check(setup);
    const bool isFault = each.error[0] != '\0';
    EXPECT_EQ(result.exitCode, isFault ? 1 : 0) << result.error;
    EXPECT_THAT(result.output, HasSubstr(each.told));
    if (!isFault) {
      EXPECT_THAT(result.output, HasSubstr("Aggregate: "));
    }
    EXPECT_EQ(result.output.find("Nothing is wrong") != std::string::npos, !isFault);
    EXPECT_THAT(result.error, AllOf(HasSubstr(each.error), Not(HasSubstr("was run"))));
    EXPECT_FALSE(folder.exists("basin_Check_Process1"));
    EXPECT_TRUE(stateOf(folder) == before);
  }
}

TEST(SetupCheck, RunsASetOfTheSampleOfEverySearch) {
  for (const char* search : {"SCE", "PSE", "OPSE", "DDS", "PDDS", "CMA-ES", "GLM"}) {
    SCOPED_TRACE(search);
    const ModelFolder folder;
    const std::string setup = folder.writeSetup({.search = search, .includesInitial = false, .maxEvaluations = 80});
    constrainToSix(folder);
    const ProgramResult result = check(setup);
    EXPECT_EQ(result.exitCode, 0) << result.error;
    EXPECT_THAT(result.output, HasSubstr("Values of a set of the task, with which the model is run instead"));
  }
  // Of a sample file GLM takes six sets, which can be run, unlike those behind them.
  const ModelFolder folder;
  const std::string setup = folder.writeSetup({.search = "GLM", .includesInitial = false, .maxEvaluations = 80});
  constrainToSix(folder);
  std::string sample = "a b\n";
  for (int i = 0; i < 30; ++i) sample += fmt::format("{} {}\n", i < 6 ? 4 + i : 1, i < 6 ? 4.0 : 0.1 * i);
  folder.write("sample.txt", sample);
  folder.editSetup("Initial_Sample_Generation = 0\n      Initial_Sample_File_Name = ''",
                   "Initial_Sample_Generation = 4\n      Initial_Sample_File_Name = 'sample.txt'");
  const ProgramResult result = check(setup);
  EXPECT_EQ(result.exitCode, 0) << result.output << result.error;
  EXPECT_THAT(result.output, Not(HasSubstr("Warning")));
}

TEST(SetupCheck, LeavesARunInProgressAloneAndHasAFolderOfItsOwn) {
  const ModelFolder folder;
  const std::string setup = folder.writeSetup({.option = 0});
  ASSERT_EQ(runProgram({setup}).exitCode, 0);
  const std::string expected = withoutDates(folder.read("basin.dat"));
  const std::string hold = fmt::format(
      "here='{0}'\ncase $PWD in *_Check_*) which=check;; *) which=run;; esac\necho $$ >$here/$which.pid\n"
      "while [ -e $here/$which.hold ]; do sleep 0.02; done",
      folder.path());
  folder.useScript(hold);
  folder.write("run.hold", "");
  RunningProgram run({setup});
  folder.waitForProcess("run.pid");
  const ProgramResult beside = check(setup);
  EXPECT_EQ(beside.exitCode, 0) << beside.error;
  std::filesystem::remove(folder / "run.hold");
  EXPECT_EQ(run.wait().exitCode, 0);
  EXPECT_EQ(withoutDates(folder.read("basin.dat")), expected);

  folder.write("check.hold", "");
  std::filesystem::remove(folder / "check.pid");
  RunningProgram first({"--check", setup});
  const int model = folder.waitForProcess("check.pid");
  const ProgramResult second = check(setup);
  EXPECT_EQ(second.exitCode, 1);
  EXPECT_THAT(second.error, HasSubstr("Error: Unable to initialise MirevoSimpleLaunch"));
  EXPECT_THAT(second.error, HasSubstr("basin_Check_Process"));
  first.send(SIGTERM);
  EXPECT_EQ(first.wait().exitCode, 128 + SIGTERM);
  EXPECT_TRUE(waitUntil([model] { return !isRunning(model); }));
  EXPECT_FALSE(folder.exists("basin_Check_Process._lock_"));
}

TEST(NewSetup, RunsAsItIsAndReplacesNothing) {
  const TemporaryFolder folder;
  const std::string target = folder / "basins/first";
  const ProgramResult made = runProgram({"--new", target});
  EXPECT_EQ(made.exitCode, 0) << made.error;
  EXPECT_THAT(made.output, HasSubstr("\nNext: Mirevo --check " + target + "/setup.kdx, then Mirevo "));
  const FolderState before = stateOf(folder);

  const ProgramResult again = runProgram({"--new", target});
  EXPECT_EQ(again.exitCode, 1);
  EXPECT_THAT(again.error, HasSubstr("files are there already; name another folder:\n   " + target + "/setup.kdx\n"));
  const std::string other = folder / "other";
  folder.write("other/data/flow.csv", "the user's");
  EXPECT_EQ(runProgram({"--new", other}).exitCode, 1);
  for (const char* name : {"setup.kdx", "model"}) EXPECT_FALSE(std::filesystem::exists(other + "/" + name));
  EXPECT_THAT(runProgram({"--new", folder / "basin.kdx"}).error, HasSubstr("expected the folder for it, found "));
  EXPECT_THAT(runProgram({"--new", folder / "other/data/flow.csv"}).error, HasSubstr("flow.csv/setup.kdx: "));
  std::filesystem::remove_all(other);
  EXPECT_TRUE(stateOf(folder) == before);

  const std::string setup = target + "/setup.kdx";
  EXPECT_EQ(
      std::system(
          ("cd '" + target + "/model' && cp flow.csv made && ./run.sh && cmp -s flow.csv made && rm made").c_str()),
      0);
  const ProgramResult checked = check(setup);
  EXPECT_EQ(checked.exitCode, 0) << checked.error;
  EXPECT_THAT(checked.output, HasSubstr("\n   334 pairs, 0 observations without a simulated value\n"));
  EXPECT_THAT(checked.output, Not(HasSubstr("Warning: ")));
  EXPECT_EQ(runProgram({setup}).exitCode, 0);
  EXPECT_THAT(folder.read("basins/first/setup.log"),
              AllOf(HasSubstr("\n   delay = 9."), HasSubstr("\n   loss = 0.44"), Not(HasSubstr("Warning: "))));
}

}  // namespace
}  // namespace mirevo::testing
