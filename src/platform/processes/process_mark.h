#pragma once

#include <array>

namespace mirevo {

/// A variable in the environment of whatever a run's models start, inherited by what that starts in turn. By it those
/// processes are found that have left their process group and their parent, as a daemon does. One that empties its
/// environment is out of reach.
class ProcessMark final {
 public:
  /// One that no other run has.
  ProcessMark();

  /// "MIREVO_RUN=..."
  const char* variable() const { return text_.data(); }

  /// Ends (SIGKILL) every process of this machine that bears the mark, and looks again until there is none or two
  /// seconds have passed. Async-signal-safe; some milliseconds where there is none.
  void endBearers() const noexcept;

 private:
  std::array<char, 32> text_{};
};

}  // namespace mirevo
