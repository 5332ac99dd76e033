#include "platform/processes/left_processes.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <csignal>
#include <cstring>
#include <ctime>
#include <fcntl.h>
#include <filesystem>
#include <span>
#include <string_view>
#include <sys/prctl.h>
#include <sys/wait.h>
#include <unistd.h>
#include <utility>

#include <fmt/core.h>

#include "common/clock.h"
#include "common/files.h"
#include "common/paths.h"
#include "platform/processes/process_groups.h"

namespace mirevo {
namespace {

/// Longest wait for a killed process; one that waits for a lost network drive may never end.
constexpr double kKilledSeconds = 5.0;

/// Whether the process works in the folder, has a file of it open, or was given its name.
bool pointsInto(pid_t id, const std::string& folder) {
  const std::filesystem::path process = fmt::format("/proc/{}", id);
  std::error_code ignored;
  const auto leadsThere = [&](const std::filesystem::path& link) {
    return pathInFolder(std::filesystem::read_symlink(link, ignored).string(), folder).has_value();
  };
  if (leadsThere(process / "cwd")) return true;
  std::filesystem::directory_iterator file(process / "fd", ignored);
  for (; file != std::filesystem::directory_iterator(); file.increment(ignored)) {
    if (leadsThere(file->path())) return true;
  }
  std::string reason;
  return readTextFile(process / "cmdline", reason).value_or("").find(folder + "/") != std::string::npos;
}

/// What is said of those that the item has left and that were ended, or could not be.
std::string textOfSome(const std::vector<LeftProcess>& left, const std::string& batchFile, bool isEnded) {
  std::string names;
  int count = 0;
  for (const LeftProcess& process : left) {
    if (process.batchFile != batchFile || process.problem.empty() != isEnded) continue;
    names += fmt::format("{}{} ({}{}{})", count++ == 0 ? "" : ", ", process.name, process.id, isEnded ? "" : ": ",
                         process.problem);
  }
  if (count == 0) return {};
  const bool isOfOther = std::any_of(left.begin(), left.end(), [&](const LeftProcess& process) {
    return process.isOfOther && process.batchFile == batchFile && process.problem.empty() == isEnded;
  });
  if (isOfOther) names += "; without MIREVO_RUN in its environment it may be of another model run at that time";
  const char* const outcome = !isEnded ? "could not be ended" : count == 1 ? "was ended" : "were ended";
  return fmt::format("{} left {}, which {}: {}", batchFile,
                     count == 1 ? "a process running" : fmt::format("{} processes running", count), outcome, names);
}

}  // namespace

std::string textOfLeft(const std::vector<LeftProcess>& left) {
  std::set<std::string> items;
  std::string text;
  for (const LeftProcess& process : left) {
    if (!items.insert(process.batchFile).second) continue;
    for (const bool isEnded : {true, false}) {
      const std::string part = textOfSome(left, process.batchFile, isEnded);
      text += (text.empty() || part.empty() ? "" : "; ") + part;
    }
  }
  return text;
}

LeftProcesses::~LeftProcesses() {
  if (childrenFile_ >= 0) ::close(childrenFile_);
}

bool LeftProcesses::adopt(std::string& reason) {
  if (::prctl(PR_SET_CHILD_SUBREAPER, 1UL, 0UL, 0UL, 0UL) != 0) {
    reason = std::strerror(errno);
    return false;
  }
  isParent_ = true;
  // A process that loses its parent goes to the first thread, which is the one that bears the program's number.
  const std::string path = fmt::format("/proc/self/task/{}/children", ::getpid());
  childrenFile_ = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
  for (const pid_t child : children()) others_.insert(child);
  return true;
}

void LeftProcesses::addSlot(const std::string& folder) {
  std::error_code ignored;
  slots_.emplace_back().folder = std::filesystem::weakly_canonical(folder, ignored).string();
}

void LeftProcesses::begin(int slot) {
  slotAt(slot).isRunning = true;
  slotAt(slot).hasEnded = false;
  slotAt(slot).endingSince.reset();
  slotAt(slot).endedGroup = 0;
  slotAt(slot).left.clear();
}

/// Zombies are among them. None of the list is missed, as a child stays in it until this program reaps it.
std::vector<pid_t> LeftProcesses::children() const {
  if (childrenFile_ < 0) return childrenOf(::getpid());
  std::string text;
  std::array<char, 4096> bytes{};
  while (true) {
    const ssize_t count = ::pread(childrenFile_, bytes.data(), bytes.size(), static_cast<off_t>(text.size()));
    if (count <= 0) break;
    text.append(bytes.data(), static_cast<std::size_t>(count));
  }
  std::vector<pid_t> found;
  const char* at = text.data();
  const char* const end = at + text.size();
  while (at < end) {
    pid_t id = 0;
    const auto [next, error] = std::from_chars(at, end, id);
    if (error == std::errc()) found.push_back(id);
    at = next + 1;
  }
  return found;
}

void LeftProcesses::look() {
  // The children of one that has ended are in the next list.
  while (isParent_ && lookOnce()) {
  }
}

/// Whether a process was reaped.
bool LeftProcesses::lookOnce() {
  const std::vector<pid_t> all = children();
  const auto isGone = [&all](pid_t id) { return std::find(all.begin(), all.end(), id) == all.end(); };
  std::erase_if(others_, isGone);
  std::erase_if(adopted_, [&isGone](const auto& entry) { return isGone(entry.first); });
  bool hasReaped = false;
  for (const pid_t id : all) {
    if (others_.contains(id) || isOwn_(id)) continue;
    const auto known = adopted_.find(id);
    if (known == adopted_.end() && ::getpgid(id) == ::getpgrp()) {
      others_.insert(id);  // started by a library of this program
      continue;
    }
    siginfo_t ended{};
    if (::waitid(P_PID, static_cast<id_t>(id), &ended, WEXITED | WNOHANG) == 0 && ended.si_pid == id) {
      adopted_.erase(id);
      hasReaped = true;
    } else if (known == adopted_.end()) {
      if (auto process = describe(id)) adopted_.emplace(id, std::move(*process));
    }
  }
  return hasReaped;
}

std::optional<LeftProcesses::Adopted> LeftProcesses::describe(pid_t id) const {
  const auto found = findProcess(id);
  if (!found) return std::nullopt;
  Adopted process{.name = found->name, .slot = mark_.slotOf(id), .candidates = {}, .group = found->group};
  if (process.slot > 0) return process;
  for (std::size_t i = 0; i < slots_.size() && process.slot == 0; ++i) {
    if (pointsInto(id, slots_[i].folder)) process.slot = static_cast<int>(i + 1);
  }
  for (std::size_t i = 0; i < slots_.size() && process.slot == 0; ++i) {
    if (slots_[i].isRunning) process.candidates.insert(static_cast<int>(i + 1));
  }
  return process;
}

/// Whether the slot's batch is not over as long as the process is there.
bool LeftProcesses::belongsTo(const Adopted& process, int slot) {
  return process.slot > 0 ? process.slot == slot : process.candidates.empty() || process.candidates.contains(slot);
}

/// Whether one of the batches that may have started it has items that are running, and may need it.
bool LeftProcesses::mayBelongToRunning(const Adopted& process) const {
  return process.slot == 0 && std::any_of(process.candidates.begin(), process.candidates.end(), [this](int slot) {
           return slotAt(slot).isRunning && !slotAt(slot).hasEnded;
         });
}

/// Whether the program itself had ended it with its batch.
bool LeftProcesses::wasEnded(pid_t group) const {
  return std::any_of(slots_.begin(), slots_.end(),
                     [group](const Slot& slot) { return slot.endedGroup > 0 && slot.endedGroup == group; });
}

void LeftProcesses::giveUp(pid_t id, Adopted& process, Slot& slot, const std::string& batchFile, std::string problem) {
  process.isGivenUp = true;
  const auto named = std::find_if(slot.left.begin(), slot.left.end(), [id](const auto& left) { return left.id == id; });
  if (named != slot.left.end()) {
    named->problem = std::move(problem);
  } else {
    slot.left.push_back({id, process.name, batchFile, std::move(problem)});
  }
}

void LeftProcesses::addKilled(int number, const std::string& batchFile, const std::vector<FoundProcess>& processes) {
  Slot& slot = slotAt(number);
  for (const FoundProcess& found : processes) {
    Adopted& process =
        adopted_
            .insert_or_assign(found.id,
                              Adopted{.name = found.name, .slot = number, .candidates = {}, .group = found.group})
            .first->second;
    process.isKilled = true;
    if (!wasEnded(found.group)) slot.left.push_back({found.id, found.name, batchFile, {}});
    if (::kill(found.id, 0) != 0 && errno == EPERM) giveUp(found.id, process, slot, batchFile, std::strerror(EPERM));
  }
}

// SIGKILL at once, as in a group: what is asked to end first could still write to the results of the batch.
bool LeftProcesses::areGone(int number, const std::string& batchFile, double now) {
  Slot& slot = slotAt(number);
  look();
  slot.hasEnded = true;
  bool areGone = true;
  for (auto& [id, process] : adopted_) {
    if (process.isGivenUp || !belongsTo(process, number)) continue;
    if (mayBelongToRunning(process)) {
      areGone = false;
      continue;
    }
    if (!slot.endingSince || !process.isKilled) slot.endingSince = now;
    const auto isIt = [id = id](const LeftProcess& left) { return left.id == id; };
    if (!wasEnded(process.group) && std::none_of(slot.left.begin(), slot.left.end(), isIt)) {
      const auto found = findProcess(id);  // it may have become another program
      const bool isOfOther = process.slot == 0 && process.candidates.size() > 1;
      slot.left.push_back({id, found ? found->name : process.name, batchFile, {}, isOfOther});
    }
    // Not reaped yet, so the number is still its own.
    if (!std::exchange(process.isKilled, true) && ::kill(id, SIGKILL) != 0) {
      giveUp(id, process, slot, batchFile, std::strerror(errno));
    } else if (now - *slot.endingSince > kKilledSeconds) {
      const auto found = findProcess(id);
      giveUp(id, process, slot, batchFile,
             found && found->state == 'D' ? "it is in an uninterruptible wait" : "it does not end");
    } else {
      areGone = false;
    }
  }
  if (!areGone) return false;
  slot.isRunning = false;
  for (auto& [id, process] : adopted_) process.candidates.erase(number);
  return true;
}

void LeftProcesses::endAll(double seconds) {
  const double deadline = runTimeClock() + seconds;
  while (true) {
    look();
    bool any = false;
    for (const auto& [id, process] : adopted_) any = (::kill(id, SIGKILL) == 0 && !process.isGivenUp) || any;
    if (!any || runTimeClock() >= deadline) return;
    const timespec pause{0, 1'000'000};
    ::nanosleep(&pause, nullptr);
  }
}

}  // namespace mirevo
