#include "platform/processes/posix_process_launcher.h"

#include <algorithm>
#include <array>
#include <cassert>
#include <cerrno>
#include <cmath>
#include <csignal>
#include <cstring>
#include <ctime>
#include <fcntl.h>
#include <filesystem>
#include <limits>
#include <new>
#include <poll.h>
#include <span>
#include <string_view>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/fatal_error.h"
#include "common/paths.h"
#include "common/run_files.h"
#include "common/text.h"
#include "platform/processes/argument_text.h"
#include "platform/processes/batch_file_hints.h"
#include "platform/processes/child_process.h"
#include "platform/processes/helper_process.h"
#include "platform/processes/own_files.h"
#include "platform/processes/process_folder.h"

namespace mirevo {
namespace {

/// Variables by which the usual run-time libraries choose their number of threads.
constexpr std::array<std::string_view, 9> kThreadVariables = {
    "OMP_NUM_THREADS",     "OMP_THREAD_LIMIT",       "OPENBLAS_NUM_THREADS", "GOTO_NUM_THREADS", "MKL_NUM_THREADS",
    "NUMEXPR_NUM_THREADS", "VECLIB_MAXIMUM_THREADS", "BLIS_NUM_THREADS",     "RAYON_NUM_THREADS"};

constexpr std::size_t kOutputTailBytes = 65536;
constexpr std::size_t kOutputLineBytes = 400;
/// Longest wait for a killed process to end; one that waits for a lost network drive may never end.
constexpr double kKilledSeconds = 10.0;
constexpr int kGroupLookMilliseconds = 20;
/// The same for the rest of a group before the next item, and for what batches have left when the run ends.
constexpr double kRestSeconds = 5.0;
constexpr double kLeftSeconds = 2.0;
/// Between two looks at what a batch has left, and at a batch where the kernel has no pidfd to wait with.
constexpr double kLeftLookSeconds = 0.002;
constexpr double kUnwatchedSeconds = 0.02;
/// A batch system that ends a job sends the signal to all its processes, one after the other. Where the model has it
/// first, the program waits so long for its own before it takes the end of the model for a failure, which a restart
/// would keep: as long as the model ran, within these limits, as many runs may end like that for reasons of their own.
constexpr double kLeastRequestSeconds = 0.1;
constexpr double kMostRequestSeconds = 0.5;

/// Whether the signal may have been meant for the whole job: a request to end or, after that, a kill.
bool mayEndJob(int signal) {
  constexpr std::array kSignals{SIGINT, SIGTERM, SIGHUP, SIGQUIT, SIGXCPU, SIGKILL};
  return std::find(kSignals.begin(), kSignals.end(), signal) != kSignals.end();
}

std::string baseName(const std::string& path) {
  return std::filesystem::path(path).filename().string();
}

/// Opens with a descriptor above 2, so that it can be duplicated onto the standard descriptors of a child.
int openAboveStandard(const char* path, int flags, unsigned mode) {
  const int fd = ::open(path, flags | O_CLOEXEC, mode);
  if (fd < 0 || fd > STDERR_FILENO) return fd;
  const int moved = ::fcntl(fd, F_DUPFD_CLOEXEC, STDERR_FILENO + 1);
  const int error = errno;
  ::close(fd);
  errno = error;
  return moved;
}

/// The end of a file, at most `kOutputTailBytes`.
std::string readTail(int fd) {
  struct stat status {};
  if (fd < 0 || ::fstat(fd, &status) != 0) return {};
  const off_t start = std::max<off_t>(0, status.st_size - static_cast<off_t>(kOutputTailBytes));
  std::string text(static_cast<std::size_t>(status.st_size - start), '\0');
  const ssize_t length = text.empty() ? 0 : ::pread(fd, text.data(), text.size(), start);
  if (length < 0) return fmt::format("(its output cannot be read: {})", std::strerror(errno));
  text.resize(static_cast<std::size_t>(length));
  return text;
}

/// Returns when no process of these groups is running any more, or after `seconds`.
void awaitEndOfGroups(std::span<const pid_t> groups, double seconds) {
  const double deadline = runTimeClock() + seconds;
  while (!runningMembers(groups).empty() && runTimeClock() < deadline) {
    const timespec pause{0, kGroupLookMilliseconds * 1'000'000L};
    ::nanosleep(&pause, nullptr);
  }
}

/// A line of output prepared for a log: without control characters, and not too long.
std::string printable(std::string_view line) {
  std::string text(line.substr(0, kOutputLineBytes));
  for (char& c : text) {
    if (static_cast<unsigned char>(c) < ' ' || c == '\x7f') c = ' ';
  }
  return std::string(trimTrailing(text));
}

/// Calls `look` at most so often.
std::function<void()> everyTenthOfSecond(const std::function<void()>& look) {
  return [look, last = runTimeClock()]() mutable {
    if (runTimeClock() - last < 0.1) return;
    look();
    last = runTimeClock();
  };
}

std::string textOf(const FatalError& error) {
  return error.detail().empty() ? error.message() : error.message() + "\n" + error.detail();
}

/// What to do where folders that are not there cannot be made, which the system's reason does not say; else empty.
std::string remedyForFolders(const std::vector<std::string>& folders) {
  for (const std::string& folder : folders) {
    const std::string parent = std::filesystem::path(folder).parent_path();
    if (::access(folder.c_str(), F_OK) == 0 || ::access(parent.c_str(), W_OK | X_OK) == 0) continue;
    return fmt::format(
        "\nProcessFolder in the section SimultaneousSimulations names another folder for the process folders, one that "
        "can be written, or the permissions of {} need to be changed",
        parent);
  }
  return {};
}

}  // namespace

PosixProcessLauncher::~PosixProcessLauncher() {
  haltProcesses();
  closeDescriptors();
  for (const Slot& slot : slots_) {
    // A model has put it in the place of its folder; the next run would refuse it as the user's.
    std::error_code ignored;
    if (slot.isMade && std::filesystem::is_symlink(slot.folder, ignored)) std::filesystem::remove(slot.folder, ignored);
  }
}

void PosixProcessLauncher::closeDescriptors() {
  for (Slot& slot : slots_) {
    if (slot.log >= 0) ::close(slot.log);
    slot.log = -1;
  }
  if (nullInput_ >= 0) ::close(nullInput_);
  nullInput_ = -1;
}

bool PosixProcessLauncher::initialise(const LauncherSettings& settings) {
  assert(!settings.batchItems.empty() && settings.slotCount > 0);
  haltProcesses();
  closeDescriptors();
  slots_.clear();
  // If this signal was ignored at the start of the program, the kernel would discard how its children ended.
  ::signal(SIGCHLD, SIG_DFL);
  ignoredSignals_ = ignoredSignals();
  graceSeconds_ = settings.graceSeconds;
  maxSeconds_ = settings.maxSeconds;
  baseFolder_ = settings.baseFolder;
  processFolderPrefix_ = settings.processFolderPrefix;
  ownFiles_ = settings.ownFiles;
  linksReadOnlyFiles_ = settings.linksReadOnlyFiles;
  warn_ = settings.warn;
  try {
    std::vector<std::vector<std::string>> arguments;
    for (const BatchItem& item : settings.batchItems) {
      std::string reason;
      auto words = splitArguments(item.arguments, reason);
      if (!words) fatalError(fmt::format("Arguments of {}: {}: {}", item.batchFileName, reason, item.arguments));
      if (!pathInFolder(item.batchFileName, settings.baseFolder)) {
        fatalError(fmt::format("{} does not lie in the model's folder {}", item.batchFileName, settings.baseFolder));
      }
      arguments.push_back(std::move(*words));
    }
    nullInput_ = openAboveStandard("/dev/null", O_RDONLY, 0);
    if (nullInput_ < 0) fatalError(fmt::format("Error: Unable to open /dev/null: {}", std::strerror(errno)));
    prepareEnvironment(settings.useSingleThread);
    groups_ = std::make_unique<ProcessGroupTable>(settings.slotCount);
    groups_->makeCurrent();
    startGuard();
    lockFolders(settings);
    makeFolders(settings);
    for (int number = 1; number <= settings.slotCount; ++number) prepareSlot(settings, number, arguments);
  } catch (const FatalError& error) {
    lastError_ = textOf(error);
    return false;
  } catch (const std::bad_alloc&) {
    lastError_ = std::strerror(ENOMEM);
    return false;
  }
  lastError_.clear();
  return true;
}

void PosixProcessLauncher::startGuard() {
  guard_ = std::make_unique<ChildGuard>(*groups_, mark_);
  std::string reason;
  if (!guard_->start(reason)) fatalError("Error: Unable to start the guard of the model's processes: " + reason);
  if (!guard_->limitation().empty()) warn_ ? warn_(guard_->limitation()) : warnings_.push_back(guard_->limitation());
  left_ = std::make_unique<LeftProcesses>(mark_, [this](pid_t id) {
    const auto isGroup = [id](const std::atomic<pid_t>& entry) { return entry.load() == id; };
    return id == guard_->process() || isHelperProcess(id) ||
           std::any_of(groups_->entries().begin(), groups_->entries().end(), isGroup);
  });
  if (!left_->adopt(reason)) {
    fatalError("Error: Unable to become the parent of what the model's processes leave: " + reason);
  }
}

void PosixProcessLauncher::lockFolders(const LauncherSettings& settings) {
  const std::string& prefix = settings.processFolderPrefix;
  const std::filesystem::path parent = std::filesystem::path(prefix).parent_path();
  std::error_code failed;
  std::filesystem::create_directories(parent, failed);
  if (failed) {
    fatalError(fmt::format("Unable to create {}, the folder of the process folders (ProcessFolder): {}",
                           parent.string(), failed.message()));
  }
  const FileLock::Range folders{settings.firstFolderNumber, settings.slotCount};
  if (!lock_.take(processLockPath(prefix), folders, kLockPatienceSeconds)) {
    fatalError(processFoldersInUse(prefix, lock_.holder()));
  }
  if (settings.warn && !lock_.warning().empty()) settings.warn(lock_.warning());
}

void PosixProcessLauncher::makeFolders(const LauncherSettings& settings) {
  std::error_code failed;
  const auto resolved = [&failed](const std::string& folder) {
    std::string path = std::filesystem::weakly_canonical(folder, failed).string();
    if (failed) fatalError(fmt::format("Unable to look at {}: {}", folder, failed.message()));
    return path;
  };
  slots_.reserve(static_cast<std::size_t>(settings.slotCount));
  std::vector<std::string> folders;
  for (int number = 0; number < settings.slotCount; ++number) {
    const std::string& folder =
        folders.emplace_back(settings.processFolderPrefix + std::to_string(settings.firstFolderNumber + number));
    if (pathInFolder(resolved(settings.baseFolder), resolved(folder))) {
      fatalError(fmt::format("The model's folder {} lies in the process folder {}, which is made anew for every run",
                             settings.baseFolder, folder));
    }
    slots_.emplace_back().folder = folder;
  }
  const auto look = [&settings] {
    if (settings.isCancelled && settings.isCancelled()) throw RunCancelled();
  };
  look();
  const FolderListing listing = listFolder(baseFolder_, processFolderPrefix_, everyTenthOfSecond(look));
  try {
    const FoldersMade made = makeProcessFolders(listing, folders, {ownFiles_, linksReadOnlyFiles_},
                                                [&settings, &look](const FoldersMade& soFar) {
                                                  if (settings.tellOfFolders) settings.tellOfFolders(soFar);
                                                  look();
                                                });
    if (settings.tellOfFolders) settings.tellOfFolders(made);
  } catch (const FatalError& error) {
    fatalError(textOf(error) + remedyForFolders(folders));
  }
}

void PosixProcessLauncher::prepareSlot(const LauncherSettings& settings, int number,
                                       const std::vector<std::vector<std::string>>& arguments) {
  Slot& slot = slotAt(number);
  slot.isMade = true;
  slot.mark = mark_.variable(number);
  left_->addSlot(slot.folder);
  makeFilesOwn(slot.folder, baseFolder_, ownFiles_, processFolderPrefix_);
  if (!renewLog(slot)) {
    fatalError(fmt::format("Unable to create {}/{}: {}", slot.folder, run_files::kBatchLog, std::strerror(errno)));
  }
  for (std::size_t i = 0; i < settings.batchItems.size(); ++i) {
    std::string file = slot.folder + settings.batchItems[i].batchFileName.substr(settings.baseFolder.size());
    std::string folder = std::filesystem::path(file).parent_path().string();
    slot.commands.emplace_back(std::move(file), std::move(folder), arguments[i]);
  }
}

void PosixProcessLauncher::prepareEnvironment(bool useSingleThread) {
  environmentTexts_.clear();
  environment_.clear();
  for (char** variable = ::environ; variable != nullptr && *variable != nullptr; ++variable) {
    const std::string_view text = *variable;
    const std::string_view name = text.substr(0, text.find('='));
    const bool replaced =
        useSingleThread && std::find(kThreadVariables.begin(), kThreadVariables.end(), name) != kThreadVariables.end();
    if (!replaced) environmentTexts_.emplace_back(text);
  }
  if (useSingleThread) {
    for (const std::string_view name : kThreadVariables) environmentTexts_.push_back(fmt::format("{}=1", name));
  }
  for (std::string& text : environmentTexts_) environment_.push_back(text.data());
  environment_.insert(environment_.end(), 2, nullptr);
}

bool PosixProcessLauncher::renewFolder(int slotNumber, const std::function<void()>& look) {
  const std::string& folder = slotAt(slotNumber).folder;
  try {
    const std::function<void()> looking = everyTenthOfSecond(look ? look : [] {});
    CopyProgress progress(nullptr, looking);
    makeProcessFolderAnew(listFolder(baseFolder_, processFolderPrefix_, looking), folder,
                          {ownFiles_, linksReadOnlyFiles_}, progress);
    makeFilesOwn(folder, baseFolder_, ownFiles_, processFolderPrefix_);
  } catch (const FatalError& error) {
    lastError_ = textOf(error);
    return false;
  }
  return true;
}

std::string PosixProcessLauncher::getProcessFolder(int slot) const {
  return slotAt(slot).folder;
}

std::atomic<pid_t>& PosixProcessLauncher::groupEntry(const Slot& slot) const {
  return groups_->entries()[static_cast<std::size_t>(&slot - slots_.data())];
}

/// Provides an empty log for the next batch. The log of the last batch is reused if it is empty and still there, which
/// saves removing and creating a file for every run. It is never truncated: that costs more, and a process of an
/// earlier run may still have it open.
bool PosixProcessLauncher::renewLog(Slot& slot) {
  struct stat status {};
  if (slot.log >= 0 && ::fstat(slot.log, &status) == 0 && status.st_size == 0 && status.st_nlink > 0) return true;
  if (slot.log >= 0) ::close(slot.log);
  const std::string path = slot.folder + "/" + run_files::kBatchLog;
  slot.log = -1;
  if (::unlink(path.c_str()) != 0 && errno != ENOENT) return false;
  slot.log = openAboveStandard(path.c_str(), O_RDWR | O_CREAT | O_EXCL | O_APPEND, 0666);
  return slot.log >= 0;
}

void PosixProcessLauncher::createProcesses(int slotNumber) {
  Slot& slot = slotAt(slotNumber);
  assert(slot.group == 0 && !slot.isEnding);
  slot.item = 0;
  slot.failure = {};
  slot.isEnding = true;
  left_->begin(slotNumber);
  slot.started = clock_();
  slot.unseen = 0.0;
  slot.overdue.reset();
  slot.heldBack.reset();
  if (!renewLog(slot)) {
    slot.failure = {
        BatchFailure::Kind::couldNotStart, errno,
        fmt::format("{} could not be started: unable to create {}/{}: {}", baseName(slot.commands.front().file()),
                    slot.folder, run_files::kBatchLog, std::strerror(errno))};
    return;
  }
  startItem(slot);
}

void PosixProcessLauncher::startItem(Slot& slot) {
  const SpawnCommand& command = slot.commands[slot.item];
  environment_[environment_.size() - 2] = slot.mark.data();
  const SpawnSurroundings surroundings{environment_.data(), nullInput_, slot.log, &groupEntry(slot), ignoredSignals_};
  const SpawnedProcess process = spawnProcess(command, surroundings);
  if (process.error == 0) {
    slot.pidfd = process.pidfd;
    slot.group = process.id;
    return;
  }
  std::string hint;
  if (process.error == ENOENT) hint = interpreterHint(command.file());
  slot.failure = {BatchFailure::Kind::couldNotStart, process.error,
                  fmt::format("{} could not be {}: {}{}", baseName(command.file()), process.failedStep,
                              std::strerror(process.error), hint)};
}

void PosixProcessLauncher::excludeTime(double seconds) {
  for (Slot& slot : slots_) slot.unseen += seconds;
}

void PosixProcessLauncher::isExecuting(int slotNumber, std::int32_t& executing, std::int32_t& status) {
  Slot& slot = slotAt(slotNumber);
  if (slot.group > 0) {
    // Not reaped (WNOWAIT): until then its number cannot be reused for another group.
    siginfo_t ended{};
    const int result = ::waitid(P_PID, static_cast<id_t>(slot.group), &ended, WEXITED | WNOHANG | WNOWAIT);
    if (result == 0 && ended.si_pid != 0) {
      finishItem(slot, ended.si_code, ended.si_status);
    } else if (result == 0) {
      endOverdue(slot);
    } else if (result < 0 && errno == ECHILD) {  // something else in this program has reaped it
      endRestOfGroup(slot);
      slot.failure = {BatchFailure::Kind::exitCode, -1,
                      baseName(slot.commands[slot.item].file()) + " has ended, but how could not be learned"};
    }
  }
  if (slot.group == 0 && slot.isEnding) {
    const std::string last = baseName(slot.commands[slot.item].file());
    slot.isEnding = !left_->areGone(slotNumber, last, clock_());
  }
  if (slot.heldBack && clock_() >= *slot.heldBack) slot.heldBack.reset();
  slot.unseen = 0.0;
  executing = isBusy(slot) ? 1 : 0;
  status = static_cast<std::int32_t>(slot.failure.kind == BatchFailure::Kind::none ? BatchStatus::succeeded
                                                                                   : BatchStatus::failed);
}

/// After the first process of the item has ended: ends the rest of its group and starts the next item of the batch.
void PosixProcessLauncher::finishItem(Slot& slot, int code, int status) {
  endRestOfGroup(slot);
  const std::string name = baseName(slot.commands[slot.item].file());
  if (slot.overdue) {  // however it ended
    slot.failure = {BatchFailure::Kind::timedOut, 0,
                    fmt::format("{} was ended because it ran longer than {:g} seconds", name, maxSeconds_)};
  } else if (code != CLD_EXITED) {
    slot.failure = {BatchFailure::Kind::signal, status, fmt::format("{} {}", name, endedBySignal(status))};
    if (mayEndJob(status)) holdBack(slot);
  } else if (status != 0) {
    slot.failure = {
        BatchFailure::Kind::exitCode, status,
        fmt::format("{} exited with code {}{}", name, status, meaningOfCode(status, slot.commands[slot.item].file()))};
    if (mayEndJob(status - 128)) holdBack(slot);  // as shells tell of it
  } else if (slot.item + 1 < slot.commands.size()) {
    ++slot.item;
    slot.started = std::min(slot.started + slot.unseen, clock_());
    startItem(slot);
  }
}

/// Its end is not told for a while, see kMostRequestSeconds.
void PosixProcessLauncher::holdBack(Slot& slot) {
  const double now = clock_();
  slot.heldBack = now + std::clamp(now - slot.started, kLeastRequestSeconds, kMostRequestSeconds);
}

/// Ends a batch that has run too long, without waiting for it: SIGTERM first, and SIGKILL after the grace time.
void PosixProcessLauncher::endOverdue(Slot& slot) {
  const double now = clock_();
  if (slot.overdue) {
    if (now - *slot.overdue >= graceSeconds_) ::kill(-slot.group, SIGKILL);
  } else if (maxSeconds_ > 0.0 && now - slot.started > maxSeconds_) {
    slot.overdue = now;
    ::kill(-slot.group, SIGTERM);
  }
}

/// Seconds until a batch that is not over must be checked even if its process has not ended.
double PosixProcessLauncher::secondsToLook(const Slot& slot) const {
  constexpr double kShortest = 0.001;
  if (slot.group == 0 && !slot.isEnding && slot.heldBack) return std::max(*slot.heldBack - clock_(), kShortest);
  if (slot.group == 0) return kLeftLookSeconds;
  const double unwatched = slot.pidfd >= 0 ? std::numeric_limits<double>::infinity() : kUnwatchedSeconds;
  double limit = 0.0;
  if (slot.overdue) {
    limit = *slot.overdue + graceSeconds_ - clock_();
    if (limit <= 0.0) return unwatched;  // killed: nothing left to do but wait for its end
  } else {
    if (maxSeconds_ <= 0.0) return unwatched;
    limit = slot.started + maxSeconds_ - clock_();
  }
  return std::min(std::max(limit, kShortest), unwatched);
}

/// Reaps the ended first process of the group and ends the processes that it left behind. The group is stopped first,
/// so that none of them can end or start others between being listed and being killed.
void PosixProcessLauncher::endRestOfGroup(Slot& slot) {
  if (slot.overdue) left_->addEndedGroup(numberOf(slot), slot.group);
  ::kill(-slot.group, SIGSTOP);
  siginfo_t ignored{};
  while (::waitid(P_PID, static_cast<id_t>(slot.group), &ignored, WEXITED) < 0 && errno == EINTR) {
  }
  if (slot.pidfd >= 0) ::close(slot.pidfd);
  slot.pidfd = -1;
  while (::waitpid(-slot.group, nullptr, WNOHANG) > 0) {  // those that it did not reap have become this program's
  }
  // After its first process is reaped, a group without others is gone; one with others keeps its number.
  if (::kill(-slot.group, 0) == 0) {
    const std::vector<FoundProcess> members = runningMembers(std::span(&slot.group, 1));
    ::kill(-slot.group, SIGKILL);
    const bool isLast = slot.item + 1 == slot.commands.size();
    if (!members.empty()) left_->addKilled(numberOf(slot), baseName(slot.commands[slot.item].file()), members);
    if (!isLast) awaitEndOfGroups(std::span(&slot.group, 1), kRestSeconds);  // the next item must not meet them
  }
  groupEntry(slot).store(0);
  slot.group = 0;
}

BatchFailure PosixProcessLauncher::failure(int slot) const {
  return slotAt(slot).failure;
}

std::string PosixProcessLauncher::leftBehind(int slot) const {
  return textOfLeft(left_->of(slot));
}

std::vector<std::string> PosixProcessLauncher::lastOutput(int slot, int lineCount) const {
  const std::string text = readTail(slotAt(slot).log);
  const std::vector<std::string_view> lines = splitLines(text);
  const std::size_t wanted = std::min(lines.size(), static_cast<std::size_t>(std::max(lineCount, 0)));
  std::vector<std::string> last;
  for (std::size_t i = lines.size() - wanted; i < lines.size(); ++i) last.push_back(printable(lines[i]));
  return last;
}

void PosixProcessLauncher::waitForChange(double seconds, std::span<const int> readable) {
  std::vector<pollfd> watched;
  bool isNeeded = !readable.empty();
  for (const int descriptor : readable) watched.push_back({descriptor, POLLIN, 0});
  for (const Slot& slot : slots_) {
    if (!isBusy(slot)) continue;
    isNeeded = true;
    seconds = std::min(seconds, secondsToLook(slot));
    if (slot.pidfd >= 0) watched.push_back({slot.pidfd, POLLIN, 0});
  }
  if (!isNeeded) return;
  const double whole = std::floor(std::max(seconds, 0.0));
  const timespec timeout{static_cast<time_t>(whole), static_cast<long>((std::max(seconds, 0.0) - whole) * 1e9)};
  ::ppoll(watched.data(), watched.size(), &timeout, nullptr);  // a signal ends the wait, as it should
  left_->look();
  if (auto text = guard_->renewIfEnded()) warnings_.push_back(std::move(*text));
}

void PosixProcessLauncher::haltProcesses() {
  haltGroups();
  for (Slot& slot : slots_) {
    slot.isEnding = false;
    slot.heldBack.reset();
  }
  if (left_) left_->endAll(kLeftSeconds);
  if (guard_) mark_.endBearers();  // without a guard no process was started
}

void PosixProcessLauncher::haltGroups() {
  std::vector<pid_t> running;
  for (const Slot& slot : slots_) {
    if (slot.group > 0) running.push_back(slot.group);
  }
  if (running.empty()) return;
  // The first processes of the groups are not reaped until the end, so that their numbers are not reused.
  groups_->signalAll(SIGTERM);
  awaitEndOfGroups(running, graceSeconds_);
  groups_->signalAll(SIGKILL);
  awaitEndOfGroups(running, kKilledSeconds);
  for (Slot& slot : slots_) {
    if (slot.group == 0) continue;
    siginfo_t ignored{};
    ::waitid(P_PID, static_cast<id_t>(slot.group), &ignored, WEXITED | WNOHANG);
    if (slot.pidfd >= 0) ::close(slot.pidfd);
    slot.pidfd = -1;
    slot.group = 0;
    groupEntry(slot).store(0);
    slot.failure = {BatchFailure::Kind::signal, SIGTERM,
                    baseName(slot.commands[slot.item].file()) + " was ended because the run ends"};
  }
}

/// The function belongs to a library that exists only for another operating system.
ResistanceUpdate PosixProcessLauncher::r35UpdateResistanceNumbers(const std::string& fileName) {
  const std::string extension = std::filesystem::path(fileName).extension().string();
  return equalIgnoringCase(extension, ".qcsr") ? ResistanceUpdate::libraryNotFound : ResistanceUpdate::wrongExtension;
}

}  // namespace mirevo
