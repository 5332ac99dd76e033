#pragma once

#include <string>
#include <sys/types.h>

#include "platform/processes/process_groups.h"
#include "platform/processes/process_mark.h"

namespace mirevo {

/// A small process that outlives the program by a moment: when the program has ended, in whatever way (including kill
/// -9), it ends the process groups that are still in the table and every other process with the mark, and then itself.
/// The kernel's parent-death signal reaches direct children only; the guard also reaches what they have started. Until
/// then it sleeps and costs a model run nothing.
class ChildGuard final {
 public:
  ChildGuard() = default;
  /// Ends the guard, but not the groups that are still running.
  ~ChildGuard();
  ChildGuard(const ChildGuard&) = delete;
  ChildGuard& operator=(const ChildGuard&) = delete;

  /// Starts it; false with the system's reason when that fails.
  bool start(const ProcessGroupTable& table, const ProcessMark& mark, std::string& reason);

 private:
  pid_t process_ = 0;
};

}  // namespace mirevo
