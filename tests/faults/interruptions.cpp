#include <algorithm>
#include <random>
#include <span>

#include "faults/fault_report.h"
#include "faults/faulty_run.h"

namespace mirevo::testing {
namespace {

/// Every task and search, with failed runs and slots, and an aggregate that is settled by the sample.
const RunSettings kRuns[] = {
    {.option = 0,
     .scenarios = {"1, 1, 1", "2, 1, 1", "3, 1, 1", "9, 1, 1", "4, 1, 1", "5, 1, 1", "6, 1, 1", "2, 2, 1", "3, 2, 1",
                   "4, 2, 1"},
     .slots = 3,
     .modelArguments = "--fail-above 8"},
    {.option = 1},
    {.maxEvaluations = 12},
    {.option = 3, .maxEvaluations = 10},
    {.algorithm = 0, .aggregation = 1, .maxEvaluations = 40, .modelArguments = "--fail-above 9"},
    {.algorithm = 1, .usesSurrogate = true, .aggregation = 1, .maxEvaluations = 45, .slots = 3},
    {.includesInitial = false, .aggregation = 1, .maxEvaluations = 20, .savedFile = "model/simulated.csv"}};

std::string nameOf(const RunSettings& settings) {
  return fmt::format("option {}, algorithm {}", settings.option, settings.algorithm);
}

RunSettings restarting(RunSettings settings) {
  settings.restart = 1;
  return settings;
}

void pauseMilliseconds(int milliseconds) {
  const timespec pause{milliseconds / 1000, milliseconds % 1000 * 1'000'000L};
  ::nanosleep(&pause, nullptr);
}

/// Killed before a system call on its files that is drawn at random; where runs restart the next one goes on from
/// there, and is itself killed every second time.
void tryKills(const RunSettings& settings, int count, FaultReport& report) {
  FaultyRun run(settings);
  const bool restarts = settings.restart != 0;
  const TemporaryFolder records;
  run.makeReference(run.injection({{"FAULT_RECORD", records / "calls"}}));
  const std::string calls = records.read("calls");
  std::mt19937 generator(static_cast<unsigned>(settings.option));
  const auto callCount = static_cast<unsigned long>(std::count(calls.begin(), calls.end(), '\n'));
  for (int i = 0; i < count && callCount > 0; ++i) {
    const unsigned long moment = 1 + generator() % callCount;
    const auto environment = run.injection({{"FAULT_KILL", std::to_string(moment)}});
    run.reset();
    const ProgramResult result = run.run(environment);
    if (result.signal != SIGKILL) continue;  // with several slots the number of calls is not always the same
    auto problems = run.checkProcesses();
    if (restarts && i % 2 == 1) run.run(environment);
    for (const auto& more : {run.checkProcesses(), run.checkRows({}), run.checkNextRun()}) {
      problems.insert(problems.end(), more.begin(), more.end());
    }
    report.tried(restarts ? "killed and restarted" : "killed",
                 fmt::format("{}, before call {} of {}", nameOf(settings), moment, callCount), problems);
  }
}

/// The result file ends anywhere in its last two rows, as a machine that loses power leaves it.
void tryCuts(const RunSettings& settings, bool isLong, FaultReport& report) {
  FaultyRun run(settings);
  run.makeReference();
  std::string whole = run.folder().read(run.resultFileName());
  // Up to the last row: closing lines are written by a run that ends orderly.
  std::size_t end = whole.size();
  while (whole[whole.rfind('\n', end - 2) + 1] == '#') end = whole.rfind('\n', end - 2) + 1;
  whole.resize(end);
  const std::size_t begin = whole.rfind('\n', whole.rfind('\n', end - 2) - 1) + 1;
  run.startFromHere();
  for (std::size_t length = begin; length <= end; length += isLong ? 1 : (end - begin) / 3) {
    run.reset();
    run.folder().write(run.resultFileName(), whole.substr(0, length));
    const ProgramResult result = run.run({});
    auto problems = run.checkOutputs();
    if (result.exitCode != 0) problems.push_back(fmt::format("exit code {}: {}", result.exitCode, result.error));
    const std::string log = run.folder().read("basin.log");
    const auto rows =
        std::count(whole.begin(), whole.begin() + static_cast<std::ptrdiff_t>(length), '\n') -
        std::count(whole.begin(), whole.begin() + static_cast<std::ptrdiff_t>(whole.find("\n1\t")), '\n') - 1;
    if (log.find(fmt::format("Restart: {} evaluations are taken from", rows)) == std::string::npos) {
      problems.push_back(fmt::format("not all of the {} whole rows were taken up", rows));
    }
    report.tried("result file cut", fmt::format("{}, to {} of {} bytes", nameOf(settings), length, end), problems);
  }
}

void tryStops(int count, FaultReport& report) {
  FaultyRun run(kRuns[2]);
  run.makeReference();
  for (int i = 0; i < count; ++i) {
    run.reset();
    RunningProgram program = run.start({});
    pauseMilliseconds(10 + 7 * i);
    program.send(SIGSTOP);
    pauseMilliseconds(60);
    program.send(SIGCONT);
    report.tried("stopped and continued", fmt::format("after {} ms", 10 + 7 * i),
                 run.check(program.wait(), {.mayPassSilently = true, .exitCode = 0}));
  }
}

void tryClocks(FaultReport& report) {
  for (const RunSettings& settings : {kRuns[0], kRuns[2]}) {
    FaultyRun run(settings);
    run.makeReference();
    for (const char* step : {"1", "3600", "-86400", "31557600", "2000000000"}) {
      run.reset();
      report.tried(
          "clock set back", fmt::format("{}, by {} s at each look", nameOf(settings), step),
          run.check(run.run(run.injection({{"FAULT_CLOCK", step}})), {.mayPassSilently = true, .exitCode = 0}));
    }
  }
}

}  // namespace

void tryInterruptions(bool isLong, FaultReport& report) {
  for (const RunSettings& settings : kRuns) tryKills(restarting(settings), isLong ? 100 : 3, report);
  for (const RunSettings& settings : std::span(kRuns).first(4)) {
    tryKills(settings, isLong ? 25 : 1, report);
    tryCuts(restarting(settings), isLong, report);
  }
  tryStops(isLong ? 40 : 3, report);
  tryClocks(report);
}

}  // namespace mirevo::testing
