#include <algorithm>
#include <chrono>
#include <cmath>
#include <memory>
#include <ostream>
#include <random>

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "integration/model_folder.h"
#include "integration/mpi_job.h"

namespace mirevo::testing {
namespace {

using ::testing::HasSubstr;
using ::testing::Not;

using Edits = std::vector<std::pair<std::string, std::string>>;

constexpr const char* kDds = "    Algorithm_Type = 2\n    Use_Surrogate_Model = 0\n";
constexpr const char* kSce = "    Algorithm_Type = 0\n    Use_Surrogate_Model = 0\n";
constexpr const char* kPseWithSurrogate = R"(    Algorithm_Type = 1
    Use_Surrogate_Model = 1
    [SURROGATE_MODEL_PARAMETERS]
      Neighbourhood_Size = 20
      No_Initial_Generations = 2
    [/SURROGATE_MODEL_PARAMETERS]
)";
const std::pair<std::string, std::string> kSettledBySample{"Aggregation_Method = 0", "Aggregation_Method = 1"};
const std::pair<std::string, std::string> kFromRandomPoints{"Include_Initial_Parameters = 1",
                                                            "Include_Initial_Parameters = 0"};

/// The lines of a file in alphabetical order: slots write in the order in which they end.
std::vector<std::string> sortedLines(const std::string& text) {
  std::vector<std::string> lines;
  std::istringstream stream(text);
  for (std::string line; std::getline(stream, line);) lines.push_back(line);
  std::sort(lines.begin(), lines.end());
  return lines;
}

class Restart : public ::testing::Test {
 protected:
  /// Writes a setup that goes on with what it finds.
  void writeSetup(const RunSettings& settings, const Edits& edits = {}) {
    setup_ = folder_.writeSetup(settings);
    folder_.editSetup("    Title = ", "    Restart = 1\n    Title = ");
    for (const auto& [from, to] : edits) folder_.editSetup(from, to);
    resultFile_ = settings.option == 2   ? "basin_Optimisation.dat"
                  : settings.option == 1 ? "basin_Sensitivity.dat"
                                         : "basin.dat";
  }
  void removeResults() const {
    for (const auto& entry : std::filesystem::directory_iterator(folder_.path())) {
      const std::string name = entry.path().filename().string();
      const bool isMade = name.starts_with("basin") || name.starts_with("calSimErr");
      if (isMade && name != "basin.kdx") std::filesystem::remove_all(entry.path());
    }
  }

  /// Runs the setup; with `processes` under MPI.
  void run(int processes = 0, int exitCode = 0) const {
    const auto program = start(processes);
    const ProgramResult result = program->wait();
    ASSERT_EQ(result.exitCode, exitCode) << result.error << folder_.read("basin.log");
  }
  std::unique_ptr<RunningProgram> start(int processes) const {
    if (processes == 0) return std::make_unique<RunningProgram>(std::vector{setup_});
    return std::make_unique<RunningProgram>(mpirunArguments(processes, {setup_}), mpirunEnvironment(), "mpirun");
  }
  /// Kills a run after that time, without a chance to put anything in order.
  void runAndKill(int processes, double seconds) const {
    const auto program = start(processes);
    const timespec pause{static_cast<time_t>(seconds), static_cast<long>((seconds - std::floor(seconds)) * 1e9)};
    ::nanosleep(&pause, nullptr);
    if (processes == 0) {
      program->send(SIGKILL);
    } else if (const int master = masterProcess(); master > 0) {
      ::kill(master, SIGKILL);
    } else {
      program->send(SIGTERM);  // not that far yet
    }
    program->wait();
  }
  int masterProcess() const {
    const std::string progress = folder_.read("basin._spi_");
    const auto at = progress.find(", process ");
    const int process = at == std::string::npos ? 0 : std::atoi(progress.c_str() + at + 10);
    return process > 0 && isRunning(process) ? process : 0;
  }

  std::string results() const { return withoutDates(folder_.read(resultFile_)); }
  std::string log() const { return folder_.read("basin.log"); }

  ModelFolder folder_;
  std::string setup_;
  std::string resultFile_;
};

/// MIREVO_RESTART_MOMENTS: how many moments of each run it is killed at, for a longer test.
int momentsToTry() {
  const char* text = std::getenv("MIREVO_RESTART_MOMENTS");
  return text == nullptr ? 1 : std::max(1, std::atoi(text));
}

struct KilledRun {
  const char* name;
  RunSettings settings;
  Edits edits;
  int processes = 0;  ///< of an MPI job; 0: a plain run
};

void PrintTo(const KilledRun& run, std::ostream* stream) {
  *stream << run.name;
}

class KilledRuns : public Restart, public ::testing::WithParamInterface<KilledRun> {};

TEST_P(KilledRuns, EndLikeOneThatWasNot) {
  const KilledRun& param = GetParam();
  if (param.processes > 0 && !mpirunIsInstalled()) GTEST_SKIP() << "no mpirun";
  writeSetup(param.settings, param.edits);
  const auto began = std::chrono::steady_clock::now();
  run(param.processes);
  const double seconds = std::chrono::duration<double>(std::chrono::steady_clock::now() - began).count();
  const std::string expected = results();
  const std::vector<std::string> failures = sortedLines(folder_.read("calSimErr.dat"));
  const auto savedCount = [this] {
    const std::filesystem::path saved = folder_ / "basin_Saved";
    return std::filesystem::exists(saved) ? std::distance(std::filesystem::recursive_directory_iterator(saved), {}) : 0;
  };
  const auto saved = savedCount();
  std::mt19937 random(7);
  std::uniform_real_distribution<double> moment(0.0, 1.05 * seconds);
  for (int i = 0; i < momentsToTry(); ++i) {
    removeResults();
    for (int kill = 0; kill < 2; ++kill) runAndKill(param.processes, moment(random) / (1.0 + kill));
    run(param.processes);
    ASSERT_EQ(results(), expected) << log();
    EXPECT_EQ(sortedLines(folder_.read("calSimErr.dat")), failures);
    EXPECT_EQ(savedCount(), saved);
  }
}

std::vector<std::string> scenarios(int count) {
  std::vector<std::string> values;
  for (int i = 0; i < count; ++i) values.push_back(fmt::format("{}, {}, 1", 0.3 * i, 0.1 * i));
  return values;
}

const KilledRun kKilledRuns[] = {
    {"Scenarios", {.option = 0, .scenarios = scenarios(30), .slots = 3, .modelArguments = "--fail-above 8.5"}, {}},
    {"Sensitivity", {.option = 1, .modelArguments = "--sleep-ms 20"}, {}},
    {"Dds", {.maxEvaluations = 60, .savedFile = "model/simulated.csv"}, {{kFromRandomPoints, kSettledBySample}}},
    {"Sce", {.maxEvaluations = 60, .modelArguments = "--fail-above 9"}, {{kDds, kSce}, kSettledBySample}},
    {"PseWithSurrogate", {.maxEvaluations = 90, .slots = 3}, {{kDds, kPseWithSurrogate}, kSettledBySample}},
    {"Uncertainty", {.option = 3, .maxEvaluations = 40, .slots = 3, .modelArguments = "--fail-above 5.9"}, {}},
    {"PseUnderMpi",
     {.maxEvaluations = 60, .modelArguments = "--sleep-ms 10", .savedFile = "model/simulated.csv"},
     {{kDds, kPseWithSurrogate}},
     3},
    {"UncertaintyUnderMpi", {.option = 3, .maxEvaluations = 40, .modelArguments = "--sleep-ms 10"}, {}, 3},
};

INSTANTIATE_TEST_SUITE_P(Restart, KilledRuns, ::testing::ValuesIn(kKilledRuns),
                         [](const auto& test) { return std::string(test.param.name); });

TEST_F(Restart, ARunOfOneKindIsTakenUpByAnother) {
  if (!mpirunIsInstalled()) GTEST_SKIP() << "no mpirun";
  writeSetup({.maxEvaluations = 60, .slots = 3, .modelArguments = "--sleep-ms 10"}, {{kDds, kPseWithSurrogate}});
  run();
  const std::string expected = results();
  removeResults();
  const auto killWithRows = [this](int processes, int rows) {
    const auto program = start(processes);
    ASSERT_TRUE(waitUntil([&] { return std::ssize(readResults(folder_.read(resultFile_)).rows) > rows; }));
    processes == 0 ? program->send(SIGKILL) : static_cast<void>(::kill(masterProcess(), SIGKILL));
    program->wait();
  };
  killWithRows(0, 10);
  killWithRows(3, 30);
  run();
  EXPECT_EQ(results(), expected) << log();
  EXPECT_THAT(log(), HasSubstr("Restart: "));
}

TEST_F(Restart, AFinishedRunIsWalkedThroughAndEndsWithTheSameFile) {
  writeSetup({.option = 3, .maxEvaluations = 20}, {});
  run();
  const std::string expected = results();
  folder_.write("model/run.sh", folder_.read("model/run.sh") + "\n");  // the same model, but not the same text
  run(0, 1);
  EXPECT_THAT(log(), HasSubstr("Error: Unable to continue the earlier run\n"
                               "the setup is another one than that of the earlier run:\n"
                               "   BatchFileName of MIREVO_SIMULATION_OPTION/SIMBATCH/SIMBATCHITEM_1: the content of "
                               "model/run.sh has changed"));
  EXPECT_EQ(results(), expected) << "refused without a change";
  const std::string script = folder_.read("model/run.sh");
  folder_.write("model/run.sh", script.substr(0, script.size() - 1));
  run();
  EXPECT_EQ(results(), expected);
  EXPECT_THAT(log(), Not(HasSubstr("initiated")));
  EXPECT_THAT(folder_.read("basin._spi_"), HasSubstr("MESSAGEvaluation of parameter set No. 20 taken from the earlier "
                                                     "run: OK\nPROGRE100.0\n"));
  EXPECT_FALSE(folder_.exists("basin.1.dat"));
  EXPECT_FALSE(folder_.exists("basin_Band_1.1.csv"));
  folder_.editSetup("Restart = 1", "Restart = 0");
  run();
  EXPECT_TRUE(folder_.exists("basin.1.dat"));
  EXPECT_EQ(results(), expected);
}

TEST_F(Restart, AChangedSettingIsRefusedByName) {
  writeSetup({.maxEvaluations = 10});
  run();
  const std::string before = folder_.read(resultFile_);
  folder_.editSetup("Upper_Bound = 10.0", "Upper_Bound = 9.0");
  folder_.editSetup("Random_Seed = 1", "Random_Seed = 2");
  folder_.editSetup("Small test basin", "Another title");
  run(0, 1);
  EXPECT_THAT(log(), HasSubstr("   Upper_Bound of PARAMETER_1 (a): 10 then, 9 now\n"
                               "   Random_Seed of OPTIMISATION_ALGORITHM/INITIAL_SAMPLE: 1 then, 2 now\n"
                               "Restart = 0 begins anew"));
  EXPECT_EQ(folder_.read(resultFile_), before);
  EXPECT_FALSE(folder_.exists("basin_Optimisation.1.dat"));
}

TEST_F(Restart, ARaisedBudgetTakesAFinishedSearchFurther) {
  for (const char* search : {kSce, kPseWithSurrogate}) {
    writeSetup({.maxEvaluations = 40}, {{kDds, search}});
    run();
    folder_.editSetup("Max_No_Evaluations = 40", "Max_No_Evaluations = 70");
    run();
    const std::string taken = results();
    removeResults();
    run();
    EXPECT_EQ(taken, results()) << search;
    removeResults();
  }
}

TEST_F(Restart, ARaisedBudgetIsANewSearchOfDds) {
  writeSetup({.maxEvaluations = 20}, {kFromRandomPoints});
  run();
  const ResultTable first = readResults(folder_.read(resultFile_));
  folder_.editSetup("Max_No_Evaluations = 20", "Max_No_Evaluations = 50");
  const auto checkFirstRows = [&] {
    const ResultTable table = readResults(folder_.read(resultFile_));
    ASSERT_GE(table.rows.size(), first.rows.size());
    EXPECT_TRUE(std::equal(first.rows.begin(), first.rows.end(), table.rows.begin()));
  };
  run();
  EXPECT_THAT(log(), HasSubstr("a new search starts from the best of the first 20 evaluations, which are kept"));
  checkFirstRows();
  const std::string expected = results();
  EXPECT_EQ(readResults(expected).rows.size(), 52U);  // header, 50 and the final run
  // Cut off in the second search, it goes on in the second search.
  folder_.write(resultFile_, expected.substr(0, expected.find("\n37\t") + 5));
  run();
  EXPECT_EQ(results(), expected);
}

TEST_F(Restart, FailuresThatEndedARunAreMadeAgainWhenAsked) {
  writeSetup({.option = 0, .scenarios = scenarios(30)});
  folder_.editSetup("  [SimultaneousSimulations]\n", "  [SimultaneousSimulations]\n    MaxSimulationTime = 0.2\n");
  const std::string script = folder_.read("model/run.sh");
  folder_.write("model/run.sh", "#!/bin/sh\ntest -e ../fast || test ! -e second || sleep 60\ntouch second\n" +
                                    script.substr(script.find("exec")));
  run(0, 1);
  EXPECT_THAT(log(), HasSubstr("Why evaluations failed:\n   4 x batch ran too long; first No. 2: run.sh was ended "
                               "because it ran longer than 0.2 seconds\n"
                               "Error: Unable to continue. No of failed simulations too high.\n"));
  for (const int number : {2, 3, 4}) {
    EXPECT_TRUE(folder_.exists(fmt::format("basin_Failed{}/mirevo_batch.log", number)));
  }
  EXPECT_FALSE(folder_.exists("basin_Failed5"));
  folder_.write("fast", "");
  run(0, 1);  // the same failures, so the same end
  EXPECT_THAT(log(), HasSubstr("   4 x batch ran too long; first No. 2: run.sh was ended because"));
  folder_.editSetup("Restart = 1", "Restart = 2");
  run();
  EXPECT_EQ(readResults(results()).rows.size(), 31U);
  EXPECT_THAT(results(), Not(HasSubstr("FAILED")));
  EXPECT_EQ(folder_.read("calSimErr.dat"), "# Failed evaluations of basin\n");
  EXPECT_FALSE(folder_.exists("basin_Failed2"));
}

}  // namespace
}  // namespace mirevo::testing
