#include <algorithm>
#include <tuple>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "common/data_table.h"
#include "integration/model_folder.h"
#include "integration/mpi_job.h"
#include "matchers.h"

namespace mirevo::testing {
namespace {

/// A model that uses MPI itself must not take itself for a process of this job.
constexpr char kCountsJobVariables[] = "env | grep -cE '^(OMPI|PMIX|PMI)_' > job_variables.txt";

class Mpi : public ::testing::Test {
 protected:
  void SetUp() override {
    if (!mpirunIsInstalled()) GTEST_SKIP() << "mpirun is not installed";
  }

  static ProgramResult runJob(int processes, const std::vector<std::string>& arguments) {
    return startJob(processes, arguments).wait();
  }
  std::string processFolder(const RunSettings& settings, int number) const {
    return folder_.processFolder(settings.processFolder.empty() ? "." : settings.processFolder, number);
  }
  std::string log() const { return folder_.read("basin.log"); }

  ModelFolder folder_;
};

TEST_F(Mpi, OneProcessChecksTheSetup) {
  const ProgramResult result = runJob(3, {"--check", folder_.writeSetup({})});
  EXPECT_EQ(result.exitCode, 0) << result.error;
  EXPECT_EQ(occurrences(result.output, "Check of "), 1);
  EXPECT_EQ(occurrences(result.output, "Nothing is wrong"), 1);
}

TEST_F(Mpi, AJobWritesTheResultsOfAPlainRun) {
  const std::pair<RunSettings, int> cases[] = {
      {{.maxEvaluations = 25}, 2},
      {{.algorithm = 0, .maxEvaluations = 25}, 3},
      {{.algorithm = 1, .aggregation = 1, .maxEvaluations = 25}, 5},
      {{.option = 3, .maxEvaluations = 15, .savedFile = "model/simulated.csv"}, 3},
      // Two of them fail, which is as many as may.
      {{.option = 0, .scenarios = scenarios(20), .modelArguments = "--fail-above 8", .processFolder = "scratch/made"},
       3},
  };
  folder_.useScript(fmt::format("{}\n{}", kSleepByParameters, kCountsJobVariables));
  std::filesystem::create_directory(folder_ / "scratch");  // a plain run would warn that it is missing
  // Behind another item, so that workers must find the one that is named.
  std::string observed = folder_.read("observed.csv");
  for (auto comma = observed.find(','); comma != std::string::npos; comma = observed.find(',', comma + 5)) {
    observed.insert(comma, comma < observed.find('\n') ? ",bed" : ",0.5");
  }
  folder_.write("observed.csv", observed);
  const auto nameItem = [this] {
    folder_.editSetup("'observed.csv'\n          Item_No = 1", "'observed.csv'\nItem_Name = 'simulated'");
  };
  for (auto [settings, processes] : cases) {
    const std::string setup = folder_.writeSetup(settings);
    nameItem();
    const ProgramResult alone = runProgram({setup});
    ASSERT_EQ(alone.exitCode, 0) << log();
    const std::string plain = folder_.read(settings.resultFile());
    settings.slots = 3;  // which counts for nothing in a job
    folder_.writeSetup(settings);
    nameItem();
    const std::string series = folder_.read("basin_Series.dat");
    const ProgramResult job = runJob(processes, {setup});
    EXPECT_EQ(job.exitCode, 0) << job.error << log();
    EXPECT_EQ(job.output + job.error, alone.error) << "the warnings of the setup";
    EXPECT_EQ(withoutDates(folder_.read(settings.resultFile())), withoutDates(plain));
    EXPECT_EQ(occurrences(log(), "NoSimultaneousSim: taken as 1 on each worker"), 1);
    EXPECT_EQ(folder_.read("basin_Series.dat"), series);
    EXPECT_THAT(log(), HasSubstr(fmt::format("MPI job: this master and {} workers", processes - 1)));
    EXPECT_THAT(log(), EndsWith("\n\nNormal termination\n"));
    for (int rank = 1; rank < processes; ++rank) {
      EXPECT_EQ(folder_.read(processFolder(settings, rank) + "/job_variables.txt"), "0\n");
    }
    EXPECT_EQ(processFolder(settings, 0), "");
    if (!settings.savedFile.empty()) {
      EXPECT_TRUE(folder_.exists("basin_Saved/15/simulated.csv"));
      EXPECT_EQ(folder_.read("basin_Saved/15/simulated.csv"), folder_.read("basin_Saved.1/15/simulated.csv"));
    }
    EXPECT_THAT(folder_.read("basin._spi_"), EndsWith("PROGRE100.0\n"));
  }
}

TEST_F(Mpi, WorkersThatTheSearchHasNoUseForAreNamed) {
  folder_.writeSetup({.algorithm = 2, .maxEvaluations = 12});
  folder_.editSetup("Algorithm_Type = 2", "Algorithm_Type = 'PDDS'");
  folder_.editSetup("Candidates = 6", "Candidates = 2");
  const auto warningsWith = [this](int processes) {
    const ProgramResult job = runJob(processes, {folder_ / "basin.kdx"});
    EXPECT_EQ(job.exitCode, 0) << job.error << log();
    return occurrences(log(), "Only 2 workers can be used by the evaluations of this run");
  };
  EXPECT_EQ(warningsWith(3), 0);
  EXPECT_EQ(warningsWith(4), 1);
}

// exp(ln(5)) is 4.999999999999999, and exp(ln(10)) is above 10.
TEST_F(Mpi, ASampleFileOfALogarithmicParameterIsRunAsItIsWritten) {
  const std::vector<std::string> given{"5", "10", "1", "3", "7", "9.7", "2.2", "6", "8.3", "9"};
  std::string sample = "a b\n";
  for (const std::string& value : given) sample += value + " 2\n";
  folder_.write("sample.txt", sample);
  for (const auto& [algorithm, processes] : {std::pair(0, 1), std::pair(1, 1), std::pair(0, 3), std::pair(1, 3)}) {
    const std::string setup =
        folder_.writeSetup({.algorithm = algorithm, .includesInitial = false, .maxEvaluations = 10});
    folder_.editSetup("Lower_Bound = 0.0\n      Upper_Bound = 10.0\n      Transformation_Type = 0",
                      "Lower_Bound = 1.0\n      Upper_Bound = 10.0\n      Transformation_Type = 1");
    folder_.editSetup("Initial_Sample_Generation = 0", "Initial_Sample_Generation = 4");
    folder_.editSetup("File_Name = ''\n    [/INITIAL", "File_Name = 'sample.txt'\n    [/INITIAL");
    folder_.editSetup("Count = 0\n    [/INTERNAL",
                      "Count = 1\n      [CONSTRAINT_1]\n        Left_Equation = 'a'\n        Right_Equation = '10'\n"
                      "        Logical_Operator = 1\n      [/CONSTRAINT_1]\n    [/INTERNAL");
    const ProgramResult run = processes == 1 ? runProgram({setup}) : runJob(processes, {setup});
    ASSERT_EQ(run.exitCode, 0) << run.error << log();
    const auto rows = readDataTable(folder_.read("basin_Optimisation.dat")).rows;
    ASSERT_GT(rows.size(), given.size());
    for (std::size_t i = 0; i < given.size(); ++i) {
      EXPECT_EQ(rows[i][1] + " " + rows[i][2], "OK " + given[i]) << algorithm << " " << processes;
    }
  }
}

// Its ranks make their process folders while the others do so and the master opens its files, all in one folder, which
// is the one that they copy. What they copy of it is the model, whatever earlier runs have left there.
TEST_F(Mpi, ASetupBesideItsModelIsRunByManyRanks) {
  folder_.write("run.sh", "#!/bin/sh\ncd model && exec ./run.sh \"$@\"\n", 0755);
  folder_.write("basin.txt", "the model's own");
  for (int i = 0; i < 40; ++i) folder_.write(fmt::format("maps/{}.bin", i), std::string(100'000, 'm'));
  RunSettings settings{.maxEvaluations = 15, .batchFile = "run.sh", .savedFile = "model/simulated.csv"};
  for (settings.option = 1; settings.option <= 3; ++settings.option) {
    ASSERT_EQ(runProgram({folder_.writeSetup(settings)}).exitCode, 0) << log();
  }
  settings.option = 0;
  settings.scenarios = scenarios(20);
  settings.modelArguments = "--fail-above 8.3";
  for (const char* processFolders : {"", "", "scratch"}) {
    settings.processFolder = processFolders;
    const ProgramResult job = runJob(12, {folder_.writeSetup(settings)});
    ASSERT_EQ(job.exitCode, 0) << job.error << log();
    for (int rank = 1; rank < 12; ++rank) {
      std::set<std::string> names;
      for (const auto& entry : std::filesystem::directory_iterator(folder_ / processFolder(settings, rank))) {
        names.insert(entry.path().filename());
      }
      for (const char* ofThisRun : {".mirevo_process", "mirevo_batch.log", "scratch"}) names.erase(ofThisRun);
      EXPECT_THAT(names, ElementsAre("basin.kdx", "basin.txt", "maps", "model", "observed.csv", "run.sh"));
    }
  }
  EXPECT_TRUE(folder_.exists("calSimErr.dat"));  // there was something of everything
  EXPECT_TRUE(folder_.exists("basin_Saved.1"));
}

TEST_F(Mpi, AProcessAloneInItsJobIsAPlainRun) {
  folder_.useScript(kCountsJobVariables);
  const ProgramResult job = runJob(1, {folder_.writeSetup({.option = 0, .scenarios = scenarios(4), .slots = 2})});
  EXPECT_EQ(job.exitCode, 0) << job.error << log();
  EXPECT_THAT(log(), Not(HasSubstr("MPI")));
  EXPECT_EQ(folder_.read("basin_Process2/job_variables.txt"), "0\n");
}

TEST_F(Mpi, AnErrorEndsTheJobWithItsMessageOnce) {
  // The model's script, the model's arguments and the file of it, and what is said.
  const std::tuple<std::string, RunSettings, std::string, std::string> cases[] = {
      {"",
       {.modelArguments = "--fail-above -1"},
       "Error: Unable to continue. No of failed",
       "run.sh exited with code 3"},
      // Each run leaves a folder where the next one's worker is to write the parameters.
      {"cp parameters.txt copy; rm -f parameters.txt; mkdir -p parameters.txt/full; set -- --parameters copy",
       {},
       "Error: Unable to open ",
       "parameters.txt\n"},
      {"", {.batchFile = "model/none.sh"}, "Error: The file ", "none.sh"},
  };
  for (auto [script, settings, message, detail] : cases) {
    SCOPED_TRACE(message);
    folder_.useScript(script);
    settings.option = 0;
    settings.scenarios = scenarios(20);
    const ProgramResult job = runJob(3, {folder_.writeSetup(settings)});
    EXPECT_EQ(job.exitCode, 1);
    EXPECT_FALSE(job.timedOut);
    EXPECT_THAT(log(), HasSubstr(message));
    EXPECT_THAT(log(), HasSubstr(detail));
    EXPECT_THAT(log(), Not(HasSubstr("Termination request")));
    EXPECT_EQ(occurrences(job.error, message), 1) << job.error;
  }
  EXPECT_EQ(occurrences(runJob(3, {"//qmon"}).error, "Usage: Mirevo kdx-file"), 1);
}

/// Of a job of three processes one worker's model hangs, ignores SIGTERM and has a child that does so, too.
TEST_F(Mpi, HoweverAJobIsEndedItLeavesNoProcess) {
  const char* const pidFiles[] = {"worker.pid", "model.pid", "grandchild.pid"};
  folder_.useScript(
      fmt::format("if mkdir '{0}/first' 2>/dev/null; then\n"
                  "  echo $PPID >'{0}/worker.pid'\n  echo $$ >'{0}/model.pid'\n"
                  "  exec {1} --sleep-ms 3600000 --ignore-term 1 --grandchild '{0}/grandchild.pid'\n"
                  "fi",
                  folder_.path(), MIREVO_TEST_MODEL));
  struct Way {
    const char* name;
    int stoppedRank, killedRank;  // of 0 and 1; -1: none
    bool outlivesRanks;
    int launcherSignal;  // 0: the kill file
    int exitCode;
    std::vector<const char*> messages;
  };
  const char* const cancelled = "EM: Simulation cancelled";
  const char* const terminated = "Termination request";
  const Way ways[] = {
      {"kill file", -1, -1, false, 0, 1, {cancelled}},
      {"SIGTERM to mpirun", -1, -1, false, SIGTERM, 1, {terminated}},
      {"killed worker", -1, 1, false, -1, 128 + SIGKILL, {terminated, "signal 9"}},
      {"stopped worker", 1, -1, false, 0, 1, {cancelled, "no answer to the request to stop from worker"}},
      {"stopped worker of a job that outlives it",
       1,
       -1,
       true,
       0,
       1,
       {cancelled, "no answer to the request to stop from worker"}},
      {"stopped master", 0, -1, false, 0, 1, {"aborted by worker"}}};
  for (const Way& way : ways) {
    SCOPED_TRACE(way.name);
    const bool endsBySignal = way.launcherSignal != 0 || way.stoppedRank == 0;
    RunningProgram job = startJob(3, {folder_.writeSetup({.option = 0, .scenarios = scenarios(12)})},
                                  endsBySignal ? 4 : 1, way.outlivesRanks);
    std::vector<int> processes;
    for (const char* name : pidFiles) processes.push_back(folder_.waitForProcess(name));
    // All sets but one have been evaluated by the other worker.
    EXPECT_TRUE(waitUntil([&] { return occurrences(log(), " completed: OK") == 11; })) << log();
    if (way.stoppedRank >= 0) ::kill(way.stoppedRank == 0 ? folder_.runsProcess() : processes.front(), SIGSTOP);
    if (way.killedRank >= 0) ::kill(processes.front(), SIGKILL);
    if (way.launcherSignal > 0) job.send(way.launcherSignal);
    if (way.launcherSignal == 0) folder_.write("basin._kill_", "");
    const ProgramResult result = job.wait(60.0);  // five seconds on a machine that is not busy
    EXPECT_FALSE(result.timedOut);
    EXPECT_EQ(result.exitCode, way.exitCode);
    for (const char* message : way.messages) EXPECT_THAT(result.error, HasSubstr(message));
    if (way.stoppedRank != 0) {
      EXPECT_THAT(log(), HasSubstr(fmt::format("\n{}\n", way.messages.front())));
      EXPECT_THAT(folder_.read("basin.dat"), HasSubstr(fmt::format("# {}\n", way.messages.front())));
    }
    EXPECT_THAT(folder_.read("basin_Termination.log"), EndsWith("Abnormal completion\n"));
    EXPECT_EQ(readDataTable(folder_.read("basin.dat")).rows.size(), 11U);
    for (const int process : processes) EXPECT_TRUE(waitUntil([&] { return !isRunning(process); })) << process;
    for (const char* name : pidFiles) std::filesystem::remove(folder_ / name);
    std::filesystem::remove(folder_ / "first");
  }
}

/// The first model that is started hangs, and its worker is lost; the second run of its set does not.
TEST_F(Mpi, ALostWorkerCostsOneModelRun) {
  const std::string setup = folder_.writeSetup({.option = 0, .scenarios = scenarios(12)});
  ASSERT_EQ(runProgram({setup}).exitCode, 0) << log();
  const std::string plain = withoutDates(folder_.read("basin.dat"));
  folder_.useScript(
      fmt::format("if mkdir '{0}/first' 2>/dev/null; then\n"
                  "  echo $PPID >'{0}/worker.pid'\n  echo $$ >'{0}/model.pid'\n  exec {1} --sleep-ms 3600000\nfi",
                  folder_.path(), MIREVO_TEST_MODEL));
  folder_.editSetup("[SimultaneousSimulations]", "[SimultaneousSimulations]\n    MaxWorkerSilence = 3");
  struct Way {
    const char* name;
    int signal;
    bool outlivesRanks;
    const char* why;
  };
  for (const Way& way :
       {Way{"killed", SIGKILL, true, "its process has ended"},
        Way{"stopped", SIGSTOP, true, "it has given no sign of life for 3 s"},
        Way{"stopped, and nobody may be lost", SIGSTOP, false, "it has given no sign of life for 3 s"}}) {
    SCOPED_TRACE(way.name);
    RunningProgram job = startJob(3, {setup}, 1, way.outlivesRanks);
    const int worker = folder_.waitForProcess("worker.pid");
    const int model = folder_.waitForProcess("model.pid");
    ::kill(worker, way.signal);
    const ProgramResult result = job.wait(100.0);
    EXPECT_FALSE(result.timedOut);
    EXPECT_EQ(result.exitCode, 0) << result.error;
    EXPECT_EQ(withoutDates(folder_.read("basin.dat")), plain);
    EXPECT_THAT(log(), ::testing::ContainsRegex(
                           fmt::format("Warning: Worker [12] on .* is lost: {}.*Evaluation No. ", way.why)));
    EXPECT_THAT(log(), HasSubstr("\n1 evaluation made once more, as the worker that had it was lost\n"));
    EXPECT_THAT(log(), EndsWith("\n\nNormal termination\n"));
    EXPECT_THAT(folder_.read("basin_Run.dat"), HasSubstr("lostRuns\t1\n"));
    for (const int process : {worker, model}) EXPECT_TRUE(waitUntil([&] { return !isRunning(process); })) << process;
    for (const char* name : {"worker.pid", "model.pid", "first"}) std::filesystem::remove(folder_ / name);
  }
}

}  // namespace
}  // namespace mirevo::testing
