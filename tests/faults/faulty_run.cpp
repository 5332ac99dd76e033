#include "faults/faulty_run.h"

#include <algorithm>
#include <set>
#include <sys/stat.h>

#include "integration/mpi_job.h"

namespace mirevo::testing {
namespace {

namespace fs = std::filesystem;

/// The outputs of an "earlier run": each must be found again, under this name or a numbered one.
const std::vector<std::string>& earlierFiles() {
  static const std::vector<std::string> names = {"basin.log",
                                                 "basin.dat",
                                                 "basin_Optimisation.dat",
                                                 "calSimErr.dat",
                                                 "basin_Band_1.csv",
                                                 "basin_Sensitivity.dat",
                                                 "basin_Run.dat",
                                                 "basin_Failures.dat",
                                                 "basin_Quantiles.dat",
                                                 "basin_Optimisation_Failures.dat",
                                                 "basin_Optimisation_Checksums.dat",
                                                 "basin_Sensitivity_Run.dat",
                                                 "basin_Saved/1/a.csv",
                                                 "basin_Process1/mirevo_batch.log",
                                                 "basin._kill_"};
  return names;
}
constexpr std::size_t kKeptEarlierFiles = 13;

/// With the marks of all of a run's files, or the program would not touch it.
std::string earlierContent(const std::string& name) {
  return fmt::format("earlier {} # Mirevo # Band of # Failed evaluations of \n", name);
}

std::string excerpt(const std::string& text) {
  return text.size() < 600 ? text : text.substr(0, 300) + " ... " + text.substr(text.size() - 300);
}

/// The rows of a result file by their number, line ends included; `torn` is what stands behind the last line end.
/// Without the column that the first repeated set adds to all rows: a run that was killed before has none.
std::map<int, std::string> rowsOf(const std::string& text, std::string& torn) {
  std::map<int, std::string> rows;
  bool hasRepeats = false;
  std::size_t begin = 0;
  for (auto end = text.find('\n'); end != std::string::npos; end = text.find('\n', begin)) {
    std::string line = text.substr(begin, end + 1 - begin);
    if (line.starts_with("Evaluation")) {
      hasRepeats = line.ends_with("\tRepeats\n");
    } else if (line[0] != '#') {
      if (const auto last = line.rfind('\t'); hasRepeats && last != std::string::npos)
        line = line.substr(0, last) + '\n';
      rows[std::atoi(line.c_str())] = line;
    }
    begin = end + 1;
  }
  torn = text.substr(begin);
  return rows;
}

}  // namespace

FaultyRun::FaultyRun(const RunSettings& settings, const std::string& script)
    : restarts_(settings.restart != 0), resultFileName_(settings.resultFile()), marker_(folder_.path()) {
  folder_.useScript("test -s data/table.txt || exit 9\n" + script);
  folder_.write("model/data/table.txt", std::string(20'000, 'x'));
  fs::create_symlink("data/table.txt", folder_ / "model/link");
  folder_.writeSetup(settings);
  for (const auto& entry : fs::directory_iterator(path())) inputs_.insert(entry.path().filename());
}

FaultyRun::Environment FaultyRun::injection(Environment more) const {
  more.insert({{"LD_PRELOAD", MIREVO_FAULT_INJECTOR}, {"FAULT_PROGRAM", MIREVO_PROGRAM}, {"FAULT_FOLDER", path()}});
  return more;
}

void FaultyRun::reset() const {
  for (const auto& entry : fs::directory_iterator(path())) {
    if (!inputs_.contains(entry.path().filename())) fs::remove_all(entry.path());
  }
  if (start_) {
    fs::copy(start_->path(), path(), fs::copy_options::recursive | fs::copy_options::copy_symlinks);
  } else {
    for (const std::string& name : earlierFiles()) folder_.write(name, earlierContent(name));
  }
}

void FaultyRun::startFromHere() {
  start_ = std::make_unique<TemporaryFolder>();
  for (const auto& entry : fs::directory_iterator(path())) {
    if (inputs_.contains(entry.path().filename())) continue;
    fs::copy(entry.path(), fs::path(start_->path()) / entry.path().filename(),
             fs::copy_options::recursive | fs::copy_options::copy_symlinks);
  }
}

std::set<int> FaultyRun::rowNumbers(const TemporaryFolder& folder) const {
  std::string torn;
  std::set<int> numbers;
  for (const auto& [number, row] : rowsOf(folder.read(resultFileName_), torn)) {
    if (!row.starts_with("earlier") && row != "<no file>") numbers.insert(number);
  }
  return numbers;
}

bool FaultyRun::makeReference(const Environment& environment) {
  reset();
  const ProgramResult result = run(environment);
  if (result.exitCode != 0) {
    fmt::print("The undisturbed run fails: {}\n", result.error);
    return false;
  }
  reference_ = outputs();
  return true;
}

RunningProgram FaultyRun::start(const Environment& environment, const std::vector<std::string>& prefix) const {
  Environment marked = environment;
  marked["FAULT_RUN"] = marker_;
  if (prefix.empty()) return RunningProgram({setup()}, marked);
  std::vector<std::string> arguments(prefix.begin() + 1, prefix.end());
  arguments.insert(arguments.end(), {MIREVO_PROGRAM, setup()});
  return RunningProgram(arguments, marked, prefix.front().c_str());
}

ProgramResult FaultyRun::runJob(int processes, int rank, Environment environment) const {
  if (processes <= 1) return run(environment);
  environment.merge(jobEnvironment(0));  // the others have ended themselves when the master fails
  environment["FAULT_RANK"] = std::to_string(rank);
  std::vector<std::string> prefix = jobArguments(processes);
  prefix.insert(prefix.begin(), "mpirun");
  return run(environment, prefix);
}

std::map<std::string, std::string> FaultyRun::outputs() const {
  std::map<std::string, std::string> found;
  const std::string failures = resultFileName_.substr(0, resultFileName_.rfind('.')) + "_Failures.dat";
  for (const std::string& name :
       {std::string("calSimErr.dat"), failures, std::string("basin_Band_1.csv"), std::string("basin_Quantiles.dat"),
        std::string("basin_Covariance.dat"), checksumFileName(), resultFileName_}) {
    if (folder_.exists(name)) found[name] = withoutDates(folder_.read(name));
  }
  if (!folder_.exists("basin_Saved")) return found;
  for (const auto& entry : fs::recursive_directory_iterator(folder_ / "basin_Saved")) {
    if (entry.is_regular_file())
      found[entry.path().lexically_relative(path())] = TemporaryFolder::readFile(entry.path());
  }
  return found;
}

std::vector<std::string> FaultyRun::check(const ProgramResult& program, const Expectation& expected) const {
  std::vector<std::string> problems = checkProcesses();
  if (program.timedOut) problems.push_back("it does not end");
  if (program.signal != 0 && !program.timedOut) problems.push_back(fmt::format("signal {}", program.signal));
  checkMessage(program, expected, problems);
  for (const auto& more : {checkRows(expected), checkEarlierFiles()}) {
    problems.insert(problems.end(), more.begin(), more.end());
  }
  return problems;
}

void FaultyRun::checkMessage(const ProgramResult& program, const Expectation& expected,
                             std::vector<std::string>& problems) const {
  if (program.timedOut || program.signal != 0) return;
  const bool isWanted =
      expected.exitCode ? program.exitCode == expected.exitCode : program.exitCode == 0 || program.exitCode == 1;
  if (!isWanted) problems.push_back(fmt::format("exit code {}", program.exitCode));
  if (program.exitCode == 0 && expected.mayPassSilently && checkOutputs().empty()) return;
  const auto isIn = [&](const std::string& text) {
    const auto named = [&text](const std::string& name) { return text.find(name) != std::string::npos; };
    const bool isReason = named(expected.reason) || (!expected.otherReason.empty() && named(expected.otherReason));
    return isReason && (expected.names.empty() || std::any_of(expected.names.begin(), expected.names.end(), named));
  };
  // Errors are shown and logged; a warning of a run that goes on need only be in its log.
  const std::string log = folder_.read("basin.log");
  const bool toldElsewhere =
      expected.mayFailEvaluation && program.error.find("described in calSimErr.dat") != std::string::npos;
  if (program.exitCode != 0 && !isIn(program.error) && !toldElsewhere) {
    problems.push_back("standard error does not tell of it: " + excerpt(program.error));
  }
  const bool isInReport =
      expected.mayBeToldInReport &&
      folder_.read("basin_Report.html")
              .find(fs::path(expected.names.front()).filename().string() + ": " + expected.reason) != std::string::npos;
  const bool isToldBehindLog = expected.mayBeToldBehindLog && isIn(program.error);
  if (!isIn(log) && !expected.logMayLackMessage && !isInReport && !isToldBehindLog) {
    problems.push_back(fmt::format("exit code {}, but the log does not tell of it: {}", program.exitCode,
                                   excerpt(log.substr(log.size() > 500 ? log.size() - 500 : 0))));
  }
}

std::vector<std::string> FaultyRun::checkRows(const Expectation& expected) const {
  std::vector<std::string> problems;
  const std::string text = folder_.read(resultFileName_);
  if (text == "<no file>" || text.starts_with("earlier")) return problems;
  std::string torn;
  const auto rows = rowsOf(text, torn);
  if (!torn.empty()) problems.push_back("the result file ends in a torn line: " + torn);
  const auto wanted = rowsOf(reference_.at(resultFileName_), torn);
  for (const auto& [number, row] : rows) {
    const auto found = wanted.find(number);
    if (found != wanted.end() && found->second == row) continue;
    // An aggregate that the sample's end settles is not known before.
    const auto aggregate = row.rfind("\tNaN\n");
    if (aggregate != std::string::npos && found != wanted.end() &&
        found->second.starts_with(row.substr(0, aggregate + 1)))
      continue;
    if (expected.mayFailEvaluation && row.find("\tFAILED\t") != std::string::npos) {
      if (resultFileName_ == "basin_Optimisation.dat") break;  // a search goes another way from here
      continue;
    }
    problems.push_back("a row of no undisturbed run: " + row);
  }
  if (start_) {
    for (const int number : rowNumbers(*start_)) {
      if (!rows.contains(number))
        problems.push_back(fmt::format("evaluation {} of before the restart is lost", number));
    }
  }
  if (expected.resultFileFails) return problems;
  std::istringstream log(folder_.read("basin.log"));
  for (std::string line; std::getline(log, line);) {
    int number = 0;
    std::array<char, 20> word{};
    if (std::sscanf(line.c_str(), "Evaluation of parameter set No. %d completed: %19s", &number, word.data()) != 2)
      continue;
    if (!rows.contains(number))
      problems.push_back(fmt::format("evaluation {} was reported as done and is lost", number));
  }
  return problems;
}

std::vector<std::string> FaultyRun::checkProcesses() const {
  std::string names;
  const auto noneIsLeft = [&] {
    names.clear();
    for (const auto& entry : fs::directory_iterator("/proc")) {
      const std::string id = entry.path().filename();
      if (id.find_first_not_of("0123456789") != std::string::npos || !isRunning(std::atoi(id.c_str()))) continue;
      const std::string environment = TemporaryFolder::readFile(entry.path() / "environ");
      if (environment.find("FAULT_RUN=" + marker_) != std::string::npos)
        names += TemporaryFolder::readFile(entry.path() / "comm");
    }
    return names.empty();
  };
  if (waitUntil(noneIsLeft, 20.0)) return {};
  return {"processes are left: " + names};
}

std::vector<std::string> FaultyRun::checkOutputs() const {
  std::vector<std::string> problems;
  const auto found = outputs();
  for (const auto& [name, content] : reference_) {
    const auto other = found.find(name);
    if (other == found.end() || other->second != content) problems.push_back("not as in an undisturbed run: " + name);
  }
  if (found.size() > reference_.size()) problems.push_back("more outputs than of an undisturbed run");
  return problems;
}

std::vector<std::string> FaultyRun::checkEarlierFiles() const {
  std::set<std::string> contents;
  for (const auto& entry : fs::recursive_directory_iterator(path())) {
    if (entry.is_regular_file() && entry.file_size() < 100) contents.insert(TemporaryFolder::readFile(entry.path()));
  }
  std::vector<std::string> problems;
  for (std::size_t i = 0; i < kKeptEarlierFiles; ++i) {
    const std::string& name = earlierFiles()[i];
    if (!contents.contains(earlierContent(name))) problems.push_back("the earlier run's file is lost: " + name);
  }
  return problems;
}

/// Whether the result file has a failed evaluation that succeeds in an undisturbed run.
bool FaultyRun::hasFailedEvaluation() const {
  std::string torn;
  const auto wanted = rowsOf(reference_.at(resultFileName_), torn);
  for (const auto& [number, row] : rowsOf(folder_.read(resultFileName_), torn)) {
    const auto found = wanted.find(number);
    if (row.find("\tFAILED\t") != std::string::npos && (found == wanted.end() || found->second != row)) return true;
  }
  return false;
}

std::vector<std::string> FaultyRun::checkNextRun() const {
  const std::size_t known = rowNumbers(folder_).size();
  const bool failuresStand = restarts_ && hasFailedEvaluation();
  const ProgramResult result = run({});
  const bool endsInFailures = failuresStand && result.error.find("No of failed simulations") != std::string::npos;
  if (result.exitCode != 0 && !endsInFailures) return {"the setup cannot be run again: " + excerpt(result.error)};
  std::vector<std::string> problems = failuresStand ? checkRows({.mayFailEvaluation = true}) : checkOutputs();
  const std::string taken = fmt::format("Restart: {} evaluations are taken from", known);
  if (restarts_ && known > 0 && folder_.read("basin.log").find(taken) == std::string::npos) {
    problems.push_back(fmt::format("not all of the {} evaluations that stood were taken up", known));
  }
  for (std::string& problem : problems) problem = "the next run: " + problem;
  return problems;
}

}  // namespace mirevo::testing
