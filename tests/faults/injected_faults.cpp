#include <algorithm>
#include <cstring>
#include <set>

#include "common/files.h"
#include "faults/fault_report.h"
#include "faults/faulty_run.h"
#include "integration/mpi_job.h"

namespace mirevo::testing {
namespace {

/// A call of the undisturbed run: what is done to which file, named relative to the setup's folder.
using Call = std::pair<std::string, std::string>;

struct Fault {
  Call call;
  int number = 1;
  int error = 0;
  const char* how = "once";

  std::string text() const { return fmt::format("{}\t{}\t{}\t{}\t{}", call.first, call.second, number, error, how); }
};

/// The errors that each call may meet in practice. The short form takes them in turn, one for each kind of file.
const std::map<std::string, std::vector<std::pair<int, const char*>>>& errorsOfCalls() {
  static const std::map<std::string, std::vector<std::pair<int, const char*>>> errors = {
      {"open-to-write", {{ENOSPC, "once"}, {EACCES, "once"}, {EMFILE, "lasting"}, {EDQUOT, "once"}}},
      {"open-to-read", {{EACCES, "once"}, {EIO, "once"}, {EMFILE, "lasting"}, {ESTALE, "once"}}},
      {"write", {{ENOSPC, "short"}, {EIO, "lasting"}, {EDQUOT, "short"}, {ESTALE, "lasting"}}},
      {"read", {{EIO, "once"}, {ESTALE, "once"}}},
      {"read-at", {{EIO, "once"}, {ESTALE, "once"}}},
      {"close", {{EIO, "once"}, {EDQUOT, "once"}}},
      {"copy", {{ENOSPC, "lasting"}, {EDQUOT, "lasting"}}},
      {"lock", {{ENOLCK, "lasting"}}},
      {"fsync", {{EIO, "once"}}},
      {"chmod", {{EPERM, "once"}}},
      {"rename", {{EACCES, "once"}, {EIO, "once"}, {ESTALE, "once"}}},
      {"mkdir", {{ENOSPC, "once"}, {EACCES, "once"}, {EDQUOT, "once"}}},
      {"unlink", {{EACCES, "once"}}},
      {"rmdir", {{EBUSY, "once"}}},
      {"symlink", {{EPERM, "once"}}},
      {"readlink", {{EIO, "once"}}},
      {"access", {{EACCES, "once"}}},
      {"stat", {{EACCES, "once"}, {EIO, "lasting"}, {ESTALE, "once"}}},
      {"set-times", {{EPERM, "once"}}},
      {"open-folder", {{EMFILE, "lasting"}}},
      {"read-folder", {{EIO, "once"}}},
      {"fork", {{EAGAIN, "once"}}},
      {"clone", {{EAGAIN, "once"}, {ENOMEM, "lasting"}}}};
  return errors;
}

/// The kinds of files by what stands in their names; the first that does is it.
constexpr std::pair<const char*, const char*> kKinds[] = {{"_Restart.dat", "restart settings"},
                                                          {"_Simulated.bin", "simulated values"},
                                                          {"basin._spi_", "message file"},
                                                          {"basin._kill_", "kill file"},
                                                          {"._lock_", "lock"},
                                                          {"calSimErr", "failed-run file"},
                                                          {"_Failures.", "failure table"},
                                                          {"_Run.", "run record"},
                                                          {"_Checksums.", "row checksums"},
                                                          {"_NotKept.", "table of files not kept"},
                                                          {"basin_Saved", "saved output files"},
                                                          {"basin_Band_", "band file"},
                                                          {"basin_Sensitivity", "sensitivity file"},
                                                          {"basin.dat", "result file"},
                                                          {"basin_Optimisation", "result file"},
                                                          {"basin_Failed", "kept failed folders"},
                                                          {"basin_Series.dat", "series file"},
                                                          {"basin_Report.html", "report"},
                                                          {"basin_Termination.log", "termination log"},
                                                          {"(process)", "starting processes"},
                                                          {"mirevo_batch.log", "batch log"},
                                                          {"observed.csv", "observed series"},
                                                          {".tpl", "template"}};

std::string kindOf(const std::string& path) {
  if (path == "basin.kdx") return "setup file";
  if (path.starts_with("basin.") && path.ends_with(".log")) return "run log";
  for (const auto& [part, kind] : kKinds) {
    if (path.find(part) != std::string::npos) return kind;
  }
  if (path.starts_with("model")) return "model folder";
  if (!path.starts_with("basin_Process"))
    return path.find(".dat") != std::string::npos ? "analysis table" : "other files";
  if (path.ends_with("parameters.txt")) return "parameter file";
  return path.ends_with("simulated.csv") ? "simulated series" : "process folder";
}

/// What may fail unmentioned, and why that is right.
bool mayPassSilently(const Call& call) {
  const auto& [name, path] = call;
  if (name == "set-times") return true;                                    // a copy with other times is still a copy
  if (name == "access" && path == "basin._kill_") return true;             // looked for again at once
  if (path.ends_with("mirevo_batch.log")) return name != "open-to-write";  // made anew
  if ((name == "close" || name == "fsync") && (path == "basin._spi_" || path.ends_with("(deleted)")))
    return true;  // another took its place
  // What is left of a lock keeps nobody away, and what it says of its holder is for a message only.
  if (path.ends_with("._lock_")) return name != "lock" && name != "open-to-write";
  // What it records of the copies only tells a later run which of them it need not make again.
  if (path.ends_with(".mirevo_process") && (name == "read" || name == "write")) return true;
  // What cannot be compared is written anew, beside the one of before.
  const std::string kind = kindOf(path);
  if ((name == "read" || name == "open-to-read") &&
      (kind == "band file" || kind == "analysis table" || kind == "table of files not kept"))
    return true;
  if (name == "unlink" && path.ends_with(".part")) return true;  // where one is in the way, making it fails
  // The same for this one; its only line is the process's last word, which the exit code and the log say, too.
  if (path == "basin_Termination.log" && name != "open-to-write") return true;
  return name == "stat";  // where it matters, the call that follows tells
}

std::map<Call, int> countCalls(const std::string& record) {
  std::map<Call, int> counts;
  std::istringstream lines(record);
  for (std::string line; std::getline(lines, line);) {
    const auto tab = line.find('\t');
    ++counts[{line.substr(0, tab), line.substr(tab + 1)}];
  }
  return counts;
}

/// The files that took another's place without being flushed to disk first: after a power cut such a one may be empty.
std::vector<std::string> unflushedReplacements(const std::string& record) {
  std::vector<std::string> problems;
  if (record.find("rename\tbasin_Series.dat.tmp") == std::string::npos) problems.push_back("no series file");
  std::map<std::string, std::string> lastCall;  // that wrote or flushed, by path
  std::istringstream lines(record);
  for (std::string call, path; std::getline(lines, call, '\t') && std::getline(lines, path);) {
    if (call == "rename" && path.ends_with(kTemporaryEnding) && lastCall[path] != "fsync") problems.push_back(path);
    if (call == "write" || call == "fsync") lastCall[path] = call;
  }
  return problems;
}

/// Which of `count` calls fail: all of few, a spread of many.
std::set<int> numbersToFail(int count, bool isLong) {
  if (!isLong) return {(count + 1) / 2};
  if (count <= 5) return {1, 2 <= count ? 2 : 1, 3 <= count ? 3 : 1, 4 <= count ? 4 : 1, count};
  return {1, 2, count / 2, count - 1, count};
}

/// A run on which faults are tried, and the rank of a job that meets them.
struct Case {
  RunSettings settings;
  int processes = 1;
  int rank = 0;

  bool isJob() const { return processes > 1; }
  std::string name() const {
    const std::string option =
        fmt::format("{} {}", settings.restart != 0 ? "restart of option" : "option", settings.option);
    return isJob() ? fmt::format("{}, rank {} of {}", option, rank, processes) : option;
  }
};

/// In a job the short form tries the calls that a full disk and a lack of processes make fail.
bool isTriedInShort(const Call& call, const Case& tried, std::set<std::string>& known) {
  constexpr const char* kOfJobs[] = {"write", "copy", "clone"};
  if (tried.isJob() && std::find(std::begin(kOfJobs), std::end(kOfJobs), call.first) == std::end(kOfJobs)) return false;
  return known.insert(fmt::format("{}{}{}", tried.isJob() ? tried.rank : -1, call.first, kindOf(call.second))).second;
}

std::vector<Fault> faultsOf(const std::map<Call, int>& counts, bool isLong, const Case& tried,
                            std::set<std::string>& triedInShort) {
  std::vector<Fault> faults;
  for (const auto& [call, count] : counts) {
    const auto errors = errorsOfCalls().find(call.first);
    if (errors == errorsOfCalls().end()) continue;
    // What cannot be read of a batch's output is said in its place, where failures are described.
    if (call.first == "read-at" && call.second.ends_with("mirevo_batch.log")) continue;
    if (!isLong && !isTriedInShort(call, tried, triedInShort)) continue;
    const auto& all = errors->second;
    for (std::size_t i = 0; i < all.size(); ++i) {
      if (!isLong && i != triedInShort.size() % all.size()) continue;
      for (const int number : numbersToFail(count, isLong)) {
        faults.push_back({call, number, all[i].first, all[i].second});
      }
    }
  }
  return faults;
}

Expectation expectationOf(const Fault& fault, const FaultyRun& run) {
  const std::string& path = fault.call.second;
  Expectation expected;
  expected.reason = std::strerror(fault.error);
  // What another machine has replaced is opened again.
  const bool isReopened = fault.error == ESTALE && fault.call.first == "open-to-read";
  const bool isRelease = fault.call.first == "lock" && fault.number > 1;  // closing the file does it, too
  expected.mayPassSilently = mayPassSilently(fault.call) || isReopened || isRelease;
  expected.names.push_back(path == "(process)" ? fault.call.first == "fork" ? "guard" : "run.sh" : run.folder() / path);
  for (const char* ending : {".tmp", ".part"}) {  // a file is written under this name first
    if (path.ends_with(ending)) expected.names.push_back(expected.names[0].substr(0, expected.names[0].rfind('.')));
  }
  const std::string kind = kindOf(path);
  // The kind of the setup file is looked at before anything is made beside it, the log included.
  expected.logMayLackMessage = kind == "run log" || (kind == "setup file" && fault.call.first == "stat");
  expected.mayFailEvaluation = kind == "simulated series" || kind == "starting processes" || kind == "batch log";
  expected.mayBeToldInReport = (kind == "series file" || kind == "failure table" || kind == "run record" ||
                                kind == "row checksums" || kind == "restart settings") &&
                               (fault.call.first == "read" || fault.call.first == "open-to-read");
  expected.mayBeToldBehindLog = kind == "message file";  // its last records follow the log's end
  // Making a folder goes on without knowing what is there, and fails for what is missing.
  if (kind == "saved output files" && fault.call.first == "stat") expected.otherReason = std::strerror(ENOENT);
  expected.resultFileFails = path.starts_with(run.resultFileName());
  return expected;
}

/// Brings the folder into the state of a run that was killed in the middle of its evaluations, and has the calls of
/// going on from there in the record.
void leaveInterrupted(FaultyRun& run, const TemporaryFolder& records) {
  const std::string calls = records.read("calls");
  const auto count = std::count(calls.begin(), calls.end(), '\n');
  run.reset();
  run.run(run.injection({{"FAULT_KILL", std::to_string(count * 3 / 4)}}));
  run.startFromHere();
  std::filesystem::remove(records / "calls");
  run.run(run.injection({{"FAULT_RECORD", records / "calls"}}));
}

}  // namespace

void tryInjectedFaults(bool isLong, FaultReport& report) {
  const std::string slowFirst = "grep -q '^a = *1$' parameters.txt && sleep 0.1";
  const std::vector<std::string> scenarios = {"1, 1, 1", "2, 1, 1", "3, 1, 1", "9, 1, 1", "4, 1, 1",
                                              "5, 1, 1", "6, 1, 1", "2, 2, 1", "3, 2, 1", "4, 2, 1"};
  const Case cases[] = {
      // Two slots, of which one is slow at first, so that the result file is put in order at its end; one failed run.
      {{.option = 0, .scenarios = scenarios, .slots = 2, .modelArguments = "--fail-above 8"}},
      {{.option = 2, .maxEvaluations = 6, .savedFile = "model/simulated.csv"}},
      {{.option = 1}},
      {{.option = 3, .maxEvaluations = 10}},
      {{.option = 0, .scenarios = scenarios, .restart = 1, .modelArguments = "--fail-above 8"}},
      {{.option = 2, .maxEvaluations = 6, .restart = 1, .savedFile = "model/simulated.csv"}},
      {{.option = 3, .maxEvaluations = 10, .restart = 1}},
      {{.option = 2, .maxEvaluations = 6, .savedFile = "model/simulated.csv"}, 3, 0},
      {{.option = 2, .maxEvaluations = 6, .savedFile = "model/simulated.csv"}, 2, 1}};
  std::set<std::string> triedInShort;
  for (const Case& tried : cases) {
    const RunSettings& setting = tried.settings;
    const bool isRestart = setting.restart != 0;
    if (tried.isJob() && !mpirunIsInstalled()) {
      report.skipped(tried.name(), "mpirun is not installed");
      continue;
    }
    FaultyRun run(setting, setting.slots > 1 ? slowFirst : "");
    const TemporaryFolder records;
    const FaultyRun::Environment recording = run.injection({{"FAULT_RECORD", records / "calls"}});
    if (!run.makeReference(tried.isJob() ? FaultyRun::Environment{} : recording)) {
      report.tried("undisturbed run", tried.name(), {"fails"});
      continue;
    }
    if (tried.isJob()) {
      run.reset();
      run.runJob(tried.processes, tried.rank, recording);
      report.tried("undisturbed job", tried.name(), run.checkOutputs());
    } else {
      report.tried("flushed before renamed", tried.name(), unflushedReplacements(records.read("calls")));
    }
    if (isRestart) leaveInterrupted(run, records);
    for (const Fault& fault : faultsOf(countCalls(records.read("calls")), isLong, tried, triedInShort)) {
      run.reset();
      std::filesystem::remove(records / "trial");
      const ProgramResult result = run.runJob(
          tried.processes, tried.rank, run.injection({{"FAULT", fault.text()}, {"FAULT_RECORD", records / "trial"}}));
      if (records.read("trial").find("failed\t") == std::string::npos) continue;  // another slot took that run
      const std::vector<std::string> problems = run.check(result, expectationOf(fault, run));
      report.tried((tried.isJob() ? "under MPI: " : "") + kindOf(fault.call.second),
                   fmt::format("{}: {} {}, call {} ({}): {}", tried.name(), fault.call.first, fault.call.second,
                               fault.number, fault.how, std::strerror(fault.error)),
                   problems, run.checkNextRun());
    }
  }
}

}  // namespace mirevo::testing
