#include <algorithm>
#include <optional>
#include <random>
#include <span>

#include "faults/fault_report.h"
#include "faults/faulty_run.h"
#include "integration/mpi_job.h"

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
/// there, and is itself killed every second time. In a job it is one of its ranks, and mpirun ends the others.
void tryKills(const RunSettings& settings, int count, FaultReport& report, int processes = 1, int rank = 0) {
  FaultyRun run(settings);
  const bool restarts = settings.restart != 0;
  const TemporaryFolder records;
  run.makeReference();
  run.reset();
  run.runJob(processes, rank, run.injection({{"FAULT_RECORD", records / "calls"}}));
  const std::string calls = records.read("calls");
  std::mt19937 generator(static_cast<unsigned>(settings.option));
  const auto callCount = static_cast<unsigned long>(std::count(calls.begin(), calls.end(), '\n'));
  for (int i = 0; i < count && callCount > 0; ++i) {
    const unsigned long moment = 1 + generator() % callCount;
    const auto environment = run.injection({{"FAULT_KILL", std::to_string(moment)}});
    run.reset();
    const ProgramResult result = run.runJob(processes, rank, environment);
    const bool wasKilled = result.signal == SIGKILL || result.exitCode == 128 + SIGKILL;
    if (!wasKilled) continue;  // with several slots or ranks the number of calls is not always the same
    auto problems = run.checkProcesses();
    if (restarts && i % 2 == 1) run.runJob(processes, rank, environment);
    for (const auto& more : {run.checkProcesses(), run.checkRows({}), run.checkNextRun()}) {
      problems.insert(problems.end(), more.begin(), more.end());
    }
    const std::string kind = restarts ? "killed and restarted" : "killed";
    report.tried(
        processes > 1 ? "under MPI: " + kind : kind,
        fmt::format("{}, rank {} of {}, before call {} of {}", nameOf(settings), rank, processes, moment, callCount),
        problems);
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

std::string replaced(std::string text, const std::string& from, const std::string& to) {
  const auto at = text.find(from);
  return at == std::string::npos ? text : text.replace(at, from.size(), to);
}

/// A result file or its checksums as a disk, a person or another program may leave them.
struct Damage {
  std::string what;
  std::string results;
  std::optional<std::string> checksums;  ///< none: the file is gone
  std::string refusal = {};              ///< what the restart ends with; empty: it takes up what is left
  std::string repaired = {};             ///< the results with which it then goes on
};

/// `row` is the line of a row in `whole`, the results without their closing lines; `sums` are the checksums.
/// `isScaled`: the initial sample determines the scale of the aggregate.
std::vector<Damage> damagesOf(const std::string& whole, const std::string& row, const std::string& sums,
                              bool isScaled) {
  const std::string first = row.substr(0, row.find('\t') + 1);
  const auto lineCount = std::count(whole.begin(), whole.begin() + static_cast<std::ptrdiff_t>(whole.find(row)), '\n');
  const std::string where = fmt::format("line {} (evaluation No. {}): ", lineCount + 1, std::stoi(row));
  const std::string without = replaced(whole, row, "");
  const std::string sum = sums.substr(sums.find("\n" + first) + 1, first.size() + 17);
  const auto with = [&](const std::string& other) { return replaced(whole, row, other); };
  std::vector<Damage> damages = {
      {"a row is missing", without, sums},
      {"a row is cut off, with a line end", with(row.substr(0, row.size() / 2) + "\n"), sums},
      {"a row of zero bytes", with(std::string(row.size() - 1, '\0') + "\n"), sums},
      {"line ends of another system", with(row.substr(0, row.size() - 1) + "\r\n"), sums},
      {"a row twice", whole + row, sums, fmt::format("(evaluation No. {}): the evaluation is in line", std::stoi(row)),
       whole},
      {"another number", with("99999\t" + row.substr(first.size())), sums, "(evaluation No. 99999): it has no checksum",
       without},
      {"a checksum is missing", whole, replaced(sums, sum, ""), where + "it has no checksum", without},
      {"checksums are cut off", whole, sums.substr(0, sums.size() - 9)},
      {"checksums are cut off in their head", whole, sums.substr(0, 5)},
      {"checksums are damaged", whole, replaced(sums, "Checksum\n", "Check\n")},
      {"no checksums", whole, {}}};
  const bool isOk = row.starts_with(first + "OK\t");
  const std::string failed = first + "FAILED" + row.substr(row.find('\t', first.size()));
  damages.push_back({"another status", with(failed), sums, isOk ? where + "it is not as it was written" : "", without});
  if (isOk) damages.push_back({"another status, no checksums", with(failed), {}, where + "its status is", without});
  const bool hasRepeats = whole.find("\tRepeats\n") != std::string::npos;
  const std::size_t last = hasRepeats ? row.rfind('\t') : row.size() - 1;  // the end of the aggregate
  const std::size_t lastTab = row.rfind('\t', last - 1);
  for (std::size_t begin = row.find('\t', first.size()) + 1; begin < last;) {
    const std::size_t end = row.find_first_of("\t\n", begin);
    const std::string other = with(std::string(row).replace(begin, end - begin, "0.123"));
    damages.push_back({"another value", other, sums, where + "it is not as it was written", without});
    if (isOk && end == lastTab) {
      damages.push_back({"another value, no checksums", other, {}, where + "objective function \"", without});
    } else if (isOk && end == last) {
      damages.push_back(
          {"another aggregate, no checksums", other, {}, isScaled ? "" : where + "the aggregate is", without});
    }
    begin = end + 1;
  }
  return damages;
}

void tryDamages(const RunSettings& settings, bool isLong, FaultReport& report) {
  FaultyRun run(settings);
  run.makeReference();
  run.startFromHere();
  std::string whole = run.folder().read(run.resultFileName());
  whole.resize(whole.find("\n# ", whole.find("\n1\t")) + 1);
  for (const int number : isLong ? std::vector{2, 4} : std::vector{2}) {
    const std::size_t begin = whole.find(fmt::format("\n{}\t", number)) + 1;
    const std::string row = whole.substr(begin, whole.find('\n', begin) + 1 - begin);
    for (const Damage& damage :
         damagesOf(whole, row, run.folder().read(run.checksumFileName()), settings.aggregation != 0)) {
      run.reset();
      run.folder().write(run.resultFileName(), damage.results);
      run.folder().write(run.checksumFileName(), damage.checksums.value_or(""));
      if (!damage.checksums) std::filesystem::remove(run.folder() / run.checksumFileName());
      ProgramResult result = run.run({});
      std::vector<std::string> problems;
      if (!damage.refusal.empty()) {
        if (result.exitCode != 1 || result.error.find(damage.refusal) == std::string::npos) {
          problems.push_back(fmt::format("not refused, exit code {}: {}", result.exitCode, result.error));
        }
        const bool isUntouched = run.folder().read(run.resultFileName()) == damage.results;
        if (!isUntouched) problems.push_back("the refused results were changed");
        run.folder().write(run.resultFileName(), damage.repaired);
        result = run.run({});
      }
      if (result.exitCode != 0) problems.push_back(fmt::format("exit code {}: {}", result.exitCode, result.error));
      report.tried("result file damaged", fmt::format("{}: {}, row {}", nameOf(settings), damage.what, number),
                   problems, run.checkOutputs());
    }
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

/// Killed on a machine whose clock is an hour off, and continued on one whose is right; the file system is slow.
void tryNodes(FaultReport& report) {
  for (const RunSettings& settings : {kRuns[0], kRuns[3], kRuns[6]}) {
    for (const char* skew : {"3600", "-3600"}) {
      FaultyRun run(restarting(settings));
      const TemporaryFolder records;
      run.makeReference(run.injection({{"FAULT_RECORD", records / "calls"}}));
      const std::string calls = records.read("calls");
      const auto half = std::count(calls.begin(), calls.end(), '\n') / 2;
      run.reset();
      run.run(run.injection({{"FAULT_SKEW", skew}, {"FAULT_DELAY", "500"}, {"FAULT_KILL", std::to_string(half)}}));
      auto problems = run.checkProcesses();
      run.startFromHere();
      const ProgramResult result = run.run(run.injection({{"FAULT_DELAY", "500"}}));
      for (const auto& more : {run.check(result, {.mayPassSilently = true, .exitCode = 0}), run.checkOutputs()}) {
        problems.insert(problems.end(), more.begin(), more.end());
      }
      report.tried("another node's clock", fmt::format("{}, {} s off", nameOf(settings), skew), problems);
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
  for (const RunSettings& settings : isLong ? std::span(kRuns) : std::span(kRuns).subspan(4, 1)) {
    tryDamages(restarting(settings), isLong, report);
  }
  for (const int rank : {0, 1}) {
    if (mpirunIsInstalled()) tryKills(restarting(kRuns[0]), isLong ? 50 : 1, report, 3, rank);
  }
  tryStops(isLong ? 40 : 3, report);
  tryClocks(report);
  tryNodes(report);
}

}  // namespace mirevo::testing
