#pragma once

#include <optional>
#include <string>
#include <sys/types.h>

#include "platform/processes/process_groups.h"
#include "platform/processes/process_mark.h"

namespace mirevo {

/// A small process that outlives the program by a moment: when the program has ended, in whatever way (including kill
/// -9), it ends the process groups that are still in the table and every other process with the mark, and then itself.
/// The kernel's parent-death signal reaches direct children only; the guard also reaches what they have started. Until
/// then it sleeps and costs a model run nothing. Should it be ended itself, the program starts another one.
class ChildGuard final {
 public:
  /// Both must outlive the guard.
  ChildGuard(const ProcessGroupTable& table, const ProcessMark& mark);
  /// Ends the guard, but not the groups that are still running.
  ~ChildGuard();
  ChildGuard(const ChildGuard&) = delete;
  ChildGuard& operator=(const ChildGuard&) = delete;

  /// Starts it; false with the system's reason when that fails.
  bool start(std::string& reason);
  /// After start(): a line for the log if the guard has to look at intervals whether the program is still there, as the
  /// system cannot wake it at its end; else empty.
  const std::string& limitation() const { return limitation_; }

  /// To be called now and then: starts another guard if this one has ended, a few times at once and then once a minute.
  /// Returns a line for the log, but for the rare ones.
  std::optional<std::string> renewIfEnded();

  /// 0 while there is none.
  pid_t process() const { return process_; }

  /// For a signal handler that is about to end the program: makes a stopped guard continue, and ends the bearers of the
  /// mark itself if there is no guard any more. Async-signal-safe.
  void relieve() const noexcept;

 private:
  bool isThere() const noexcept;

  const ProcessGroupTable& table_;
  const ProcessMark& mark_;
  pid_t process_ = 0;
  int renewals_ = 0;       ///< not counting the rare ones
  double nextLook_ = 0.0;  ///< for a rare one
  std::string limitation_;
};

/// Ends every running model process (SIGKILL) of the launcher that was initialised last, or leaves the end of those
/// that are in no group to its guard. For signal handlers: async-signal-safe; takes 20 ms while there is a guard, and
/// up to 2 s where it is gone and a bearer of the mark does not end.
void haltProcessesFromSignal() noexcept;

}  // namespace mirevo
