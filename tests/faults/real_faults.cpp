#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <memory>
#include <sched.h>
#include <sys/mount.h>
#include <sys/statfs.h>
#include <tuple>

#include "faults/fault_report.h"
#include "faults/faulty_run.h"
#include "integration/mpi_job.h"

namespace mirevo::testing {
namespace {

namespace fs = std::filesystem;

/// A user with no files and no processes.
constexpr unsigned kNobody = 64'123;

const RunSettings kSearch{.option = 2, .maxEvaluations = 6, .savedFile = "model/simulated.csv"};

/// `command` is a shell's, before the program takes the shell's place.
std::vector<std::string> throughShell(const std::string& command) {
  return {"/bin/sh", "-c", command + "; exec \"$@\"", "sh"};
}

std::vector<std::string> asNobody(std::vector<std::string> command = {}) {
  std::vector<std::string> prefix = {"setpriv", fmt::format("--reuid={}", kNobody), fmt::format("--regid={}", kNobody),
                                     "--clear-groups"};
  prefix.insert(prefix.end(), command.begin(), command.end());
  return prefix;
}

void giveToNobody(const FaultyRun& run) {
  if (::lchown(run.path().c_str(), kNobody, kNobody) != 0) throw std::runtime_error(std::strerror(errno));
  for (const auto& entry : fs::recursive_directory_iterator(run.path())) {
    if (::lchown(entry.path().c_str(), kNobody, kNobody) != 0) throw std::runtime_error(std::strerror(errno));
  }
}

/// Whether that user can run the program at all.
bool nobodyCanRun() {
  std::vector<std::string> arguments = asNobody();
  arguments.erase(arguments.begin());
  arguments.insert(arguments.end(), {MIREVO_PROGRAM, "--version"});
  return ::geteuid() == 0 && RunningProgram(arguments, {}, "setpriv").wait().exitCode == 0;
}

void tryForbiddenFiles(FaultReport& report) {
  // The file, its mode, what the message names.
  constexpr std::tuple<const char*, unsigned, const char*> kCases[] = {
      {"basin.kdx", 0000, "basin.kdx"},
      {"model", 0000, "model"},
      {"model/parameters.tpl", 0000, "model/parameters.tpl"},
      {"model/parameters.txt", 0000, "model/parameters.txt"},
      {"model/data/table.txt", 0000, "model/data/table.txt"},
      {"model/run.sh", 0000, "model/run.sh"},
      {"model/data", 0000, "model/data"},
      {"observed.csv", 0000, "observed.csv"},
      {"basin_Process1", 0555, "basin_Process1"},
      {".", 0555, "basin.log"}};
  if (!nobodyCanRun()) {
    report.skipped("forbidden files", "it takes root to become a user who may not read all");
    return;
  }
  FaultyRun run(kSearch);
  run.makeReference();
  for (const auto& [name, mode, named] : kCases) {
    run.reset();
    giveToNobody(run);
    const std::string path = run.folder() / name;
    struct stat before {};
    ::stat(path.c_str(), &before);
    ::chmod(path.c_str(), mode);
    // A folder that the program may make writable is not forbidden to it.
    if (name == std::string("basin_Process1") && ::lchown(path.c_str(), 0, 0) != 0) continue;
    const ProgramResult result = run.run({}, asNobody());
    const auto problems = run.check(result, {.names = {run.folder() / named},
                                             .reason = "Permission denied",
                                             .logMayLackMessage = name == std::string("."),
                                             .exitCode = 1});
    ::chmod(path.c_str(), before.st_mode & 07777);
    report.tried("forbidden files", fmt::format("{} with mode {:o}", name, mode), problems, run.checkNextRun());
  }
}

/// Runs under ever higher limits until two runs in a row are undisturbed.
void tryLimit(FaultReport& report, const std::string& kind, const char* option, int first, int step, int last,
              const Expectation& expected, bool isNobody) {
  FaultyRun run(kSearch);
  run.makeReference();
  int undisturbed = 0;
  for (int limit = first; limit <= last && undisturbed < 2; limit += step) {
    const std::string command = fmt::format("ulimit -{} {}", option, limit);
    const auto prefix = isNobody ? asNobody(throughShell(command)) : throughShell(command);
    run.reset();
    if (isNobody) giveToNobody(run);
    const ProgramResult result = run.run({}, prefix);
    if (result.exitCode > 1) continue;  // too little to load the program
    const auto problems = run.check(result, expected);
    undisturbed = result.exitCode == 0 && run.checkOutputs().empty() ? undisturbed + 1 : 0;
    report.tried(kind, command, problems, run.checkNextRun());
  }
}

void tryLimits(bool isLong, FaultReport& report) {
  Expectation expected{.reason = "Too many open files", .mayPassSilently = true, .mayFailEvaluation = true};
  expected.logMayLackMessage = true;  // it may be what cannot be opened
  tryLimit(report, "descriptors exhausted", "n", 3, isLong ? 1 : 4, 60, expected, false);
  // The model says it in its own words, or is ended by the signal.
  expected.reason.clear();
  expected.names = {"File too large", "cannot write", "File size limit"};
  expected.resultFileFails = true;
  tryLimit(report, "file size limit", "f", 4, isLong ? 1 : 6, 60, expected, false);
  if (!nobodyCanRun()) {
    report.skipped("processes exhausted", "it takes root to become a user without other processes");
    return;
  }
  expected.names = {"Resource temporarily unavailable"};
  expected.resultFileFails = false;
  tryLimit(report, "processes exhausted", "u", 1, 1, 8, expected, true);
}

/// A small disk of its own, seen by this process and those that it starts.
class SmallDisk {
 public:
  SmallDisk() {
    isThere_ = ::unshare(CLONE_NEWNS) == 0 && ::mount("none", "/", nullptr, MS_REC | MS_PRIVATE, nullptr) == 0 &&
               ::mount("tmpfs", folder_.path().c_str(), "tmpfs", 0, "size=64m") == 0;
    reason_ = isThere_ ? "" : std::strerror(errno);
  }
  ~SmallDisk() {
    if (isThere_) ::umount2(folder_.path().c_str(), MNT_DETACH);
  }
  SmallDisk(const SmallDisk&) = delete;
  SmallDisk& operator=(const SmallDisk&) = delete;
  bool isThere() const { return isThere_; }
  const std::string& reason() const { return reason_; }
  const std::string& path() const { return folder_.path(); }

  /// Leaves room for so many blocks of 4096 bytes, or for so many files; negative: for plenty.
  bool leave(int blocks, int files) const {
    struct statfs status {};
    ::statfs(folder_.path().c_str(), &status);
    const auto usedBlocks = status.f_blocks - status.f_bfree;
    const auto usedFiles = status.f_files - status.f_ffree;
    const std::string options =
        fmt::format("size={}k,nr_inodes={}", blocks < 0 ? 65536 : 4 * (usedBlocks + static_cast<unsigned>(blocks)),
                    files < 0 ? 100'000 : usedFiles + static_cast<unsigned>(files));
    return ::mount("tmpfs", folder_.path().c_str(), "tmpfs", MS_REMOUNT, options.c_str()) == 0;
  }

 private:
  TemporaryFolder folder_;
  bool isThere_ = false;
  std::string reason_;
};

void tryFullDisk(bool isLong, FaultReport& report) {
  const SmallDisk disk;
  if (!disk.isThere()) {
    report.skipped("full disk", "no disk of its own can be mounted: " + disk.reason());
    return;
  }
  for (const auto& [option, processes] :
       {std::pair(0, 1), std::pair(1, 1), std::pair(2, 1), std::pair(3, 1), std::pair(2, 3)}) {
    const bool isJob = processes > 1;
    if ((!isLong && option != 2) || (isJob && !mpirunIsInstalled())) continue;
    RunSettings settings{.option = option, .maxEvaluations = option == 3 ? 10 : 6, .savedFile = "model/simulated.csv"};
    if (option == 0) settings.scenarios = {"1, 1, 1", "2, 2, 1", "3, 1, 1"};
    ::setenv("TMPDIR", disk.path().c_str(), 1);
    const auto run = std::make_unique<FaultyRun>(settings);
    ::unsetenv("TMPDIR");
    run->makeReference();
    for (const bool isFiles : {false, true}) {
      if (isJob && isFiles && !isLong) continue;
      int undisturbed = 0;
      for (int room = 0; room < 200 && undisturbed < 2; room += isLong ? 1 : isJob ? 27 : 7) {
        run->reset();
        if (!disk.leave(isFiles ? -1 : room, isFiles ? room : -1)) throw std::runtime_error(std::strerror(errno));
        const ProgramResult result = run->runJob(processes, 0, {});
        disk.leave(-1, -1);
        // The log is on the same disk; a model that cannot write says so in its own words.
        const auto problems = run->check(result, {.names = {"No space left on device", "cannot write"},
                                                  .mayPassSilently = true,
                                                  .mayFailEvaluation = true,
                                                  .logMayLackMessage = result.exitCode == 1,
                                                  .resultFileFails = true});
        undisturbed = result.exitCode == 0 && run->checkOutputs().empty() ? undisturbed + 1 : 0;
        report.tried(isJob ? "under MPI: full disk" : "full disk",
                     fmt::format("option {}, room for {} {}", option, room, isFiles ? "files" : "blocks"), problems,
                     run->checkNextRun());
      }
    }
  }
}

/// Failed runs whose folders are to be kept on a disk that has no room for them.
void tryKeptFolders(bool isLong, FaultReport& report) {
  const SmallDisk disk;
  if (!disk.isThere()) {
    report.skipped("kept folders", "no disk of its own can be mounted: " + disk.reason());
    return;
  }
  constexpr std::uintmax_t kModelSize = 3'000'000;
  constexpr int kBlocksOfMegabyte = 256;
  ::setenv("TMPDIR", disk.path().c_str(), 1);
  const auto run =
      std::make_unique<FaultyRun>(RunSettings{.option = 3, .maxEvaluations = 60, .modelArguments = "--fail-above 5.8"});
  ::unsetenv("TMPDIR");
  run->folder().write("model/grid.bin", std::string(kModelSize, 'x'));
  run->makeReference();
  for (int room = 5; room <= 25; room += isLong ? 1 : 5) {
    run->reset();
    if (!disk.leave(room * kBlocksOfMegabyte, -1)) throw std::runtime_error(std::strerror(errno));
    auto problems = run->check(run->run({}), {.mayPassSilently = true, .exitCode = 0});
    disk.leave(-1, -1);
    for (const auto& entry : fs::directory_iterator(run->path())) {
      if (entry.path().filename().string().find("_Failed") == std::string::npos || !entry.is_directory()) continue;
      std::error_code none;
      const bool isWhole =
          fs::exists(entry.path() / "mirevo_batch.log") && fs::file_size(entry.path() / "grid.bin", none) == kModelSize;
      if (!isWhole) problems.push_back("half a copy: " + entry.path().string());
    }
    report.tried("kept folders", fmt::format("room for {} MB, of which the process folder takes 3", room), problems,
                 run->checkNextRun());
  }
}

bool isDone(const std::string& command, const std::string& path) {
  return std::system(fmt::format(fmt::runtime(command + " >/dev/null 2>&1"), path).c_str()) == 0;
}

bool canMakeImmutable(const TemporaryFolder& folder) {
  const std::string file = folder.write("file", "");
  return isDone("chattr +i {}", file) && isDone("chattr -i {}", file);
}

/// A model that leaves its process folder unusable, in the second of two slots or in both.
void tryDamagedFolders(FaultReport& report) {
  // what it does, the slots, what the log says
  constexpr std::tuple<const char*, const char*, const char*> kCases[] = {
      {"rm -rf \"$PWD\"", "2", "Slot 2 is given up"},
      {"rm -rf \"$PWD\" && ln -s {} \"$PWD\"", "2", "Slot 2 is given up"},
      {"rm -f simulated.csv; mkdir simulated.csv simulated.csv/x", "2", "Slot 2 is given up"},
      {"rm run.sh", "2", "Slot 2 is given up"},
      {"rm parameters.txt; mkdir parameters.txt", "2", "Slot 2 is given up"},
      {"chattr +i simulated.csv", "2", "Slot 2 is given up"},
      {"chattr +i parameters.txt", "2", "Slot 2 is given up"},
      {"chattr +i simulated.csv", "?", "no process folder is left"},
      {"rm parameters.txt", "?", "no process folder is left"},
      {"mv simulated.csv {0}; ln -s {0}/simulated.csv .", "2", "leads to"}};
  for (const auto& [damage, slots, told] : kCases) {
    const TemporaryFolder outside;
    const std::string command = fmt::format(fmt::runtime(damage), outside.path());
    const bool isImmutable = command.starts_with("chattr");
    if (isImmutable && !canMakeImmutable(outside)) {
      report.skipped("damaged folders", command + " is not permitted or not known here");
      continue;
    }
    FaultyRun run(RunSettings{.option = 3, .maxEvaluations = 30, .slots = 2},
                  fmt::format("{0} \"$@\" || exit 1\n"
                              "test -e {1}/armed && case $PWD in *_Process{2}) {3};; esac\n"
                              "exit 0",
                              MIREVO_TEST_MODEL, outside.path(), slots, command));
    run.makeReference();
    outside.write("armed", "");
    run.reset();
    const bool isFatal = std::string(told) != "Slot 2 is given up";
    const auto problems =
        run.check(run.run({}), {.names = {told}, .mayFailEvaluation = true, .exitCode = isFatal ? 1 : 0});
    fs::remove(outside / "armed");
    if (isImmutable) isDone("find {} -type f -exec chattr -i {{}} +", run.path());
    report.tried("damaged folders", command + " in slot " + slots, problems, run.checkNextRun());
  }
}

/// The model itself removes, in its third run, what the program works with.
void tryRemovedFiles(FaultReport& report) {
  // named: the message names it; null: the run does not need it any more
  constexpr std::tuple<const char*, const char*, const char*> kCases[] = {
      {"model", nullptr, ""},
      {"observed.csv", nullptr, ""},
      {"basin.kdx", nullptr, ""},
      {"basin._spi_", nullptr, ""},
      {"basin_Saved", nullptr, ""},
      {"basin_Process1", "basin_Process1/simulated.csv", ""},
      {"basin_Process1/parameters.txt", nullptr, ""},
      {"basin_Process1/run.sh", nullptr, ""},
      {"basin_Optimisation.dat", nullptr, ""},
      {"basin_Optimisation_Restart.dat", nullptr, ""},
      {"basin.log", nullptr, ""}};
  for (const auto& [removed, named, reason] : kCases) {
    const TemporaryFolder outside;
    FaultyRun run(RunSettings{.option = 2, .maxEvaluations = 6},
                  fmt::format("echo >>{1}/count\n{0} \"$@\" || exit 1\n"
                              "test -e {1}/armed && test `wc -l <{1}/count` -eq 3 && rm -rf \"`cat {1}/armed`\"\n"
                              "exit 0",
                              MIREVO_TEST_MODEL, outside.path()));
    run.makeReference();
    fs::remove(outside / "count");
    outside.write("armed", run.folder() / removed);
    run.reset();
    const ProgramResult result = run.run({});
    Expectation expected{.reason = reason, .mayPassSilently = named == nullptr};
    if (named != nullptr) expected.names = {named};
    expected.mayFailEvaluation = true;
    expected.exitCode = named == nullptr ? 0 : 1;
    auto problems = run.check(result, expected);
    if (run.folder().read("basin.log").find("Setup file:") == std::string::npos) problems.push_back("the log is lost");
    if (!run.folder().exists("basin_Optimisation_Restart.dat")) problems.push_back("the settings are not put back");
    report.tried("files removed during the run", removed, problems);
  }
}

/// The model's third run damages what it wrote, or loses its end as on a full disk, and ends well.
void tryDamagedResults(FaultReport& report) {
  // what is done to the file `simulated`, its ending, what is told
  constexpr std::tuple<const char*, const char*, const char*> kCases[] = {
      {"truncate -s -1 $F", "csv", "simulated.csv has no end"},
      {"truncate -s -2 $F", "csv", "simulated.csv has no end"},
      {"truncate -s -6 $F", "csv", "simulated.csv has no end"},
      {"truncate -s 40G $F", "csv", "MB are too many"},
      {"head -c 2000000 /dev/zero | tr '\\000' , >$F", "csv", "expected at most 1000000 items"},
      {"cp {}/endless.nc $F", "nc", "took longer than the model run had left of its 2 seconds"},
      {"printf 'CDF\\001\\000\\000\\000\\000\\000\\000\\000\\012\\177\\377\\377\\377' >$F", "nc",
       "it ends within its header"}};
  const std::string files = MIREVO_SOURCE_DIR "/tests/platform/series";
  for (const auto& [damage, ending, told] : kCases) {
    const TemporaryFolder outside;
    const std::string file = fmt::format("simulated.{}", ending);
    FaultyRun run(
        RunSettings{.option = 2, .maxEvaluations = 6},
        fmt::format("F={3}\necho >>{1}/count\n{0} \"$@\" || exit 1\ncp {4}/sound.nc simulated.nc\n"
                    "test -e {1}/armed && test `wc -l <{1}/count` -eq 3 && {2}\n"
                    "exit 0",
                    MIREVO_TEST_MODEL, outside.path(), fmt::format(fmt::runtime(damage), files), file, files));
    fs::copy_file(files + "/sound.nc", run.folder() / "model/simulated.nc");
    run.folder().editSetup("model/simulated.csv", "model/" + file);
    run.folder().editSetup("NoSimultaneousSim = 1", "NoSimultaneousSim = 1\n    MaxSimulationTime = 2.0");
    run.makeReference();
    fs::remove(outside / "count");
    outside.write("armed", "");
    run.reset();
    const ProgramResult result = run.run({});
    auto problems = run.check(result, {.names = {told}, .mayFailEvaluation = true, .exitCode = 1});
    if (run.folder().read("basin.log").find("left a process") != std::string::npos) {
      problems.push_back("a process of the program is laid to the model");
    }
    report.tried("results damaged", damage, problems);
  }
}

/// A model whose runs leave a process that spoils the results of the runs after it.
void tryLeftProcesses(bool isLong, FaultReport& report) {
  // what starts it in which way
  constexpr std::pair<const char*, const char*> kCases[] = {
      {"in its group", "sh -c '{}' &"},
      {"in a session of its own", "setsid -f sh -c '{}'"},
      {"deaf to SIGTERM", "trap \"\" TERM; setsid -f sh -c '{}'"},
      {"without its environment and folder", "(cd /; env -i PATH=$PATH setsid -f setsid -f sh -c '{}')"}};
  for (const auto& [way, start] : kCases) {
    for (const int slots : {1, 2}) {
      if (!isLong && slots == 1) continue;
      const TemporaryFolder outside;
      const std::string spoil = "sleep 0.1; for i in `seq 500`; do cp '$F'/run.sh '$F'/simulated.csv; sleep 0.01; done";
      FaultyRun run(RunSettings{.option = 3, .maxEvaluations = 10, .slots = slots},
                    fmt::format("{0} \"$@\" || exit 1\ntest -e {1}/armed && {{\nF=$PWD\n{2}\nsleep 0.03\n}}\nexit 0",
                                MIREVO_TEST_MODEL, outside.path(), fmt::format(fmt::runtime(start), spoil)));
      run.makeReference();
      outside.write("armed", "");
      run.reset();
      auto problems = run.check(run.run({}), {.mayPassSilently = true, .exitCode = 0});
      const std::string log = run.folder().read("basin.log");
      if (occurrences(log, " running, which w") != 10) problems.push_back("not named for each evaluation");
      for (const std::string& problem : run.checkOutputs()) problems.push_back(problem);
      report.tried("processes left", fmt::format("{}, {} slots", way, slots), problems);
    }
  }
}

/// Without its guard, or where it cannot wait for the program's end, a run ends as ever, and what is lost is told.
void tryGuard(FaultReport& report) {
  const std::string kill =
      "kill -9 `grep -ls mirevo_guard $(sed 's:[0-9]*:/proc/&/comm:g' /proc/$PPID/task/$PPID/children) | cut -d / -f "
      "3`";
  const std::tuple<const char*, std::string, FaultyRun::Environment, const char*> cases[] = {
      {"killed once", "test -e first || " + kill + "; touch first", {}, "was ended by signal 9 (Killed); another one"},
      {"killed each time", kill, {}, "looked at once a minute"},
      {"old kernel", "", {{"FAULT_OLD", "1"}}, "(pidfd_open: Function not implemented)"}};
  for (const auto& [name, script, environment, told] : cases) {
    FaultyRun run(RunSettings{.option = 3, .maxEvaluations = 30});
    run.makeReference();
    run.folder().useScript(script);
    run.reset();
    const ProgramResult result = run.run(environment.empty() ? environment : run.injection(environment));
    auto problems = run.check(result, {.mayPassSilently = true, .exitCode = 0});
    if (run.folder().read("basin.log").find(told) == std::string::npos)
      problems.push_back("the log does not tell of it");
    report.tried("guard", name, problems);
  }
}

}  // namespace

void tryRealFaults(bool isLong, FaultReport& report) {
  tryForbiddenFiles(report);
  tryLimits(isLong, report);
  tryRemovedFiles(report);
  tryDamagedResults(report);
  tryDamagedFolders(report);
  tryLeftProcesses(isLong, report);
  tryGuard(report);
  tryKeptFolders(isLong, report);
  tryFullDisk(isLong, report);
}

}  // namespace mirevo::testing
