// What the evaluation loop adds to a model run: wall time per evaluation of LocalEvaluator against a bare loop that
// does posix_spawn and wait on the same batch, and how well slots are kept busy.
//
//   overhead [FOLDER]...     folders to work in, one a file system to measure (default: /dev/shm and the temporary one)
//
// The two loops take turns in short rounds, so that what else the machine does strikes both; each figure is the median
// of its rounds. The model is the small one of the tests: it reads its parameter file and writes 365 values.
#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <map>
#include <memory>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <fmt/format.h>

#include "common/fatal_error.h"
#include "evaluation/local_evaluator.h"
#include "platform/posix_process_launcher.h"

namespace {

using namespace mirevo;
using Clock = std::chrono::steady_clock;

constexpr int kRounds = 11;
constexpr int kRunsARound = 100;

double secondsSince(Clock::time_point start) {
  return std::chrono::duration<double>(Clock::now() - start).count();
}

double median(std::vector<double> values) {
  std::sort(values.begin(), values.end());
  return values[values.size() / 2];
}

class SilentObserver final : public EvaluationObserver {
 public:
  void message(std::string_view) override {}
  void warning(std::string_view text) override { fmt::print("warning: {}\n", text); }
  void evaluationFinished(std::span<const double>, const EvaluationResult& result) override {
    if (!result.ok()) fatalError("a model run failed", result.failure->reason);
  }
  bool isCancelled() override { return false; }
};

std::string series(int steps) {
  std::string text = "time,flow\n";
  for (int day = 1; day <= steps; ++day) text += fmt::format("2001-01-{:02},{}\n", day, 1.0);
  return text;
}

/// A calibration of the test model in a folder of its own.
class Calibration final {
 public:
  Calibration(const std::string& folder, int slotCount, const std::string& fixedParameters) : folder_(folder) {
    const std::string base = folder + "/base";
    std::filesystem::remove_all(folder);
    std::filesystem::create_directories(base);
    std::filesystem::copy_file(MIREVO_TEST_MODEL, base + "/model");
    std::ofstream(base + "/parameters.tpl") << "!\na = !a             !\nb = !b             !\n" << fixedParameters;
    std::ofstream(base + "/parameters.txt") << "a = 1\n";
    std::ofstream(base + "/simulated.csv") << series(28);
    std::ofstream(folder + "/observed.csv") << series(28);

    ModelDescription description;
    description.baseFolder = base;
    description.parameterFiles = {{0, base + "/parameters.txt", base + "/parameters.tpl"}};
    OutputMeasure measure;
    measure.name = "rms";
    measure.statisticType = StatisticType::rootMeanSquare;
    measure.simulation = {base + "/simulated.csv", 1};
    measure.observation = {folder + "/observed.csv", 1};
    description.measures = {measure};
    description.period = {{2001, 1, 1}, {2001, 12, 31}};
    ObjectiveFunction objective;
    objective.name = "all";
    objective.measures = {0};
    description.objectives = {objective};
    LauncherSettings settings;
    settings.baseFolder = base;
    settings.processFolderPrefix = folder + "/run_Process";
    settings.batchItems = {{base + "/model", ""}};
    settings.slotCount = slotCount;

    std::vector<ModelParameter> parameters(2);
    parameters[0].name = "a";
    parameters[1].name = "b";
    for (ModelParameter& parameter : parameters) parameter.upperBound = 10.0;
    parameters_ = std::make_unique<ParameterModel>(parameters, std::vector<InternalConstraint>{});
    aggregator_ = std::make_unique<ObjectiveAggregator>(description.objectives, AggregationMethod::none);
    runner_ = std::make_unique<ModelRunner>(description, *parameters_, *aggregator_, launcher_, settings);
    evaluator_ = std::make_unique<LocalEvaluator>(*runner_, observer_, failedRuns_, slotCount);
  }
  ~Calibration() { std::filesystem::remove_all(folder_); }
  Calibration(const Calibration&) = delete;
  Calibration& operator=(const Calibration&) = delete;

  /// Seconds for that many evaluations in one batch.
  double evaluate(int count) {
    std::vector<ParameterSet> sets;
    for (int i = 0; i < count; ++i) sets.push_back({1.0 + 0.001 * i, 2.0});
    const auto start = Clock::now();
    evaluator_->evaluateParameterSets(sets, DispatchMode::task);
    return secondsSince(start);
  }

  /// Seconds for that many runs of the same batch in the same folders by posix_spawn and wait alone.
  double runBare(int count, int slotCount) {
    std::map<pid_t, int> running;
    std::vector<std::string> models;
    std::vector<posix_spawn_file_actions_t> actions(static_cast<std::size_t>(slotCount));
    for (int slot = 1; slot <= slotCount; ++slot) {
      auto& action = actions[static_cast<std::size_t>(slot - 1)];
      models.push_back(launcher_.getProcessFolder(slot) + "/model");
      posix_spawn_file_actions_init(&action);
      posix_spawn_file_actions_addchdir_np(&action, launcher_.getProcessFolder(slot).c_str());
    }
    const auto spawn = [&](int slot) {
      const auto i = static_cast<std::size_t>(slot - 1);
      char* const arguments[] = {models[i].data(), nullptr};
      pid_t process = 0;
      if (posix_spawn(&process, models[i].c_str(), &actions[i], nullptr, arguments, environ) != 0) std::abort();
      running[process] = slot;
    };
    const auto start = Clock::now();
    int started = 0;
    while (started < std::min(slotCount, count)) spawn(++started);
    while (!running.empty()) {
      int status = 0;
      const auto ended = running.find(waitpid(-1, &status, 0));
      if (ended == running.end()) continue;  // the launcher's guard is a child, too
      if (status != 0) std::abort();
      const int slot = ended->second;
      running.erase(ended);
      if (started++ < count) spawn(slot);
    }
    const double seconds = secondsSince(start);
    for (auto& action : actions) posix_spawn_file_actions_destroy(&action);
    return seconds;
  }

 private:
  std::string folder_;
  PosixProcessLauncher launcher_;
  SilentObserver observer_;
  FailedRunPolicy failedRuns_{10};
  std::unique_ptr<ParameterModel> parameters_;
  std::unique_ptr<ObjectiveAggregator> aggregator_;
  std::unique_ptr<ModelRunner> runner_;
  std::unique_ptr<LocalEvaluator> evaluator_;
};

void compareWithBareLoop(const std::string& folder) {
  for (const int slotCount : {1, 2, 4}) {
    Calibration calibration(folder, slotCount, "");
    std::vector<double> ours;
    std::vector<double> bare;
    std::vector<double> ratios;
    calibration.runBare(kRunsARound, slotCount);
    for (int round = 0; round < kRounds; ++round) {
      bare.push_back(calibration.runBare(kRunsARound, slotCount) / kRunsARound * 1e6);
      ours.push_back(calibration.evaluate(kRunsARound) / kRunsARound * 1e6);
      ratios.push_back(ours.back() / bare.back());
    }
    fmt::print("{:24} {:5} {:12.0f} {:12.0f} {:8.2f}\n", folder, slotCount, bare.empty() ? 0.0 : median(bare),
               median(ours), median(ratios));
  }
}

void keepSlotsBusy(const std::string& folder) {
  constexpr int kRuns = 100;
  constexpr double kModelSeconds = 0.2;
  fmt::print("\n{} runs of a model that sleeps {} ms\n{:>5} {:>10} {:>10} {:>10}\n", kRuns, 1000 * kModelSeconds,
             "slots", "ideal s", "took s", "ideal/took");
  for (const int slotCount : {1, 2, 4, 8}) {
    Calibration calibration(folder, slotCount, fmt::format("sleep-ms = {}\n", 1000 * kModelSeconds));
    const double ideal = kModelSeconds * ((kRuns + slotCount - 1) / slotCount);
    const double took = calibration.evaluate(kRuns);
    fmt::print("{:5} {:10.2f} {:10.2f} {:10.3f}\n", slotCount, ideal, took, ideal / took);
  }
}

void lookForGrowth(const std::string& folder) {
  Calibration calibration(folder, 1, "");
  fmt::print("\n{:>16} {:>14}\n", "evaluations", "us/evaluation");
  int done = 0;
  for (const int until : {100, 1000, 2000, 5000, 9000, 10000}) {
    const double seconds = calibration.evaluate(until - done);
    fmt::print("{:7} to {:5} {:14.0f}\n", done + 1, until, seconds / (until - done) * 1e6);
    done = until;
  }
}

}  // namespace

int main(int argc, char** argv) {
  std::vector<std::string> folders(argv + 1, argv + argc);
  if (folders.empty()) folders = {"/dev/shm", std::filesystem::temp_directory_path().string()};
  try {
    fmt::print("{:24} {:>5} {:>12} {:>12} {:>8}\n", "folder", "slots", "bare us", "ours us", "ratio");
    for (const std::string& folder : folders)
      compareWithBareLoop(folder + fmt::format("/mirevo_overhead_{}", getpid()));
    keepSlotsBusy(folders.front() + fmt::format("/mirevo_overhead_{}", getpid()));
    lookForGrowth(folders.front() + fmt::format("/mirevo_overhead_{}", getpid()));
  } catch (const FatalError& error) {
    fmt::print(stderr, "{}\n{}\n", error.message(), error.detail());
    return 1;
  }
  return 0;
}
