#pragma once

#include <array>
#include <string>
#include <sys/types.h>

namespace mirevo {

/// A variable in the environment of all processes of a run's models, inherited by what they start. It identifies
/// processes that have left their process group and their parent, as daemons do. One that clears its environment cannot
/// be found by it.
class ProcessMark final {
 public:
  /// Makes a mark that no other run has.
  ProcessMark();

  /// "MIREVO_RUN=..."; with the number of a slot behind it that of the slot's processes.
  const char* variable() const { return text_.data(); }
  std::string variable(int slot) const;

  /// The slot of a process by its mark; 0 if it has none or its environment may not be read.
  int slotOf(pid_t process) const;

  /// Ends (SIGKILL) every process of this machine that has the mark, and looks again until there is none or two seconds
  /// have passed. Async-signal-safe; takes some milliseconds if there is none.
  void endBearers() const noexcept;

 private:
  std::array<char, 32> text_{};
};

}  // namespace mirevo
