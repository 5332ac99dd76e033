#pragma once

#include <atomic>
#include <optional>
#include <span>
#include <string>
#include <sys/types.h>
#include <vector>

namespace mirevo {

/// The process groups that are running, one entry per slot (0 = none). The memory is shared with processes forked
/// later, so that the guard sees what its parent and the children write; it is lock-free, so that a signal handler may
/// read it.
class ProcessGroupTable final {
 public:
  /// Throws std::bad_alloc when the memory cannot be allocated.
  explicit ProcessGroupTable(int entryCount);
  ~ProcessGroupTable();
  ProcessGroupTable(const ProcessGroupTable&) = delete;
  ProcessGroupTable& operator=(const ProcessGroupTable&) = delete;

  std::span<std::atomic<pid_t>> entries() const noexcept { return entries_; }

  /// Sends the signal to every group in the table. Async-signal-safe.
  void signalAll(int signal) const noexcept;

  /// Makes this the table that haltGroupsFromSignal() acts on, until it is destroyed.
  void makeCurrent() const noexcept;

 private:
  std::span<std::atomic<pid_t>> entries_;
};

/// Ends (SIGKILL) every running group of the current table. Async-signal-safe.
void haltGroupsFromSignal() noexcept;

/// A process of the system.
struct FoundProcess {
  pid_t id = 0;
  pid_t parent = 0;
  pid_t group = 0;
  char state = '?';  ///< 'D': in an uninterruptible wait; 'Z': its first thread, if not all of it, has ended
  std::string name;  ///< without control characters
};

/// Empty if there is none; one that has ended is there until it is reaped.
std::optional<FoundProcess> findProcess(pid_t id);

/// The processes of these groups that are still running (zombies excluded), found among all processes of the system,
/// which takes some milliseconds.
std::vector<FoundProcess> runningMembers(std::span<const pid_t> groups);

/// The children of a process, zombies included, found in the same way.
std::vector<pid_t> childrenOf(pid_t parent);

}  // namespace mirevo
