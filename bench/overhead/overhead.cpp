// The overhead of the program: wall time per evaluation, for the evaluation loop in this process and for the built
// program from start to end, compared with a bare loop of posix_spawn and wait on the same batch; how well slots are
// kept busy; and whether an evaluation takes longer the longer a run goes on.
//
//   overhead [FOLDER]... folders to work in, one per file system (default: /dev/shm and the temporary folder)
//   overhead --short [FOLDER]...   the comparison with one slot, and the start of the program, alone
//
// The three take turns in short rounds, so that other load on the machine affects all of them; each figure is the
// median of the rounds, a ratio the median of their ratios. The model is the small one of the tests: it reads its
// parameter file and writes 365 values. In the bare loop it truncates the file of its last run, which the program would
// have removed. The last two columns are ratios of processor time, of which other load takes no share.
#include <algorithm>
#include <fcntl.h>
#include <filesystem>
#include <spawn.h>
#include <string>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>
#include <vector>

#include <fmt/format.h>

#include "calibration.h"
#include "common/fatal_error.h"

namespace {

using mirevo::bench::Calibration;

constexpr int kRounds = 11;
constexpr int kRunsARound = 200;
constexpr int kProgramRuns = 600;  ///< more, as the start and end of the program are included

double median(std::vector<double> values) {
  std::sort(values.begin(), values.end());
  return values[values.size() / 2];
}

/// Of this process and of the children that it has waited for.
double processorSeconds() {
  double seconds = 0.0;
  for (const auto who : {RUSAGE_SELF, RUSAGE_CHILDREN}) {
    rusage usage{};
    ::getrusage(who, &usage);
    for (const timeval& time : {usage.ru_utime, usage.ru_stime}) {
      seconds += static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / 1e6;
    }
  }
  return seconds;
}

/// A run's wall and processor time in each round, in microseconds.
struct Times {
  std::vector<double> wall;
  std::vector<double> processor;

  template <class Run>
  void add(int runs, Run run) {
    const double before = processorSeconds();
    wall.push_back(run() / runs * 1e6);
    processor.push_back((processorSeconds() - before) / runs * 1e6);
  }
};

double ratio(const std::vector<double>& times, const std::vector<double>& others) {
  std::vector<double> ratios;
  for (std::size_t i = 0; i < times.size(); ++i) ratios.push_back(times[i] / others[i]);
  return median(ratios);
}

void compareWithBareLoop(const std::string& folder, int slotCount) {
  Calibration calibration(folder, slotCount, "");
  Times bare, loop, program;
  calibration.runBare(kRunsARound);
  for (int round = 0; round < kRounds; ++round) {
    bare.add(kRunsARound, [&] { return calibration.runBare(kRunsARound); });
    loop.add(kRunsARound, [&] { return calibration.evaluate(kRunsARound); });
    program.add(kProgramRuns, [&] { return calibration.runProgram(kProgramRuns) * kProgramRuns; });
  }
  fmt::print("{:30} {:5} {:8.0f} {:8.0f} {:8.0f} {:10.2f} {:10.2f} {:10.2f} {:10.2f}\n", folder, slotCount,
             median(bare.wall), median(loop.wall), median(program.wall), ratio(loop.wall, bare.wall),
             ratio(program.wall, bare.wall), ratio(loop.processor, bare.processor),
             ratio(program.processor, bare.processor));
}

/// Processor time of the program from its start to its end, after it has printed its help.
void startProgram() {
  constexpr int kStarts = 31;
  std::string program = MIREVO_PROGRAM;
  std::string argument = "--help";
  char* const arguments[] = {program.data(), argument.data(), nullptr};
  posix_spawn_file_actions_t quiet;
  posix_spawn_file_actions_init(&quiet);
  posix_spawn_file_actions_addopen(&quiet, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
  std::vector<double> seconds;
  for (int start = 0; start < kStarts; ++start) {
    const double before = processorSeconds();
    pid_t process = 0;
    int status = 0;
    if (::posix_spawn(&process, program.c_str(), &quiet, nullptr, arguments, environ) != 0 ||
        ::waitpid(process, &status, 0) != process || status != 0) {
      mirevo::fatalError("the program failed", program);
    }
    seconds.push_back(processorSeconds() - before);
  }
  posix_spawn_file_actions_destroy(&quiet);
  fmt::print("\nstart of the program: {:.1f} ms of processor time\n", median(seconds) * 1e3);
}

void keepSlotsBusy(const std::string& folder) {
  constexpr int kRuns = 100;
  constexpr double kModelSeconds = 0.2;
  fmt::print("\n{} runs of a model that sleeps {} ms: 1 is no time lost\n{:>5} {:>8} {:>10} {:>10}\n", kRuns,
             1000 * kModelSeconds, "slots", "ideal s", "loop", "program");
  for (const int slotCount : {1, 2, 4, 8}) {
    Calibration calibration(folder, slotCount, fmt::format("sleep-ms = {}\n", 1000 * kModelSeconds));
    const double ideal = kModelSeconds * ((kRuns + slotCount - 1) / slotCount);
    const double loop = calibration.evaluate(kRuns);
    const double program = calibration.runProgram(kRuns) * kRuns;
    fmt::print("{:5} {:8.2f} {:10.3f} {:10.3f}\n", slotCount, ideal, ideal / loop, ideal / program);
  }
}

void lookForGrowth(const std::string& folder) {
  Calibration calibration(folder, 1, "");
  fmt::print("\nus per evaluation as the run goes on, beside the bare loop at the time\n{:>14} {:>8} {:>8}\n",
             "evaluations", "loop", "bare");
  int done = 0;
  for (const int until : {100, 1000, 2000, 4000, 6000, 8000, 10000}) {
    const double loop = calibration.evaluate(until - done) / (until - done);
    const double bare = calibration.runBare(kRunsARound) / kRunsARound;
    fmt::print("{:5} to {:5} {:8.0f} {:8.0f}\n", done + 1, until, loop * 1e6, bare * 1e6);
    done = until;
  }
}

}  // namespace

int main(int argc, char** argv) {
  std::vector<std::string> folders(argv + 1, argv + argc);
  const bool isShort = !folders.empty() && folders.front() == "--short";
  if (isShort) folders.erase(folders.begin());
  if (folders.empty()) folders = {"/dev/shm", std::filesystem::temp_directory_path().string()};
  for (std::string& folder : folders) folder += fmt::format("/mirevo_overhead_{}", ::getpid());
  try {
    fmt::print(
        "us per evaluation, {} a round ({} of the program)\n"
        "{:30} {:>5} {:>8} {:>8} {:>8} {:>10} {:>10} {:>10} {:>10}\n",
        kRunsARound, kProgramRuns, "folder", "slots", "bare", "loop", "program", "loop/bare", "prog/bare", "cpu loop",
        "cpu prog");
    for (const std::string& folder : folders) {
      for (const int slotCount : {1, 2, 4}) {
        if (slotCount == 1 || !isShort) compareWithBareLoop(folder, slotCount);
      }
    }
    startProgram();
    if (isShort) return 0;
    keepSlotsBusy(folders.front());
    lookForGrowth(folders.front());
  } catch (const mirevo::FatalError& error) {
    fmt::print(stderr, "{}\n{}\n", error.message(), error.detail());
    return 1;
  }
  return 0;
}
