#include <algorithm>
#include <array>
#include <cmath>
#include <map>
#include <optional>
#include <random>
#include <span>

#include "faults/fault_report.h"
#include "faults/faulty_run.h"
#include "integration/mpi_job.h"

namespace mirevo::testing {
namespace {

constexpr int kProcesses = 4;
/// After which a silent worker is lost; the machine that runs the tests may be busy.
constexpr double kSilenceLimit = 1.5;

/// All sets at once, a generation at a time, and one after the other; of the first, one fails.
const RunSettings kJobRuns[] = {
    {.option = 0, .scenarios = scenarios(30), .modelArguments = "--sleep-ms 80 --fail-above 8.6"},
    {.algorithm = 1, .aggregation = 1, .maxEvaluations = 30, .modelArguments = "--sleep-ms 60"},
    {.algorithm = 2, .maxEvaluations = 20, .modelArguments = "--sleep-ms 40", .savedFile = "model/simulated.csv"}};

enum class Harm { kill, stop, pause, starve };
constexpr std::array kHarms{Harm::kill, Harm::stop, Harm::pause, Harm::starve};
constexpr std::array<const char*, kHarms.size()> kHarmNames{"killed", "stopped", "stopped and continued", "starved"};

void pauseSeconds(double seconds) {
  const timespec pause{static_cast<time_t>(seconds), static_cast<long>((seconds - std::floor(seconds)) * 1e9)};
  ::nanosleep(&pause, nullptr);
}

/// The process of a rank: a child of mpirun, unlike its own children, which have its environment, too.
std::optional<pid_t> processOf(const std::string& folder, int rank) {
  for (const auto& entry : std::filesystem::directory_iterator("/proc")) {
    const std::string id = entry.path().filename();
    if (id.find_first_not_of("0123456789") != std::string::npos) continue;
    const std::string environment = TemporaryFolder::readFile(entry.path() / "environ");
    if (environment.find("FAULT_RUN=" + folder) == std::string::npos) continue;
    if (environment.find(fmt::format("OMPI_COMM_WORLD_RANK={}", rank) + '\0') == std::string::npos) continue;
    const std::string status = TemporaryFolder::readFile(entry.path() / "status");
    const auto parent = status.find("\nPPid:\t");
    if (parent == std::string::npos) continue;
    if (TemporaryFolder::readFile(fmt::format("/proc/{}/comm", std::atoi(status.c_str() + parent + 7))) == "mpirun\n")
      return std::atoi(id.c_str());
  }
  return std::nullopt;
}

/// A process that is given a hundredth of the time.
void starve(pid_t process, double seconds) {
  for (double done = 0.0; done < seconds; done += 0.1) {
    ::kill(process, SIGSTOP);
    pauseSeconds(0.099);
    ::kill(process, SIGCONT);
    pauseSeconds(0.001);
  }
}

struct Trial {
  RunSettings settings;
  Harm harm = Harm::kill;
  std::vector<int> ranks;  ///< of the workers that are harmed
  double moment = 0.0;     ///< s after the beginning of the run
  double length = 0.0;     ///< s, of a pause or of starving
};

/// In a job that outlives losses the rows are those of an undisturbed run, and no model run has failed.
void tryHarm(const FaultyRun& run, const Trial& trial, const std::string& name, FaultReport& report) {
  run.reset();
  RunningProgram::Environment environment = jobEnvironment(1, true);
  std::vector<std::string> prefix = jobArguments(kProcesses);
  prefix.insert(prefix.begin(), "mpirun");
  RunningProgram job = run.start(environment, prefix);
  // Before that, MPI itself begins, and waits for every process.
  waitUntil([&run] { return run.folder().read("basin.log").find("MPI job: ") != std::string::npos; }, 60.0);
  pauseSeconds(trial.moment);
  for (const int rank : trial.ranks) {
    const auto process = processOf(run.path(), rank);
    if (!process) continue;  // the job has ended
    if (trial.harm == Harm::starve) {
      starve(*process, trial.length);
      continue;
    }
    ::kill(*process, trial.harm == Harm::kill ? SIGKILL : SIGSTOP);
    if (trial.harm != Harm::pause) continue;
    pauseSeconds(trial.length);
    ::kill(*process, SIGCONT);
  }
  const ProgramResult result = job.wait(60.0);
  auto problems = run.check(result, {.mayPassSilently = true, .exitCode = 0});
  if (!problems.empty()) problems.push_back(result.error);
  report.tried(fmt::format("worker {}", kHarmNames[static_cast<std::size_t>(trial.harm)]), name, problems,
               run.checkOutputs());
}

}  // namespace

void tryLostRanks(bool isLong, FaultReport& report) {
  if (!mpirunIsInstalled()) return report.skipped("lost ranks", "mpirun is not installed");
  std::mt19937 generator(19);
  const auto draw = [&generator](double least, double most) {
    return least + (most - least) * static_cast<double>(generator()) / static_cast<double>(std::mt19937::max());
  };
  for (const RunSettings& settings : isLong ? std::span(kJobRuns) : std::span(kJobRuns).first(1)) {
    FaultyRun run(settings);
    run.folder().editSetup("[SimultaneousSimulations]",
                           fmt::format("[SimultaneousSimulations]\n    MaxWorkerSilence = {}", kSilenceLimit));
    if (!run.makeReference()) return report.tried("worker lost", "reference", {"the undisturbed run fails"});
    for (int i = 0; i < (isLong ? 34 : 4); ++i) {
      Trial trial{
          settings, kHarms[static_cast<std::size_t>(i) % kHarms.size()], {1, 2, 3}, draw(0.0, 2.0), draw(0.2, 3.0)};
      std::shuffle(trial.ranks.begin(), trial.ranks.end(), generator);
      trial.ranks.resize(1 + generator() % 2);
      tryHarm(run, trial,
              fmt::format("option {}, algorithm {}: worker {} after {:.3f} s, for {:.2f} s", settings.option,
                          settings.algorithm, fmt::join(trial.ranks, " and "), trial.moment, trial.length),
              report);
    }
  }
}

}  // namespace mirevo::testing
