#pragma once

#include <string>
#include <sys/types.h>

#include "platform/processes/process_groups.h"
#include "platform/processes/process_mark.h"

namespace mirevo {

/// A small process of our own that outlives the program by a moment: when the program has ended, in whatever way (kill
/// -9 included), it ends the process groups that still stand in the table and whatever else bears the mark, and then
/// itself. The kernel's own signal on a parent's death reaches direct children only; this reaches what they have
/// started, too. It sleeps until then and is told nothing, so it costs a model run nothing.
class ChildGuard final {
 public:
  ChildGuard() = default;
  /// Ends the guard. Groups that still run are not touched.
  ~ChildGuard();
  ChildGuard(const ChildGuard&) = delete;
  ChildGuard& operator=(const ChildGuard&) = delete;

  /// Starts it; false with the system's reason when that fails.
  bool start(const ProcessGroupTable& table, const ProcessMark& mark, std::string& reason);

 private:
  pid_t process_ = 0;
};

}  // namespace mirevo
